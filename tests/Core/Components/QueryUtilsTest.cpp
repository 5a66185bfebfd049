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

struct LessCase {
    char const* name;
    Record a;
    Record b;
    Vector<Column> ordering;
    bool aBeforeB;
    bool bBeforeA;
};

void PrintTo(LessCase const& c, std::ostream* os) { *os << c.name; }

class QueryUtilsTest : public testing::TestWithParam<LessCase> {};

TEST_P(QueryUtilsTest, IsLessFollowsTheOrdering) {
    LessCase const& c = GetParam();
    EXPECT_EQ(QueryUtils::isLess(c.a, c.b, c.ordering), c.aBeforeB);
    EXPECT_EQ(QueryUtils::isLess(c.b, c.a, c.ordering), c.bBeforeA);
}

INSTANTIATE_TEST_SUITE_P(
    Table, QueryUtilsTest,
    testing::Values(
        LessCase{"AscendingSingleColumn", rec({{"t", 1LL}}), rec({{"t", 2LL}}), {col("t", true)},
                 true, false},
        LessCase{"DescendingSingleColumn", rec({{"t", 1LL}}), rec({{"t", 2LL}}),
                 {col("t", false)}, false, true},
        LessCase{"TieOnFirstDecidedBySecond", rec({{"t", 5LL}, {"id", "b"}}),
                 rec({{"t", 5LL}, {"id", "a"}}), {col("t", false), col("id", true)}, false, true},
        LessCase{"FirstColumnWinsOverSecond", rec({{"t", 9LL}, {"id", "a"}}),
                 rec({{"t", 5LL}, {"id", "z"}}), {col("t", false), col("id", true)}, true, false},
        LessCase{"AbsentBeforePresentAscending", rec({}), rec({{"t", 0LL}}), {col("t", true)},
                 true, false},
        LessCase{"AbsentAfterPresentDescending", rec({}), rec({{"t", 0LL}}), {col("t", false)},
                 false, true},
        LessCase{"BothAbsentFallThrough", rec({{"id", "a"}}), rec({{"id", "b"}}),
                 {col("t", true), col("id", true)}, true, false},
        LessCase{"EqualRecordsAreNotLess", rec({{"t", 1LL}}), rec({{"t", 1LL}}),
                 {col("t", true)}, false, false},
        LessCase{"EmptyOrderingIsNotLess", rec({{"t", 1LL}}), rec({{"t", 2LL}}), {}, false,
                 false}),
    [](testing::TestParamInfo<LessCase> const& info) { return info.param.name; });

}  // namespace
}  // namespace trelm
