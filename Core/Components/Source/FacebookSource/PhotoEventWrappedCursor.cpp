#include "PhotoEventWrappedCursor.h"

#include <algorithm>
#include <new>
#include <utility>

#include "QueryUtils.h"

namespace trelm {

PhotoEventWrappedCursor::PhotoEventWrappedCursor(SmartPtr<PhotoEventCursor> inner, SmartPtr<FacebookLibrary> library,
                                                 SmartPtr<FacebookSource::MappingCache> cache,
                                                 Vector<IQueryItems::Column> const& columns,
                                                 Vector<IQueryItems::Constraint> const& constraints,
                                                 String const& sourceId, bool flag)
    : CursorBase(std::move(library), std::move(cache), columns, constraints, sourceId, flag),
      inner_(std::move(inner)) {}

PhotoEventWrappedCursor::~PhotoEventWrappedCursor() = default;

uError PhotoEventWrappedCursor::derivedStart() {
    if (!inner_) return TRELM_ERROR_MSG(kOutOfWindow, "no photo event cursor to wrap");
    return inner_->start();
}

uError PhotoEventWrappedCursor::getSchema(Vector<IQueryItems::Column>& columns) {
    if (!inner_) return TRELM_ERROR(kOutOfWindow);
    return inner_->getSchema(columns);
}

uError PhotoEventWrappedCursor::populateCache() {
    if (!inner_) return TRELM_ERROR(kOutOfWindow);
    if (exhausted_) return TRELM_ERROR(kNoData);
    static String const timeKey("core_object_time");
    RecordPtr row;
    TRELM_RETURN_IF_ERROR(inner_->getRow(row));
    if (!row) {
        exhausted_ = true;
        return TRELM_ERROR(kNoData);
    }
    Variant const* first = row->search(timeKey);
    if (first == nullptr) return TRELM_ERROR_MSG(kOutOfWindow, "a photo event without a time");
    Variant const runTime = *first;
    while (true) {
        TRELM_RETURN_IF_ERROR(run_.pushBack(row));
        int moved = 0;
        TRELM_RETURN_IF_ERROR(inner_->seek(1, moved));
        if (moved <= 0) {
            exhausted_ = true;
            break;
        }
        TRELM_RETURN_IF_ERROR(inner_->getRow(row));
        if (!row) {
            exhausted_ = true;
            break;
        }
        Variant const* time = row->search(timeKey);
        if (time == nullptr) return TRELM_ERROR_MSG(kOutOfWindow, "a photo event without a time");
        if (!(*time == runTime)) break;  // stays current in the inner cursor for the next run
    }
    std::vector<RecordPtr>& rows = run_.vec();
    std::stable_sort(rows.begin(), rows.end(),
                     [this](RecordPtr const& a, RecordPtr const& b) { return QueryUtils::isLess(*a, *b, columns_); });
    return TRELM_OK();
}

uError PhotoEventWrappedCursor::getRow(RecordPtr& row) {
    if (!inner_) return TRELM_ERROR(kOutOfWindow);
    if (run_.empty() && !exhausted_) TRELM_RETURN_IF_ERROR(populateCache());
    if (run_.empty()) return inner_->getRow(row);
    // The host gets its own copy, as from every other cursor.
    try {
        row = makeSmart<Record>(*run_[0]);
    } catch (std::bad_alloc const&) {
        return TRELM_ERROR(kOutOfMemory);
    }
    return TRELM_OK();
}

uError PhotoEventWrappedCursor::seek(int offset, int& moved) {
    if (!inner_) return TRELM_ERROR(kOutOfWindow);
    if (offset < 0) return TRELM_ERROR_MSG(kNotSupported, "photo events are read forward only");
    int passed = 0;
    while (passed < offset) {
        if (run_.empty()) {
            // Nothing read yet: the first run's first row becomes current, no row is passed.
            uError err = populateCache();
            if (err.failed()) return err;
            if (run_.empty()) break;
            continue;
        }
        if (run_.size() > 1) {
            TRELM_RETURN_IF_ERROR(run_.erase(0));
            ++passed;
            continue;
        }
        // The last row of the run: pass it only when another run follows.
        if (exhausted_) break;
        RecordPtr const current = run_[0];
        run_.clear();
        uError err = populateCache();
        if (err.failed()) return err;
        if (run_.empty()) {
            TRELM_RETURN_IF_ERROR(run_.pushBack(current));
            break;
        }
        ++passed;
    }
    moved = passed;
    return TRELM_OK();
}

uError PhotoEventWrappedCursor::jumpBeginning() {
    if (!inner_) return TRELM_ERROR(kOutOfWindow);
    run_.clear();
    exhausted_ = false;
    return inner_->jumpBeginning();
}

uError PhotoEventWrappedCursor::getRows(unsigned /*count*/, Vector<RecordPtr>& /*rows*/) {
    return TRELM_ERROR(kNotSupported);
}

uError PhotoEventWrappedCursor::jumpEnd() { return TRELM_ERROR(kNotSupported); }

uError PhotoEventWrappedCursor::jump(unsigned /*index*/) { return TRELM_ERROR(kNotSupported); }

uError PhotoEventWrappedCursor::curRow(unsigned& /*index*/) { return TRELM_ERROR(kNotSupported); }

uError PhotoEventWrappedCursor::numRows(unsigned& /*count*/) { return TRELM_ERROR(kNotSupported); }

}  // namespace trelm
