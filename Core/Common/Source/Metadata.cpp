#include "trelm/Metadata.h"

#include <map>
#include <mutex>
#include <string>

namespace trelm {
namespace Metadata {
namespace {

// The process-wide table of key names and types. Built on first use, so that static initialisers
// of any library may register keys, and never destroyed, so that registrations made during
// another library's static destruction stay safe.
class Registry {
public:
    static Registry& instance() {
        static Registry* registry = new Registry;
        return *registry;
    }

    Key add(char const* name, TRELM_TYPES::TYPES type) {
        std::lock_guard<std::mutex> lock(mutex_);
        auto [it, added] = types_.try_emplace(name ? name : "", type);
        return Key(String(it->first), it->second);
    }

    bool find(std::string const& name, TRELM_TYPES::TYPES& type) const {
        std::lock_guard<std::mutex> lock(mutex_);
        auto it = types_.find(name);
        if (it == types_.end()) return false;
        type = it->second;
        return true;
    }

private:
    // Guards types_.
    mutable std::mutex mutex_;
    std::map<std::string, TRELM_TYPES::TYPES> types_;
};

// The host's own item keys, known before any plug-in is loaded.
struct CoreKeys {
    CoreKeys() {
        using namespace TRELM_TYPES;
        trelm_RegisterMetadataType("core_object_id", GUID_TYPE);
        trelm_RegisterMetadataType("core_object_type", INT32);
        trelm_RegisterMetadataType("core_object_time", INT32);
        trelm_RegisterMetadataType("core_object_deleted", BOOL);
        for (char const* name : {"core_object_source",
                                 "core_object_origin_importcomponent",
                                 "core_object_origin_servicename",
                                 "core_event_service",
                                 "core_event_serviceid",
                                 "core_event_parent_serviceid",
                                 "core_event_uri",
                                 "core_event_contactid",
                                 "core_event_contactname",
                                 "core_event_contactfullname",
                                 "core_event_text",
                                 "core_event_subject",
                                 "core_contact_service",
                                 "core_contact_service_id",
                                 "core_contact_profile_url",
                                 "core_contact_profile_picture_url",
                                 "core_contact_display_name",
                                 "core_contact_name",
                                 "core_contact_location",
                                 "core_service_id",
                                 "media_uri",
                                 "media_notes"}) {
            trelm_RegisterMetadataType(name, STRING);
        }
    }
};

CoreKeys const coreKeys;

}  // namespace

uError getType(String const& name, TRELM_TYPES::TYPES& type) {
    if (!Registry::instance().find(name.str(), type)) return TRELM_ERROR(kNotFound);
    return TRELM_OK();
}

}  // namespace Metadata
}  // namespace trelm

trelm::Metadata::Key trelm_RegisterMetadataType(char const* name, trelm::TRELM_TYPES::TYPES type) {
    return trelm::Metadata::Registry::instance().add(name, type);
}
