#include "PhotoEventCursor.h"

#include <new>
#include <utility>

#include "FStreamCursor.h"

namespace trelm {

namespace {

constexpr char const* kTimeKey = "core_object_time";
constexpr char const* kServiceIdKey = "core_event_serviceid";

// The texts are made once: the records' keys share them.
struct PhotoField {
    String rowField;
    String recordKey;
    TRELM_TYPES::TYPES type;
};

PhotoField const kPhotoFields[] = {
    {"owner", "core_event_contactid", TRELM_TYPES::STRING},
    {"pid", kServiceIdKey, TRELM_TYPES::STRING},
    {"created", kTimeKey, TRELM_TYPES::INT32},
    {"caption", "core_event_text", TRELM_TYPES::STRING},
    {"aid", "core_event_parent_serviceid", TRELM_TYPES::STRING},
    {"src", "core_event_uri", TRELM_TYPES::STRING},
};

}  // namespace

PhotoEventCursor::PhotoEventCursor(SmartPtr<FacebookLibrary> library, SmartPtr<FacebookSource::MappingCache> cache,
                                   Vector<IQueryItems::Column> const& columns,
                                   Vector<IQueryItems::Constraint> const& constraints, String const& sourceId,
                                   bool flag, bool paged)
    : FqlCursorBase(std::move(library), std::move(cache), columns, constraints, sourceId, flag, paged) {}

PhotoEventCursor::~PhotoEventCursor() = default;

uError PhotoEventCursor::getSchema(Vector<IQueryItems::Column>& columns) {
    Vector<IQueryItems::Column> schema = FStreamCursor::fixedOrdering();
    TRELM_RETURN_IF_ERROR(schema.pushBack({Metadata::Key("core_object_id", TRELM_TYPES::GUID_TYPE), false}));
    TRELM_RETURN_IF_ERROR(schema.pushBack({Metadata::Key("core_object_type", TRELM_TYPES::INT32), false}));
    TRELM_RETURN_IF_ERROR(schema.pushBack({Metadata::Key("core_event_parent_serviceid", TRELM_TYPES::STRING), false}));
    TRELM_RETURN_IF_ERROR(schema.pushBack({Metadata::Key("core_event_uri", TRELM_TYPES::STRING), false}));
    columns = std::move(schema);
    return TRELM_OK();
}

uError PhotoEventCursor::derivedStart() {
    TRELM_RETURN_IF_ERROR(FStreamCursor::checkOrdering(columns_));
    for (IQueryItems::Constraint const& c : constraints_) {
        String const& name = c.key.name();
        if (name == kTimeKey) {
            static char const* const kOperators[] = {" < ", " <= ", " = ", " >= ", " > ", " <> "};
            if (c.function < IQueryItems::Constraint::LessThan || c.function > IQueryItems::Constraint::NotEqual) {
                return TRELM_ERROR_MSG(kInvalid, "unsupported comparison on core_object_time");
            }
            int v = 0;
            uError err = c.value.as(v);
            if (err.failed()) return TRELM_WRAP_MSG(kInvalid, err, "core_object_time must be a number");
            timeCondition_ = String("created") + kOperators[c.function] + String::from(v);
        } else if (name != "core_object_type" && name != "core_object_source") {
            return TRELM_ERROR_MSG(kInvalid, "unsupported photo event constraint " + name);
        }
    }
    return TRELM_OK();
}

uError PhotoEventCursor::generateBaseQuery(String const& fields, RecordPtr const& key, Direction direction,
                                           bool ordered, String& query) {
    String userId;
    TRELM_RETURN_IF_ERROR(library_->getUserId(userId));
    String text =
        "select " + fields +
        " from photo where aid in (select aid from album where owner in (select uid2 from friend where uid1='" +
        userId + "'))";
    if (!timeCondition_.empty()) text += " and (" + timeCondition_ + ")";
    if (key) {
        static String const timeKey(kTimeKey);
        static String const serviceIdKey(kServiceIdKey);
        Variant const* time = key->search(timeKey);
        Variant const* id = key->search(serviceIdKey);
        int t = 0;
        String pid;
        if (time == nullptr || id == nullptr || time->as(t).failed() || id->as(pid).failed()) {
            return TRELM_ERROR_MSG(kInvalid, "key record without a time and a photo id");
        }
        // The id goes into the statement quoted; one that could end the quote is not a photo id.
        if (pid.find('\'') != String::npos || pid.find('\\') != String::npos) {
            return TRELM_ERROR_MSG(kInvalid, "key record with a malformed photo id");
        }
        String const T = String::from(t);
        String const P = "'" + pid + "'";
        if (direction == kAfter) {
            text += " and (created < " + T + " or (created = " + T + " and pid < " + P + "))";
        } else if (direction == kUpTo) {
            text += " and (created > " + T + " or (created = " + T + " and pid >= " + P + "))";
        } else {
            text += " and (created > " + T + " or (created = " + T + " and pid > " + P + "))";
        }
    }
    if (ordered) text += direction == kBefore ? " order by created asc" : " order by created desc";
    query = std::move(text);
    return TRELM_OK();
}

uError PhotoEventCursor::getFieldList(String& fields) {
    fields = "pid,aid,owner,src,caption,created";
    return TRELM_OK();
}

uError PhotoEventCursor::getObjectType(String& type) {
    type = "photo";
    return TRELM_OK();
}

uError PhotoEventCursor::convertItem(Map<String, String> const& row, RecordPtr& record, int& /*convertError*/) {
    try {
        record = makeSmart<Record>();
    } catch (std::bad_alloc const&) {
        return TRELM_ERROR(kOutOfMemory);
    }
    // The photo id is kept whole: photo ids name the photo on their own.
    for (PhotoField const& f : kPhotoFields) {
        TRELM_RETURN_IF_ERROR(FStreamCursor::copyEventField(row, f.rowField, f.recordKey, f.type, record));
    }
    static String const serviceKey("core_event_service");
    static String const typeKey("core_object_type");
    TRELM_RETURN_IF_ERROR(record->insert(serviceKey, Variant("Facebook")));
    TRELM_RETURN_IF_ERROR(record->insert(typeKey, Variant(FacebookSource::kPhotoEvent)));
    return addBaseFields(record);
}

uError PhotoEventCursor::getSid(RecordPtr const& record, Metadata::Key& key, String& serviceId) {
    static Metadata::Key const sidKey(kServiceIdKey, TRELM_TYPES::STRING);
    return stringSid(record, sidKey, "photo event record without a photo id", key, serviceId);
}

uError PhotoEventCursor::postConvert(Vector<RecordPtr>& window) {
    return contactNames_.annotate(*library_, window, false);
}

}  // namespace trelm
