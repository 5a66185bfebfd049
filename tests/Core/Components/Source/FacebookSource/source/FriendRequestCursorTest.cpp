#include <gtest/gtest.h>

#include <algorithm>
#include <chrono>
#include <ctime>
#include <set>
#include <string>
#include <thread>
#include <vector>

#include "EmulatorHost.h"
#include "ErrorAssertions.h"
#include "IQueryItems.h"
#include "trelm/GUID.h"

namespace trelm::test {
namespace {

using Column = IQueryItems::Column;
using Constraint = IQueryItems::Constraint;
using Cursor = SmartPtr<IQueryItems::ICursor>;

constexpr char const* kSourceName = "facebook";
constexpr int kRequests = 200;  // more than one page of 150

std::string const kDemoUid = std::to_string(emu::DemoAccount::uid);
std::string const kBase = "select uid_from from friend_request where (uid_to = '" + kDemoUid + "')";
std::string const kOrder = " order by concat(uid_from, ' ')";

Vector<Column> requestOrdering() {
    return Vector<Column>{{Metadata::Key("core_event_service", TRELM_TYPES::STRING), true},
                          {Metadata::Key("core_event_serviceid", TRELM_TYPES::STRING), true}};
}

std::string text(Map<String, Variant> const& record, char const* key) {
    Variant const* v = record.search(key);
    return v ? v->asString().str() : "<missing>";
}

// 200 pending requests to the demo user, from users whose ids have 6 to 10 digits, so that the
// requesters' text order differs from their numeric order.
class FriendRequestCursorTest : public ::testing::Test {
protected:
    static void SetUpTestSuite() {
        emu::GeneratorOptions generator;
        generator.users = 600;
        generator.demoFriends = 50;
        generator.friendsPerUser = 2;
        generator.albumsPerUser = 0;
        generator.postsPerUser = 0;
        generator.threadsPerUser = 0;
        generator.friendRequests = kRequests;
        host = new EmulatorHost(generator);
        std::string error;
        ASSERT_TRUE(host->start(error)) << error;
        source = &host->addSource(host->demoGroup(kSourceName, true));
        requesters = host->fqlColumn(kBase, "friend_info", "uid_from");
        std::sort(requesters.begin(), requesters.end(),
                  [](std::string const& a, std::string const& b) { return a + " " < b + " "; });
    }

    static void TearDownTestSuite() {
        delete host;
        host = nullptr;
        requesters.clear();
    }

    void SetUp() override { host->emulator().log().clear(); }

    static uError open(Cursor& cursor, Vector<Column> columns = requestOrdering(),
                       std::vector<Constraint> const& extra = {}) {
        Vector<Constraint> constraints{
            Constraint{Metadata::Key("core_object_type", TRELM_TYPES::INT32), Variant(12), Constraint::Equal}};
        for (Constraint const& c : extra) EXPECT_OK(constraints.pushBack(c));
        IQueryItems::StartQueryMessage msg(columns, constraints);
        uError err = source->onMessage(msg);
        cursor = msg.cursor;
        return err;
    }

