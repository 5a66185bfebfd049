#pragma once

#include "ContactNames.h"
#include "FqlCursorBase.h"
#include "trelm/Map.h"
#include "trelm/String.h"
#include "trelm/uError.h"

namespace trelm {

// Answers a query for the posts of the user's news stream: status posts ("core_object_type" 4)
// and photo posts (5), newest first. The window is filled by the stream call
// ("facebook.stream.get"), not by an FQL statement, and paging goes by time: each further window
// is asked for with its upper bound one second below the time of the last row delivered, so the
// stream is only ever walked towards older posts (even after jumpBeginning).
//
// Posts of a kind the query did not ask for (and posts that are neither status nor photo) are
// left out of the window, but still move the paging time; when a whole window was left out the
// cursor fetches the next older one by itself. After each window the authors' names are looked
// up with one FQL statement (ContactNames) and set on the records.
//
// The query's ordering must begin with "core_object_time", "core_event_service",
// "core_event_serviceid", each descending (flag false); kInvalid otherwise.
// Constraints it understands:
//   "core_object_time"    < <= = >= >: the bounds of the stream call ("start_time", "end_time")
//   "core_object_type"    = 4 or 5, or a list holding 4 and/or 5: the kinds wanted; nothing is
//                         wanted without it. Another single value is kNotSupported.
//   "core_object_source"  accepted (the dispatch has checked it)
// Any other constraint is kInvalid.
//
// Moves: seek(1) only (anything else is kNotSupported once paging), jumpBeginning; jumpEnd is
// kNotSupported. numRows knows the count only when the first window was short; otherwise it,
// curRow away from the first window, and jump past it are kNotSupported (there is no statement
// to count with).
//
// Ownership and thread safety: as FqlCursorBase.
class FStreamCursor : public FacebookSource::FqlCursorBase {
public:
    FStreamCursor(SmartPtr<FacebookLibrary> library, SmartPtr<FacebookSource::MappingCache> cache,
                  Vector<IQueryItems::Column> const& columns, Vector<IQueryItems::Constraint> const& constraints,
                  String const& sourceId, bool flag, bool paged);
    ~FStreamCursor() override;

    uError getSchema(Vector<IQueryItems::Column>& columns) override;
    uError seek(int offset, int& moved) override;
    uError jumpBeginning() override;
    uError jumpEnd() override;

    // The ordering the stream and photo-event cursors serve: time, service, service id, all
    // descending. Built once.
    static Vector<IQueryItems::Column> const& fixedOrdering();
    // kInvalid unless `ordering` begins with fixedOrdering().
    static uError checkOrdering(Vector<IQueryItems::Column> const& ordering);

    // Copies the row's `field` into the record under `recordKey`, converted by `type`: strings
    // as they are, 32-bit (signed and unsigned) and 64-bit integers from decimal text that must
    // be consumed whole. A missing field leaves the key unset; a text that does not convert, or
    // a type not listed, is kNotSupported.
    static uError copyEventField(Map<String, String> const& row, String const& field, String const& recordKey,
                                 TRELM_TYPES::TYPES type, RecordPtr& record);

    // Bounds and kinds read by start(); for tests.
    int startTime() const noexcept { return startTime_; }
    int endTime() const noexcept { return endTime_; }
    bool includeStatus() const noexcept { return includeStatus_; }
    bool includePhoto() const noexcept { return includePhoto_; }

protected:
    uError derivedStart() override;
    // Never used: the window is filled by the stream call. Both answer kNoData.
    uError generateBaseQuery(String const& fields, RecordPtr const& key, Direction direction, bool ordered,
                             String& query) override;
    uError getFieldList(String& fields) override;
    uError getObjectType(String& type) override;
    // Fills the window with the posts older than `anchor` (all posts within the bounds when it
    // is null), at most `count`. `lastTime` receives the time of the last row read, delivered
    // or left out; -1 when the service answered nothing. Success when the row at `startIndex`
    // exists, else kNoData.
    uError refreshWindow(RecordPtr const& anchor, unsigned startIndex, unsigned count, bool forward, unsigned& fetched,
                         int& lastTime) override;
    // A status or photo post to its record; kNoData for a post left out (which still sets
    // `lastTime` from its "created_time").
    uError convertItem(Map<String, String> const& row, RecordPtr& record, int& lastTime) override;
    uError getSid(RecordPtr const& record, Metadata::Key& key, String& sid) override;
    // Sets the authors' names on the window.
    uError postConvert(Vector<RecordPtr>& records) override;

    uError convertStatusItem(Map<String, String> const& row, RecordPtr& record, int& lastTime);
    uError convertPhotoItem(Map<String, String> const& row, RecordPtr& record, int& lastTime);
    uError getContactNames(Vector<String> const& uids);

private:
    // The step loop of seek(1) and jumpBeginning: fills from `anchor` until a window holds
    // records or the service has nothing older. `filled` tells which of the two ended it.
    uError fillUntilRows(RecordPtr anchor, unsigned startIndex, unsigned& fetched, uError& fillResult, bool& filled);

    // Set by derivedStart; endTime_ is lowered by every anchored fill and never raised.
    int startTime_ = 0;
    int endTime_ = 0;
    bool includeStatus_ = false;
    bool includePhoto_ = false;
    ContactNames contactNames_;
};

}  // namespace trelm
