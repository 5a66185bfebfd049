#pragma once

#include <cstdint>

#include "PhotoLibraryCursor.h"

namespace trelm {

// Answers a query for photo tags ("core_object_type" 13) from the FQL table "photo_tag": by
// default the tags that name the signed-in user, newest first. A tag is identified by its photo
// and the tagged user together.
//
// Records: "facebook_photo_tag_photo_service_id", "facebook_photo_tag_tagged_service_id",
// "facebook_photo_tag_text", "facebook_photo_tag_x", "facebook_photo_tag_y" (percent of the
// picture's width and height, as text), "core_object_time" (made).
//
// Conditions: "facebook_photo_tag_photo_service_id" (the tags of these photos),
// "facebook_photo_tag_tagged_service_id" (the tags naming these users), "core_object_time", and
// the fixed keys of PhotoLibraryCursor.
// Orderings: "core_object_time" (default, descending), "facebook_photo_tag_photo_service_id"
// (by photo, then tagged user).
// Since mode: the tags made at or after the given time.
//
// Ownership and thread safety: as FqlCursorBase.
class PhotoTagCursor : public PhotoLibraryCursor {
public:
    static Kind const kKind;

    PhotoTagCursor(SmartPtr<FacebookLibrary> library, SmartPtr<FacebookSource::MappingCache> cache,
                   Vector<IQueryItems::Column> const& columns, Vector<IQueryItems::Constraint> const& constraints,
                   String const& sourceId, bool flag, std::int64_t since);
    ~PhotoTagCursor() override;
};

}  // namespace trelm
