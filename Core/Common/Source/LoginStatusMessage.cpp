#include "LoginStatusMessage.h"

namespace trelm {
namespace ILoginStatus {

// Defined here so that the class's vtable and typeinfo live in libtrelm only.
LoginStatusMessage::~LoginStatusMessage() = default;

}  // namespace ILoginStatus
}  // namespace trelm
