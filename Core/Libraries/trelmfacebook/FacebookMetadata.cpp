#include "FacebookMetadata.h"

namespace trelm {
namespace Metadata {
namespace Facebook {

// The handles are defined before the routine that fills them: within one unit, static
// initialisation runs in definition order, so they are constructed before they are assigned.
namespace Media {
Key reg_OwnerSid;
Key reg_AlbumSid;
Key reg_ThumbUri;
}  // namespace Media

namespace PhotoTag {
Key reg_PhotoSid;
Key reg_ContactSid;
Key reg_X;
Key reg_Y;
Key reg_Text;
}  // namespace PhotoTag

namespace Album {
Key reg_OwnerSid;
Key reg_Modified;
Key reg_Location;
Key reg_Link;
Key reg_Notes;
Key reg_PhotoCount;
Key reg_CoverSid;
Key reg_Type;
}  // namespace Album

void Register() {}

namespace {

// The coordinates and the modification time are deliberately text keys, like the identifiers:
// the records carry them as the service sends them. Only the photo count is a number.
// Nothing checks the results: a name that another library registered first keeps its first
// type, and this plug-in's records are written the same way either way.
bool registerKeys() {
    using TRELM_TYPES::INT32;
    using TRELM_TYPES::STRING;
    Media::reg_OwnerSid = trelm_RegisterMetadataType("facebook_media_owner_service_id", STRING);
    Media::reg_AlbumSid = trelm_RegisterMetadataType("facebook_media_album_service_id", STRING);
    Media::reg_ThumbUri = trelm_RegisterMetadataType("facebook_media_thumb_uri", STRING);
    PhotoTag::reg_PhotoSid = trelm_RegisterMetadataType("facebook_photo_tag_photo_service_id", STRING);
    PhotoTag::reg_ContactSid = trelm_RegisterMetadataType("facebook_photo_tag_tagged_service_id", STRING);
    PhotoTag::reg_X = trelm_RegisterMetadataType("facebook_photo_tag_x", STRING);
    PhotoTag::reg_Y = trelm_RegisterMetadataType("facebook_photo_tag_y", STRING);
    PhotoTag::reg_Text = trelm_RegisterMetadataType("facebook_photo_tag_text", STRING);
    Album::reg_OwnerSid = trelm_RegisterMetadataType("facebook_album_owner_service_id", STRING);
    Album::reg_Modified = trelm_RegisterMetadataType("facebook_album_modified", STRING);
    Album::reg_Location = trelm_RegisterMetadataType("facebook_album_location", STRING);
    Album::reg_Link = trelm_RegisterMetadataType("facebook_album_link", STRING);
    Album::reg_Notes = trelm_RegisterMetadataType("facebook_album_notes", STRING);
    Album::reg_PhotoCount = trelm_RegisterMetadataType("facebook_album_photocount", INT32);
    Album::reg_CoverSid = trelm_RegisterMetadataType("facebook_album_cover_service_id", STRING);
    Album::reg_Type = trelm_RegisterMetadataType("facebook_album_type", STRING);
    return true;
}

[[maybe_unused]] bool const keysRegistered = registerKeys();

}  // namespace
}  // namespace Facebook
}  // namespace Metadata
}  // namespace trelm
