#include "ResetRuntimeConfigurationMessage.h"

namespace trelm {

// Defined here so that the class's vtable and typeinfo live in libtrelm only.
ResetRuntimeConfigurationMessage::~ResetRuntimeConfigurationMessage() = default;

}  // namespace trelm
