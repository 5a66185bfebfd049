// The stream cursor and the photo-event cursors walking the in-process emulator's stream and the
// friends' photos.
#include <gtest/gtest.h>

#include <algorithm>
#include <map>
#include <set>
#include <string>
#include <tuple>
#include <utility>
#include <vector>

#include "EmulatorHost.h"
#include "ErrorAssertions.h"
#include "FStreamCursor.h"
#include "MappingCache.h"
#include "PhotoEventWrappedCursor.h"

namespace trelm::test {
namespace {

using Constraint = IQueryItems::Constraint;
using Record = EmulatorHost::Record;

std::string const kDemoUid = std::to_string(emu::DemoAccount::uid);
std::string const kFriendPhotos =
    "select pid,aid,owner,src,caption,created from photo where aid in (select aid from album where owner in "
    "(select uid2 from friend where uid1='" + kDemoUid + "'))";

// An event record's kind, service id, time, author, text, address and parent, '|'-joined.
std::string event(std::vector<std::string> const& fields) {
    std::string out;
    for (std::string const& f : fields) out += (out.empty() ? "" : "|") + (f.empty() ? "<none>" : f);
    return out;
}

// Each record as event() gives it; every record has a GUID of its own per service id and an
// author name.
std::vector<std::string> events(std::vector<Record> const& rows) {
    std::vector<std::string> out;
    std::set<std::string> guids, ids;
    for (Record const& r : rows) {
        std::string const type = EmulatorHost::text(r, "core_object_type");
        std::vector<std::string> fields;
        for (char const* key : {"core_object_type", "core_event_serviceid", "core_object_time", "core_event_contactid",
                                "core_event_text", "core_event_uri", "core_event_parent_serviceid"}) {
            fields.push_back(EmulatorHost::text(r, key));
        }
        out.push_back(event(fields));
        guids.insert(type + EmulatorHost::text(r, "core_object_id"));
        ids.insert(type + EmulatorHost::text(r, "core_event_serviceid"));
        EXPECT_NE(EmulatorHost::text(r, "core_event_contactname"), "<none>") << out.back();
    }
    EXPECT_EQ(guids.size(), ids.size()) << "a photo shown by two posts is one photo event";
    return out;
}

// A demo user whose 60 friends post 12 times each, every post in a second of its own (posts
// sharing a second across a window's edge would be passed over by the time paging), with two
// albums of four photos each, three photos of every five sharing a second.
class EventCursorsTest : public EmulatorSuite {
protected:
    static void SetUpTestSuite() {
        startSuite({.users = 300, .demoFriends = 60, .photosPerAlbum = 4, .postsPerUser = 12, .photosPerSecond = 3,
                    .postsPerSecond = 1});
        // The whole stream in one call.
        Vector<Map<String, String>> rows;
        unsigned count = 0;
        ASSERT_OK(host->demoClient()->runFStreamQuery(String(kDemoUid), 0, 0, 100000, rows, count));
        for (auto const& row : rows) {
            auto field = [&](char const* name) { return row.search(name) ? row.search(name)->str() : ""; };
            bool const status = row.contains("is_status");
            std::string const id = field(status ? "post_id" : "pid");
            int const kind = status ? 4 : row.contains("is_photo") && !id.empty() ? 5 : 0;
            posts.push_back({kind, std::stoi(field("created_time")),
                             event({std::to_string(kind), id.substr(id.find('_') + 1), field("created_time"),
                                    field(status ? "source_id" : "owner"), field(status ? "message" : "alt"),
                                    status ? "" : field("src"), status ? "" : field("aid")})});
        }
        ASSERT_GE(posts.size(), 700u);
    }

