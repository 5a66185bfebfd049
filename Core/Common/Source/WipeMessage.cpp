#include "WipeMessage.h"

namespace trelm {

// Defined here so that the class's vtable and typeinfo live in libtrelm only.
WipeMessage::~WipeMessage() = default;

}  // namespace trelm
