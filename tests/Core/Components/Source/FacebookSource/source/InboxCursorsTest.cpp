#include <gtest/gtest.h>

#include <algorithm>
#include <chrono>
#include <ctime>
#include <map>
#include <set>
#include <string>
#include <thread>
#include <tuple>
#include <vector>

#include "EmulatorHost.h"
#include "ErrorAssertions.h"
#include "IQueryItems.h"
#include "MessageCursor.h"
#include "trelm/GUID.h"

namespace trelm::test {
namespace {

using Column = IQueryItems::Column;
using Constraint = IQueryItems::Constraint;
using Cursor = SmartPtr<IQueryItems::ICursor>;
using Record = Map<String, Variant>;
using Row = std::map<std::string, std::string>;
using Request = std::tuple<std::string, std::string, int>;  // mailbox method, thread id, start

std::string const kDemoUid = std::to_string(emu::DemoAccount::uid);
std::string const kRequestBase = "select uid_from from friend_request where (uid_to = '" + kDemoUid + "')";
std::string const kRequestOrder = " order by concat(uid_from, ' ')";

struct Message {
    int time;
    int seq;  // place in its thread: orders equal times in the mailbox answers
    std::string mid, tid, author, body;
};
struct Thread {
    std::string tid;
    int updated;
    std::vector<Message> messages;  // as the service pages them, newest first
};

Vector<Column> const kMessageOrder = EmulatorHost::eventOrdering();
Vector<Column> const kRequestOrdering{{Metadata::Key("core_event_service", TRELM_TYPES::STRING), true},
                                      {Metadata::Key("core_event_serviceid", TRELM_TYPES::STRING), true}};
auto const text = EmulatorHost::text;

// The demo user's mailbox of 45 threads of 60 messages (three pages of threads, two of messages
// each) and 200 pending friend requests from users whose ids have 6 to 10 digits. The reference
// copy is read through the FQL tables "thread" and "message", not the mailbox calls.
class InboxCursorsTest : public EmulatorSuite {
protected:
    static void SetUpTestSuite() {
        startSuite({.users = 600, .demoFriends = 50, .friendsPerUser = 2, .albumsPerUser = 0, .postsPerUser = 0,
                    .threadsPerUser = 45, .messagesPerThread = 60, .friendRequests = 200});

        std::string const inbox = "thread_id in (select thread_id from thread where folder_id = 0)";
        std::map<std::string, Thread> byId;
        for (Row& r : host->fql("select thread_id, updated_time from thread where folder_id = 0"))
            byId[r["thread_id"]] = Thread{r["thread_id"], std::stoi(r["updated_time"]), {}};
        for (Row& r :
             host->fql("select message_id, thread_id, author_id, body, created_time from message where " + inbox)) {
            std::string const& mid = r["message_id"];
            byId.at(r["thread_id"])
                .messages.push_back(Message{std::stoi(r["created_time"]), std::stoi(mid.substr(mid.find('_') + 1)), mid,
                                            r["thread_id"], r["author_id"], r["body"]});
        }
        for (auto& [id, t] : byId) {
            std::sort(t.messages.rbegin(), t.messages.rend(),
                      [](auto const& a, auto const& b) { return std::tie(a.time, a.seq) < std::tie(b.time, b.seq); });
            threads.push_back(t);
        }
        std::sort(threads.begin(), threads.end(), [](Thread const& a, Thread const& b) {
            return std::make_tuple(b.updated, std::stoll(b.tid)) < std::make_tuple(a.updated, std::stoll(a.tid));
        });
        for (Row& r :
             host->fql("select uid, name from user where uid in (select author_id from message where " + inbox + ")"))
            names[r["uid"]] = r["name"];
        for (Row& r : host->fql(kRequestBase)) requesters.push_back(r["uid_from"]);
        std::sort(requesters.begin(), requesters.end(), [](auto const& a, auto const& b) { return a + " " < b + " "; });
    }

    // Every message at or after the bound (after it when `exclusive`), newest first, equal times
    // by descending id: "serviceid time author name body".
    static std::vector<std::string> expectedMessages(int bound, bool exclusive) {
        std::vector<Message> kept;
        for (Thread const& t : threads)
            for (Message const& m : t.messages)
                if (m.time > bound || (m.time == bound && !exclusive)) kept.push_back(m);
        std::sort(kept.begin(), kept.end(),
                  [](Message const& a, Message const& b) { return std::tie(b.time, b.mid) < std::tie(a.time, a.mid); });
        std::vector<std::string> out;
        for (Message const& m : kept)
            out.push_back(m.tid + "-" + m.mid + " " + std::to_string(m.time) + " " + m.author + " " + names[m.author] +
                          " " + m.body);
        return out;
    }