    struct Post {
        int kind;  // 0: neither a status nor a photo
        int time;
        std::string event;
    };
    static inline std::vector<Post> posts;
};

// Each window is asked for when the walk leaves the one before, up to one second below its last
// record. A window holding a wanted post costs one names query right after its stream call.
TEST_F(EventCursorsTest, StreamWalksVisitEveryWantedPostOnceNewestFirstInBoundedWindows) {
    struct Case {
        char const* name;
        std::vector<int> kinds;  // asked for
        unsigned window;
    };
    for (Case const& c : {Case{"status and photos", {4, 5}, 75}, Case{"no kind: nothing, but every window", {}, 75},
                          Case{"status only, past photo-only windows", {4}, 3}}) {
        SCOPED_TRACE(c.name);
        auto cache = makeSmart<FacebookSource::MappingCache>();
        ASSERT_OK(cache->setup());
        Vector<Constraint> constraints;
        if (!c.kinds.empty()) {
            ASSERT_OK(constraints.pushBack({Metadata::Key("core_object_type", TRELM_TYPES::INT32),
                                            Variant(Vector<int>(c.kinds)), Constraint::InList}));
        }
        auto cursor = makeSmart<FStreamCursor>(host->demoClient(), cache, EmulatorHost::eventOrdering(), constraints,
                                               "facebook", true, true);
        cursor->setWindowSize(c.window);
        ASSERT_OK(cursor->start());
        unsigned count = 0;
        EXPECT_CODE(cursor->numRows(count), kNotSupported) << "no statement to count with";
        host->emulator().log().clear();

        // The windows: each asks for up to `window` posts below the last record of the one before,
        // or below its last post when it delivered nothing; the last finds nothing.
        std::vector<std::string> wanted, ends{"0"};
        std::size_t named = 0;
        for (std::size_t at = 0, n = posts.size(); at < n;) {
            std::size_t last = std::min(n, at + c.window) - 1;
            bool any = false;
            for (std::size_t end = last + 1; at < end; ++at) {
                if (std::count(c.kinds.begin(), c.kinds.end(), posts[at].kind) == 0) continue;
                wanted.push_back(posts[at].event);
                last = at;
                any = true;
            }
            named += any;
            ends.push_back(std::to_string(posts[last].time - 1));
            at = last + 1;
        }
        if (c.window == 3) {
            ASSERT_LT(named, ends.size() - 1) << "a window without status";
        }
        std::vector<Record> const rows = EmulatorHost::walk(*cursor);
        EXPECT_EQ(events(rows), wanted);

        std::vector<emu::LoggedRequest> const log = host->emulator().log().entries();
        std::vector<std::string> asked;
        std::map<std::string, std::size_t> askedBy;  // author -> the names query that asked for it
        for (std::size_t i = 0; i < log.size(); ++i) {
            if (log[i].method.find("stream.get") != std::string::npos) {
                asked.push_back(log[i].args.at("end_time"));
                EXPECT_EQ(log[i].args.at("limit"), std::to_string(c.window));
                continue;
            }
            EXPECT_TRUE(i > 0 && log[i - 1].method.find("stream.get") != std::string::npos) << log[i].fql;
            std::string const& fql = log[i].fql;
            std::string list = fql.substr(fql.find(" in (") + 5);
            list.back() = ',';
            for (std::size_t at = 0, comma; (comma = list.find(',', at)) != std::string::npos; at = comma + 1) {
                auto [it, added] = askedBy.emplace(list.substr(at, comma - at), i);
                EXPECT_TRUE(added || it->second == i) << it->first << " asked for again";
            }
        }
        EXPECT_EQ(asked, ends);
        std::set<std::string> authors;
        for (Record const& r : rows) authors.insert(EmulatorHost::text(r, "core_event_contactid"));
        EXPECT_EQ(askedBy.size(), authors.size());
        EXPECT_LE(log.size() - ends.size(), named) << "a names query only for a window with a wanted post";

        // The stream moves one way, a row at a time; the beginning keeps the lowered bound.
        int moved = 0;
        for (int offset : {2, -1}) EXPECT_CODE(cursor->seek(offset, moved), kNotSupported);
        ASSERT_OK(cursor->jumpBeginning());
        EXPECT_EQ(host->emulator().log().entriesFor("stream.get").back().args.at("end_time"), ends.back());
    }
}

// The service orders the photos by time only; the wrapper sorts each second's photos by the
// query's whole ordering (service ids descending) across windows of 150.
TEST_F(EventCursorsTest, PhotoEventsComeOnceInTheQueryOrderAcrossWindows) {
    std::vector<std::tuple<int, std::string, std::string>> order;  // time, pid, event
    for (auto& r : host->fql(kFriendPhotos)) {
        order.emplace_back(std::stoi(r["created"]), r["pid"],
                           event({"5", r["pid"], r["created"], r["owner"], r["caption"], r["src"], r["aid"]}));
    }
    std::sort(order.rbegin(), order.rend());
    std::vector<std::string> expected;
    std::size_t runsOfThree = 0;
    for (std::size_t i = 0; i < order.size(); ++i) {
        expected.push_back(std::get<2>(order[i]));
        runsOfThree += i >= 2 && std::get<0>(order[i]) == std::get<0>(order[i - 2]);
    }
    ASSERT_GT(expected.size(), 300u);
    ASSERT_GT(runsOfThree, 10u);
    host->emulator().log().clear();

    auto cursor = EmulatorHost::open(*source, 5, EmulatorHost::eventOrdering());
    ASSERT_NE(dynamic_cast<PhotoEventWrappedCursor*>(cursor.get()), nullptr);
    EXPECT_EQ(events(EmulatorHost::walk(*cursor)), expected);

    // The first window, then one per 150 photos after the last photo of the window before.
    std::vector<std::string> const statements = host->fqlStatements();
    std::vector<std::string> pages;
    std::copy_if(statements.begin(), statements.end(), std::back_inserter(pages),
                 [](std::string const& fql) { return fql.rfind("select pid,", 0) == 0; });
    ASSERT_EQ(pages.size(), expected.size() / 150 + 1);
    EXPECT_EQ(pages[0], kFriendPhotos + " order by created desc limit 150");
    for (std::size_t k = 1; k < pages.size(); ++k) {
        auto const& [time, pid, e] = order[k * 150 - 1];
        std::string const T = std::to_string(time);
        EXPECT_EQ(pages[k], kFriendPhotos + " and (created < " + T + " or (created = " + T + " and pid < '" + pid +
                                "')) order by created desc limit 150");
    }

    // The wrapper reads forward only and cannot count.
    unsigned n = 0;
    int moved = 0;
    EXPECT_CODE(cursor->numRows(n), kNotSupported);
    EXPECT_CODE(cursor->seek(-1, moved), kNotSupported);
}

}  // namespace
}  // namespace trelm::test
