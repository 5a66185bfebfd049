#pragma once

#include "CursorBase.h"
#include "PhotoEventCursor.h"
#include "trelm/SmartPtr.h"
#include "trelm/Vector.h"
#include "trelm/uError.h"

namespace trelm {

// Puts the rows of a PhotoEventCursor into the query's exact order. The service orders photos
// by creation time only; this cursor takes from the inner cursor each run of rows that share one
// time, sorts the run with QueryUtils::isLess over the query's whole ordering (its columns), and
// hands the rows out one by one.
//
// It is a CursorBase so that the dispatch starts it like any other cursor: start() takes a tag
// it does not use and starts the inner cursor (kOutOfWindow when there is none).
//
// Moves: seek forward only (a negative offset is kNotSupported; seeking stops on the last row),
// jumpBeginning. numRows, curRow, jump, jumpEnd and getRows are kNotSupported: the inner
// cursor's counts and positions are not those of the sorted rows.
//
// Ownership: owns its inner cursor by SmartPtr; holds one run of rows (copies) at a time.
// Thread safety: as CursorBase (one thread at a time).
class PhotoEventWrappedCursor : public CursorBase {
public:
    // `columns` are the query's, and so its ordering.
    PhotoEventWrappedCursor(SmartPtr<PhotoEventCursor> inner, SmartPtr<FacebookLibrary> library,
                            SmartPtr<FacebookSource::MappingCache> cache, Vector<IQueryItems::Column> const& columns,
                            Vector<IQueryItems::Constraint> const& constraints, String const& sourceId, bool flag);
    ~PhotoEventWrappedCursor() override;

    uError getSchema(Vector<IQueryItems::Column>& columns) override;
    // A copy of the current row; kNoData (row released) when there is none.
    uError getRow(RecordPtr& row) override;
    uError getRows(unsigned count, Vector<RecordPtr>& rows) override;
    uError seek(int offset, int& moved) override;
    uError jumpBeginning() override;
    uError jumpEnd() override;
    uError jump(unsigned index) override;
    uError curRow(unsigned& index) override;
    uError numRows(unsigned& count) override;

protected:
    uError derivedStart() override;

private:
    // Reads the next run of equal-time rows from the inner cursor into run_ and sorts it; the
    // inner cursor is left on the first row of the following run. kNoData when it is exhausted.
    uError populateCache();

    SmartPtr<PhotoEventCursor> inner_;
    bool exhausted_ = false;  // the inner cursor cannot move forward any more
    Vector<RecordPtr> run_;   // the sorted run not yet passed, current row first
};

}  // namespace trelm
