#include "BaseSource.h"

namespace trelm {

BaseSource::BaseSource(String const& name, String const& componentId)
    : Component(name, componentId) {}

BaseSource::~BaseSource() = default;

uError BaseSource::insert(Record& record) {
    uError e = manageInputDataImpl(record, false);
    if (e.failed()) return e;
    e = insertData(record);
    if (e.failed()) return e;
    return postInsert(record);
}

uError BaseSource::update(Record& record) {
    uError e = manageUpdateDataImpl(record, Record());
    if (e.failed()) return e;
    e = updateData(record);
    if (e.failed()) return e;
    return postUpdate(record);
}

uError BaseSource::remove(GUID const& guid, bool flag) {
    uError e = removeData(guid, flag);
    if (e.failed()) return e;
    return postRemove(guid);
}

uError BaseSource::markInvisible(GUID const& guid) {
    uError e = markDataInvisible(guid);
    if (e.failed()) return e;
    return postMarkInvisible(guid);
}

uError BaseSource::retrieve(GUID const& guid, Record& record, bool flag) {
    uError e = retrieveData(guid, record, flag);
    if (e.failed()) return e;
    return modifyRetrievedData(record);
}

uError BaseSource::startQuery(IQueryItems::StartQueryMessage& msg, bool interactive) {
    uError e = checkQuery(msg, interactive);
    if (e.failed()) return e;
    return doStartQuery(msg, interactive);
}

uError BaseSource::handleMessage(IMessage& msg) {
    if (msg.type() == ConfigurationChangedMessage::kType) {
        auto* changed = dynamic_cast<ConfigurationChangedMessage*>(&msg);
        if (changed == nullptr) return TRELM_ERROR_MSG(kInvalid, "message of another class");
        return configurationChangedImpl(*changed);
    }
    if (msg.type() == IQueryItems::StartQueryMessage::kType) {
        auto* query = dynamic_cast<IQueryItems::StartQueryMessage*>(&msg);
        if (query == nullptr) return TRELM_ERROR_MSG(kInvalid, "message of another class");
        return startQuery(*query, query->interactive);
    }
    return Component::handleMessage(msg);
}

uError BaseSource::fieldRequired(Record const& record, String const& key, int& out) {
    Variant const* value = record.search(key);
    if (value == nullptr || value->empty()) return TRELM_ERROR_MSG(kInvalid, "missing " + key);
    int converted = 0;
    uError e = value->as(converted);
    if (e.failed()) return TRELM_WRAP(kInvalid, e);
    out = converted;
    return TRELM_OK();
}

uError BaseSource::fieldRequiredNotEmpty(Record const& record, String const& key, String& out) {
    Variant const* value = record.search(key);
    if (value == nullptr || value->empty()) return TRELM_ERROR_MSG(kInvalid, "missing " + key);
    String converted;
    uError e = value->as(converted);
    if (e.failed()) return TRELM_WRAP(kInvalid, e);
    if (converted.empty()) return TRELM_ERROR_MSG(kInvalid, "empty " + key);
    out = converted;
    return TRELM_OK();
}

uError BaseSource::fieldRequiredStringNotEmpty(Record const& record, String const& key) {
    String ignored;
    return fieldRequiredNotEmpty(record, key, ignored);
}

uError BaseSource::fieldOptional(Record const& record, String const& key, bool& present,
                                 String& value) {
    Variant const* held = record.search(key);
    if (held == nullptr || held->empty()) {
        present = false;
        return TRELM_OK();
    }
    String converted;
    uError e = held->as(converted);
    if (e.failed()) return TRELM_WRAP(kInvalid, e);
    present = true;
    value = converted;
    return TRELM_OK();
}

uError BaseSource::configurationChangedImpl(ConfigurationChangedMessage&) { return TRELM_OK(); }
uError BaseSource::manageInputDataImpl(Record&, bool) { return TRELM_OK(); }
uError BaseSource::manageUpdateDataImpl(Record&, Record const&) { return TRELM_OK(); }
uError BaseSource::modifyRetrievedData(Record&) { return TRELM_OK(); }
uError BaseSource::insertData(Record&) { return TRELM_ERROR(kDataOpNotSupported); }
uError BaseSource::postInsert(Record const&) { return TRELM_OK(); }
uError BaseSource::updateData(Record&) { return TRELM_ERROR(kDataOpNotSupported); }
uError BaseSource::postUpdate(Record const&) { return TRELM_OK(); }
uError BaseSource::markDataInvisible(GUID const&) { return TRELM_ERROR(kDataOpNotSupported); }
uError BaseSource::postMarkInvisible(GUID const&) { return TRELM_OK(); }
uError BaseSource::removeData(GUID const&, bool) { return TRELM_ERROR(kDataOpNotSupported); }
uError BaseSource::postRemove(GUID const&) { return TRELM_OK(); }
uError BaseSource::retrieveData(GUID const&, Record&, bool) {
    return TRELM_ERROR(kDataOpNotSupported);
}
uError BaseSource::checkQuery(IQueryItems::StartQueryMessage const&, bool) { return TRELM_OK(); }
uError BaseSource::doStartQuery(IQueryItems::StartQueryMessage&, bool) {
    return TRELM_ERROR(kNotSupported);
}

}  // namespace trelm
