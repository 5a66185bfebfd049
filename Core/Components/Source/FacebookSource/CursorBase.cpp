#include "CursorBase.h"

#include <utility>

#include "trelm/Trace.h"

namespace trelm {

CursorBase::CursorBase(SmartPtr<FacebookLibrary> library, SmartPtr<FacebookSource::MappingCache> cache,
                       Vector<IQueryItems::Column> const& columns, Vector<IQueryItems::Constraint> const& constraints,
                       String const& sourceId, bool flag)
    : library_(std::move(library)), cache_(std::move(cache)), sourceId_(sourceId), flag_(flag) {
    // Element by element, so that running out of memory is an error value, not an exception
    // escaping a constructor.
    constructError_ = columns_.reserve(columns.size());
    for (unsigned i = 0; constructError_.ok() && i < columns.size(); ++i) {
        constructError_ = columns_.pushBack(columns[i]);
    }
    if (constructError_.ok()) constructError_ = constraints_.reserve(constraints.size());
    for (unsigned i = 0; constructError_.ok() && i < constraints.size(); ++i) {
        constructError_ = constraints_.pushBack(constraints[i]);
    }
}

CursorBase::~CursorBase() {
    // The records and mappings of this cursor die with it; other cursors' holds keep theirs.
    if (haveTag_ && cache_) {
        // A destructor has no one to report to: a failure (the cache's lock could not be taken)
        // leaves this tag's holds in place, which costs memory but keeps every entry consistent.
        if (uError err = cache_->clearMapping(tag_); err.failed()) traceError("cursor", "releasing its mappings", err);
        if (uError err = cache_->clearItems(tag_); err.failed()) traceError("cursor", "releasing its records", err);
    }
}

uError CursorBase::start() {
    if (constructError_.failed()) return constructError_;
    if (!library_ || !cache_) return TRELM_ERROR_MSG(kNotSet, "cursor without client or mapping cache");
    if (haveTag_) return TRELM_ERROR_MSG(kInvalid, "cursor started twice");
    TRELM_RETURN_IF_ERROR(cache_->getTag(tag_));
    haveTag_ = true;
    return derivedStart();
}

uError CursorBase::addBaseFields(RecordPtr& record) {
    // Called for every converted row: the key texts are made once, not per call.
    static String const sourceKey("core_object_source");
    static String const deletedKey("core_object_deleted");
    static String const importKey("core_object_origin_importcomponent");
    static String const serviceKey("core_object_origin_servicename");
    TRELM_RETURN_IF_ERROR(record->insert(sourceKey, Variant(sourceId_)));
    TRELM_RETURN_IF_ERROR(record->insert(deletedKey, Variant(false)));
    TRELM_RETURN_IF_ERROR(record->insert(importKey, Variant(sourceId_)));
    return record->insert(serviceKey, Variant("Facebook"));
}

}  // namespace trelm
