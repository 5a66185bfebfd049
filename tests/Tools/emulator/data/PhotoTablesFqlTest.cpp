// The photo tables (album, photo, photo_tag) hold the service's rule that a statement must pin
// an indexable column: a condition on any other column alone, or a range on an indexable one, is
// refused with the service's error. (The forms the client's cursors send are run against the
// emulator by the cursors' own tests.)
#include <gtest/gtest.h>

#include "FqlEngine.h"
#include "Store.h"

namespace emu::test {
namespace {

TEST(PhotoTablesFqlTest, StatementsThatPinNoIndexableColumnAreRefused) {
    const char* const statements[] = {
        "select aid from album where name = 'Album 1' and modified >= 1262304000",
        "select aid from album where owner > 5",
        "select pid from photo where created > 0 ORDER BY created DESC limit 150",
        "select pid from photo where owner = 1 or caption = 'x'",
        "select pid from photo_tag where text = 'x' and xcoord > 50",
    };
    for (const char* query : statements) {
        FqlPlan plan;
        Status status = FqlEngine::compile(DemoAccount::uid, 1300000000, query, plan);
        ASSERT_TRUE(status.has_value()) << query;
        EXPECT_EQ(status->code, 604) << query;
        EXPECT_EQ(status->message, "Your statement is not indexable - the WHERE clause must contain one of the "
                                   "columns marked with a star");
    }
}

}  // namespace
}  // namespace emu::test
