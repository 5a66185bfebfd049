#include "ItemQuery.h"

#include "trelm/GUID.h"
#include "trelm/Metadata.h"
#include "trelm/SmartPtr.h"

namespace trelm {
namespace host {

namespace {

using Column = IQueryItems::Column;
using Constraint = IQueryItems::Constraint;

// In the order the help text lists them.
constexpr ItemQuery::Kind kKinds[] = {
    {"contacts", Metadata::Object::TYPE_CONTACT, true},
    {"status", Metadata::Object::TYPE_STATUS, false},
    {"photos", Metadata::Object::TYPE_PHOTO_EVENT, false},
    {"media", Metadata::Object::TYPE_MEDIA, true},
    {"messages", Metadata::Object::TYPE_MESSAGE, true},
    {"albums", Metadata::Object::TYPE_ALBUM, true},
    {"friend-requests", Metadata::Object::TYPE_FRIEND_REQUEST, true},
    {"photo-tags", Metadata::Object::TYPE_PHOTO_TAG, true},
};

// The ordering a kind's cursor refuses to start without.
Vector<Column> orderingOf(int type) {
    Column const time{Metadata::Key("core_object_time", TRELM_TYPES::INT32), false};
    Metadata::Key const service("core_event_service", TRELM_TYPES::STRING);
    Metadata::Key const serviceId("core_event_serviceid", TRELM_TYPES::STRING);
    switch (type) {
        case Metadata::Object::TYPE_STATUS:
        case Metadata::Object::TYPE_PHOTO_EVENT:
        case Metadata::Object::TYPE_MESSAGE:
            return Vector<Column>{time, Column{service, false}, Column{serviceId, false}};
        case Metadata::Object::TYPE_FRIEND_REQUEST:
            return Vector<Column>{Column{service, true}, Column{serviceId, true}};
        default:
            return Vector<Column>{};
    }
}

struct Operator {
    char const* text;
    Constraint::Function function;
};
// Two-character operators first, so that "<=" is not read as "<".
constexpr Operator kOperators[] = {
    {"<=", Constraint::LessOrEqual}, {">=", Constraint::GreaterOrEqual}, {"!=", Constraint::NotEqual},
    {"<", Constraint::LessThan},     {">", Constraint::GreaterThan},     {"=", Constraint::Equal},
};

// One value of a condition, read as the key's type.
uError typedValue(TRELM_TYPES::TYPES type, String const& text, Variant& out) {
    uError e;
    switch (type) {
        case TRELM_TYPES::INT32: {
            int v = 0;
            e = text.to(v);
            if (e.ok()) out = v;
            break;
        }
        case TRELM_TYPES::UINT32: {
            unsigned v = 0;
            e = text.to(v);
            if (e.ok()) out = v;
            break;
        }
        case TRELM_TYPES::INT64:
        case TRELM_TYPES::UINT64: {
            long long v = 0;
            e = text.to(v);
            if (e.ok()) out = v;
            break;
        }
        case TRELM_TYPES::GUID_TYPE: {
            GUID v;
            e = GUID::fromString(text, v);
            if (e.ok()) out = v;
            break;
        }
        case TRELM_TYPES::BOOL: {
            bool v = false;
            e = Variant(text).as(v);
            if (e.ok()) out = v;
            break;
        }
        default:
            out = text;
            break;
    }
    return e;
}

}  // namespace

ItemQuery::Kind const* ItemQuery::findKind(std::string const& name) {
    for (Kind const& kind : kKinds) {
        if (name == kind.name) return &kind;
    }
    return nullptr;
}

ItemQuery::Kind const* ItemQuery::findKind(int type) {
    for (Kind const& kind : kKinds) {
        if (kind.type == type) return &kind;
    }
    return nullptr;
}

std::vector<std::string> ItemQuery::kindNames() {
    std::vector<std::string> names;
    for (Kind const& kind : kKinds) names.emplace_back(kind.name);
    return names;
}

ItemQuery::ItemQuery(Kind const& kind) : kind_(&kind) {}

uError ItemQuery::where(std::string const& text) {
    auto bad = [&](std::string const& reason) {
        return TRELM_ERROR_MSG(kInvalid, "condition \"" + text + "\": " + reason);
    };
    std::size_t at = text.find_first_of("<>!=");
    if (at == std::string::npos) return bad("needs an operator (= != < <= > >=)");
    Operator const* op = nullptr;
    for (Operator const& candidate : kOperators) {
        if (text.compare(at, std::char_traits<char>::length(candidate.text), candidate.text) == 0) {
            op = &candidate;
            break;
        }
    }
    if (op == nullptr) return bad("needs an operator (= != < <= > >=)");
    String const key(text.substr(0, at));
    if (key.empty()) return bad("needs a key before the operator");
    // A cursor reads one condition per key: a second one would be dropped without a word.
    for (Constraint const& earlier : conditions_) {
        if (earlier.key.name() == key) {
            return bad(key.str() + " is already constrained by an earlier --where; give each key once");
        }
    }
    std::string const valueText = text.substr(at + std::char_traits<char>::length(op->text));

    // Keys the plug-ins did not register are compared as text.
    TRELM_TYPES::TYPES type = TRELM_TYPES::STRING;
    (void)Metadata::getType(key, type);

    Constraint condition;
    condition.key = Metadata::Key(key, type);
    condition.function = op->function;
    if (op->function == Constraint::Equal && valueText.find(',') != std::string::npos) {
        condition.function = Constraint::InList;
        Vector<int> numbers;
        Vector<String> texts;
        std::size_t begin = 0;
        while (true) {
            std::size_t end = valueText.find(',', begin);
            String item(valueText.substr(begin, end == std::string::npos ? std::string::npos : end - begin));
            Variant value;
            uError e = typedValue(type, item, value);
            if (e.failed()) return TRELM_WRAP_MSG(kInvalid, e, "condition \"" + text + "\": \"" + item.str() + "\" does not fit the key");
            TRELM_RETURN_IF_ERROR(type == TRELM_TYPES::INT32 ? numbers.pushBack(value.asInt32()) : texts.pushBack(item));
            if (end == std::string::npos) break;
            begin = end + 1;
        }
        condition.value = type == TRELM_TYPES::INT32 ? Variant(numbers) : Variant(texts);
    } else {
        uError e = typedValue(type, String(valueText), condition.value);
        if (e.failed()) return TRELM_WRAP_MSG(kInvalid, e, "condition \"" + text + "\": the value does not fit the key");
        // The sources hand times to the service as unsigned seconds: a negative one would mean a
        // time far in the future, and the listing would be silently empty.
        if (key == "core_object_time" && condition.value.asInt64() < 0) {
            return bad("a time is in seconds since 1970 and cannot be negative");
        }
    }
    return conditions_.pushBack(condition);
}

uError ItemQuery::orderBy(std::string const& text) {
    std::string key = text;
    bool ascending = true;
    std::size_t const colon = text.rfind(':');
    if (colon != std::string::npos) {
        std::string const sense = text.substr(colon + 1);
        if (sense != "asc" && sense != "desc") {
            return TRELM_ERROR_MSG(kInvalid, "ordering \"" + text + "\": the sense is asc or desc");
        }
        ascending = sense == "asc";
        key = text.substr(0, colon);
    }
    if (key.empty()) return TRELM_ERROR_MSG(kInvalid, "ordering \"" + text + "\" names no key");
    TRELM_TYPES::TYPES type = TRELM_TYPES::STRING;
    // Keys the plug-ins did not register are named as text.
    Metadata::getType(String(key), type).ignore();
    order_ = Column{Metadata::Key(String(key), type), ascending};
    return TRELM_OK();
}

uError ItemQuery::checkSince() const {
    if (since) {
        std::string const given = "--since " + std::to_string(*since);
        if (*since < 0) return TRELM_ERROR_MSG(kInvalid, given + ": a time is in seconds since 1970 and cannot be negative");
        int const type = kind_->type;
        if (type != Metadata::Object::TYPE_ALBUM && type != Metadata::Object::TYPE_MEDIA &&
            type != Metadata::Object::TYPE_PHOTO_TAG) {
            return TRELM_ERROR_MSG(kInvalid, given + ": only albums, media and photo tags are listed from a time; list " +
                                                 kind_->name + " without it");
        }
    }
    return TRELM_OK();
}

uError ItemQuery::fill(IQueryItems::StartQueryMessage& msg) const {
    TRELM_RETURN_IF_ERROR(checkSince());
    Constraint type;
    type.key = Metadata::Key("core_object_type", TRELM_TYPES::INT32);
    type.function = Constraint::Equal;
    type.value = kind_->type;
    Vector<Constraint> constraints;
    uError e = constraints.pushBack(type);
    for (Constraint const& c : conditions_) {
        if (e.ok()) e = constraints.pushBack(c);
    }
    if (e.failed()) return e;
    msg.columns = order_ ? Vector<Column>{*order_} : orderingOf(kind_->type);
    msg.constraints = std::move(constraints);
    msg.position = since ? *since : -1;
    return TRELM_OK();
}

uError ItemQuery::walk(IQueryItems::ICursor& cursor, std::vector<Record>& rows, StepRunner const& run,
                       RowSink const& arrived) const {
    // A failed cursor step leaves the cursor where it was, so a step can be tried again as it is.
    auto step = [&](char const* what, std::function<uError()> const& op) { return run ? run(what, op) : op(); };
    uError e = step("moving to the first row", [&] { return cursor.jumpBeginning(); });
    if (e.failed()) return e;
    for (unsigned i = 0; i < skip; ++i) {
        int moved = 0;
        TRELM_RETURN_IF_ERROR(step("passing over a row", [&] { return cursor.seek(1, moved); }));
        if (moved <= 0) return TRELM_OK();  // fewer rows than were to be passed over
    }
    while (!limit || rows.size() < *limit) {
        SmartPtr<Record> row;
        e = step("reading a row", [&] { return cursor.getRow(row); });
        if (e.failed()) return e;
        if (e.code() == kNoData || !row) break;
        rows.push_back(*row);
        if (arrived) arrived(rows.size(), rows.back());
        if (limit && rows.size() >= *limit) break;
        int moved = 0;
        TRELM_RETURN_IF_ERROR(step("moving to the next row", [&] { return cursor.seek(1, moved); }));
        if (moved <= 0) break;
    }
    return TRELM_OK();
}

}  // namespace host
}  // namespace trelm
