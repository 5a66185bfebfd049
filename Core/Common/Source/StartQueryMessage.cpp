#include "IQueryItems.h"

namespace trelm {
namespace IQueryItems {

StartQueryMessage::~StartQueryMessage() = default;

}  // namespace IQueryItems
}  // namespace trelm
