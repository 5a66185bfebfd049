#include "FStreamCursor.h"

#include <algorithm>
#include <charconv>
#include <new>
#include <utility>

#include "trelm/Trace.h"

namespace trelm {

namespace {

constexpr char const* kTimeKey = "core_object_time";
constexpr char const* kServiceIdKey = "core_event_serviceid";
constexpr char const* kServiceName = "Facebook";

// A stream row's field, the record key it goes to, and that key's type. The texts are made once:
// the records' keys share them.
struct EventField {
    String rowField;
    String recordKey;
    TRELM_TYPES::TYPES type;
};

EventField const kStatusFields[] = {
    {"source_id", "core_event_contactid", TRELM_TYPES::STRING},
    {"post_id", kServiceIdKey, TRELM_TYPES::STRING},
    {"created_time", kTimeKey, TRELM_TYPES::INT32},
    {"message", "core_event_text", TRELM_TYPES::STRING},
};

EventField const kPhotoFields[] = {
    {"owner", "core_event_contactid", TRELM_TYPES::STRING},
    {"pid", kServiceIdKey, TRELM_TYPES::STRING},
    {"created_time", kTimeKey, TRELM_TYPES::INT32},
    {"alt", "core_event_text", TRELM_TYPES::STRING},
    {"aid", "core_event_parent_serviceid", TRELM_TYPES::STRING},
    {"src", "core_event_uri", TRELM_TYPES::STRING},
};

// Decimal text read whole into `out`; false for anything else (empty, trailing text, range).
template <class T>
bool readDecimal(String const& text, T& out) {
    char const* begin = text.cStr();
    char const* end = begin + text.size();
    auto [stop, ec] = std::from_chars(begin, end, out);
    return ec == std::errc() && stop == end && begin != end;
}

// Makes a record of one post: its fields, the post id without its owner prefix (the text before
// the first '_'), the fixed service and type.
template <std::size_t N>
uError convertEvent(Map<String, String> const& row, EventField const (&fields)[N], int type,
                    CursorBase::RecordPtr& record, int& lastTime) {
    try {
        record = makeSmart<CursorBase::Record>();
    } catch (std::bad_alloc const&) {
        return TRELM_ERROR(kOutOfMemory);
    }
    for (EventField const& f : fields) {
        TRELM_RETURN_IF_ERROR(FStreamCursor::copyEventField(row, f.rowField, f.recordKey, f.type, record));
    }
    static String const serviceIdKey(kServiceIdKey);
    if (Variant* id = record->search(serviceIdKey)) {
        String sid = id->asString();
        unsigned const underscore = sid.find('_');
        if (underscore != String::npos) *id = Variant(sid.substr(underscore + 1));
    }
    static String const timeKey(kTimeKey);
    if (Variant const* time = record->search(timeKey)) lastTime = time->asInt32();
    static String const serviceKey("core_event_service");
    static String const typeKey("core_object_type");
    TRELM_RETURN_IF_ERROR(record->insert(serviceKey, Variant(kServiceName)));
    return record->insert(typeKey, Variant(type));
}

}  // namespace

FStreamCursor::FStreamCursor(SmartPtr<FacebookLibrary> library, SmartPtr<FacebookSource::MappingCache> cache,
                             Vector<IQueryItems::Column> const& columns,
                             Vector<IQueryItems::Constraint> const& constraints, String const& sourceId, bool flag,
                             bool paged)
    : FqlCursorBase(std::move(library), std::move(cache), columns, constraints, sourceId, flag, paged) {}

FStreamCursor::~FStreamCursor() = default;

Vector<IQueryItems::Column> const& FStreamCursor::fixedOrdering() {
    static Vector<IQueryItems::Column> const ordering{
        {Metadata::Key(kTimeKey, TRELM_TYPES::INT32), false},
        {Metadata::Key("core_event_service", TRELM_TYPES::STRING), false},
        {Metadata::Key(kServiceIdKey, TRELM_TYPES::STRING), false},
    };
    return ordering;
}

uError FStreamCursor::checkOrdering(Vector<IQueryItems::Column> const& ordering) {
    Vector<IQueryItems::Column> const& fixed = fixedOrdering();
    if (ordering.size() < fixed.size()) {
        return TRELM_ERROR_MSG(kInvalid, "the ordering must begin with time, service and service id, descending");
    }
    for (unsigned i = 0; i < fixed.size(); ++i) {
        if (!(ordering[i] == fixed[i])) {
            return TRELM_ERROR_MSG(
                kInvalid, "ordering entry " + String::from(i + 1) + " (" + ordering[i].key.name() + ") is not served");
        }
    }
    return TRELM_OK();
}

uError FStreamCursor::getSchema(Vector<IQueryItems::Column>& columns) {
    static constexpr struct {
        char const* key;
        TRELM_TYPES::TYPES type;
    } kSchema[] = {
        {kTimeKey, TRELM_TYPES::INT32},
        {"core_event_service", TRELM_TYPES::STRING},
        {kServiceIdKey, TRELM_TYPES::STRING},
        {"core_object_id", TRELM_TYPES::GUID_TYPE},
        {"core_object_source", TRELM_TYPES::STRING},
        {"core_object_type", TRELM_TYPES::INT32},
        {"core_event_parent_serviceid", TRELM_TYPES::STRING},
        {"core_event_uri", TRELM_TYPES::STRING},
    };
    for (auto const& column : kSchema) {
        TRELM_RETURN_IF_ERROR(columns.pushBack(IQueryItems::Column{Metadata::Key(column.key, column.type), false}));
    }
    return TRELM_OK();
}

uError FStreamCursor::derivedStart() {
    TRELM_RETURN_IF_ERROR(checkOrdering(columns_));
    for (IQueryItems::Constraint const& c : constraints_) {
        String const& name = c.key.name();
        if (name == kTimeKey) {
            int v = 0;
            uError err = c.value.as(v);
            if (err.failed()) return TRELM_WRAP_MSG(kInvalid, err, "core_object_time must be a number");
            switch (c.function) {
                case IQueryItems::Constraint::LessThan:
                    endTime_ = v - 1;
                    break;
                case IQueryItems::Constraint::LessOrEqual:
                    endTime_ = v;
                    break;
                case IQueryItems::Constraint::Equal:
                    startTime_ = endTime_ = v;
                    break;
                case IQueryItems::Constraint::GreaterOrEqual:
                    startTime_ = v;
                    break;
                case IQueryItems::Constraint::GreaterThan:
                    startTime_ = v + 1;
                    break;
                default:
                    return TRELM_ERROR_MSG(kInvalid, "unsupported comparison on core_object_time");
            }
        } else if (name == "core_object_type") {
            if (c.function == IQueryItems::Constraint::InList) {
                Vector<int> types;
                uError err = c.value.as(types);
                if (err.failed()) return TRELM_WRAP(kInvalid, err);
                for (int type : types) {
                    includeStatus_ = includeStatus_ || type == FacebookSource::kStatus;
                    includePhoto_ = includePhoto_ || type == FacebookSource::kPhotoEvent;
                }
            } else if (c.function == IQueryItems::Constraint::Equal) {
                int type = 0;
                uError err = c.value.as(type);
                if (err.failed()) return TRELM_WRAP(kInvalid, err);
                if (type == FacebookSource::kStatus) {
                    includeStatus_ = true;
                } else if (type == FacebookSource::kPhotoEvent) {
                    includePhoto_ = true;
                } else {
                    return TRELM_ERROR_MSG(kNotSupported, "the stream holds no object type " + String::from(type));
                }
            }
        } else if (name != "core_object_source") {
            return TRELM_ERROR_MSG(kInvalid, "unsupported stream constraint " + name);
        }
    }
    return TRELM_OK();
}

uError FStreamCursor::generateBaseQuery(String const& /*fields*/, RecordPtr const& /*key*/, Direction /*direction*/,
                                        bool /*ordered*/, String& /*query*/) {
    return TRELM_ERROR(kNoData);
}

uError FStreamCursor::getFieldList(String& /*fields*/) { return TRELM_ERROR(kNoData); }

uError FStreamCursor::getObjectType(String& type) {
    type = "stream_post";
    return TRELM_OK();
}

uError FStreamCursor::refreshWindow(RecordPtr const& anchor, unsigned startIndex, unsigned count, bool forward,
                                    unsigned& fetched, int& lastTime) {
    lastTime = -1;
    if (noMoreData()) {
        fetched = 0;
        return TRELM_ERROR(kNoData);
    }
    String userId;
    TRELM_RETURN_IF_ERROR(library_->getUserId(userId));
    if (anchor) {
        static String const timeKey(kTimeKey);
        Variant const* value = anchor->search(timeKey);
        if (value == nullptr) return TRELM_ERROR_MSG(kResource, "the anchor record has no time");
        int t = 0;
        uError err = value->as(t);
        if (err.failed()) return TRELM_WRAP_MSG(kInnerStep, err, "the anchor record's time is not a number");
        // Kept for every later fill: the stream is only walked towards older posts.
        if (t > 0) endTime_ = t - 1;
    }
    Vector<Map<String, String>> rows;
    TRELM_RETURN_IF_ERROR(library_->runFStreamQuery(userId, static_cast<unsigned>(startTime_),
                                                    static_cast<unsigned>(endTime_), count, rows, fetched));
    if (!rows.empty()) {
        TRELM_RETURN_IF_ERROR(convertItems(rows, paged() ? forward : true, lastTime));
        setWindowLoaded();
        if (atBeginning() && rows.size() < count) setRowCount(rows.size());
    }
    if (startIndex < fetched) return TRELM_OK();
    return TRELM_ERROR(kNoData);
}

uError FStreamCursor::convertItem(Map<String, String> const& row, RecordPtr& record, int& lastTime) {
    static String const isStatus("is_status");
    static String const isPhoto("is_photo");
    if (row.contains(isStatus)) {
        if (includeStatus_) return convertStatusItem(row, record, lastTime);
    } else if (row.contains(isPhoto)) {
        if (includePhoto_) return convertPhotoItem(row, record, lastTime);
    }
    // Left out, but the next window still starts below it.
    static String const createdTime("created_time");
    String const* created = row.search(createdTime);
    if (created == nullptr) return TRELM_ERROR(kNoData);
    int t = 0;
    if (!readDecimal(*created, t)) return TRELM_ERROR_MSG(kNotSupported, "created_time is not a number");
    lastTime = t;
    return TRELM_ERROR(kNoData);
}

uError FStreamCursor::convertStatusItem(Map<String, String> const& row, RecordPtr& record, int& lastTime) {
    TRELM_RETURN_IF_ERROR(convertEvent(row, kStatusFields, FacebookSource::kStatus, record, lastTime));
    return addBaseFields(record);
}

uError FStreamCursor::convertPhotoItem(Map<String, String> const& row, RecordPtr& record, int& lastTime) {
    static String const pid("pid");
    if (!row.contains(pid)) return TRELM_ERROR(kNoData);
    TRELM_RETURN_IF_ERROR(convertEvent(row, kPhotoFields, FacebookSource::kPhotoEvent, record, lastTime));
    return addBaseFields(record);
}

uError FStreamCursor::copyEventField(Map<String, String> const& row, String const& field, String const& recordKey,
                                     TRELM_TYPES::TYPES type, RecordPtr& record) {
    String const* text = row.search(field);
    if (text == nullptr) return TRELM_OK();
    Variant value;
    bool converted = false;
    switch (type) {
        case TRELM_TYPES::STRING:
            value = *text;
            converted = true;
            break;
        case TRELM_TYPES::UINT32: {
            unsigned n = 0;
            converted = readDecimal(*text, n);
            value = n;
            break;
        }
        case TRELM_TYPES::INT32: {
            int n = 0;
            converted = readDecimal(*text, n);
            value = n;
            break;
        }
        case TRELM_TYPES::INT64: {
            long long n = 0;
            converted = readDecimal(*text, n);
            value = n;
            break;
        }
        default:
            return TRELM_ERROR_MSG(kNotSupported, "no conversion for the type of " + recordKey);
    }
    if (!converted) return TRELM_ERROR_MSG(kNotSupported, "field " + field + " does not convert");
    return record->insert(recordKey, std::move(value));
}

uError FStreamCursor::getSid(RecordPtr const& record, Metadata::Key& key, String& sid) {
    static Metadata::Key const sidKey(kServiceIdKey, TRELM_TYPES::STRING);
    return stringSid(record, sidKey, "event record without a service id", key, sid);
}

uError FStreamCursor::postConvert(Vector<RecordPtr>& records) {
    return contactNames_.annotate(*library_, records, true);
}

uError FStreamCursor::getContactNames(Vector<String> const& uids) { return contactNames_.lookUp(*library_, uids); }

uError FStreamCursor::fillUntilRows(RecordPtr anchor, unsigned startIndex, unsigned& fetched, uError& fillResult,
                                    bool& filled) {
    filled = false;
    while (true) {
        int lastTime = -1;
        uError err = refreshWindow(anchor, startIndex, windowSize(), true, fetched, lastTime);
        if (err.failed()) return err;
        if (!window().empty()) {
            filled = true;
            fillResult = err;
            return TRELM_OK();
        }
        // Nothing came back: the stream has nothing older.
        if (lastTime < 1) return TRELM_OK();
        // Every post of the window was left out: go on below the last of them.
        try {
            anchor = makeSmart<Record>();
        } catch (std::bad_alloc const&) {
            return TRELM_ERROR(kOutOfMemory);
        }
        TRELM_RETURN_IF_ERROR(anchor->insert(kTimeKey, Variant(lastTime)));
    }
}

uError FStreamCursor::seek(int offset, int& moved) {
    // A cursor that has not read anything yet reads its first window, so that seek(1) moves to
    // the second post like getRow expects.
    if (!windowLoaded()) TRELM_RETURN_IF_ERROR(jumpBeginning());
    setAtBeginning(false);
    unsigned const n = window().size();
    unsigned const p = position();
    if (!paged()) {
        if (offset < 0) {
            unsigned const back = std::min<unsigned>(p, static_cast<unsigned>(-static_cast<long long>(offset)));
            setPosition(p - back);
            moved = -static_cast<int>(back);
        } else if (offset == 0 || n == 0) {
            moved = 0;
        } else {
            unsigned const forward = std::min<unsigned>(n - p - 1, static_cast<unsigned>(offset));
            setPosition(p + forward);
            moved = static_cast<int>(forward);
        }
        return TRELM_OK();
    }
    if (offset != 1) return TRELM_ERROR_MSG(kNotSupported, "the stream moves one post at a time");
    if (p + 1 < n) {
        setPosition(p + 1);
        moved = 1;
        return TRELM_OK();
    }
    RecordPtr const anchor = n == 0 ? RecordPtr() : window()[n - 1];
    unsigned fetched = 0;
    uError fillResult;
    bool filled = false;
    TRELM_RETURN_IF_ERROR(fillUntilRows(anchor, p + 1 - n, fetched, fillResult, filled));
    if (!filled) return TRELM_OK();  // nothing older: no move
    if (fillResult.code() == kSuccess) {
        setPosition(0);
        moved = 1;
    } else {
        moved = static_cast<int>(n - p - 1 + fetched);
        setPosition(fetched == 0 ? window().size() - 1 : 0);
    }
    clearBackwardWindow();
    return TRELM_OK();
}

uError FStreamCursor::jumpBeginning() {
    if (atBeginning() && windowLoaded()) return TRELM_OK();
    setAtBeginning(true);
    unsigned fetched = 0;
    uError fillResult;
    bool filled = false;
    uError err = fillUntilRows(RecordPtr(), 0, fetched, fillResult, filled);
    if (err.failed()) {
        // The host learns of it as an empty result; the next getRow asks again.
        traceError("FStreamCursor", "filling the first window", err);
        return TRELM_OK();
    }
    if (filled) {
        setPosition(0);
    } else {
        // The stream has nothing within the bounds: remember that, so getRow does not ask again.
        setWindowLoaded();
    }
    return TRELM_OK();
}

uError FStreamCursor::jumpEnd() { return TRELM_ERROR_MSG(kNotSupported, "the stream cannot be read from its end"); }

}  // namespace trelm
