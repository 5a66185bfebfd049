// The photo tables (album, photo, photo_tag) and the service's rule that a statement must pin an
// indexable column: each table's starred columns admit a statement, any other condition on its
// own is refused with the service's error, whatever else the statement holds.
#include <gtest/gtest.h>

#include <string>

#include "FqlEngine.h"
#include "Store.h"

namespace emu::test {
namespace {

constexpr std::int64_t kViewer = DemoAccount::uid;

struct Statement {
    const char* name;
    std::string query;
    bool indexable;
};

void PrintTo(const Statement& s, std::ostream* os) { *os << s.name; }

// The forms the client's cursors send (pages with a keyset on a time-and-id expression, counts
// with the field list '') and what a hand-written statement might try.
const Statement kStatements[] = {
    {"AlbumsOfAnOwner", "select aid,owner,cover_pid,name,created,modified,description,location,link,size,type "
                        "from album where owner = 100000001 and (concat(created,' ',aid) < '1262304000 x') "
                        "ORDER BY concat(created,' ',aid) DESC limit 150", true},
    {"AlbumsByName", "select aid from album where name = 'Album 1'", false},
    {"AlbumsByTimeOnly", "select aid from album where modified >= 1262304000", false},
    {"AlbumOwnerRange", "select aid from album where owner > 5", false},
    {"PhotosOfAnAlbum", "select pid,aid,owner,src_small,src_big,created from photo where aid in ('1_1') "
                        "and created >= 1262304000 ORDER BY pid ASC", true},
    {"PhotosOfAnOwnerCounted", "select '' from photo where owner = 100000001 and (concat(created,' ',pid) >= "
                               "'1262304000 1_1')", true},
    {"PhotosByTimeOnly", "select pid from photo where created > 0 ORDER BY created DESC", false},
    {"TagsOfAUser", "select pid,subject,text,xcoord,ycoord,created from photo_tag where subject = 100000001 and "
                    "(concat(created,' ',pid,' ',subject) > '1262304000 1_1 5') ORDER BY "
                    "concat(created,' ',pid,' ',subject) ASC limit 300", true},
    {"TagsByText", "select pid from photo_tag where text = 'x'", false},
};

class PhotoTablesFqlTest : public testing::TestWithParam<Statement> {};

TEST_P(PhotoTablesFqlTest, IsAdmittedOnlyWhenAnIndexableColumnIsPinned) {
    const Statement& s = GetParam();
    FqlPlan plan;
    Status status = FqlEngine::compile(kViewer, 1300000000, s.query, plan);
    ASSERT_EQ(status.has_value(), !s.indexable) << s.query;
    if (status) {
        EXPECT_EQ(status->code, 604);
        EXPECT_EQ(status->message, "Your statement is not indexable - the WHERE clause must contain one of the "
                                   "columns marked with a star");
    }
}

INSTANTIATE_TEST_SUITE_P(Fql, PhotoTablesFqlTest, testing::ValuesIn(kStatements),
                         [](const auto& info) { return std::string(info.param.name); });

}  // namespace
}  // namespace emu::test
