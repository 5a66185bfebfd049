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

using Constraint = IQueryItems::Constraint;

constexpr char const* kSourceName = "facebook";
std::string const kDemoUid = std::to_string(emu::DemoAccount::uid);
std::string const kFriendPhotos =
    "select pid,aid,owner,src,caption,created from photo where aid in (select aid from album where owner in "
    "(select uid2 from friend where uid1='" + kDemoUid + "'))";

// Forty friends with three albums of five photos each; of every five photos the last three share
// one second.
class PhotoEventTest : public ::testing::Test {
protected:
    static void SetUpTestSuite() {
        emu::GeneratorOptions generator;
        generator.users = 200;
        generator.demoFriends = 40;
        generator.friendsPerUser = 4;
        generator.albumsPerUser = 3;
        generator.photosPerAlbum = 5;
        generator.photosPerSecond = 3;
        generator.postsPerUser = 1;
        generator.threadsPerUser = 1;
        generator.messagesPerThread = 1;
        host = new EmulatorHost(generator);
        std::string error;
        ASSERT_TRUE(host->start(error)) << error;
        source = &host->addSource(host->demoGroup(kSourceName, true));
        expected = new std::vector<EventRow>(referenceOrder());
        ASSERT_GT(expected->size(), 300u);
    }

    static void TearDownTestSuite() {
        delete expected;
        delete host;
        expected = nullptr;
        host = nullptr;
    }

    void SetUp() override { host->emulator().log().clear(); }

    // The friends' photos read in one statement by a client of its own, in the query's order:
    // newest first, photos of one second by id, highest first.
    static std::vector<EventRow> referenceOrder() {
        std::vector<std::string> pids = host->fqlColumn(kFriendPhotos, "photo", "pid");
        std::vector<std::string> times = host->fqlColumn(kFriendPhotos, "photo", "created");
        std::vector<EventRow> rows;
        for (std::size_t i = 0; i < pids.size(); ++i) rows.push_back(EventRow::of(5, pids[i], std::stoi(times[i])));
        std::sort(rows.begin(), rows.end(),
                  [](EventRow const& a, EventRow const& b) { return a.time != b.time ? a.time > b.time : a.id > b.id; });
        host->emulator().log().clear();
        return rows;
    }

    static SmartPtr<IQueryItems::ICursor> open(std::vector<Constraint> extra = {}) {
        Vector<Constraint> constraints{typeIs(5)};
        for (Constraint const& c : extra) EXPECT_OK(constraints.pushBack(c));
        IQueryItems::StartQueryMessage msg(eventOrdering(), constraints);
        EXPECT_OK(source->onMessage(msg));
        return msg.cursor;
    }

    static std::vector<std::string> photoStatements() {
        std::vector<std::string> out;
        for (std::string const& fql : host->fqlStatements()) {
            if (fql.rfind("select pid,", 0) == 0) out.push_back(fql);
        }
        return out;
    }

    static EmulatorHost* host;
    static FacebookSource* source;
    static std::vector<EventRow>* expected;
};

EmulatorHost* PhotoEventTest::host = nullptr;
FacebookSource* PhotoEventTest::source = nullptr;
std::vector<EventRow>* PhotoEventTest::expected = nullptr;

TEST_F(PhotoEventTest, WalkVisitsEveryFriendPhotoOnceInTheQueryOrderAcrossWindows) {
    SmartPtr<IQueryItems::ICursor> cursor = open();
    ASSERT_NE(dynamic_cast<PhotoEventWrappedCursor*>(cursor.get()), nullptr);
    std::vector<EventRow> seen = walkEvents(*cursor);
    EXPECT_EQ(seen, *expected);

    std::size_t runsOfThree = 0;
    for (std::size_t i = 2; i < expected->size(); ++i) {
        if ((*expected)[i].time == (*expected)[i - 2].time) ++runsOfThree;
    }
    EXPECT_GT(runsOfThree, 10u) << "the data holds photos sharing a second";

    std::set<std::string> guids;
    for (EventRow const& row : seen) {
        guids.insert(row.guid);
        EXPECT_FALSE(row.authorName.empty()) << row;
    }
    EXPECT_EQ(guids.size(), seen.size());

    // The first window, then one per 150 photos after the last photo of the window before.
    std::vector<std::string> statements = photoStatements();
    ASSERT_EQ(statements.size(), expected->size() / 150 + 1);
    EXPECT_EQ(statements[0], kFriendPhotos + " order by created desc limit 150");
    for (std::size_t k = 1; k < statements.size(); ++k) {
        EventRow const& last = (*expected)[k * 150 - 1];
        std::string const T = std::to_string(last.time);
        EXPECT_EQ(statements[k], kFriendPhotos + " and (created < " + T + " or (created = " + T + " and pid < '" +
                                     last.id + "')) order by created desc limit 150");
    }
}

TEST_F(PhotoEventTest, TimeConditionLimitsThePhotosToItsRange) {
    int const from = (*expected)[expected->size() / 2].time;
    std::vector<EventRow> wanted;
    std::copy_if(expected->begin(), expected->end(), std::back_inserter(wanted),
                 [&](EventRow const& row) { return row.time >= from; });
    SmartPtr<IQueryItems::ICursor> cursor = open({timeCompared(Constraint::GreaterOrEqual, from)});
    EXPECT_EQ(walkEvents(*cursor), wanted);
    EXPECT_EQ(photoStatements().at(0),
              kFriendPhotos + " and (created >= " + std::to_string(from) + ") order by created desc limit 150");
}

}  // namespace
}  // namespace trelm::test
