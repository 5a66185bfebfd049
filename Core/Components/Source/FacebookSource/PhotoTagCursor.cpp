#include "PhotoTagCursor.h"

#include <utility>

namespace trelm {

namespace {

constexpr PhotoLibraryCursor::FieldMapping kFields[] = {
    {"pid", "facebook_photo_tag_photo_service_id"},
    {"subject", "facebook_photo_tag_tagged_service_id"},
    {"text", "facebook_photo_tag_text"},
    {"xcoord", "facebook_photo_tag_x"},
    {"ycoord", "facebook_photo_tag_y"},
    {"created", "core_object_time"},
};

constexpr char const* kIdParts[] = {"facebook_photo_tag_photo_service_id", "facebook_photo_tag_tagged_service_id"};
constexpr char const* kCreatedParts[] = {"core_object_time", "facebook_photo_tag_photo_service_id",
                                         "facebook_photo_tag_tagged_service_id"};

constexpr PhotoLibraryCursor::Ordering kOrderings[] = {
    {"core_object_time", "concat(created,' ',pid,' ',subject)", kCreatedParts},
    {"facebook_photo_tag_photo_service_id", "concat(pid,' ',subject)", kIdParts},
};

constexpr PhotoLibraryCursor::IdCondition kIdConditions[] = {
    {"facebook_photo_tag_photo_service_id", "pid", false},
    {"facebook_photo_tag_tagged_service_id", "subject", true},
};

}  // namespace

// A tag has no id of its own: its identity is "<photo id> <tagged user id>".
PhotoLibraryCursor::Kind const PhotoTagCursor::kKind{
    FacebookSource::kPhotoTag,
    "photo_tag",
    "pid,subject,text,xcoord,ycoord,created",
    kFields,
    "facebook_photo_tag_tagged_service_id",
    kIdParts,
    kOrderings,
    false,
    kIdConditions,
    "subject",
    "created",
    "created",
};

PhotoTagCursor::PhotoTagCursor(SmartPtr<FacebookLibrary> library, SmartPtr<FacebookSource::MappingCache> cache,
                               Vector<IQueryItems::Column> const& columns,
                               Vector<IQueryItems::Constraint> const& constraints, String const& sourceId, bool flag,
                               std::int64_t since)
    : PhotoLibraryCursor(kKind, std::move(library), std::move(cache), columns, constraints, sourceId, flag, since) {}

PhotoTagCursor::~PhotoTagCursor() = default;

}  // namespace trelm
