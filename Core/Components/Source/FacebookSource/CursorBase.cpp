#include "CursorBase.h"

#include <utility>

namespace trelm {

CursorBase::CursorBase(SmartPtr<FacebookLibrary> library, SmartPtr<FacebookSource::MappingCache> cache,
                       Vector<IQueryItems::Column> const& columns,
                       Vector<IQueryItems::Constraint> const& constraints, String const& sourceId, bool flag)
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
        cache_->clearMapping(tag_);
        cache_->clearItems(tag_);
    }
}

uError CursorBase::start() {
    if (constructError_.failed()) return constructError_;
    if (!library_ || !cache_) return TRELM_ERROR_MSG(kNotSet, "cursor without client or mapping cache");
    if (haveTag_) return TRELM_ERROR_MSG(kInvalid, "cursor started twice");
    uError err = cache_->getTag(tag_);
    if (err.failed()) return err;
    haveTag_ = true;
    return derivedStart();
}

uError CursorBase::addBaseFields(RecordPtr& record) {
    // Called for every converted row: the key texts are made once, not per call.
    static String const sourceKey("core_object_source");
    static String const deletedKey("core_object_deleted");
    static String const importKey("core_object_origin_importcomponent");
    static String const serviceKey("core_object_origin_servicename");
    uError err = record->insert(sourceKey, Variant(sourceId_));
    if (err.failed()) return err;
    err = record->insert(deletedKey, Variant(false));
    if (err.failed()) return err;
    err = record->insert(importKey, Variant(sourceId_));
    if (err.failed()) return err;
    return record->insert(serviceKey, Variant("Facebook"));
}

}  // namespace trelm
