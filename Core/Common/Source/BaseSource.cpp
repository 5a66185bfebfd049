#include "BaseSource.h"

namespace trelm {

BaseSource::BaseSource(String const& name, String const& componentId) : Component(name, componentId) {}

BaseSource::~BaseSource() = default;

uError BaseSource::insert(Record& record) {
    TRELM_RETURN_IF_ERROR(manageInputDataImpl(record, false));
    TRELM_RETURN_IF_ERROR(insertData(record));
    return postInsert(record);
}

uError BaseSource::update(Record& record) {
    TRELM_RETURN_IF_ERROR(manageUpdateDataImpl(record, Record()));
    TRELM_RETURN_IF_ERROR(updateData(record));
    return postUpdate(record);
}

uError BaseSource::remove(GUID const& guid, bool flag) {
    TRELM_RETURN_IF_ERROR(removeData(guid, flag));
    return postRemove(guid);
}

uError BaseSource::markInvisible(GUID const& guid) {
    TRELM_RETURN_IF_ERROR(markDataInvisible(guid));
    return postMarkInvisible(guid);
}

uError BaseSource::retrieve(GUID const& guid, Record& record, bool flag) {
    TRELM_RETURN_IF_ERROR(retrieveData(guid, record, flag));
    return modifyRetrievedData(record);
}

uError BaseSource::startQuery(IQueryItems::StartQueryMessage& msg, bool interactive) {
    TRELM_RETURN_IF_ERROR(checkQuery(msg, interactive));
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

uError BaseSource::fieldOptional(Record const& record, String const& key, bool& present, String& value) {
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
uError BaseSource::retrieveData(GUID const&, Record&, bool) { return TRELM_ERROR(kDataOpNotSupported); }
uError BaseSource::checkQuery(IQueryItems::StartQueryMessage const&, bool) { return TRELM_OK(); }
uError BaseSource::doStartQuery(IQueryItems::StartQueryMessage&, bool) { return TRELM_ERROR(kNotSupported); }

}  // namespace trelm
