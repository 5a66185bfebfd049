#pragma once

#include "FacebookLibrary.h"
#include "FacebookSource.h"
#include "IQueryItems.h"
#include "MappingCache.h"
#include "trelm/Map.h"
#include "trelm/SmartPtr.h"
#include "trelm/String.h"
#include "trelm/Variant.h"
#include "trelm/Vector.h"
#include "trelm/uError.h"

namespace trelm {

// The common base of the source's cursors: holds the service client, the mapping cache, the
// query's columns and constraints and the identity of the answering source; takes the cursor's
// tag from the cache at start; stamps the fields every record carries.
//
// A cursor is made by FacebookSource::doStartQuery, started once with start(), then used by the
// host through IQueryItems::ICursor, and released through its SmartPtr. The destructor releases
// the tag's mappings and records in the cache, so records the cursor produced can no longer be
// retrieved by GUID once it is gone.
//
// Ownership: shares the client and the cache (SmartPtr); copies the columns and constraints.
// Thread safety: a cursor is not guarded; the host uses one cursor from one thread at a time.
// Different cursors may run on different threads (the client and the cache guard themselves).
class CursorBase : public IQueryItems::ICursor {
public:
    using Record = Map<String, Variant>;
    using RecordPtr = SmartPtr<Record>;

    // `sourceId` becomes "core_object_source" and "core_object_origin_importcomponent" of every
    // record; `flag` is kept for the derived cursors. If copying the vectors runs out of memory,
    // start() reports it.
    CursorBase(SmartPtr<FacebookLibrary> library, SmartPtr<FacebookSource::MappingCache> cache,
               Vector<IQueryItems::Column> const& columns, Vector<IQueryItems::Constraint> const& constraints,
               String const& sourceId, bool flag);
    ~CursorBase() override;
    CursorBase(CursorBase const&) = delete;
    CursorBase& operator=(CursorBase const&) = delete;

    // Takes a tag from the mapping cache, then runs derivedStart(). Call once, before anything else.
    uError start();

    // Sets "core_object_source", "core_object_deleted" (false), "core_object_origin_importcomponent"
    // and "core_object_origin_servicename" ("Facebook"), stopping at the first failure.
    // REQUIRES: record is not null.
    uError addBaseFields(RecordPtr& record);

    // Decides whether a value the cursor knows without asking the service satisfies a constraint:
    // Equal and NotEqual read the constraint's value as a T, InList as a Vector<T> (an empty list
    // matches nothing). Any other function is kNotSupported; a value of the wrong kind gives the
    // conversion's error. `matches` is written only on success.
    template <class T>
    static uError doFixedComparison(IQueryItems::Constraint::Function function, Variant const& constraintValue,
                                    T const& value, bool& matches);

    String const& tag() const noexcept { return tag_; }
    String const& sourceId() const noexcept { return sourceId_; }

protected:
    // The cursor's own start work: reading its constraints and ordering.
    virtual uError derivedStart() = 0;

    // Constant after construction (tag_ after start).
    SmartPtr<FacebookLibrary> library_;
    SmartPtr<FacebookSource::MappingCache> cache_;
    Vector<IQueryItems::Column> columns_;
    Vector<IQueryItems::Constraint> constraints_;
    String sourceId_;
    bool flag_;
    String tag_;

private:
    uError constructError_;  // an allocation failure while copying the constructor's vectors
    bool haveTag_ = false;
};

template <class T>
uError CursorBase::doFixedComparison(IQueryItems::Constraint::Function function, Variant const& constraintValue,
                                     T const& value, bool& matches) {
    switch (function) {
        case IQueryItems::Constraint::Equal:
        case IQueryItems::Constraint::NotEqual: {
            T wanted{};
            TRELM_RETURN_IF_ERROR(constraintValue.as(wanted));
            matches = (wanted == value) == (function == IQueryItems::Constraint::Equal);
            return TRELM_OK();
        }
        case IQueryItems::Constraint::InList: {
            Vector<T> wanted;
            TRELM_RETURN_IF_ERROR(constraintValue.as(wanted));
            bool found = false;
            for (T const& w : wanted) found = found || w == value;
            matches = found;
            return TRELM_OK();
        }
        default:
            return TRELM_ERROR(kNotSupported);
    }
}

}  // namespace trelm