    // The mailbox requests of a reading that stops at the first thread and the first message older
    // than the bound: pages of 20 threads and 50 messages, each offset grown by the page before,
    // each list read until an empty page.
    static std::vector<Request> expectedRequests(int bound, bool exclusive) {
        auto older = [&](int t) { return t < bound || (t == bound && exclusive); };
        std::vector<Request> requests;
        for (size_t offset = 0;;) {
            requests.emplace_back("mailbox.getInbox", "", static_cast<int>(offset));
            size_t const end = std::min(threads.size(), offset + 20);
            if (offset == end) return requests;
            for (size_t i = offset; i < end; ++i) {
                if (older(threads[i].updated)) return requests;
                std::vector<Message> const& m = threads[i].messages;
                for (size_t start = 0;;) {
                    requests.emplace_back("mailbox.getThreadMessages", threads[i].tid, static_cast<int>(start));
                    size_t const last = std::min(m.size(), start + 50);
                    if (start == last || std::any_of(m.begin() + long(start), m.begin() + long(last),
                                                     [&](Message const& x) { return older(x.time); }))
                        break;
                    start = last;
                }
            }
            offset = end;
        }
    }

    static std::vector<Request> loggedRequests() {
        std::vector<Request> out;
        for (emu::LoggedRequest const& r : host->emulator().log().entries()) {
            std::size_t const at = r.method.find("mailbox.");
            if (at == std::string::npos) continue;
            std::string const method = r.method.substr(at);
            EXPECT_EQ(r.args.at("limit"), method == "mailbox.getInbox" ? "20" : "50");
            out.emplace_back(method, r.args.count("tid") ? r.args.at("tid") : "", std::stoi(r.args.at("start")));
        }
        return out;
    }

