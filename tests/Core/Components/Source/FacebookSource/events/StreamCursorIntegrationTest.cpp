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

using Constraint = IQueryItems::Constraint;

constexpr char const* kSourceName = "facebook";
std::string const kDemoUid = std::to_string(emu::DemoAccount::uid);

// The stream as the service holds it, newest first, read in one call.
struct Reference {
    std::vector<EventRow> statuses;  // in stream order
    std::vector<EventRow> all;       // statuses and photo posts with a photo id, in stream order
    std::vector<int> times;          // of every post, wanted or not
    std::map<std::string, std::string> names;  // author id to name
};

std::string withoutOwner(std::string const& id) {
    std::size_t const underscore = id.find('_');
    return underscore == std::string::npos ? id : id.substr(underscore + 1);
}

// A demo user whose 60 friends post 12 times each, every post in a second of its own (posts
// sharing a second across a window's edge would be skipped by the time paging).
class StreamCursorTest : public ::testing::Test {
protected:
    static void SetUpTestSuite() {
        emu::GeneratorOptions generator;
        generator.users = 300;
        generator.demoFriends = 60;
        generator.friendsPerUser = 4;
        generator.albumsPerUser = 1;
        generator.photosPerAlbum = 3;
        generator.postsPerUser = 12;
        generator.postsPerSecond = 1;
        generator.threadsPerUser = 1;
        generator.messagesPerThread = 1;
        host = new EmulatorHost(generator);
        std::string error;
        ASSERT_TRUE(host->start(error)) << error;
        source = &host->addSource(host->demoGroup(kSourceName, true));
        reference = new Reference(readReference());
        ASSERT_GE(reference->times.size(), 700u);
    }

    static void TearDownTestSuite() {
        delete reference;
        delete host;
        reference = nullptr;
        host = nullptr;
    }

    void SetUp() override { host->emulator().log().clear(); }

    static Reference readReference() {
        Vector<Map<String, String>> rows;
        unsigned count = 0;
        SmartPtr<FacebookLibrary> client = host->demoClient();
        EXPECT_OK(client->runFStreamQuery(String(kDemoUid), 0, 0, 100000, rows, count));
        Reference ref;
        std::set<std::string> authors;
        for (auto const& row : rows) {
            auto field = [&](char const* name) {
                String const* v = row.search(name);
                return v ? v->str() : std::string();
            };
            int const time = std::stoi(field("created_time"));
            ref.times.push_back(time);
            if (row.contains("is_status")) {
                ref.statuses.push_back(EventRow::of(4, withoutOwner(field("post_id")), time));
                ref.all.push_back(ref.statuses.back());
                authors.insert(field("source_id"));
            } else if (row.contains("is_photo") && row.contains("pid")) {
                ref.all.push_back(EventRow::of(5, withoutOwner(field("pid")), time));
                authors.insert(field("owner"));
            }
        }
        std::string list;
        for (std::string const& a : authors) list += (list.empty() ? "" : ",") + a;
        std::vector<std::string> uids = host->fqlColumn("select uid,name from user where uid in (" + list + ")", "user", "uid");
        std::vector<std::string> names = host->fqlColumn("select uid,name from user where uid in (" + list + ")", "user", "name");
        for (std::size_t i = 0; i < uids.size(); ++i) ref.names[uids[i]] = names[i];
        host->emulator().log().clear();
        return ref;
    }

    static std::vector<EventRow> only(int type) {
        std::vector<EventRow> out;
        for (EventRow const& row : reference->all) {
            if (row.type == type) out.push_back(row);
        }
        return out;
    }

    static std::vector<emu::LoggedRequest> streamCalls() { return host->emulator().log().entriesFor("stream.get"); }

    static long long endTimeOf(emu::LoggedRequest const& call) { return std::stoll(call.args.at("end_time")); }

