#include <gtest/gtest.h>

#include <algorithm>
#include <map>
#include <set>
#include <string>
#include <vector>

#include "EmulatorHost.h"
#include "ErrorAssertions.h"
#include "EventWalk.h"
#include "FStreamCursor.h"
#include "MappingCache.h"

namespace trelm::test {
namespace {

std::string const kDemoUid = std::to_string(emu::DemoAccount::uid);

long long endTimeOf(emu::LoggedRequest const& call) { return std::stoll(call.args.at("end_time")); }

// A demo user whose 60 friends post 12 times each, every post in a second of its own (posts
// sharing a second across a window's edge would be passed over by the time paging).
class StreamCursorTest : public EmulatorSuite {
protected:
    static void SetUpTestSuite() {
        startSuite({.users = 300, .demoFriends = 60, .photosPerAlbum = 3, .postsPerUser = 12, .postsPerSecond = 1});

        // The whole stream in one call: the wanted posts, and the time of every post.
        Vector<Map<String, String>> rows;
        unsigned count = 0;
        ASSERT_OK(host->demoClient()->runFStreamQuery(String(kDemoUid), 0, 0, 100000, rows, count));
        for (auto const& row : rows) {
            auto field = [&](char const* name) { return row.search(name) ? row.search(name)->str() : ""; };
            std::string const id = field(row.contains("is_status") ? "post_id" : "pid");
            EventRow post = EventRow::of(row.contains("is_status") ? 4 : 5, id.substr(id.find('_') + 1),
                                         std::stoi(field("created_time")));
            times.push_back(post.time);
            if (row.contains("is_status") || (row.contains("is_photo") && !id.empty())) wanted.push_back(post);
        }
        ASSERT_GE(times.size(), 700u);
        host->emulator().log().clear();
    }

    static std::vector<emu::LoggedRequest> streamCalls() { return host->emulator().log().entriesFor("stream.get"); }

    static inline std::vector<EventRow> wanted;  // status and photo posts, newest first
    static inline std::vector<int> times;        // of every post, newest first
};


TEST_F(StreamCursorTest, StatusAndPhotoQueryVisitsEveryPostOnceNewestFirstInBoundedWindows) {
    IQueryItems::StartQueryMessage msg(eventOrdering(), Vector<IQueryItems::Constraint>{typeIn({4, 5})});
    ASSERT_OK(source->onMessage(msg));
    ASSERT_NE(dynamic_cast<FStreamCursor*>(msg.cursor.get()), nullptr);

    // Each window is asked for when the walk leaves the one before: 75 posts up to one second
    // below the last post delivered.
    std::size_t calls = 0;
    std::vector<EventRow> seen = walkEvents(*msg.cursor, [&](EventRow const& previous) {
        std::vector<emu::LoggedRequest> log = streamCalls();
        if (calls == 0) {
            EXPECT_EQ(endTimeOf(log.at(0)), 0);
        }
        if (log.size() > std::max<std::size_t>(calls, 1)) {
            ASSERT_EQ(log.size(), std::max<std::size_t>(calls, 1) + 1) << "one call per window";
            EXPECT_EQ(endTimeOf(log.back()), previous.time - 1) << "after " << previous;
            EXPECT_EQ(log.back().args.at("limit"), "75");
        }
        calls = log.size();
    });
    ASSERT_GE(seen.size(), 500u);
    EXPECT_EQ(seen, wanted);
    EXPECT_EQ(calls, (times.size() + 74) / 75 + 1) << "the windows and one that finds nothing";

    // A photo shown by two posts is one photo event: GUIDs follow the service ids.
    std::set<std::pair<int, std::string>> guids, ids;
    std::set<std::string> authors;
    for (EventRow const& row : seen) {
        guids.insert({row.type, row.guid});
        ids.insert({row.type, row.id});
        authors.insert(row.author);
        EXPECT_FALSE(row.authorName.empty()) << row;
    }
    EXPECT_EQ(guids.size(), ids.size());

    // One names query right after its window's stream call at most; an author is asked for by
    // one window only.
    std::vector<emu::LoggedRequest> log = host->emulator().log().entries();
    std::map<std::string, std::size_t> askedBy;
    for (std::size_t i = 1; i < log.size(); ++i) {
        if (log[i].method.find("fql.query") == std::string::npos) continue;
        EXPECT_NE(log[i - 1].method.find("stream.get"), std::string::npos) << log[i].fql;
        std::string const prefix = "select uid,name from user where uid in (";
        ASSERT_EQ(log[i].fql.rfind(prefix, 0), 0u) << log[i].fql;
        std::string const list = log[i].fql.substr(prefix.size(), log[i].fql.size() - prefix.size() - 1) + ",";
        for (std::size_t at = 0, comma; (comma = list.find(',', at)) != std::string::npos; at = comma + 1) {
            auto [it, added] = askedBy.emplace(list.substr(at, comma - at), i);
            EXPECT_TRUE(added || it->second == i) << it->first << " asked for again";
        }
    }
    EXPECT_EQ(askedBy.size(), authors.size());
}

TEST_F(StreamCursorTest, QueryWithoutKindWalksTheWholeStreamAndEndsOnAnEmptyAnswer) {
    auto cache = makeSmart<FacebookSource::MappingCache>();
    ASSERT_OK(cache->setup());
    auto cursor = makeSmart<FStreamCursor>(host->demoClient(), cache, eventOrdering(), Vector<IQueryItems::Constraint>(),
                                           "facebook", true, true);
    cursor->setWindowSize(75);
    ASSERT_OK(cursor->start());
    host->emulator().log().clear();

    ASSERT_OK(cursor->jumpBeginning());
    SmartPtr<Map<String, Variant>> row;
    EXPECT_CODE(cursor->getRow(row), kNoData);
    EXPECT_FALSE(row);

    // One call per 75 posts, each below the oldest post of the one before, then one that finds
    // nothing; no names are looked up for an empty window, and getRow does not walk again.
    std::vector<emu::LoggedRequest> calls = streamCalls();
    ASSERT_EQ(calls.size(), (times.size() + 74) / 75 + 1);
    EXPECT_EQ(endTimeOf(calls[0]), 0);
    for (std::size_t k = 1; k < calls.size(); ++k) {
        EXPECT_EQ(endTimeOf(calls[k]), times[std::min(times.size(), k * 75) - 1] - 1) << "call " << k;
    }
    EXPECT_TRUE(host->emulator().log().entriesFor("fql.query").empty());
}

}  // namespace
}  // namespace trelm::test
