#include "FacebookSource.h"

#include <utility>

namespace trelm {

FacebookSource::FacebookSource(String name) : BaseSource(std::move(name), kComponentId) {}

FacebookSource::~FacebookSource() = default;

}  // namespace trelm
