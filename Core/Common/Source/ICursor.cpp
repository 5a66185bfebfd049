#include "IQueryItems.h"

namespace trelm {
namespace IQueryItems {

ICursor::~ICursor() = default;

}  // namespace IQueryItems
}  // namespace trelm
