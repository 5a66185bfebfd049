#include "trelm/Metadata.h"

#include <gtest/gtest.h>

#include "ErrorAssertions.h"

namespace trelm {
namespace {

using TRELM_TYPES::TYPES;

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
