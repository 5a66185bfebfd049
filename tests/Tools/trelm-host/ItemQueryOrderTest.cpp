#include <gtest/gtest.h>

#include "ErrorAssertions.h"
#include "ItemQuery.h"

namespace trelm::host {
namespace {

using Column = IQueryItems::Column;

// An ordering and a since time given by the person asking replace the kind's own ordering and
// make a background query carrying the position; a malformed ordering changes nothing.
TEST(ItemQueryOrderTest, OrderingAndSinceShapeTheMessage) {
    ItemQuery query(*ItemQuery::findKind("media"));
    EXPECT_CODE(query.orderBy("core_object_time:newest"), kInvalid);
    EXPECT_CODE(query.orderBy(":desc"), kInvalid);
    IQueryItems::StartQueryMessage msg;
    ASSERT_OK(query.fill(msg));
    EXPECT_TRUE(msg.columns.empty());
    EXPECT_TRUE(query.interactive());

    struct Case {
        char const* text;
        Column column;
    };
    Case const cases[] = {
        {"core_object_time:desc", {Metadata::Key("core_object_time", TRELM_TYPES::INT32), false}},
        {"core_service_id", {Metadata::Key("core_service_id", TRELM_TYPES::STRING), true}},
        {"core_service_id:asc", {Metadata::Key("core_service_id", TRELM_TYPES::STRING), true}},
    };
    for (Case const& c : cases) {
        ASSERT_OK(query.orderBy(c.text));
        ASSERT_OK(query.fill(msg));
        EXPECT_EQ(msg.columns, Vector<Column>{c.column}) << c.text;
    }
    query.since = 1262304000;
    ASSERT_OK(query.fill(msg));
    EXPECT_EQ(msg.position, 1262304000);
    EXPECT_FALSE(query.interactive());
}

}  // namespace
}  // namespace trelm::host
