#pragma once

#include <cstdint>

#include "PhotoLibraryCursor.h"

namespace trelm {

// Answers a query for albums ("core_object_type" 11) from the FQL table "album": by default the
// signed-in user's albums, newest first.
//
// Records: "core_service_id" (the album id), "facebook_album_owner_service_id",
// "facebook_album_cover_service_id", "core_event_subject" (the name), "core_object_time" (made),
// "facebook_album_modified", "facebook_album_notes" (the description), "facebook_album_location",
// "facebook_album_link", "facebook_album_photocount" (32-bit integer), "facebook_album_type".
//
// Conditions: "facebook_album_owner_service_id" (the albums of these users),
// "core_service_id" (these albums), "core_object_time" (when made), and the fixed keys of
// PhotoLibraryCursor.
// Orderings: "core_object_time" (default, descending), "facebook_album_modified",
// "core_service_id".
// Since mode: the albums modified at or after the given time.
//
// Ownership and thread safety: as FqlCursorBase.
class AlbumCursor : public PhotoLibraryCursor {
public:
    static Kind const kKind;

    AlbumCursor(SmartPtr<FacebookLibrary> library, SmartPtr<FacebookSource::MappingCache> cache,
                Vector<IQueryItems::Column> const& columns, Vector<IQueryItems::Constraint> const& constraints,
                String const& sourceId, bool flag, std::int64_t since);
    ~AlbumCursor() override;
};

}  // namespace trelm
