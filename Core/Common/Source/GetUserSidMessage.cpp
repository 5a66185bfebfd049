#include "GetUserSidMessage.h"

namespace trelm {
namespace IServiceSource {

// Defined here so that the class's vtable and typeinfo live in libtrelm only.
GetUserSidMessage::~GetUserSidMessage() = default;

}  // namespace IServiceSource
}  // namespace trelm
