#include "ConfigurationChangedMessage.h"

namespace trelm {

// Defined here so that the class's vtable and typeinfo live in libtrelm only.
ConfigurationChangedMessage::~ConfigurationChangedMessage() = default;

}  // namespace trelm
