#include "ComponentHost.h"

#include <exception>
#include <utility>

namespace trelm {
namespace host {

ComponentHost::ComponentHost() = default;

ComponentHost::~ComponentHost() {
    shutdownAll();
    for (String const& name : attached_) (void)registry_.remove(name);
    for (auto it = slots_.rbegin(); it != slots_.rend(); ++it) destroy(*it);
    destroy(items_);
    destroy(runtime_);
    destroy(http_);
}

void ComponentHost::destroy(Slot& slot) {
    // A registered slot is in the registry, so removal finds it.
    if (slot.registered) registry_.remove(slot.component->name()).ignore();
    slot.registered = false;
    slot.component.reset();
}

RuntimeConfiguration& ComponentHost::runtimeConfiguration() {
    return static_cast<RuntimeConfiguration&>(*runtime_.component);
}

HttpRequestFactory& ComponentHost::httpRequestFactory() {
    return static_cast<HttpRequestFactory&>(*http_.component);
}

ItemStore& ComponentHost::itemStore() { return static_cast<ItemStore&>(*items_.component); }

uError ComponentHost::startItemStore(String const& path) {
    items_.component = std::make_unique<ItemStore>();
    uError e = registry_.add(items_.component->name(), items_.component.get());
    if (e.failed()) return TRELM_WRAP_MSG(kFailure, e, "cannot register ItemStore");
    items_.registered = true;
    return addBuiltin(*items_.component, Map<String, Variant>{{"path", Variant(path)}});
}

uError ComponentHost::addBuiltin(Component& component, Map<String, Variant> const& values) {
    uError e = component.sendConfig(Configuration::Group(component.name(), values));
    if (e.ok()) e = component.startup();
    if (e.failed()) {
        return TRELM_WRAP_MSG(kFailure, e, "cannot start the built-in component " + component.name());
    }
    return TRELM_OK();
}

uError ComponentHost::startBuiltins(Map<String, Variant> const& http,
                                    Map<String, Variant> const& runtime,
                                    String const& runtimeStorePath) {
    registry_.activate();

    http_.component = std::make_unique<HttpRequestFactory>();
    uError e = registry_.add(http_.component->name(), http_.component.get());
    if (e.failed()) return TRELM_WRAP_MSG(kFailure, e, "cannot register HttpRequestFactory");
    http_.registered = true;
    TRELM_RETURN_IF_ERROR(addBuiltin(*http_.component, http));

    runtime_.component = std::make_unique<RuntimeConfiguration>();
    e = registry_.add(runtime_.component->name(), runtime_.component.get());
    if (e.failed()) return TRELM_WRAP_MSG(kFailure, e, "cannot register RuntimeConfiguration");
    runtime_.registered = true;
    Map<String, Variant> runtimeValues = runtime;
    if (!runtimeValues.contains("path")) {
        TRELM_RETURN_IF_ERROR(runtimeValues.insert("path", Variant(runtimeStorePath)));
    }
    e = addBuiltin(*runtime_.component, runtimeValues);
    if (e.failed()) {
        String path;
        if (Variant const* value = runtimeValues.search("path")) value->as(path).ignore();  // shown as given
        return TRELM_WRAP_MSG(kFailure, e,
                              "the state database " + path +
                                  " cannot be used; if it is damaged, move it away or delete it to start afresh "
                                  "(the stored session is then lost and the next command signs in again)");
    }
    return TRELM_OK();
}

uError ComponentHost::restore(HostConfig::ComponentEntry const& entry, Configuration::Group& group,
                              Vector<String>& restored) {
    // The store answers only for keys it is asked about: the component's configured keys and
    // the keys it is known to keep there (its session).
    Map<String, Variant> stored;
    for (auto const& [key, value] : entry.config) {
        (void)value;
        TRELM_RETURN_IF_ERROR(stored.insert(key, Variant()));
    }
    for (String const& key : entry.runtimeKeys) {
        TRELM_RETURN_IF_ERROR(stored.insert(key, Variant()));
    }
    uError e = runtimeConfiguration().get(entry.name, stored);
    if (e.failed()) return e;
    for (auto const& [key, value] : stored) {
        if (value.empty()) continue;
        e = group.set(key, value);
        if (e.ok()) e = restored.pushBack(key);
        if (e.failed()) return e;
    }
    return TRELM_OK();
}

ComponentHost::Instance ComponentHost::addComponent(HostConfig::ComponentEntry const& entry,
                                                    PluginLoader::Table const& table) {
    Instance instance{entry.name, entry.id, nullptr, uError(), {}};
    auto finish = [&](uError const& error) -> Instance {
        instance.error = error;
        instances_.push_back(instance);
        return instance;
    };

    PluginLoader::Factory const* factory = table.search(entry.id);
    if (factory == nullptr) {
        return finish(TRELM_ERROR_MSG(kNotFound, "no plug-in offers the component id " + entry.id));
    }
    Component* made = nullptr;
    try {
        made = (*factory)(entry.name);
    } catch (std::exception const& ex) {
        return finish(TRELM_ERROR_MSG(kFailure, "the factory of " + entry.id + " failed: " + ex.what()));
    }
    if (made == nullptr) {
        return finish(TRELM_ERROR_MSG(kFailure, "the factory of " + entry.id + " made nothing"));
    }
    slots_.push_back(Slot{std::unique_ptr<Component>(made), false});
    instance.component = made;

    uError e = registry_.add(entry.name, made);
    if (e.failed()) {
        return finish(TRELM_WRAP_MSG(kFailure, e, "cannot register the component " + entry.name));
    }
    slots_.back().registered = true;

    Configuration::Group group(entry.name, entry.config);
    e = restore(entry, group, instance.restored);
    if (e.failed()) {
        return finish(
            TRELM_WRAP_MSG(kFailure, e, "cannot read the stored values of " + entry.name));
    }
    e = made->sendConfig(group);
    if (e.failed()) {
        return finish(TRELM_WRAP_MSG(kFailure, e, "the configuration of " + entry.name + " failed"));
    }
    e = made->startup();
    if (e.failed()) {
        return finish(TRELM_WRAP_MSG(kFailure, e, "the start-up of " + entry.name + " failed"));
    }
    return finish(uError());
}

uError ComponentHost::attach(Component& component) {
    uError e = registry_.add(component.name(), &component);
    if (e.failed()) return TRELM_WRAP_MSG(kFailure, e, "cannot register " + component.name());
    attached_.push_back(component.name());
    return TRELM_OK();
}

BaseSource* ComponentHost::startedSource(String const& name) const {
    for (Instance const& instance : instances_) {
        if (instance.name != name || instance.component == nullptr) continue;
        if (instance.component->state() != Component::State::Started) return nullptr;
        return dynamic_cast<BaseSource*>(instance.component);
    }
    return nullptr;
}

void ComponentHost::shutdownOne(Component& component, Vector<uError>* errors) {
    Component::State state = component.state();
    if (state != Component::State::Started && state != Component::State::Stopped) return;
    uError e = component.shutdown();
    if (e.failed() && errors != nullptr) {
        (void)errors->pushBack(
            TRELM_WRAP_MSG(kFailure, e, "the shut-down of " + component.name() + " failed"));
    }
}

void ComponentHost::shutdownAll(Vector<uError>* errors) {
    for (auto it = slots_.rbegin(); it != slots_.rend(); ++it) {
        if (it->component) shutdownOne(*it->component, errors);
    }
    if (items_.component) shutdownOne(*items_.component, errors);
    if (runtime_.component) shutdownOne(*runtime_.component, errors);
    if (http_.component) shutdownOne(*http_.component, errors);
}

}  // namespace host
}  // namespace trelm