    // Walks `cursor` and checks each window's bound as it is asked for: the first call of a step
    // ends one second below the last row delivered, and the calls for windows whose rows were all
    // left out go further down. `skippedWindows` counts the steps that needed more than one call.
    static std::vector<EventRow> walkCheckingBounds(IQueryItems::ICursor& cursor, long long firstEndTime,
                                                    int& skippedWindows) {
        std::size_t seen = 0;
        skippedWindows = 0;
        auto checkNewCalls = [&](EventRow const* previous) {
            std::vector<emu::LoggedRequest> calls = streamCalls();
            for (std::size_t k = seen; k < calls.size(); ++k) {
                long long const end = endTimeOf(calls[k]);
                if (k == 0) {
                    EXPECT_EQ(end, firstEndTime) << "the first window is bounded by the query only";
                } else if (k == seen && previous != nullptr) {
                    EXPECT_EQ(end, previous->time - 1) << "call " << k << " after " << *previous;
                } else {
                    long long const before = endTimeOf(calls[k - 1]);  // 0: no bound
                    EXPECT_TRUE(end > 0 && (before == 0 || end < before))
                        << "call " << k << " after a window left out ends at " << end << ", the one before at " << before;
                }
                EXPECT_EQ(calls[k].args.at("limit"), std::to_string(cursor_window)) << "call " << k;
            }
            if (calls.size() > seen + 1) ++skippedWindows;
            seen = calls.size();
        };
        EXPECT_OK(cursor.jumpBeginning());
        checkNewCalls(nullptr);
        return walkEvents(cursor, [&](EventRow const& previous) { checkNewCalls(&previous); });
    }

    // Names: one statement right after the stream call of a window at most, never an id twice.
    static void expectOneNamesQueryPerWindow() {
        std::vector<emu::LoggedRequest> entries = host->emulator().log().entries();
        std::set<std::string> asked;
        for (std::size_t i = 0; i < entries.size(); ++i) {
            if (entries[i].method.find("fql.query") == std::string::npos) continue;
            ASSERT_GT(i, 0u);
            EXPECT_NE(entries[i - 1].method.find("stream.get"), std::string::npos)
                << "a names query follows its window's stream call: " << entries[i].fql;
            std::string const& fql = entries[i].fql;
            std::string const prefix = "select uid,name from user where uid in (";
            ASSERT_EQ(fql.rfind(prefix, 0), 0u) << fql;
            std::string list = fql.substr(prefix.size(), fql.size() - prefix.size() - 1);
            std::set<std::string> inThisQuery;
            for (std::size_t at = 0; at <= list.size();) {
                std::size_t comma = std::min(list.find(',', at), list.size());
                std::string uid = list.substr(at, comma - at);
                EXPECT_EQ(asked.count(uid), 0u) << uid << " was asked for by an earlier window";
                inThisQuery.insert(uid);
                at = comma + 1;
            }
            asked.insert(inThisQuery.begin(), inThisQuery.end());
        }
    }

    static SmartPtr<FStreamCursor> openDirect(std::vector<Constraint> const& constraints, unsigned window) {
        auto cache = makeSmart<FacebookSource::MappingCache>();
        EXPECT_OK(cache->setup());
        auto cursor = makeSmart<FStreamCursor>(host->demoClient(), cache, eventOrdering(),
                                               Vector<Constraint>(std::vector<Constraint>(constraints)), kSourceName,
                                               true, true);
        cursor->setWindowSize(window);
        cursor_window = window;
        EXPECT_OK(cursor->start());
        host->emulator().log().clear();
        return cursor;
    }

    static EmulatorHost* host;
    static FacebookSource* source;
    static Reference* reference;
    static unsigned cursor_window;
};

EmulatorHost* StreamCursorTest::host = nullptr;
FacebookSource* StreamCursorTest::source = nullptr;
Reference* StreamCursorTest::reference = nullptr;
unsigned StreamCursorTest::cursor_window = 75;

