// A plug-in whose getComponents refuses: the host must report the refusal and its cause.
#include "Component.h"
#include "trelm/Map.h"
#include "trelm/String.h"
#include "trelm/uError.h"

extern "C" __attribute__((visibility("default"))) trelm::uError getComponents(
    trelm::Map<trelm::String, trelm::Component* (*)(trelm::String)>&) {
    return TRELM_ERROR(trelm::kNotSupported);
}
