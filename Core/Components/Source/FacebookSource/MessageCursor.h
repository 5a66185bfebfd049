#pragma once

#include "CursorBase.h"
#include "FacebookLibrary.h"
#include "trelm/GUID.h"
#include "trelm/Map.h"
#include "trelm/Set.h"
#include "trelm/String.h"
#include "trelm/Vector.h"
#include "trelm/uError.h"

namespace trelm {

// Answers a query for the user's inbox messages ("core_object_type" 10). The mailbox calls page
// by offset and cannot be asked for "the messages after this one", so the cursor reads the whole
// wanted part of the inbox when it starts: threads 20 at a time ("mailbox.getInbox"), each
// thread's messages 50 at a time ("mailbox.getThreadMessages"), both newest first. Every message
// becomes one record, the authors' names are added with one "user" statement, and all records
// stay in memory, newest first, until the cursor goes away. No row operation calls the service.
// A record is kept as a compact row (the message's own values and its GUID) and is made whole
// when a row is asked for: the keys every record shares are held once, so a large mailbox costs
// about twice its text and not six times.
//
// The query's columns must start with the ordering the cursor serves: "core_object_time" (32-bit
// integer), "core_event_service", "core_event_serviceid" (strings), all descending (flag false);
// otherwise start fails with kInvalid.
//
// Constraints it understands:
//   "core_object_time"   at most one, GreaterOrEqual or GreaterThan with a 32-bit integer: only
//                        messages sent at or after (after) that time. Reading stops at the first
//                        thread last updated before the bound, and within a thread at the first
//                        message sent before it, so no older page is fetched.
//   "core_object_type", "core_object_source"   accepted and left to the dispatch.
// Anything else is kInvalid.
//
// Records: "core_event_serviceid" is the thread id, "-" and the message id; "core_event_contactid"
// the author's user id and "core_event_contactname" the author's name when the service knows it;
// "core_event_text" the body; "core_event_subject" the thread's subject; "core_object_time" the
// sending time; "core_object_id" the GUID the mapping cache gives the service id; and the fields
// every record of the source carries. Two messages with the same time and id keep the later one.
//
// Rows: newest first; at equal times, the greater message id (byte order) first. The position is
// a key (time, id): the current row is the record with that key or the first one after it. Moving
// backwards is not offered (seek with a negative offset is kNotSupported); jumpBeginning, jump
// and jumpEnd go anywhere. getRow and getRows hand out copies and do not move.
//
// Retrieval: every record handed out is also stored in the mapping cache under the cursor's tag,
// so that the source can give it back by its GUID. Like an FQL cursor's window, the cursor holds
// the last records it handed out, up to kHeldRecords: when that many are held, they are released
// before the next is stored. So a mailbox read whole never keeps a second copy of every message.
//
// A start that fails part-way keeps the records read so far.
//
// Ownership and thread safety: as CursorBase (one thread at a time per cursor).
class MessageCursor : public CursorBase {
public:
    // The key of the record map: newest first, then by descending message id.
    struct MessageOrder {
        int time = 0;
        String id;

        friend bool operator<(MessageOrder const& a, MessageOrder const& b) {
            if (a.time != b.time) return a.time > b.time;
            return b.id < a.id;
        }
        friend bool operator==(MessageOrder const& a, MessageOrder const& b) {
            return a.time == b.time && a.id == b.id;
        }
    };

    // Page sizes of the two mailbox calls.
    static constexpr int kThreadPage = 20;
    static constexpr int kMessagePage = 50;
    // The most records handed out that the cache holds for retrieval at once (a contact page).
    static constexpr unsigned kHeldRecords = 150;

    // `flag` is kept by the base; the message cursor has no paged mode.
    MessageCursor(SmartPtr<FacebookLibrary> library, SmartPtr<FacebookSource::MappingCache> cache,
                  Vector<IQueryItems::Column> const& columns, Vector<IQueryItems::Constraint> const& constraints,
                  String const& sourceId, bool flag);
    ~MessageCursor() override;

    // The columns the query asked for.
    uError getSchema(Vector<IQueryItems::Column>& columns) override;
    // kNoData (row released) when there is no current row.
    uError getRow(RecordPtr& row) override;
    // Appends up to `count` records from the current row on; kNoData when there is no current row.
    uError getRows(unsigned count, Vector<RecordPtr>& rows) override;
    // Forward only: a negative offset is kNotSupported. Stops on the last row; `moved` says how
    // far it went. kNoData (moved 0) when there is no current row.
    uError seek(int delta, int& moved) override;
    uError jumpBeginning() override;
    uError jumpEnd() override;
    // The row `index` rows after the first, or the last row when there are fewer.
    uError jump(unsigned index) override;
    // The number of rows before the current one; kNoData when there are no rows.
    uError curRow(unsigned& index) override;
    uError numRows(unsigned& count) override;

protected:
    // Checks the ordering, reads the constraints, reads the mailbox and adds the names.
    uError derivedStart() override;

private:
    // What a record holds beyond the keys every message record shares; its time and message id
    // are the map key.
    struct MessageRow {
        String author;
        String serviceId;
        String body;
        String subject;
        GUID guid;
    };
    using MessageMap = Map<MessageOrder, MessageRow>;

    // Reads threads and their messages, newest first; with `hasTime` only what was sent at or
    // after `time` (after it when not `inclusive`).
    uError addMessages(bool hasTime, int time, bool inclusive);
    // One message to one row in messages_ (replacing a row under the same key).
    uError addMessageToList(FacebookLibrary::MessageObj const& message);
    // Looks up the names of every row's author into names_ ("core_event_contactname").
    uError addUserNames();
    // The whole record of a row: prototype_, the row's values and its author's name if known.
    uError makeRecord(MessageOrder const& order, MessageRow const& row, RecordPtr& record) const;
    // The record of a row for the host: made whole, stored in the cache for retrieval (see
    // kHeldRecords), and a copy of it handed out, so what the host changes never reaches the cache.
    uError handOut(MessageOrder const& order, MessageRow const& row, RecordPtr& record);
    // Names of `uids` with one statement; kNoData when a name could not be kept.
    uError getContactNames(Set<String> const& uids, Map<String, String>& names);
    // Makes prototype_ (the keys every message record carries with the same value).
    uError makePrototype();

    // The current row: the record keyed currentOrder_ or the first after it (end: none).
    MessageMap::const_iterator current() const;

    // Filled by derivedStart, read-only afterwards.
    MessageMap messages_;
    Record prototype_;
    Map<String, String> names_;  // author uid -> name, for the authors the service could name

    MessageOrder currentOrder_;
    unsigned heldRecords_ = 0;  // records stored in the cache since it was last released
};

}  // namespace trelm
