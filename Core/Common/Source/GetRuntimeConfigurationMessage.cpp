#include "GetRuntimeConfigurationMessage.h"

namespace trelm {

// Defined here so that the class's vtable and typeinfo live in libtrelm only.
GetRuntimeConfigurationMessage::~GetRuntimeConfigurationMessage() = default;

}  // namespace trelm
