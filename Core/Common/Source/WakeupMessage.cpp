#include "WakeupMessage.h"

namespace trelm {

// Defined here so that the class's vtable and typeinfo live in libtrelm only.
WakeupMessage::~WakeupMessage() = default;

}  // namespace trelm
