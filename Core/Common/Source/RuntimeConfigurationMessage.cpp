#include "RuntimeConfigurationMessage.h"

namespace trelm {

// Defined here so that the class's vtable and typeinfo live in libtrelm only.
RuntimeConfigurationMessage::~RuntimeConfigurationMessage() = default;

}  // namespace trelm
