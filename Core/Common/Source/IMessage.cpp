#include "IMessage.h"

#include "ComponentRegistry.h"

namespace trelm {

IMessage::~IMessage() = default;

uError IMessage::send(String const& target) {
    ComponentRegistry* registry = ComponentRegistry::active();
    if (registry == nullptr) return TRELM_ERROR_MSG(kNotFound, "no active component registry");
    return registry->deliver(*this, target);
}

}  // namespace trelm
