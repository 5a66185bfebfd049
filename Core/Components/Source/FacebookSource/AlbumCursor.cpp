#include "AlbumCursor.h"

#include <utility>

namespace trelm {

namespace {

constexpr PhotoLibraryCursor::FieldMapping kFields[] = {
    {"aid", "core_service_id"},
    {"owner", "facebook_album_owner_service_id"},
    {"cover_pid", "facebook_album_cover_service_id"},
    {"name", "core_event_subject"},
    {"created", "core_object_time"},
    {"modified", "facebook_album_modified"},
    {"description", "facebook_album_notes"},
    {"location", "facebook_album_location"},
    {"link", "facebook_album_link"},
    {"size", "facebook_album_photocount"},
    {"type", "facebook_album_type"},
};

constexpr char const* kIdParts[] = {"core_service_id"};
constexpr char const* kCreatedParts[] = {"core_object_time", "core_service_id"};
constexpr char const* kModifiedParts[] = {"facebook_album_modified", "core_service_id"};

constexpr PhotoLibraryCursor::Ordering kOrderings[] = {
    {"core_object_time", "concat(created,' ',aid)", kCreatedParts},
    {"facebook_album_modified", "concat(modified,' ',aid)", kModifiedParts},
    {"core_service_id", "aid", kIdParts},
};

constexpr PhotoLibraryCursor::IdCondition kIdConditions[] = {
    {"facebook_album_owner_service_id", "owner", true},
    {"core_service_id", "aid", false},
};

}  // namespace

// An album's identity is kept under the key that media records use to name their album.
PhotoLibraryCursor::Kind const AlbumCursor::kKind{
    FacebookSource::kAlbum,
    "album",
    "aid,owner,cover_pid,name,created,modified,description,location,link,size,type",
    kFields,
    "facebook_media_album_service_id",
    kIdParts,
    kOrderings,
    false,
    kIdConditions,
    "owner",
    "created",
    "modified",
};

AlbumCursor::AlbumCursor(SmartPtr<FacebookLibrary> library, SmartPtr<FacebookSource::MappingCache> cache,
                         Vector<IQueryItems::Column> const& columns, Vector<IQueryItems::Constraint> const& constraints,
                         String const& sourceId, bool flag, std::int64_t since)
    : PhotoLibraryCursor(kKind, std::move(library), std::move(cache), columns, constraints, sourceId, flag, since) {}

AlbumCursor::~AlbumCursor() = default;

}  // namespace trelm
