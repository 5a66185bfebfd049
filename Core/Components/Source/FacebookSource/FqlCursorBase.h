#pragma once

#include "CursorBase.h"
#include "FacebookSource.h"
#include "trelm/Map.h"
#include "trelm/Metadata.h"
#include "trelm/String.h"
#include "trelm/Vector.h"
#include "trelm/uError.h"

namespace trelm {

// The base of the cursors that answer a query with FQL statements ("facebook.fql.query"). It keeps
// a window of converted records, moves a position over it and refills the window from the service
// when the position leaves it. A derived cursor supplies the FQL table, the field list, the
// statement with its keyset condition and ordering, and the conversion of one answer row.
//
// Paged (the usual case): each refill asks for the rows after (or before) the record at the edge
// of the window, in the cursor's order, with " limit " offset + window size; the first `offset`
// rows of the answer are skipped. Not paged: the whole result is fetched at once and kept; the
// jumps then move over the window without asking again.
//
// Positions: seek, jumpBeginning, jumpEnd and jump move over the whole result; getRow hands out a
// copy of the record at the position. The first getRow, seek or curRow on a cursor that has not
// loaded anything yet loads the first window. numRows counts with a statement whose field list is
// the FQL literal '' (tiny rows, no ORDER BY) unless a short first page or the unpaged result
// already told the count. curRow counts the rows up to and including the current record, unless
// the window is known to start at the first row.
//
// Errors of the service are returned unchanged and the window keeps its content. Every refill
// releases the records of the previous window in the mapping cache (clearItems of the tag); the
// GUID mappings stay for the cursor's life, so a record keeps its GUID across refills.
//
// Thread safety: as CursorBase (one thread at a time per cursor).
class FacebookSource::FqlCursorBase : public CursorBase {
public:
    // Which rows a statement asks for, relative to a key record.
    enum Direction : int {
        kBefore = -1,  // strictly before the key, in descending order
        kUpTo = 0,     // up to and including the key, ascending
        kAfter = 1,    // strictly after the key, ascending
    };

    static constexpr unsigned kDefaultWindowSize = 150;

    FqlCursorBase(SmartPtr<FacebookLibrary> library, SmartPtr<MappingCache> cache,
                  Vector<IQueryItems::Column> const& columns, Vector<IQueryItems::Constraint> const& constraints,
                  String const& sourceId, bool flag, bool paged);
    ~FqlCursorBase() override;

    // IQueryItems::ICursor. getRow gives a fresh copy of the record at the position: kNoData (row
    // released) when the window is empty, kOutOfWindow when the position is past a non-empty
    // window. getRows is not offered (kNotSupported): read with getRow and seek.
    uError getRow(RecordPtr& row) override;
    uError getRows(unsigned count, Vector<RecordPtr>& rows) override;
    uError seek(int delta, int& moved) override;
    uError jumpBeginning() override;
    uError jumpEnd() override;
    uError jump(unsigned index) override;
    uError curRow(unsigned& index) override;
    uError numRows(unsigned& count) override;

    // Rows asked of the service per page. REQUIRES: size > 0, set before the first refill.
    void setWindowSize(unsigned size) { windowSize_ = size; }
    unsigned windowSize() const noexcept { return windowSize_; }
    bool paged() const noexcept { return paged_; }

protected:
    // The whole statement without its row limit. `key` is the record at the edge of the window
    // (null: no keyset condition); `direction` says which rows relative to it; `ordered` whether
    // the statement carries its ORDER BY (ascending for kAfter and kUpTo, descending for kBefore).
    virtual uError generateBaseQuery(String const& fields, RecordPtr const& key, Direction direction, bool ordered,
                                     String& query) = 0;
    // The comma-separated field list of the FQL table.
    virtual uError getFieldList(String& fields) = 0;
    // The FQL table, which also names the answer's row elements.
    virtual uError getObjectType(String& type) = 0;

