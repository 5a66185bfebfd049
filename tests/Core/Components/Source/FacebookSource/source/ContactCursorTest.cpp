#include <gtest/gtest.h>

#include "ErrorAssertions.h"

#include <algorithm>
#include <memory>
#include <set>
#include <string>
#include <vector>

#include "EmulatorHost.h"
#include "IQueryItems.h"
#include "trelm/GUID.h"

namespace trelm::test {
namespace {

using Constraint = IQueryItems::Constraint;
using Cursor = SmartPtr<IQueryItems::ICursor>;

constexpr int kFriends = 3000;
constexpr int kWindow = 150;
constexpr char const* kSourceName = "facebook";

std::string const kDemoUid = std::to_string(emu::DemoAccount::uid);
std::string const kFriendCondition = "uid in (select uid2 from friend where uid1='" + kDemoUid + "')";

std::string firstPage() {
    return "select uid,name,pic_big from user where " + kFriendCondition + " order by concat(uid,' ') asc limit 150";
}
std::string pageAfter(std::string const& uid) {
    return "select uid,name,pic_big from user where " + kFriendCondition + " and (concat(uid,' ') > '" + uid +
           " ') order by concat(uid,' ') asc limit 150";
}
std::string pageBefore(std::string const& uid) {
    return "select uid,name,pic_big from user where " + kFriendCondition + " and (concat(uid,' ') < '" + uid +
           " ') order by concat(uid,' ') desc limit 150";
}

// A demo user with thousands of friends; the source is signed in with a session of the demo user.
class ContactCursorTest : public EmulatorSuite {
protected:
    static void SetUpTestSuite() {
        startSuite({.users = kFriends + 200, .demoFriends = kFriends, .friendsPerUser = 2, .albumsPerUser = 1,
                    .photosPerAlbum = 1, .postsPerUser = 1, .threadsPerUser = 1, .messagesPerThread = 1});
        expected = referenceOrder();
        ASSERT_EQ(expected.size(), size_t(kFriends));
    }

    // The friends' ids as read in one statement by a client of its own, in the cursor's order:
    // the text of the id with a blank appended, byte-wise.
    static std::vector<std::string> referenceOrder() {
        std::vector<std::string> uids =
            host->fqlColumn("select uid2 from friend where uid1='" + kDemoUid + "'", "friend", "uid2");
        std::sort(uids.begin(), uids.end(), [](std::string const& a, std::string const& b) { return a + " " < b + " "; });
        host->emulator().log().clear();
        return uids;
    }

    static Cursor open(std::vector<Constraint> extra = {}) { return EmulatorHost::open(*source, 2, {}, extra); }

    static std::string uidAt(Cursor const& cursor) {
        SmartPtr<Map<String, Variant>> row;
        EXPECT_OK(cursor->getRow(row));
        return row ? row->search("core_contact_service_id")->asString().str() : "";
    }

    static GUID guidAt(Cursor const& cursor) {
        SmartPtr<Map<String, Variant>> row;
        EXPECT_CODE(cursor->getRow(row), kSuccess);
        return row ? row->search("core_object_id")->asGUID() : GUID();
    }