    static inline std::vector<Thread> threads;               // newest update first
    static inline std::map<std::string, std::string> names;  // of the authors
    static inline std::vector<std::string> requesters;       // in the friend request cursor's order
};

TEST_F(InboxCursorsTest, MessagesComeOnceNewestFirstAndATimeBoundStopsReadingAtTheFirstOlderOne) {
    std::vector<std::string> const all = expectedMessages(0, false);
    ASSERT_EQ(all.size(), 45u * 60u);
    auto timeOf = [](std::string const& m) { return std::stoi(m.substr(m.find(' ') + 1)); };
    ASSERT_NE(std::adjacent_find(all.begin(), all.end(), [&](auto& a, auto& b) { return timeOf(a) == timeOf(b); }),
              all.end())
        << "the mailbox should hold messages sent in the same second";
    int const middle = timeOf(all[all.size() / 3]);
    struct Case {
        char const* name;
        int time;  // the bound; 0: none
        bool exclusive;
    };
    for (Case const& c : {Case{"no bound", 0, false}, Case{"at or after", middle, false}, Case{"after", middle, true},
                          Case{"after the newest", threads[0].updated, true}}) {
        SCOPED_TRACE(c.name);
        host->emulator().log().clear();
        std::vector<Constraint> bound;
        if (c.time != 0) {
            bound.push_back({Metadata::Key("core_object_time", TRELM_TYPES::INT32), Variant(c.time),
                             c.exclusive ? Constraint::GreaterThan : Constraint::GreaterOrEqual});
        }
        Cursor cursor = EmulatorHost::open(*source, 10, kMessageOrder, bound);
        std::vector<Record> const rows = EmulatorHost::walk(*cursor);
        std::vector<std::string> got;
        std::set<GUID> guids;
        for (Record const& r : rows) {
            got.push_back(text(r, "core_event_serviceid") + " " + text(r, "core_object_time") + " " +
                          text(r, "core_event_contactid") + " " + text(r, "core_event_contactname") + " " +
                          text(r, "core_event_text"));
            guids.insert(r.search("core_object_id")->asGUID());
        }
        EXPECT_EQ(got, expectedMessages(c.time, c.exclusive));
        EXPECT_EQ(guids.size(), rows.size()) << "every message has a GUID of its own";
        unsigned count = 0;
        EXPECT_OK(cursor->numRows(count));
        EXPECT_EQ(count, rows.size());
        EXPECT_EQ(loggedRequests(), expectedRequests(c.time, c.exclusive));
        // One statement names every author once; no messages, no statement.
        EXPECT_EQ(host->fqlStatements().size(), rows.empty() ? 0u : 1u);
    }
    // A message was sent at the bound: the two bounds differ on it.
    EXPECT_NE(expectedMessages(middle, false).size(), expectedMessages(middle, true).size());
}

TEST_F(InboxCursorsTest, MessageRecordsCarryTheSubjectMoveForwardOnlyAndTheLastHandedOutComeBackByGuid) {
    Cursor cursor = EmulatorHost::open(*source, 10, kMessageOrder);
    host->emulator().log().clear();
    std::vector<std::string> const all = expectedMessages(0, false);
    unsigned const n = static_cast<unsigned>(all.size());
    auto idOf = [&](unsigned i) { return all[i].substr(0, all[i].find(' ')); };
    auto at = [&](char const* key) {
        SmartPtr<Record> row;
        EXPECT_OK(cursor->getRow(row));
        return row ? text(*row, key) : "";
    };
    EXPECT_EQ(at("core_event_subject"), "Subject " + idOf(0).substr(0, idOf(0).find('-')));
    EXPECT_EQ(at("core_event_service"), "Facebook");

    int moved = 0;
    unsigned index = 0;
    EXPECT_CODE(cursor->seek(-1, moved), kNotSupported);
    ASSERT_OK(cursor->jump(n - 4));
    EXPECT_OK(cursor->seek(5, moved));
    EXPECT_EQ(moved, 3);
    EXPECT_EQ(at("core_event_serviceid"), idOf(n - 1));
    EXPECT_OK(cursor->curRow(index));
    EXPECT_EQ(index, n - 1);
    ASSERT_OK(cursor->jump(n + 100));
    EXPECT_EQ(at("core_event_serviceid"), idOf(n - 1)) << "a jump past the end stops on the last row";

    // getRows hands out the records from the current row on and does not move.
    ASSERT_OK(cursor->jump(10));
    Vector<SmartPtr<Record>> rows;
    ASSERT_OK(cursor->getRows(3, rows));
    ASSERT_EQ(rows.size(), 3u);
    EXPECT_EQ(text(*rows[2], "core_event_serviceid"), idOf(12));
    EXPECT_EQ(at("core_event_serviceid"), idOf(10));
    EXPECT_TRUE(host->emulator().log().entries().empty()) << "row operations never call the service";

    // Retrieval gives back the records handed out, as they were handed out whatever the host did
    // to its copy, a window at a time: once kHeldRecords are held they are released.
    unsigned const held = MessageCursor::kHeldRecords;
    cursor.reset();  // it holds records of its own
    Cursor fresh = EmulatorHost::open(*source, 10, kMessageOrder);
    rows = {};
    ASSERT_OK(fresh->getRows(held + 10, rows));
    ASSERT_EQ(rows.size(), held + 10);
    SmartPtr<Record> const expected = makeSmart<Record>(*rows[held + 9]);
    ASSERT_OK(rows[held + 9]->insert("core_event_text", Variant("changed by the host")));
    for (unsigned i : {0u, held - 1, held, held + 9}) {
        SCOPED_TRACE(i);
        Record out;
        uError const err = source->retrieve(rows[i]->search("core_object_id")->asGUID(), out, false);
        if (i < held) {
            EXPECT_CODE(err, kNotFound);
            continue;
        }
        ASSERT_OK(err);
        EXPECT_EQ(text(out, "core_event_serviceid"), idOf(i));
        if (i == held + 9) {
            EXPECT_EQ(out, *expected);
        }
    }
}

TEST_F(InboxCursorsTest, FriendRequestsComeOnceAcrossPagesWithKeysetStatements) {
    ASSERT_EQ(requesters.size(), 200u);
    std::vector<std::string> numeric = requesters;
    std::sort(numeric.begin(), numeric.end(), [](auto& a, auto& b) { return std::stoll(a) < std::stoll(b); });
    ASSERT_NE(numeric, requesters) << "text and numeric order of the requesters should differ";

    Cursor cursor = EmulatorHost::open(*source, 12, kRequestOrdering);
    std::time_t const before = std::time(nullptr);
    std::vector<Record> const rows = EmulatorHost::walk(*cursor);
    std::vector<std::string> seen;
    for (Record const& r : rows) seen.push_back(text(r, "core_event_contactid"));
    EXPECT_EQ(seen, requesters);
    unsigned count = 0;
    ASSERT_OK(cursor->numRows(count));
    EXPECT_EQ(count, 200u);
    EXPECT_EQ(host->fqlStatements(),
              (std::vector<std::string>{
                  kRequestBase + kRequestOrder + " asc limit 150",
                  kRequestBase + " and (uid_from > '" + requesters[149] + " ')" + kRequestOrder + " asc limit 150",
                  "select '' from friend_request where (uid_to = '" + kDemoUid + "')",
              }));

    // A request carries no time of its own: it gets the device's time when it is converted.
    int const first = rows.at(0).search("core_object_time")->asInt32();
    EXPECT_GE(first, before);
    std::this_thread::sleep_for(std::chrono::milliseconds(1100));
    ASSERT_OK(cursor->jumpEnd());
    ASSERT_OK(cursor->jumpBeginning());
    SmartPtr<Record> again;
    ASSERT_OK(cursor->getRow(again));
    EXPECT_EQ(text(*again, "core_event_serviceid"), text(rows.at(0), "core_event_serviceid"));
    EXPECT_GT(again->search("core_object_time")->asInt32(), first) << "converted again a second later";
}

}  // namespace
}  // namespace trelm::test
