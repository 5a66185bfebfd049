#pragma once

#include <cstdint>

#include "PhotoLibraryCursor.h"

namespace trelm {

// Answers a query for media ("core_object_type" 9): photos from the FQL table "photo", by
// default the signed-in user's own photos, newest first.
//
// Records: "core_service_id" (the photo id), "facebook_media_album_service_id",
// "facebook_media_owner_service_id", "facebook_media_thumb_uri" (the small picture),
// "media_uri" (the large picture), "core_object_time" (made).
//
// Conditions: "facebook_media_album_service_id" (the photos of these albums),
// "facebook_media_owner_service_id" (of these users), "core_service_id" (these photos),
// "core_object_time", and the fixed keys of PhotoLibraryCursor.
// Orderings: "core_object_time" (default, descending), "core_service_id".
// Since mode: the photos made at or after the given time.
//
// Ownership and thread safety: as FqlCursorBase.
class MediaCursor : public PhotoLibraryCursor {
public:
    static Kind const kKind;

    MediaCursor(SmartPtr<FacebookLibrary> library, SmartPtr<FacebookSource::MappingCache> cache,
                Vector<IQueryItems::Column> const& columns, Vector<IQueryItems::Constraint> const& constraints,
                String const& sourceId, bool flag, std::int64_t since);
    ~MediaCursor() override;
};

}  // namespace trelm
