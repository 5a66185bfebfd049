#include "ContactCursor.h"

#include <iterator>
#include <new>
#include <utility>

namespace trelm {

namespace {

constexpr char const* kServiceIdKey = "core_contact_service_id";
constexpr char const* kServiceName = "Facebook";
constexpr char const* kOrderExpression = "concat(uid,' ')";
constexpr char const* kFriendCondition = "uid in (select uid2 from friend where uid1='";

// Answer fields copied into the record. "profile_url" and "current_location.city" are not in the
// field list this cursor asks for; they are kept so that a wider field list fills them too.
struct FieldMapping {
    char const* rowField;
    char const* recordKey;
};
constexpr FieldMapping kFieldMap[] = {
    {"uid", "core_contact_service_id"},
    {"profile_url", "core_contact_profile_url"},
    {"pic_big", "core_contact_profile_picture_url"},
    {"name", "core_contact_display_name"},
    {"name", "core_contact_name"},
    {"current_location.city", "core_contact_location"},
};

bool isDecimal(String const& text) {
    if (text.empty()) return false;
    for (unsigned i = 0; i < text.size(); ++i) {
        if (text[i] < '0' || text[i] > '9') return false;
    }
    return true;
}

}  // namespace

ContactCursor::ContactCursor(SmartPtr<FacebookLibrary> library, SmartPtr<FacebookSource::MappingCache> cache,
                             Vector<IQueryItems::Column> const& columns,
                             Vector<IQueryItems::Constraint> const& constraints, String const& sourceId, bool flag,
                             bool paged)
    : FqlCursorBase(std::move(library), std::move(cache), columns, constraints, sourceId, flag, paged) {}

ContactCursor::~ContactCursor() = default;

uError ContactCursor::getSchema(Vector<IQueryItems::Column>& columns) {
    Vector<IQueryItems::Column> schema{
        {Metadata::Key("core_contact_service", TRELM_TYPES::STRING), false},
        {Metadata::Key("core_object_type", TRELM_TYPES::INT32), false},
        {Metadata::Key(kServiceIdKey, TRELM_TYPES::STRING), false},
        {Metadata::Key("core_object_id", TRELM_TYPES::GUID_TYPE), false},
    };
    columns = std::move(schema);
    return TRELM_OK();
}

uError ContactCursor::derivedStart() {
    String const fixedType = String::from(FacebookSource::kContact);
    struct Fixed {
        char const* key;
        String const* value;
    };
    String const serviceName(kServiceName);
    Fixed const fixedValues[] = {
        {"core_contact_service", &serviceName},
        {"core_object_origin_servicename", &serviceName},
        {"core_object_type", &fixedType},
        {"core_object_source", &sourceId_},
        {"core_object_origin_importcomponent", &sourceId_},
    };

    bool canMatch = true;
    for (IQueryItems::Constraint const& c : constraints_) {
        String const& name = c.key.name();
        if (name == kServiceIdKey && c.function == IQueryItems::Constraint::GreaterThan) {
            // The contacts after this one in the cursor's own order, so that a walk can continue
            // from a known contact with the same keyset condition its pages use.
            String id;
            if (uError err = c.value.as(id); err.failed()) return TRELM_WRAP(kInvalid, err);
            if (!isDecimal(id)) return TRELM_ERROR_MSG(kInvalid, "a contact service id is not a number");
            after_ = id;
            continue;
        }
        if (name == kServiceIdKey) {
            Vector<String> ids;
            uError err;
            if (c.function == IQueryItems::Constraint::InList) {
                err = c.value.as(ids);
            } else if (c.function == IQueryItems::Constraint::Equal) {
                String id;
                err = c.value.as(id);
                if (err.ok()) err = ids.pushBack(id);
            } else {
                return TRELM_ERROR_MSG(kNotSupported, "unsupported comparison on core_contact_service_id");
            }
            if (err.failed()) return TRELM_WRAP(kInvalid, err);
            // The ids go into the statement as they are, so only plain numbers are accepted.
            String list;
            for (unsigned i = 0; i < ids.size(); ++i) {
                if (!isDecimal(ids[i])) return TRELM_ERROR_MSG(kInvalid, "a contact service id is not a number");
                if (i > 0) list += ",";
                list += ids[i];
            }
            if (ids.empty()) canMatch = false;
            baseCondition_ = "uid in (" + list + ")";
            conditionGiven_ = true;
            continue;
        }
        bool handled = false;
        for (Fixed const& fixed : fixedValues) {
            if (name != fixed.key) continue;
            bool matches = false;
            TRELM_RETURN_IF_ERROR(doFixedComparison<String>(c.function, c.value, *fixed.value, matches));
            canMatch = canMatch && matches;
            handled = true;
            break;
        }
        if (!handled) return TRELM_ERROR_MSG(kNotSupported, "unsupported contact constraint " + name);
    }
    if (!conditionGiven_) baseCondition_ = kFriendCondition;
    if (!canMatch) setEmptyResult();
    return makePrototype();
}

uError ContactCursor::makePrototype() {
    // Registered key types never change once registered, so they are looked up once here.
    uError err = fields_.reserve(std::size(kFieldMap));
    if (err.failed()) return err;
    for (FieldMapping const& m : kFieldMap) {
        Field field{m.rowField, m.recordKey, TRELM_TYPES::STRING};
        // An unregistered key is kept as text.
        Metadata::getType(field.recordKey, field.type).ignore();
        TRELM_RETURN_IF_ERROR(fields_.pushBack(std::move(field)));
    }
    RecordPtr prototype = makeSmart<Record>();
    TRELM_RETURN_IF_ERROR(prototype->insert("core_contact_service", Variant(kServiceName)));
    TRELM_RETURN_IF_ERROR(prototype->insert("core_object_type", Variant(FacebookSource::kContact)));
    TRELM_RETURN_IF_ERROR(addBaseFields(prototype));
    prototype_ = std::move(*prototype);
    return TRELM_OK();
}

uError ContactCursor::generateBaseQuery(String const& fields, RecordPtr const& key, Direction direction, bool ordered,
                                        String& query) {
    String keyset;
    if (key) {
        Variant const* value = key->search(kServiceIdKey);
        String id;
        if (value == nullptr || value->as(id).failed() || !isDecimal(id)) {
            return TRELM_ERROR_MSG(kInvalid, "key record without a contact service id");
        }
        keyset = kOrderExpression;
        keyset += direction == kAfter ? " > " : direction == kUpTo ? " <= " : " < ";
        // The ordering expression appends a blank to every id, so the key does too.
        keyset += "'" + id + " '";
    }
    String text = "select " + fields + " from user where " + baseCondition_;
    if (!conditionGiven_) {
        String userId;
        TRELM_RETURN_IF_ERROR(library_->getUserId(userId));
        text += userId + "')";
    }
    if (!after_.empty()) text += " and (" + String(kOrderExpression) + " > '" + after_ + " ')";
    if (!keyset.empty()) text += " and (" + keyset + ")";
    if (ordered) {
        text += " order by ";
        text += kOrderExpression;
        text += direction == kBefore ? " desc" : " asc";
    }
    query = std::move(text);
    return TRELM_OK();
}

uError ContactCursor::getFieldList(String& fields) {
    fields = "uid,name,pic_big";
    return TRELM_OK();
}

uError ContactCursor::getObjectType(String& type) {
    type = "user";
    return TRELM_OK();
}

uError ContactCursor::convertItem(Map<String, String> const& row, RecordPtr& record, int& /*convertError*/) {
    // A row without its id could never be told apart from others: leave it out.
    if (row.search("uid") == nullptr) return TRELM_ERROR(kNoData);
    TRELM_RETURN_IF_ERROR(addPrototype(prototype_, record));
    for (Field const& f : fields_) {
        TRELM_RETURN_IF_ERROR(copyField(row, f.rowField, f.recordKey, f.type, record));
    }
    return TRELM_OK();
}

uError ContactCursor::getSid(RecordPtr const& record, Metadata::Key& key, String& serviceId) {
    static Metadata::Key const sidKey(kServiceIdKey, TRELM_TYPES::STRING);
    return stringSid(record, sidKey, "contact record without a service id", key, serviceId);
}

}  // namespace trelm
