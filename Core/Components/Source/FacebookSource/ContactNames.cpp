#include "ContactNames.h"

#include "trelm/Trace.h"

namespace trelm {

namespace {

constexpr char const* kContactIdKey = "core_event_contactid";

}  // namespace

uError ContactNames::annotate(FacebookLibrary& library, Vector<RecordPtr>& records, bool withFullName) {
    static String const contactId(kContactIdKey);
    Vector<String> unknown;
    for (RecordPtr const& record : records) {
        Variant const* value = record->search(contactId);
        if (value == nullptr) continue;
        String uid;
        TRELM_RETURN_IF_ERROR(value->as(uid));
        if (!names_.contains(uid)) TRELM_RETURN_IF_ERROR(unknown.pushBack(std::move(uid)));
    }
    TRELM_RETURN_IF_ERROR(lookUp(library, unknown));

    static String const nameKey("core_event_contactname");
    static String const fullNameKey("core_event_contactfullname");
    for (RecordPtr& record : records) {
        Variant const* value = record->search(contactId);
        if (value == nullptr) continue;
        String uid;
        TRELM_RETURN_IF_ERROR(value->as(uid));
        String const* name = names_.search(uid);
        if (name == nullptr) continue;
        TRELM_RETURN_IF_ERROR(record->insert(nameKey, Variant(*name)));
        if (withFullName) TRELM_RETURN_IF_ERROR(record->insert(fullNameKey, Variant(*name)));
    }
    return TRELM_OK();
}

uError ContactNames::lookUp(FacebookLibrary& library, Vector<String> const& uids) {
    if (uids.empty()) return TRELM_OK();
    String query("select uid,name from user where uid in (");
    for (unsigned i = 0; i < uids.size(); ++i) {
        if (i > 0) query += ",";
        query += uids[i];
    }
    query += ")";
    Vector<Map<String, String>> rows;
    unsigned count = 0;
    TRELM_RETURN_IF_ERROR(library.runFqlQuery(query, "user", rows, 0, count));

    static String const uidField("uid");
    static String const nameField("name");
    uError stored;
    for (Map<String, String> const& row : rows) {
        String const* uid = row.search(uidField);
        String const* name = row.search(nameField);
        if (uid == nullptr || name == nullptr) continue;
        uError err = names_.insert(*uid, *name);
        if (err.failed()) stored = err;
    }
    if (stored.failed()) {
        // The names that were stored still serve; the others are asked for with the next window.
        traceError("ContactNames", "storing a contact name", stored);
        return TRELM_ERROR_MSG(kNoData, stored.toText());
    }
    return TRELM_OK();
}

}  // namespace trelm
