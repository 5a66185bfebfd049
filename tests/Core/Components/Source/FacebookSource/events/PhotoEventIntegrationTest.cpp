#include <gtest/gtest.h>

#include <algorithm>
#include <set>
#include <string>
#include <vector>

#include "EmulatorHost.h"
#include "ErrorAssertions.h"
#include "EventWalk.h"
#include "PhotoEventWrappedCursor.h"

namespace trelm::test {
namespace {

std::string const kFriendPhotos =
    "select pid,aid,owner,src,caption,created from photo where aid in (select aid from album where owner in "
    "(select uid2 from friend where uid1='" + std::to_string(emu::DemoAccount::uid) + "'))";

// Forty friends with three albums of five photos each, of every five photos the last three in
// one second: the photo cursor pages through them 150 at a time.
TEST(PhotoEventTest, WalkVisitsEveryFriendPhotoOnceInTheQueryOrderAcrossWindows) {
    EmulatorHost host({.users = 200, .demoFriends = 40, .albumsPerUser = 3, .photosPerAlbum = 5, .photosPerSecond = 3});
    std::string error;
    ASSERT_TRUE(host.start(error)) << error;
    FacebookSource& source = host.addSource(host.demoGroup("facebook", true));

    // The photos read in one statement, in the query's order: newest first, then by id, highest
    // first.
    std::vector<std::string> pids = host.fqlColumn(kFriendPhotos, "photo", "pid");
    std::vector<std::string> times = host.fqlColumn(kFriendPhotos, "photo", "created");
    std::vector<EventRow> expected;
    for (std::size_t i = 0; i < pids.size(); ++i) expected.push_back(EventRow::of(5, pids[i], std::stoi(times[i])));
    std::sort(expected.begin(), expected.end(),
              [](EventRow const& a, EventRow const& b) { return a.time != b.time ? a.time > b.time : a.id > b.id; });
    ASSERT_GT(expected.size(), 300u);
    std::size_t runsOfThree = 0;
    for (std::size_t i = 2; i < expected.size(); ++i) runsOfThree += expected[i].time == expected[i - 2].time;
    ASSERT_GT(runsOfThree, 10u);
    host.emulator().log().clear();

    IQueryItems::StartQueryMessage msg(eventOrdering(), Vector<IQueryItems::Constraint>{typeIn({5})});
    ASSERT_OK(source.onMessage(msg));
    ASSERT_NE(dynamic_cast<PhotoEventWrappedCursor*>(msg.cursor.get()), nullptr);
    std::vector<EventRow> seen = walkEvents(*msg.cursor);
    EXPECT_EQ(seen, expected);
    std::set<std::string> guids;
    for (EventRow const& row : seen) {
        guids.insert(row.guid);
        EXPECT_FALSE(row.authorName.empty()) << row;
    }
    EXPECT_EQ(guids.size(), seen.size());

    // The first window, then one per 150 photos after the last photo of the window before.
    std::vector<std::string> statements;
    for (std::string const& fql : host.fqlStatements()) {
        if (fql.rfind("select pid,", 0) == 0) statements.push_back(fql);
    }
    ASSERT_EQ(statements.size(), expected.size() / 150 + 1);
    EXPECT_EQ(statements[0], kFriendPhotos + " order by created desc limit 150");
    for (std::size_t k = 1; k < statements.size(); ++k) {
        EventRow const& last = expected[k * 150 - 1];
        std::string const T = std::to_string(last.time);
        EXPECT_EQ(statements[k], kFriendPhotos + " and (created < " + T + " or (created = " + T + " and pid < '" +
                                     last.id + "')) order by created desc limit 150");
    }
}

}  // namespace
}  // namespace trelm::test
