#include "FriendRequestCursor.h"

#include <ctime>
#include <utility>

namespace trelm {

namespace {

constexpr char const* kServiceKey = "core_event_service";
constexpr char const* kServiceIdKey = "core_event_serviceid";
constexpr char const* kContactIdKey = "core_event_contactid";

}  // namespace

FriendRequestCursor::FriendRequestCursor(SmartPtr<FacebookLibrary> library,
                                         SmartPtr<FacebookSource::MappingCache> cache,
                                         Vector<IQueryItems::Column> const& columns,
                                         Vector<IQueryItems::Constraint> const& constraints, String const& sourceId,
                                         bool flag, bool paged)
    : FqlCursorBase(std::move(library), std::move(cache), columns, constraints, sourceId, flag, paged) {}

FriendRequestCursor::~FriendRequestCursor() = default;

uError FriendRequestCursor::getSchema(Vector<IQueryItems::Column>& columns) {
    Vector<IQueryItems::Column> schema{
        {Metadata::Key("core_object_time", TRELM_TYPES::INT32), false},
        {Metadata::Key(kServiceKey, TRELM_TYPES::STRING), false},
        {Metadata::Key(kServiceIdKey, TRELM_TYPES::STRING), false},
        {Metadata::Key("core_object_id", TRELM_TYPES::GUID_TYPE), false},
        {Metadata::Key("core_object_source", TRELM_TYPES::STRING), false},
        {Metadata::Key("core_object_type", TRELM_TYPES::INT32), false},
        {Metadata::Key("core_event_uri", TRELM_TYPES::STRING), false},
    };
    columns = std::move(schema);
    return TRELM_OK();
}

uError FriendRequestCursor::derivedStart() {
    // Requests are served in ascending order of the requester, the only order the statement has.
    static Vector<IQueryItems::Column> const ordering{
        {Metadata::Key(kServiceKey, TRELM_TYPES::STRING), true},
        {Metadata::Key(kServiceIdKey, TRELM_TYPES::STRING), true},
    };
    bool served = columns_.size() >= ordering.size();
    for (unsigned i = 0; served && i < ordering.size(); ++i) served = columns_[i] == ordering[i];
    if (!served) return TRELM_ERROR_MSG(kInvalid, "friend requests are ordered by service and service id, ascending");
    for (IQueryItems::Constraint const& c : constraints_) {
        String const& name = c.key.name();
        if (name != "core_object_type" && name != "core_object_source") {
            return TRELM_ERROR_MSG(kInvalid, "unsupported friend request constraint " + name);
        }
    }
    return TRELM_OK();
}

uError FriendRequestCursor::generateBaseQuery(String const& fields, RecordPtr const& key, Direction direction,
                                              bool ordered, String& query) {
    String userId;
    TRELM_RETURN_IF_ERROR(library_->getUserId(userId));
    String text = "select " + fields + " from friend_request where (uid_to = '" + userId + "')";
    if (key) {
        static String const contactIdKey(kContactIdKey);
        Variant const* value = key->search(contactIdKey);
        if (value == nullptr) return TRELM_ERROR_MSG(kInvalid, "key record without a requester");
        String requester;
        TRELM_RETURN_IF_ERROR(value->as(requester));
        // The order key appends a blank to every id, so the key does too.
        char const* comparison = direction == kAfter  ? "uid_from > '"
                                 : direction == kUpTo ? "uid_from <= '"
                                                      : "uid_from < '";
        text += " and (" + String(comparison) + requester + " ')";
    }
    if (ordered) {
        text += " order by concat(uid_from, ' ')";
        int const d = direction;
        if (d == kBefore) {
            text += " desc";
        } else if (d > kBefore) {
            text += " asc";
        }
    }
    query = std::move(text);
    return TRELM_OK();
}

uError FriendRequestCursor::getFieldList(String& fields) {
    fields = "uid_from";
    return TRELM_OK();
}

uError FriendRequestCursor::getObjectType(String& type) {
    type = "friend_info";
    return TRELM_OK();
}

uError FriendRequestCursor::convertItem(Map<String, String> const& row, RecordPtr& record, int& /*convertError*/) {
    static String const uidField("uid_from");
    String const* uid = row.search(uidField);
    if (uid == nullptr) return TRELM_ERROR_MSG(kInvalid, "friend request row without uid_from");
    // The key texts are made once: the records share them.
    static String const contactIdKey(kContactIdKey);
    static String const serviceKey(kServiceKey);
    static String const serviceIdKey(kServiceIdKey);
    static String const typeKey("core_object_type");
    static String const timeKey("core_object_time");
    TRELM_RETURN_IF_ERROR(record->insert(contactIdKey, Variant(*uid)));
    TRELM_RETURN_IF_ERROR(record->insert(serviceKey, Variant("Facebook")));
    TRELM_RETURN_IF_ERROR(record->insert(serviceIdKey, Variant("FriendRequest: " + *uid)));
    TRELM_RETURN_IF_ERROR(record->insert(typeKey, Variant(int(Metadata::Object::TYPE_FRIEND_REQUEST))));
    // A request carries no time of its own: it is stamped when it is read.
    TRELM_RETURN_IF_ERROR(record->insert(timeKey, Variant(static_cast<int>(std::time(nullptr)))));
    return addBaseFields(record);
}

uError FriendRequestCursor::getSid(RecordPtr const& record, Metadata::Key& key, String& serviceId) {
    static Metadata::Key const sidKey(kServiceIdKey, TRELM_TYPES::STRING);
    return stringSid(record, sidKey, "friend request record without a service id", key, serviceId);
}

uError FriendRequestCursor::postConvert(Vector<RecordPtr>& window) {
    static String const contactIdKey(kContactIdKey);
    Vector<String> requesters;
    TRELM_RETURN_IF_ERROR(requesters.reserve(window.size()));
    for (RecordPtr const& record : window) {
        Variant const* value = record->search(contactIdKey);
        String uid;
        if (value == nullptr || value->as(uid).failed()) continue;
        TRELM_RETURN_IF_ERROR(requesters.pushBack(std::move(uid)));
    }
    requesters_ = std::move(requesters);
    return TRELM_OK();
}

}  // namespace trelm
