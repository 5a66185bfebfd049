#pragma once

#include "trelm/Metadata.h"

// The item keys that the plug-in adds to the host's metadata registry, besides the host's own
// "core_*" keys. They are registered once, in a fixed order, when the module is loaded; each
// handle below holds the key as the registry returned it.
//
// Lifetime: the handles are written by the module's static initialisation and never change
// afterwards. Code that fills records names the keys through Metadata::Key and the registry; the
// handles exist so that the registration keeps what it was given.
// Thread safety: read-only after load.
namespace trelm {
namespace Metadata {
namespace Facebook {

// Makes a caller depend on the unit that registers the keys, so that the registration is part of
// every link that uses the plug-in's entry points. Does nothing; any number of calls is harmless.
void Register();

namespace Media {
extern Key reg_OwnerSid;  // "facebook_media_owner_service_id"
extern Key reg_AlbumSid;  // "facebook_media_album_service_id"
extern Key reg_ThumbUri;  // "facebook_media_thumb_uri"
}  // namespace Media

namespace PhotoTag {
extern Key reg_PhotoSid;    // "facebook_photo_tag_photo_service_id"
extern Key reg_ContactSid;  // "facebook_photo_tag_tagged_service_id"
extern Key reg_X;           // "facebook_photo_tag_x"
extern Key reg_Y;           // "facebook_photo_tag_y"
extern Key reg_Text;        // "facebook_photo_tag_text"
}  // namespace PhotoTag

namespace Album {
extern Key reg_OwnerSid;    // "facebook_album_owner_service_id"
extern Key reg_Modified;    // "facebook_album_modified"
extern Key reg_Location;    // "facebook_album_location"
extern Key reg_Link;        // "facebook_album_link"
extern Key reg_Notes;       // "facebook_album_notes"
extern Key reg_PhotoCount;  // "facebook_album_photocount"
extern Key reg_CoverSid;    // "facebook_album_cover_service_id"
extern Key reg_Type;        // "facebook_album_type"
}  // namespace Album

}  // namespace Facebook
}  // namespace Metadata
}  // namespace trelm
