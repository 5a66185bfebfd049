#include "QueryUtils.h"

#include <gtest/gtest.h>

#include "ErrorAssertions.h"

namespace trelm {
namespace {

using Record = Map<String, Variant>;
using IQueryItems::Column;

Column col(char const* name, bool ascending) {
    return Column{Metadata::Key(name, TRELM_TYPES::INT64), ascending};
}

Record rec(std::initializer_list<std::pair<char const*, Variant>> fields) {
    Record r;
    for (auto const& f : fields) EXPECT_OK(r.insert(f.first, f.second));
    return r;
}

// Each case's records are compared both ways: whether a comes before b, and b before a.
TEST(QueryUtilsTest, IsLessFollowsTheOrdering) {
    Vector<Column> const t{col("t", true)}, tDesc{col("t", false)};
    Vector<Column> const tDescId{col("t", false), col("id", true)}, tId{col("t", true), col("id", true)};
    struct Case {
        char const* name;
        Record a, b;
        Vector<Column> ordering;
        bool aBeforeB, bBeforeA;
    } const cases[] = {
        {"ascending single column", rec({{"t", 1LL}}), rec({{"t", 2LL}}), t, true, false},
        {"descending single column", rec({{"t", 1LL}}), rec({{"t", 2LL}}), tDesc, false, true},
        {"tie on first decided by second", rec({{"t", 5LL}, {"id", "b"}}), rec({{"t", 5LL}, {"id", "a"}}), tDescId,
         false, true},
        {"first column wins over second", rec({{"t", 9LL}, {"id", "a"}}), rec({{"t", 5LL}, {"id", "z"}}), tDescId,
         true, false},
        {"absent before present ascending", rec({}), rec({{"t", 0LL}}), t, true, false},
        {"absent after present descending", rec({}), rec({{"t", 0LL}}), tDesc, false, true},
        {"both absent fall through", rec({{"id", "a"}}), rec({{"id", "b"}}), tId, true, false},
        {"equal records are not less", rec({{"t", 1LL}}), rec({{"t", 1LL}}), t, false, false},
        {"empty ordering is not less", rec({{"t", 1LL}}), rec({{"t", 2LL}}), {}, false, false},
    };
    for (Case const& c : cases) {
        EXPECT_EQ(QueryUtils::isLess(c.a, c.b, c.ordering), c.aBeforeB) << c.name;
        EXPECT_EQ(QueryUtils::isLess(c.b, c.a, c.ordering), c.bBeforeA) << c.name;
    }
}

}  // namespace
}  // namespace trelm
