#include "MediaCursor.h"

#include <utility>

namespace trelm {

namespace {

constexpr PhotoLibraryCursor::FieldMapping kFields[] = {
    {"pid", "core_service_id"},
    {"aid", "facebook_media_album_service_id"},
    {"owner", "facebook_media_owner_service_id"},
    {"src_small", "facebook_media_thumb_uri"},
    {"src_big", "media_uri"},
    {"created", "core_object_time"},
};

constexpr char const* kIdParts[] = {"core_service_id"};
constexpr char const* kCreatedParts[] = {"core_object_time", "core_service_id"};

constexpr PhotoLibraryCursor::Ordering kOrderings[] = {
    {"core_object_time", "concat(created,' ',pid)", kCreatedParts},
    {"core_service_id", "pid", kIdParts},
};

constexpr PhotoLibraryCursor::IdCondition kIdConditions[] = {
    {"facebook_media_album_service_id", "aid", false},
    {"facebook_media_owner_service_id", "owner", true},
    {"core_service_id", "pid", false},
};

}  // namespace

// A photo's identity is kept under the key that photo-tag records use to name their photo.
PhotoLibraryCursor::Kind const MediaCursor::kKind{
    FacebookSource::kMedia,
    "photo",
    "pid,aid,owner,src_small,src_big,created",
    kFields,
    "facebook_photo_tag_photo_service_id",
    kIdParts,
    kOrderings,
    false,
    kIdConditions,
    "owner",
    "created",
    "created",
};

MediaCursor::MediaCursor(SmartPtr<FacebookLibrary> library, SmartPtr<FacebookSource::MappingCache> cache,
                         Vector<IQueryItems::Column> const& columns, Vector<IQueryItems::Constraint> const& constraints,
                         String const& sourceId, bool flag, std::int64_t since)
    : PhotoLibraryCursor(kKind, std::move(library), std::move(cache), columns, constraints, sourceId, flag, since) {}

MediaCursor::~MediaCursor() = default;

}  // namespace trelm
