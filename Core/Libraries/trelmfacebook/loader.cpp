#include "loader.h"

#include <iterator>
#include <utility>

#include "FacebookConnector.h"
#include "FacebookMetadata.h"
#include "FacebookSource.h"

namespace trelm {
namespace {

// The data source's identifier, kept here whole so that the table never depends on how the
// source spells its own.
char const kFacebookSourceId[] = "@trelm.example:/facebooksource";

// The name of the host's metadata store component, kept with the module for hosts that address
// it; nothing in the plug-in reads it.
[[maybe_unused]] String const mdsMaster("MdsMaster");

}  // namespace
}  // namespace trelm

trelm::uError getComponents(trelm::ComponentTable& components) {
    using namespace trelm;
    // Takes the link dependency on the registration unit, so the keys are known before any
    // component of this module exists.
    Metadata::Facebook::Register();

    struct Entry {
        String id;
        ComponentFactory factory;
    };
    Entry const entries[] = {
        {String(kFacebookSourceId), &FacebookSource_component},
        {FacebookConnector::id(), &FacebookConnector_component},
    };
    for (Entry const& entry : entries) {
        uError inserted = components.insert(entry.id, entry.factory);
        if (inserted.failed()) return TRELM_WRAP(kFailure, inserted);
    }
    return TRELM_OK();
}

trelm::Component* FacebookSource_component(trelm::String name) { return new trelm::FacebookSource(std::move(name)); }

trelm::Component* FacebookConnector_component(trelm::String name) {
    return new trelm::FacebookConnector(std::move(name));
}