    static inline std::vector<std::string> expected;
};


// Forward from the first friend and backward from the last, one row at a time: every friend once,
// each with a GUID of its own, with the first page, one page past the edge row of each window, and
// one more that finds the end.
TEST_F(ContactCursorTest, SingleStepsEitherWayVisitEveryFriendOnceWithOneStatementPerPage) {
    for (int step : {1, -1}) {
        SCOPED_TRACE(step > 0 ? "forward" : "backward");
        host->emulator().log().clear();
        Cursor cursor = open();
        ASSERT_TRUE(cursor);
        if (step < 0) {
            ASSERT_CODE(cursor->jumpEnd(), kSuccess);
        }
        std::vector<std::string> seen;
        std::set<GUID> guids;
        for (int moved = step; moved != 0;) {
            SmartPtr<Map<String, Variant>> row;
            ASSERT_CODE(cursor->getRow(row), kSuccess);
            seen.push_back(row->search("core_contact_service_id")->asString().str());
            guids.insert(row->search("core_object_id")->asGUID());
            ASSERT_CODE(cursor->seek(step, moved), seen.size() == size_t(kFriends) ? unsigned(kNoData) : kSuccess);
        }
        if (step < 0) std::reverse(seen.begin(), seen.end());
        EXPECT_EQ(seen, expected);
        EXPECT_EQ(guids.size(), size_t(kFriends));

        std::vector<std::string> statements = host->fqlStatements();
        ASSERT_EQ(statements.size(), size_t(kFriends / kWindow + 1));
        EXPECT_EQ(statements[0], step > 0 ? firstPage()
                                          : "select uid,name,pic_big from user where " + kFriendCondition +
                                                " order by concat(uid,' ') desc limit 150");
        for (size_t k = 1; k < statements.size(); ++k) {
            EXPECT_EQ(statements[k], step > 0 ? pageAfter(expected[k * kWindow - 1])
                                              : pageBefore(expected[kFriends - k * kWindow]))
                << "page " << k;
        }
    }
}

TEST_F(ContactCursorTest, JumpsAndLongSeeksLandOnTheRightFriendAndKnowTheirIndex) {
    Cursor cursor = open();
    GUID const firstGuid = guidAt(cursor);
    struct Move {
        enum Op { Jump, Seek, Beginning, End } op;
        int arg;
        unsigned code;
        int index;  // where the cursor must stand afterwards
        int moved;  // for Seek
    };
    Move const moves[] = {
        {Move::Jump, 1234, kSuccess, 1234, 0},
        {Move::Seek, -700, kSuccess, 534, -700},    // back across a window edge, 700 rows
        {Move::Seek, 100, kSuccess, 634, 100},      // forward across the edge of that window
        {Move::Seek, 2000, kSuccess, 2634, 2000},
        {Move::Seek, 5000, kNoData, 2999, 365},     // past the end: stops on the last friend
        {Move::Seek, 0, kSuccess, 2999, 0},
        {Move::Seek, -5000, kNoData, 0, -2999},     // before the beginning: stops on the first
        {Move::Jump, kFriends, kNoData, 2999, 0},
        {Move::Jump, 149, kSuccess, 149, 0},
        {Move::Jump, 150, kSuccess, 150, 0},
        {Move::Seek, -100, kSuccess, 50, -100},     // a short backward window: rows 0..50
        {Move::Seek, 1, kSuccess, 51, 1},           // off its last row: the next page, not the end
        {Move::End, 0, kSuccess, 2999, 0},
        {Move::Seek, -150, kSuccess, 2849, -150},
        {Move::Beginning, 0, kSuccess, 0, 0},
        {Move::Jump, 0, kSuccess, 0, 0},
    };
    for (Move const& m : moves) {
        SCOPED_TRACE("move " + std::to_string(m.op) + " " + std::to_string(m.arg));
        int moved = 0;
        uError err;
        switch (m.op) {
            case Move::Jump: err = cursor->jump(static_cast<unsigned>(m.arg)); break;
            case Move::Seek: err = cursor->seek(m.arg, moved); break;
            case Move::Beginning: err = cursor->jumpBeginning(); break;
            case Move::End: err = cursor->jumpEnd(); break;
        }
        ASSERT_CODE(err, m.code);
        if (m.op == Move::Seek) {
            EXPECT_EQ(moved, m.moved);
        }
        EXPECT_EQ(uidAt(cursor), expected[m.index]);
        unsigned index = 0;
        ASSERT_CODE(cursor->curRow(index), kSuccess);
        EXPECT_EQ(index, unsigned(m.index));
    }
    // The cursor keeps the GUIDs it gave out across refills.
    EXPECT_EQ(guidAt(cursor), firstGuid);
}

TEST_F(ContactCursorTest, CountingAndPositionStatementsAskForTinyRowsWithoutOrdering) {
    Cursor cursor = open();
    unsigned count = 0;
    ASSERT_CODE(cursor->numRows(count), kSuccess);
    EXPECT_EQ(count, unsigned(kFriends));
    ASSERT_CODE(cursor->numRows(count), kSuccess);  // from memory
    EXPECT_EQ(count, unsigned(kFriends));

    ASSERT_CODE(cursor->jump(200), kSuccess);
    unsigned index = 0;
    ASSERT_CODE(cursor->curRow(index), kSuccess);
    EXPECT_EQ(index, 200u);

    std::string const& at200 = expected[200];
    std::vector<std::string> const statements = host->fqlStatements();
    std::vector<std::string> const wanted = {
        "select '' from user where " + kFriendCondition,
        firstPage(),
        "select uid,name,pic_big from user where " + kFriendCondition + " and (concat(uid,' ') > '" +
            expected[149] + " ') order by concat(uid,' ') asc limit 200",
        "select '' from user where " + kFriendCondition + " and (concat(uid,' ') <= '" + at200 + " ')",
    };
    EXPECT_EQ(statements, wanted);
}

TEST_F(ContactCursorTest, ShortFirstPageGivesTheCountAndRepeatedJumpsAskNothing) {
    std::vector<std::string> const& e = expected;
    Cursor cursor = open({Constraint{Metadata::Key("core_contact_service_id", TRELM_TYPES::STRING),
                                     Variant(Vector<String>{String(e[20]), String(e[5]), String(e[10])}),
                                     Constraint::InList}});
    ASSERT_CODE(cursor->jumpBeginning(), kSuccess);
    ASSERT_CODE(cursor->jumpBeginning(), kSuccess);
    unsigned count = 0;
    ASSERT_CODE(cursor->numRows(count), kSuccess);
    EXPECT_EQ(count, 3u);
    EXPECT_EQ(uidAt(cursor), e[5]);
    int moved = 0;
    EXPECT_CODE(cursor->seek(10, moved), kSuccess);  // the window holds the whole result
    EXPECT_EQ(moved, 2);
    EXPECT_EQ(uidAt(cursor), e[20]);

    std::vector<std::string> const wanted = {"select uid,name,pic_big from user where uid in (" + e[20] + "," + e[5] +
                                             "," + e[10] + ") order by concat(uid,' ') asc limit 150"};
    EXPECT_EQ(host->fqlStatements(), wanted);
}

TEST_F(ContactCursorTest, QueryThatCannotMatchAnswersNothingWithoutAsking) {
    Cursor cursor = open({Constraint{Metadata::Key("core_contact_service", TRELM_TYPES::STRING), Variant("Other"),
                                     Constraint::Equal}});
    SmartPtr<Map<String, Variant>> row = makeSmart<Map<String, Variant>>();
    EXPECT_CODE(cursor->getRow(row), kNoData);
    EXPECT_FALSE(row);
    unsigned count = 7;
    ASSERT_CODE(cursor->numRows(count), kSuccess);
    EXPECT_EQ(count, 0u);
    EXPECT_CODE(cursor->jumpEnd(), kNoData);
    int moved = 5;
    EXPECT_CODE(cursor->seek(3, moved), kSuccess);
    EXPECT_EQ(moved, 0);
    Vector<SmartPtr<Map<String, Variant>>> rows;
    EXPECT_CODE(cursor->getRows(10, rows), kNotSupported);
    EXPECT_TRUE(host->fqlStatements().empty());
}

TEST_F(ContactCursorTest, RecordsCarryContactFieldsAndTheSourcesIdentityAsACopy) {
    Cursor cursor = open();
    SmartPtr<Map<String, Variant>> row;
    ASSERT_CODE(cursor->getRow(row), kSuccess);
    std::vector<std::pair<char const*, Variant>> const wanted = {
        {"core_object_type", Variant(2)},
        {"core_contact_service", Variant("Facebook")},
        {"core_contact_service_id", Variant(String(expected[0]))},
        {"core_object_source", Variant(kSourceName)},
        {"core_object_origin_importcomponent", Variant(kSourceName)},
        {"core_object_origin_servicename", Variant("Facebook")},
        {"core_object_deleted", Variant(false)},
    };
    for (auto const& [key, value] : wanted) {
        ASSERT_NE(row->search(key), nullptr) << key;
        EXPECT_EQ(*row->search(key), value) << key;
    }
    EXPECT_FALSE(row->search("core_contact_name")->asString().empty());
    EXPECT_EQ(*row->search("core_contact_name"), *row->search("core_contact_display_name"));
    EXPECT_EQ(row->search("core_contact_profile_url"), nullptr) << "not in the field list";

    ASSERT_OK(row->insert("core_contact_name", Variant("changed")));
    SmartPtr<Map<String, Variant>> again;
    ASSERT_CODE(cursor->getRow(again), kSuccess);
    EXPECT_NE(again->search("core_contact_name")->asString(), "changed");
}

}  // namespace
}  // namespace trelm::test
