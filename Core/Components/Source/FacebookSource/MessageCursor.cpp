#include "MessageCursor.h"

#include <iterator>
#include <new>
#include <utility>

#include "MappingCache.h"
#include "trelm/GUID.h"
#include "trelm/Metadata.h"

namespace trelm {

namespace {

constexpr char const* kTimeKey = "core_object_time";
constexpr char const* kServiceKey = "core_event_service";
constexpr char const* kServiceIdKey = "core_event_serviceid";
constexpr char const* kContactIdKey = "core_event_contactid";
constexpr char const* kContactNameKey = "core_event_contactname";
constexpr char const* kServiceName = "Facebook";

// The ordering the cursor serves: newest first, then by service and service id.
Vector<IQueryItems::Column> const& fixedOrdering() {
    static Vector<IQueryItems::Column> const ordering{
        {Metadata::Key(kTimeKey, TRELM_TYPES::INT32), false},
        {Metadata::Key(kServiceKey, TRELM_TYPES::STRING), false},
        {Metadata::Key(kServiceIdKey, TRELM_TYPES::STRING), false},
    };
    return ordering;
}

Metadata::Key const& serviceIdKey() {
    static Metadata::Key const key(kServiceIdKey, TRELM_TYPES::STRING);
    return key;
}

bool isDecimal(String const& text) {
    if (text.empty()) return false;
    for (unsigned i = 0; i < text.size(); ++i) {
        if (text[i] < '0' || text[i] > '9') return false;
    }
    return true;
}

}  // namespace

MessageCursor::MessageCursor(SmartPtr<FacebookLibrary> library, SmartPtr<FacebookSource::MappingCache> cache,
                             Vector<IQueryItems::Column> const& columns,
                             Vector<IQueryItems::Constraint> const& constraints, String const& sourceId, bool flag)
    : CursorBase(std::move(library), std::move(cache), columns, constraints, sourceId, flag) {}

MessageCursor::~MessageCursor() = default;

uError MessageCursor::derivedStart() {
    Vector<IQueryItems::Column> const& ordering = fixedOrdering();
    bool served = columns_.size() >= ordering.size();
    for (unsigned i = 0; served && i < ordering.size(); ++i) served = columns_[i] == ordering[i];
    if (!served) return TRELM_ERROR_MSG(kInvalid, "messages are ordered by time, service and service id, newest first");

    bool hasTime = false;
    bool inclusive = true;
    int time = 0;
    for (IQueryItems::Constraint const& c : constraints_) {
        String const& name = c.key.name();
        if (name == kTimeKey) {
            if (hasTime) return TRELM_ERROR_MSG(kInvalid, "only one condition on core_object_time is served");
            uError err = c.value.as(time);
            if (err.failed()) return TRELM_WRAP_MSG(kInvalid, err, "core_object_time is not a 32-bit integer");
            if (c.function == IQueryItems::Constraint::GreaterOrEqual) {
                inclusive = true;
            } else if (c.function == IQueryItems::Constraint::GreaterThan) {
                inclusive = false;
            } else {
                return TRELM_ERROR_MSG(kInvalid, "core_object_time takes >= or > only");
            }
            hasTime = true;
        } else if (name != "core_object_type" && name != "core_object_source") {
            return TRELM_ERROR_MSG(kInvalid, "unsupported message constraint " + name);
        }
    }

    TRELM_RETURN_IF_ERROR(makePrototype());
    uError err = addMessages(hasTime, time, inclusive);
    if (err.ok()) err = addUserNames();
    // The cursor opens on its first row (or on nothing, for an empty inbox); this cannot fail.
    jumpBeginning().ignore();
    return err;
}

uError MessageCursor::makePrototype() {
    RecordPtr prototype = makeSmart<Record>();
    TRELM_RETURN_IF_ERROR(prototype->insert(kServiceKey, Variant(kServiceName)));
    TRELM_RETURN_IF_ERROR(prototype->insert("core_object_type", Variant(int(Metadata::Object::TYPE_MESSAGE))));
    // "core_object_source", "core_object_deleted", "core_object_origin_importcomponent" and
    // "core_object_origin_servicename", as on every record of the source.
    TRELM_RETURN_IF_ERROR(addBaseFields(prototype));
    prototype_ = std::move(*prototype);
    return TRELM_OK();
}

uError MessageCursor::addMessages(bool hasTime, int time, bool inclusive) {
    // Older than the bound: before it, or at it when the bound is exclusive.
    auto beforeBound = [&](int t) { return hasTime && (t < time || (t == time && !inclusive)); };
    int threadOffset = 0;
    for (;;) {
        Vector<FacebookLibrary::ThreadObj> threads;
        TRELM_RETURN_IF_ERROR(library_->getInboxThreads(threadOffset, kThreadPage, threads));
        if (threads.empty()) return TRELM_OK();
        for (FacebookLibrary::ThreadObj const& thread : threads) {
            // Threads come newest first: once one was last updated before the bound, so were all
            // the rest.
            if (beforeBound(thread.lastUpdate)) return TRELM_OK();
            int messageOffset = 0;
            bool threadDone = false;
            while (!threadDone) {
                Vector<FacebookLibrary::MessageObj> page;
                TRELM_RETURN_IF_ERROR(
                    library_->getThreadMessages(thread.threadId, thread.subject, messageOffset, kMessagePage, page));
                if (page.empty()) break;
                for (FacebookLibrary::MessageObj const& message : page) {
                    // Messages come newest first as well: the rest of the thread is older still.
                    if (beforeBound(message.timeSent)) {
                        threadDone = true;
                        break;
                    }
                    TRELM_RETURN_IF_ERROR(addMessageToList(message));
                }
                messageOffset += static_cast<int>(page.size());
            }
        }
        threadOffset += static_cast<int>(threads.size());
    }
}

uError MessageCursor::addMessageToList(FacebookLibrary::MessageObj const& message) {
    MessageRow row;
    try {
        row.author = message.author;
        row.serviceId = message.threadId + "-" + message.messageId;
        row.body = message.body;
        row.subject = message.context;
    } catch (std::bad_alloc const&) {
        return TRELM_ERROR(kOutOfMemory);
    }
    FacebookSource::MappingCache::SidMapKey const sid(serviceIdKey(), row.serviceId);
    TRELM_RETURN_IF_ERROR(cache_->getGuid(tag_, sid, true, row.guid));
    return messages_.insert(MessageOrder{message.timeSent, message.messageId}, std::move(row));
}

uError MessageCursor::addUserNames() {
    Set<String> uids;
    for (auto const& [order, row] : messages_) TRELM_RETURN_IF_ERROR(uids.insert(row.author));
    uError err = getContactNames(uids, names_);
    // kNoData: some names could not be kept; the others are still used.
    return err.failed() ? err : TRELM_OK();
}

uError MessageCursor::makeRecord(MessageOrder const& order, MessageRow const& row, RecordPtr& record) const {
    RecordPtr made;
    try {
        made = makeSmart<Record>(prototype_);
    } catch (std::bad_alloc const&) {
        return TRELM_ERROR(kOutOfMemory);
    }
    // The key texts are made once: the records share them.
    static String const contactIdKey(kContactIdKey);
    static String const serviceIdKey(kServiceIdKey);
    static String const textKey("core_event_text");
    static String const timeKey(kTimeKey);
    static String const subjectKey("core_event_subject");
    static String const objectIdKey("core_object_id");
    static String const contactNameKey(kContactNameKey);
    TRELM_RETURN_IF_ERROR(made->insert(contactIdKey, Variant(row.author)));
    TRELM_RETURN_IF_ERROR(made->insert(serviceIdKey, Variant(row.serviceId)));
    TRELM_RETURN_IF_ERROR(made->insert(textKey, Variant(row.body)));
    TRELM_RETURN_IF_ERROR(made->insert(timeKey, Variant(order.time)));
    TRELM_RETURN_IF_ERROR(made->insert(subjectKey, Variant(row.subject)));
    TRELM_RETURN_IF_ERROR(made->insert(objectIdKey, Variant(row.guid)));
    if (String const* name = names_.search(row.author)) {
        TRELM_RETURN_IF_ERROR(made->insert(contactNameKey, Variant(*name)));
    }
    record = std::move(made);
    return TRELM_OK();
}

uError MessageCursor::handOut(MessageOrder const& order, MessageRow const& row, RecordPtr& record) {
    RecordPtr stored;
    TRELM_RETURN_IF_ERROR(makeRecord(order, row, stored));
    RecordPtr copy;
    try {
        copy = makeSmart<Record>(*stored);
    } catch (std::bad_alloc const&) {
        return TRELM_ERROR(kOutOfMemory);
    }
    if (heldRecords_ >= kHeldRecords) {
        TRELM_RETURN_IF_ERROR(cache_->clearItems(tag_));
        heldRecords_ = 0;
    }
    TRELM_RETURN_IF_ERROR(cache_->setItem(tag_, serviceIdKey(), stored));
    ++heldRecords_;
    record = std::move(copy);
    return TRELM_OK();
}

uError MessageCursor::getContactNames(Set<String> const& uids, Map<String, String>& names) {
    // Ids go into the statement as they are, so only plain numbers are asked for.
    String list;
    for (String const& uid : uids) {
        if (!isDecimal(uid)) continue;
        if (!list.empty()) list += ",";
        list += uid;
    }
    if (list.empty()) return TRELM_OK();
    Vector<Map<String, String>> rows;
    unsigned count = 0;
    TRELM_RETURN_IF_ERROR(
        library_->runFqlQuery("select uid,name from user where uid in (" + list + ")", "user", rows, 0, count));
    static String const uidField("uid");
    static String const nameField("name");
    bool allKept = true;
    for (Map<String, String> const& row : rows) {
        String const* uid = row.search(uidField);
        String const* name = row.search(nameField);
        if (uid == nullptr || name == nullptr) continue;
        if (names.insert(*uid, *name).failed()) allKept = false;
    }
    return allKept ? TRELM_OK() : TRELM_ERROR(kNoData);
}

uError MessageCursor::getSchema(Vector<IQueryItems::Column>& columns) {
    Vector<IQueryItems::Column> copy;
    TRELM_RETURN_IF_ERROR(copy.reserve(columns_.size()));
    for (IQueryItems::Column const& column : columns_) TRELM_RETURN_IF_ERROR(copy.pushBack(column));
    columns = std::move(copy);
    return TRELM_OK();
}

MessageCursor::MessageMap::const_iterator MessageCursor::current() const {
    return messages_.map().lower_bound(currentOrder_);
}

uError MessageCursor::getRow(RecordPtr& row) {
    auto it = current();
    if (it == messages_.end()) {
        row.reset();
        return TRELM_ERROR(kNoData);
    }
    return handOut(it->first, it->second, row);
}

uError MessageCursor::getRows(unsigned count, Vector<RecordPtr>& rows) {
    if (count == 0) return TRELM_OK();
    auto it = current();
    if (it == messages_.end()) return TRELM_ERROR(kNoData);
    for (unsigned n = 0; n < count && it != messages_.end(); ++n, ++it) {
        RecordPtr record;
        TRELM_RETURN_IF_ERROR(handOut(it->first, it->second, record));
        TRELM_RETURN_IF_ERROR(rows.pushBack(std::move(record)));
    }
    return TRELM_OK();
}

uError MessageCursor::seek(int delta, int& moved) {
    auto it = current();
    if (it == messages_.end()) {
        moved = 0;
        return TRELM_ERROR(kNoData);
    }
    if (delta < 0) return TRELM_ERROR_MSG(kNotSupported, "messages can only be walked forward");
    int steps = 0;
    while (steps < delta && std::next(it) != messages_.end()) {
        ++it;
        ++steps;
    }
    currentOrder_ = it->first;
    moved = steps;
    return TRELM_OK();
}

uError MessageCursor::jumpBeginning() {
    currentOrder_ = messages_.empty() ? MessageOrder{} : messages_.begin()->first;
    return TRELM_OK();
}

uError MessageCursor::jumpEnd() {
    currentOrder_ = messages_.empty() ? MessageOrder{} : std::prev(messages_.end())->first;
    return TRELM_OK();
}

uError MessageCursor::jump(unsigned index) {
    if (messages_.empty()) {
        currentOrder_ = MessageOrder{};
        return TRELM_OK();
    }
    auto it = messages_.begin();
    for (unsigned i = 0; i < index && std::next(it) != messages_.end(); ++i) ++it;
    currentOrder_ = it->first;
    return TRELM_OK();
}

uError MessageCursor::curRow(unsigned& index) {
    if (messages_.empty()) return TRELM_ERROR(kNoData);
    auto const before = static_cast<unsigned>(std::distance(messages_.map().begin(), current()));
    index = before < messages_.size() ? before : messages_.size() - 1;
    return TRELM_OK();
}

uError MessageCursor::numRows(unsigned& count) {
    count = messages_.size();
    return TRELM_OK();
}

}  // namespace trelm
