#include "PhotoLibraryCursor.h"

#include <new>
#include <utility>

namespace trelm {

namespace {

constexpr char const* kServiceName = "Facebook";
constexpr char const* kTimeKey = "core_object_time";

bool isDecimal(String const& text) {
    if (text.empty()) return false;
    for (unsigned i = 0; i < text.size(); ++i) {
        if (text[i] < '0' || text[i] > '9') return false;
    }
    return true;
}

// A service id of an album or a photo: letters, digits, '_', '-' and '.'. Anything else could
// end the FQL literal it is written into.
bool isServiceId(String const& text) {
    if (text.empty()) return false;
    for (unsigned i = 0; i < text.size(); ++i) {
        char const c = text[i];
        bool const ok = (c >= '0' && c <= '9') || (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || c == '_' ||
                        c == '-' || c == '.';
        if (!ok) return false;
    }
    return true;
}

// Text that can stand between the quotes of an FQL literal as it is.
bool isLiteralSafe(String const& text) {
    for (unsigned i = 0; i < text.size(); ++i) {
        if (text[i] == '\'' || text[i] == '\\') return false;
    }
    return true;
}

char const* comparison(IQueryItems::Constraint::Function function) {
    switch (function) {
        case IQueryItems::Constraint::LessThan:
            return " < ";
        case IQueryItems::Constraint::LessOrEqual:
            return " <= ";
        case IQueryItems::Constraint::Equal:
            return " = ";
        case IQueryItems::Constraint::GreaterOrEqual:
            return " >= ";
        case IQueryItems::Constraint::GreaterThan:
            return " > ";
        case IQueryItems::Constraint::NotEqual:
            return " != ";
        default:
            return nullptr;
    }
}

}  // namespace

PhotoLibraryCursor::PhotoLibraryCursor(Kind const& kind, SmartPtr<FacebookLibrary> library,
                                       SmartPtr<FacebookSource::MappingCache> cache,
                                       Vector<IQueryItems::Column> const& columns,
                                       Vector<IQueryItems::Constraint> const& constraints, String const& sourceId,
                                       bool flag, std::int64_t since)
    : FqlCursorBase(std::move(library), std::move(cache), columns, constraints, sourceId, flag, since == kNoSince),
      kind_(kind),
      since_(since) {}

PhotoLibraryCursor::~PhotoLibraryCursor() = default;

uError PhotoLibraryCursor::getSchema(Vector<IQueryItems::Column>& columns) {
    Vector<IQueryItems::Column> schema;
    TRELM_RETURN_IF_ERROR(schema.pushBack({Metadata::Key("core_object_type", TRELM_TYPES::INT32), false}));
    TRELM_RETURN_IF_ERROR(schema.pushBack({Metadata::Key("core_object_id", TRELM_TYPES::GUID_TYPE), false}));
    for (FieldMapping const& m : kind_.fieldMap) {
        TRELM_TYPES::TYPES type = TRELM_TYPES::STRING;
        // An unregistered key is kept as text.
        Metadata::getType(m.recordKey, type).ignore();
        TRELM_RETURN_IF_ERROR(schema.pushBack({Metadata::Key(m.recordKey, type), false}));
    }
    columns = std::move(schema);
    return TRELM_OK();
}

uError PhotoLibraryCursor::derivedStart() {
    TRELM_RETURN_IF_ERROR(handleOrdering());
    bool canMatch = true;
    for (IQueryItems::Constraint const& c : constraints_) {
        TRELM_RETURN_IF_ERROR(handleItemCondition(c, canMatch));
    }
    if (since_ != kNoSince) {
        filter_ += " and ";
        filter_ += kind_.sinceColumn;
        filter_ += " >= " + String::from(static_cast<long long>(since_));
    }
    if (!canMatch) setEmptyResult();
    return makePrototype();
}

uError PhotoLibraryCursor::handleOrdering() {
    ordering_ = &kind_.orderings[0];
    ascending_ = kind_.defaultAscending;
    for (IQueryItems::Column const& column : columns_) {
        for (Ordering const& o : kind_.orderings) {
            if (column.key.name() != o.recordKey) continue;
            ordering_ = &o;
            ascending_ = column.flag;
            return TRELM_OK();
        }
    }
    return TRELM_OK();
}

uError PhotoLibraryCursor::handleItemCondition(IQueryItems::Constraint const& c, bool& canMatch) {
    String const& name = c.key.name();

    for (IdCondition const& id : kind_.idConditions) {
        if (name != id.recordKey) continue;
        Vector<String> ids;
        uError err;
        if (c.function == IQueryItems::Constraint::InList) {
            err = c.value.as(ids);
        } else if (c.function == IQueryItems::Constraint::Equal) {
            String one;
            err = c.value.as(one);
            if (err.ok()) err = ids.pushBack(one);
        } else {
            return TRELM_ERROR_MSG(kNotSupported, "unsupported comparison on " + name);
        }
        if (err.failed()) return TRELM_WRAP(kInvalid, err);
        if (ids.empty()) {
            canMatch = false;
            return TRELM_OK();
        }
        String list;
        for (unsigned i = 0; i < ids.size(); ++i) {
            if (id.numeric ? !isDecimal(ids[i]) : !isServiceId(ids[i])) {
                return TRELM_ERROR_MSG(kInvalid, "\"" + ids[i] + "\" is not a service id for " + name);
            }
            if (i > 0) list += ",";
            list += id.numeric ? ids[i] : "'" + ids[i] + "'";
        }
        if (!idCondition_.empty()) idCondition_ += " and ";
        idCondition_ += String(id.column) + " in (" + list + ")";
        return TRELM_OK();
    }

    if (name == kTimeKey) {
        char const* op = comparison(c.function);
        if (op == nullptr) return TRELM_ERROR_MSG(kNotSupported, "unsupported comparison on core_object_time");
        long long time = 0;
        TRELM_RETURN_IF_ERROR(c.value.as(time));
        filter_ += " and ";
        filter_ += kind_.timeColumn;
        filter_ += op;
        filter_ += String::from(time);
        return TRELM_OK();
    }

    String const fixedType = String::from(kind_.objectType);
    String const serviceName(kServiceName);
    struct Fixed {
        char const* key;
        String const* value;
    };
    Fixed const fixedValues[] = {
        {"core_object_type", &fixedType},
        {"core_object_origin_servicename", &serviceName},
        {"core_object_source", &sourceId_},
        {"core_object_origin_importcomponent", &sourceId_},
    };
    for (Fixed const& fixed : fixedValues) {
        if (name != fixed.key) continue;
        bool matches = false;
        TRELM_RETURN_IF_ERROR(doFixedComparison<String>(c.function, c.value, *fixed.value, matches));
        canMatch = canMatch && matches;
        return TRELM_OK();
    }
    return TRELM_ERROR_MSG(kNotSupported, "unsupported constraint " + name + " on " + kind_.table);
}

uError PhotoLibraryCursor::makePrototype() {
    TRELM_RETURN_IF_ERROR(fields_.reserve(kind_.fieldMap.size()));
    for (FieldMapping const& m : kind_.fieldMap) {
        Field field{m.rowField, m.recordKey, TRELM_TYPES::STRING};
        // An unregistered key is kept as text.
        Metadata::getType(field.recordKey, field.type).ignore();
        TRELM_RETURN_IF_ERROR(fields_.pushBack(std::move(field)));
    }
    RecordPtr prototype = makeSmart<Record>();
    TRELM_RETURN_IF_ERROR(prototype->insert("core_object_type", Variant(kind_.objectType)));
    TRELM_RETURN_IF_ERROR(addBaseFields(prototype));
    prototype_ = std::move(*prototype);
    return TRELM_OK();
}

uError PhotoLibraryCursor::generateBaseQuery(String const& fields, RecordPtr const& key, Direction direction,
                                             bool ordered, String& query) {
    // Directions are in the cursor's order; a descending ordering turns them around in SQL terms.
    bool const sqlAscending = (direction != kBefore) == ascending_;
    String keyset;
    if (key) {
        String value;
        TRELM_RETURN_IF_ERROR(joinedValues(key, ordering_->parts, value));
        char const* op = nullptr;
        if (direction == kUpTo) {
            op = ascending_ ? " <= " : " >= ";
        } else {
            op = sqlAscending ? " > " : " < ";
        }
        keyset = String(ordering_->expression) + op + "'" + value + "'";
    }

    String text = "select " + fields + " from " + kind_.table + " where ";
    if (idCondition_.empty()) {
        String userId;
        TRELM_RETURN_IF_ERROR(library_->getUserId(userId));
        text += String(kind_.userColumn) + " = " + userId;
    } else {
        text += idCondition_;
    }
    text += filter_;
    if (!keyset.empty()) text += " and (" + keyset + ")";
    if (ordered) {
        text += " ORDER BY ";
        text += ordering_->expression;
        text += sqlAscending ? " ASC" : " DESC";
    }
    query = std::move(text);
    return TRELM_OK();
}

uError PhotoLibraryCursor::getFieldList(String& fields) {
    fields = kind_.fields;
    return TRELM_OK();
}

uError PhotoLibraryCursor::getObjectType(String& type) {
    type = kind_.table;
    return TRELM_OK();
}

uError PhotoLibraryCursor::convertItem(Map<String, String> const& row, RecordPtr& record, int& /*convertError*/) {
    TRELM_RETURN_IF_ERROR(addPrototype(prototype_, record));
    for (Field const& f : fields_) {
        TRELM_RETURN_IF_ERROR(copyField(row, f.rowField, f.recordKey, f.type, record));
    }
    // A row without its identity or its ordering value could neither be told apart from others
    // nor placed in the order: leave it out.
    String ignored;
    if (joinedValues(record, kind_.sidParts, ignored).failed() ||
        joinedValues(record, ordering_->parts, ignored).failed()) {
        record->clear();
        return TRELM_ERROR(kNoData);
    }
    return TRELM_OK();
}

uError PhotoLibraryCursor::getSid(RecordPtr const& record, Metadata::Key& key, String& serviceId) {
    String id;
    TRELM_RETURN_IF_ERROR(joinedValues(record, kind_.sidParts, id));
    key = Metadata::Key(kind_.sidKey, TRELM_TYPES::STRING);
    serviceId = std::move(id);
    return TRELM_OK();
}

uError PhotoLibraryCursor::joinedValues(RecordPtr const& record, std::span<char const* const> keys, String& out) {
    String text;
    for (char const* name : keys) {
        Variant const* value = record->search(name);
        String part;
        if (value == nullptr || value->as(part).failed() || part.empty() || !isLiteralSafe(part)) {
            return TRELM_ERROR_MSG(kInvalid, String("record without a usable ") + name);
        }
        if (!text.empty()) text += " ";
        text += part;
    }
    out = std::move(text);
    return TRELM_OK();
}

}  // namespace trelm