    // Runs one page statement and, when rows come back, converts them into the window.
    // Paged: the rows after (`forward`) or before `key`, skipping `offset`, at most `count`.
    // `got` receives the number of rows the service answered. Success when the row at `offset`
    // exists; kNoData when it does not: the window then holds the rows nearest to it (the end of
    // the result going forward, its beginning going backward), or is unchanged when there are none.
    // `convertError` is the index of a row whose conversion failed, else -1.
    virtual uError refreshWindow(RecordPtr const& key, unsigned offset, unsigned count, bool forward, unsigned& got,
                                 int& convertError);
    // Replaces the window by the converted `rows` (kept in cursor order: `forward` false means the
    // rows arrived in descending order), gives each record its GUID and stores it in the cache.
    // A failing row conversion leaves the window as it was.
    virtual uError convertItems(Vector<Map<String, String>> const& rows, bool forward, int& convertError);
    // One answer row to one record. kNoData: skip this row.
    virtual uError convertItem(Map<String, String> const& row, RecordPtr& record, int& convertError) = 0;
    // The key and service id under which a record's GUID is kept in the cache.
    virtual uError getSid(RecordPtr const& record, Metadata::Key& key, String& serviceId) = 0;
    // A hook over a freshly converted window; does nothing here.
    virtual uError postConvert(Vector<RecordPtr>& window);

    // For a query that can match nothing: the cursor answers with no rows without asking.
    void setEmptyResult();

    // Copies the row's `field` into the record under `recordKey`, converted by the key's
    // registered type: 32-bit and 64-bit integers and booleans from their decimal text, anything
    // else as a string. A field the row lacks leaves the key unset. kInvalid (wrapping the
    // conversion's error) for a text that does not convert.
    static uError copyField(Map<String, String> const& row, String const& field, String const& recordKey,
                            RecordPtr& record);
    // The same with the key's type already known (a cursor that converts many rows looks the
    // types of its keys up once).
    static uError copyField(Map<String, String> const& row, String const& field, String const& recordKey,
                            TRELM_TYPES::TYPES type, RecordPtr& record);

    // Puts the keys every record of a cursor carries with the same value into `record`: an empty
    // record becomes a copy of `prototype` (copying a map copies its tree without a key search
    // per entry, which matters at 150 records a page); other keys of a non-empty one stay.
    // kOutOfMemory when a copy cannot be made.
    static uError addPrototype(Record const& prototype, RecordPtr& record);

    // getSid for a cursor whose records carry their service id as a string under `sidKey`:
    // `key` becomes `sidKey` and `serviceId` the record's value. kInvalid with `missing` as the
    // message when the record lacks it; the conversion's error when it is not a string.
    static uError stringSid(RecordPtr const& record, Metadata::Key const& sidKey, char const* missing,
                            Metadata::Key& key, String& serviceId);

    // The window state, for a cursor that fills its window without a statement (the stream
    // cursor pages by time) and so runs its own refreshWindow, seek and jumpBeginning.
    Vector<RecordPtr> const& window() const noexcept { return window_; }
    unsigned position() const noexcept { return position_; }
    void setPosition(unsigned position) noexcept { position_ = position; }
    bool noMoreData() const noexcept { return noMoreData_; }
    bool windowLoaded() const noexcept { return windowLoaded_; }
    void setWindowLoaded() noexcept { windowLoaded_ = true; }
    bool atBeginning() const noexcept { return atBeginning_; }
    void setAtBeginning(bool atBeginning) noexcept { atBeginning_ = atBeginning; }
    void clearBackwardWindow() noexcept { backwardWindow_ = false; }
    // The whole result is known to hold `count` rows.
    void setRowCount(unsigned count) noexcept {
        rowCount_ = count;
        rowCountKnown_ = true;
    }

private:
    // Loads the first window when nothing has been loaded yet.
    uError ensureLoaded();
    // Runs the counting statement (field list '' and no ORDER BY) for the rows `direction` gives
    // from `key` (null: the whole result) and reports how many the service answered.
    uError countRows(RecordPtr const& key, Direction direction, unsigned& total);
    uError seekUnpaged(int delta, int& moved);
    // Empties the window and releases its records in the cache.
    uError clearWindow();

    // Constant after construction.
    bool const paged_;

    unsigned windowSize_ = kDefaultWindowSize;
    unsigned position_ = 0;  // index of the current record inside window_
    Vector<RecordPtr> window_{16};
    bool noMoreData_ = false;      // the result is known to be empty without asking
    bool backwardWindow_ = false;  // the window ends at a key, not at the end of the result
    bool rowCountKnown_ = false;
    unsigned rowCount_ = 0;      // valid when rowCountKnown_
    bool atBeginning_ = true;    // the window starts at the first row of the result
    bool windowLoaded_ = false;  // a refill has succeeded
};

}  // namespace trelm