    static EmulatorHost* host;
    static FacebookSource* source;
    static std::vector<std::string> requesters;  // in the cursor's order
};

EmulatorHost* FriendRequestCursorTest::host = nullptr;
FacebookSource* FriendRequestCursorTest::source = nullptr;
std::vector<std::string> FriendRequestCursorTest::requesters;

TEST_F(FriendRequestCursorTest, EveryRequesterOnceAcrossPagesWithKeysetStatements) {
    ASSERT_EQ(requesters.size(), size_t(kRequests));
    std::vector<std::string> numeric = requesters;
    std::sort(numeric.begin(), numeric.end(), [](auto const& a, auto const& b) { return std::stoll(a) < std::stoll(b); });
    ASSERT_NE(numeric, requesters) << "the data should make text and numeric order differ";

    Cursor cursor;
    ASSERT_OK(open(cursor));
    std::vector<std::string> seen;
    std::set<GUID> guids;
    int moved = 1;
    while (moved == 1) {
        SmartPtr<Map<String, Variant>> row;
        ASSERT_OK(cursor->getRow(row));
        std::string const uid = text(*row, "core_event_contactid");
        seen.push_back(uid);
        EXPECT_EQ(text(*row, "core_event_serviceid"), "FriendRequest: " + uid);
        EXPECT_EQ(text(*row, "core_event_service"), "Facebook");
        EXPECT_EQ(row->search("core_object_type")->asInt32(), 12);
        EXPECT_EQ(text(*row, "core_object_source"), kSourceName);
        EXPECT_EQ(text(*row, "core_object_origin_servicename"), "Facebook");
        guids.insert(row->search("core_object_id")->asGUID());
        ASSERT_TRUE(cursor->seek(1, moved).ok());
    }
    EXPECT_EQ(seen, requesters);
    EXPECT_EQ(guids.size(), seen.size());

    unsigned count = 0;
    ASSERT_OK(cursor->numRows(count));
    EXPECT_EQ(count, unsigned(kRequests));
    ASSERT_OK(cursor->jumpEnd());

    EXPECT_EQ(host->fqlStatements(),
              (std::vector<std::string>{
                  kBase + kOrder + " asc limit 150",
                  kBase + " and (uid_from > '" + requesters[149] + " ')" + kOrder + " asc limit 150",
                  "select '' from friend_request where (uid_to = '" + kDemoUid + "')",
                  kBase + kOrder + " desc limit 150",
              }));
}

TEST_F(FriendRequestCursorTest, ConversionsASecondApartCarryTheirOwnTimes) {
    std::time_t const before = std::time(nullptr);
    Cursor first;
    ASSERT_OK(open(first));
    SmartPtr<Map<String, Variant>> a;
    ASSERT_OK(first->getRow(a));
    std::time_t const after = std::time(nullptr);
    int const t1 = a->search("core_object_time")->asInt32();
    EXPECT_GE(t1, before);
    EXPECT_LE(t1, after);

    std::this_thread::sleep_for(std::chrono::milliseconds(1100));
    Cursor second;
    ASSERT_OK(open(second));
    SmartPtr<Map<String, Variant>> b;
    ASSERT_OK(second->getRow(b));
    EXPECT_EQ(text(*b, "core_event_serviceid"), text(*a, "core_event_serviceid"));
    EXPECT_GT(b->search("core_object_time")->asInt32(), t1);
}

TEST_F(FriendRequestCursorTest, OrderingOrConstraintNotServedFailsBeforeAnyRequest) {
    Vector<Column> descending = requestOrdering();
    descending[0].flag = false;
    Vector<Column> byTime{{Metadata::Key("core_object_time", TRELM_TYPES::INT32), false}, requestOrdering()[0],
                          requestOrdering()[1]};
    Constraint const other{Metadata::Key("core_event_contactid", TRELM_TYPES::STRING), Variant("42"),
                           Constraint::Equal};
    Constraint const ownSource{Metadata::Key("core_object_source", TRELM_TYPES::STRING), Variant(kSourceName),
                               Constraint::Equal};
    struct Case {
        char const* name;
        Vector<Column> columns;
        std::vector<Constraint> constraints;
        unsigned code;
    };
    std::vector<Case> const cases = {
        {"service descending", descending, {}, kInvalid},
        {"one entry", Vector<Column>{requestOrdering()[0]}, {}, kInvalid},
        {"time first", byTime, {}, kInvalid},
        {"constraint on the requester", requestOrdering(), {other}, kInvalid},
        {"own source", requestOrdering(), {ownSource}, kSuccess},
    };
    for (Case const& c : cases) {
        SCOPED_TRACE(c.name);
        Cursor cursor;
        EXPECT_CODE(open(cursor, c.columns, c.constraints), c.code);
        EXPECT_EQ(bool(cursor), c.code == kSuccess);
    }
    EXPECT_TRUE(host->emulator().log().entries().empty()) << "a cursor reads nothing before it is used";
}

}  // namespace
}  // namespace trelm::test
