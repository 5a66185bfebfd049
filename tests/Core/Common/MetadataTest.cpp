#include "trelm/Metadata.h"

#include <gtest/gtest.h>

#include "ErrorAssertions.h"

namespace trelm {
namespace {

using TRELM_TYPES::TYPES;

TEST(MetadataTest, HostCoreKeysAreKnownWithTheirTypes) {
    struct Case {
        char const* name;
        TYPES type;
    } const cases[] = {{"core_object_id", TRELM_TYPES::GUID_TYPE},
                       {"core_object_type", TRELM_TYPES::INT32},
                       {"core_object_time", TRELM_TYPES::INT32},
                       {"core_object_deleted", TRELM_TYPES::BOOL},
                       {"core_object_source", TRELM_TYPES::STRING},
                       {"core_contact_profile_picture_url", TRELM_TYPES::STRING},
                       {"core_service_id", TRELM_TYPES::STRING},
                       {"media_uri", TRELM_TYPES::STRING},
                       {"media_notes", TRELM_TYPES::STRING}};
    for (auto const& c : cases) {
        TYPES type = TRELM_TYPES::NONE;
        ASSERT_OK(Metadata::getType(c.name, type)) << c.name;
        EXPECT_EQ(type, c.type) << c.name;
    }
}

// A second registration of a name keeps the first type; a name never registered is not found and
// leaves the caller's type alone.
TEST(MetadataTest, SecondRegistrationKeepsTheFirstTypeAndUnknownNamesAreNotFound) {
    Metadata::Key first = trelm_RegisterMetadataType("metadata_test_twice", TRELM_TYPES::STRING);
    EXPECT_EQ(first, Metadata::Key("metadata_test_twice", TRELM_TYPES::STRING));
    Metadata::Key second = trelm_RegisterMetadataType("metadata_test_twice", TRELM_TYPES::INT32);
    EXPECT_EQ(second.type(), TRELM_TYPES::STRING);
    TYPES type = TRELM_TYPES::NONE;
    ASSERT_OK(Metadata::getType("metadata_test_twice", type));
    EXPECT_EQ(type, TRELM_TYPES::STRING);
    EXPECT_CODE(Metadata::getType("metadata_test_never_registered", type), kNotFound);
    EXPECT_EQ(type, TRELM_TYPES::STRING);
}

}  // namespace
}  // namespace trelm