TEST_F(StreamCursorTest, StatusAndPhotoQueryVisitsEveryPostOnceNewestFirstInBoundedWindows) {
    IQueryItems::StartQueryMessage msg(eventOrdering(), Vector<Constraint>{typeIn({4, 5})});
    ASSERT_OK(source->onMessage(msg));
    ASSERT_NE(dynamic_cast<FStreamCursor*>(msg.cursor.get()), nullptr);
    cursor_window = 75;

    int skipped = 0;
    std::vector<EventRow> seen = walkCheckingBounds(*msg.cursor, 0, skipped);
    ASSERT_GE(seen.size(), 500u);
    EXPECT_EQ(seen, reference->all);
    EXPECT_TRUE(std::is_sorted(seen.begin(), seen.end(),
                               [](EventRow const& a, EventRow const& b) { return a.time > b.time; }));
    EXPECT_GE(streamCalls().size(), reference->times.size() / 75);

    // A photo shown by two posts is one photo event: GUIDs follow the service ids.
    std::set<std::pair<int, std::string>> guids, ids;
    for (EventRow const& row : seen) {
        guids.insert({row.type, row.guid});
        ids.insert({row.type, row.id});
        EXPECT_EQ(row.authorName, reference->names.at(row.author)) << row;
    }
    EXPECT_EQ(guids.size(), ids.size()) << "one GUID per service id of a kind";
    expectOneNamesQueryPerWindow();
}

// Queries whose windows are left out in part or whole: what comes back, and how the cursor
// pages past what it leaves out.
TEST_F(StreamCursorTest, KindsAndBoundsSelectThePostsAndPagingGoesPastWindowsLeftOut) {
    int const newest = reference->times.front();
    int const oldest = reference->times.back();
    int const middle = reference->times[reference->times.size() / 2];
    int const upper = reference->times[reference->times.size() / 5];
    auto within = [&](int from, int to) {
        std::vector<EventRow> out;
        for (EventRow const& row : reference->all) {
            if (row.time >= from && row.time <= to) out.push_back(row);
        }
        return out;
    };
    struct Case {
        char const* name;
        std::vector<Constraint> constraints;
        unsigned window;
        std::vector<EventRow> expected;
        long long firstEndTime;
        bool pagesPastLeftOutWindows;
    };
    std::vector<Case> const cases = {
        {"status posts only", {typeIs(4)}, 75, only(4), 0, false},
        {"status posts in windows of two", {typeIs(4)}, 2, only(4), 0, true},
        {"photo posts in windows of three", {typeIn({5, 99})}, 3, only(5), 0, true},
        {"between two times", {typeIn({4, 5}), timeCompared(Constraint::GreaterOrEqual, middle),
                               timeCompared(Constraint::LessThan, upper)},
         75, within(middle, upper - 1), upper - 1, false},
        {"after the newest post", {typeIn({4, 5}), timeCompared(Constraint::GreaterThan, newest)}, 75, {}, 0, false},
    };
    ASSERT_LT(oldest, middle);
    for (Case const& c : cases) {
        SCOPED_TRACE(c.name);
        SmartPtr<FStreamCursor> cursor = openDirect(c.constraints, c.window);
        int skipped = 0;
        std::vector<EventRow> seen = walkCheckingBounds(*cursor, c.firstEndTime, skipped);
        EXPECT_EQ(seen, c.expected);
        if (c.pagesPastLeftOutWindows) {
            EXPECT_GT(skipped, 0) << "some window held none of the wanted posts";
        }
        expectOneNamesQueryPerWindow();
    }
}

TEST_F(StreamCursorTest, QueryWithoutKindWalksTheWholeStreamAndEndsOnAnEmptyAnswer) {
    SmartPtr<FStreamCursor> cursor = openDirect({}, 75);
    ASSERT_OK(cursor->jumpBeginning());
    SmartPtr<Map<String, Variant>> row;
    EXPECT_CODE(cursor->getRow(row), kNoData);
    EXPECT_FALSE(row);

    // One call per 75 posts, each below the oldest post of the one before, then one that finds
    // nothing; no names are looked up for an empty window, and getRow does not walk again.
    std::vector<emu::LoggedRequest> calls = streamCalls();
    std::size_t const posts = reference->times.size();
    ASSERT_EQ(calls.size(), (posts + 74) / 75 + 1);
    EXPECT_EQ(endTimeOf(calls[0]), 0);
    for (std::size_t k = 1; k < calls.size(); ++k) {
        EXPECT_EQ(endTimeOf(calls[k]), reference->times[std::min(posts, k * 75) - 1] - 1) << "call " << k;
    }
    EXPECT_TRUE(host->emulator().log().entriesFor("fql.query").empty());
}

}  // namespace
}  // namespace trelm::test
