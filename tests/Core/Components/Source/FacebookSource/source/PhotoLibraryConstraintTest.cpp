// What the album, media and photo-tag cursors make of a query's constraints when they start,
// before anything is asked of the service (the source here has no network to ask).
#include <gtest/gtest.h>

#include <string>

#include "ErrorAssertions.h"
#include "FacebookSource.h"
#include "IQueryItems.h"
#include "trelm/Configuration.h"

namespace trelm {
namespace {

using Constraint = IQueryItems::Constraint;

TEST(PhotoLibraryConstraintTest, ConstraintsAreReadOrRefusedWithExactCodes) {
    FacebookSource source("facebook");
    Configuration::Group group("facebook");
    for (char const* key : {"facebook_source_appkey", "facebook_source_appsecret", "facebook_source_session_id",
                            "facebook_source_session_secret"}) {
        ASSERT_OK(group.set(key, Variant("x")));
    }
    ASSERT_OK(group.set("facebook_source_session_user", Variant("100000001")));
    ASSERT_OK(source.sendConfig(group));
    ASSERT_OK(source.startup());

    auto key = [](char const* name) { return Metadata::Key(name, TRELM_TYPES::STRING); };
    struct Case {
        int type;
        Constraint constraint;
        unsigned code;  // of the start; kNoData: started, and answers no rows without asking
    };
    Case const cases[] = {
        {9, {key("facebook_media_album_service_id"), Variant("1_2"), Constraint::Equal}, kSuccess},
        {9, {key("facebook_media_album_service_id"), Variant("1' or '1'='1"), Constraint::Equal}, kInvalid},
        {11, {key("facebook_album_owner_service_id"), Variant(Vector<int>{5, 6}), Constraint::InList}, kSuccess},
        {11, {key("facebook_album_owner_service_id"), Variant("5 or 1=1"), Constraint::Equal}, kInvalid},
        {11, {key("facebook_album_owner_service_id"), Variant("5"), Constraint::GreaterThan}, kNotSupported},
        {13, {key("facebook_photo_tag_text"), Variant("x"), Constraint::Equal}, kNotSupported},
        {13, {key("core_object_time"), Variant(1262304000), Constraint::GreaterOrEqual}, kSuccess},
        {13, {key("core_object_time"), Variant("soon"), Constraint::LessThan}, kInvalid},
        {9, {key("core_service_id"), Variant(Vector<String>{}), Constraint::InList}, kNoData},
        {11, {key("core_object_origin_servicename"), Variant("Other"), Constraint::Equal}, kNoData},
        {13, {key("core_object_origin_importcomponent"), Variant("elsewhere"), Constraint::Equal}, kNoData},
    };
    for (Case const& c : cases) {
        SCOPED_TRACE(std::to_string(c.type) + " " + c.constraint.key.name().str());
        IQueryItems::StartQueryMessage msg(
            Vector<IQueryItems::Column>(),
            Vector<Constraint>{{Metadata::Key("core_object_type", TRELM_TYPES::INT32), c.type}, c.constraint});
        uError const started = source.onMessage(msg);
        if (c.code != kNoData) {
            EXPECT_CODE(started, c.code);
            continue;
        }
        ASSERT_OK(started);
        SmartPtr<Map<String, Variant>> row;
        EXPECT_CODE(msg.cursor->getRow(row), kNoData);
        unsigned count = 1;
        EXPECT_OK(msg.cursor->numRows(count));
        EXPECT_EQ(count, 0u);
    }
}

}  // namespace
}  // namespace trelm
