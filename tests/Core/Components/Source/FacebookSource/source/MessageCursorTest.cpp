#include <gtest/gtest.h>

#include <algorithm>
#include <map>
#include <set>
#include <string>
#include <tuple>
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
using Row = std::map<std::string, std::string>;

constexpr char const* kSourceName = "facebook";
// Three pages of threads (20, 20, 5) and two of messages per thread (50, 10).
constexpr int kThreads = 45;
constexpr int kMessagesPerThread = 60;

struct Message {
    int time;
    std::string mid;
    std::string tid;
    int seq;  // the message's place in its thread, which orders equal times in the mailbox answers
    std::string author;
    std::string body;
};

struct Thread {
    std::string tid;
    int updated;
    std::vector<Message> messages;  // as the service pages them: newest first
};

// One mailbox request, as the emulator logged it.
using Request = std::tuple<std::string, std::string, int>;  // method, thread id, start

Vector<Column> messageOrdering() {
    return Vector<Column>{{Metadata::Key("core_object_time", TRELM_TYPES::INT32), false},
                          {Metadata::Key("core_event_service", TRELM_TYPES::STRING), false},
                          {Metadata::Key("core_event_serviceid", TRELM_TYPES::STRING), false}};
}

Constraint typeIsMessage() {
    return Constraint{Metadata::Key("core_object_type", TRELM_TYPES::INT32), Variant(10), Constraint::Equal};
}

Constraint timeBound(Variant value, Constraint::Function function) {
    return Constraint{Metadata::Key("core_object_time", TRELM_TYPES::INT32), std::move(value), function};
}

std::string text(Map<String, Variant> const& record, char const* key) {
    Variant const* v = record.search(key);
    return v ? v->asString().str() : "<missing>";
}

// The demo user's mailbox of 45 threads of 60 messages. The reference copy is read through the
// FQL tables "thread" and "message", not through the mailbox calls the cursor uses.
class MessageCursorTest : public ::testing::Test {
protected:
    static void SetUpTestSuite() {
        emu::GeneratorOptions generator;
        generator.users = 300;
        generator.demoFriends = 40;
        generator.friendsPerUser = 2;
        generator.albumsPerUser = 0;
        generator.postsPerUser = 0;
        generator.friendRequests = 0;
        generator.threadsPerUser = kThreads;
        generator.messagesPerThread = kMessagesPerThread;
        host = new EmulatorHost(generator);
        std::string error;
        ASSERT_TRUE(host->start(error)) << error;
        source = &host->addSource(host->demoGroup(kSourceName, true));
        readReference();
    }

    static void TearDownTestSuite() {
        delete host;
        host = nullptr;
        threads.clear();
        names.clear();
    }

    void SetUp() override { host->emulator().log().clear(); }

    static std::vector<Row> fql(std::string const& query, std::string const& rowElement) {
        Vector<Map<String, String>> rows;
        unsigned count = 0;
        EXPECT_OK(host->demoClient()->runFqlQuery(String(query), String(rowElement), rows, 0, count));
        std::vector<Row> out;
        for (auto const& row : rows) {
            Row r;
            for (auto const& [k, v] : row) r[k.str()] = v.str();
            out.push_back(r);
        }
        return out;
    }

    static void readReference() {
        std::map<std::string, Thread> byId;
        for (Row const& r : fql("select thread_id, updated_time from thread where folder_id = 0", "thread")) {
            byId[r.at("thread_id")] = Thread{r.at("thread_id"), std::stoi(r.at("updated_time")), {}};
        }
        std::set<std::string> authors;
        for (Row const& r : fql("select message_id, thread_id, author_id, body, created_time from message where "
                                "thread_id in (select thread_id from thread where folder_id = 0)",
                                "message")) {
            std::string const mid = r.at("message_id");
            int const seq = std::stoi(mid.substr(mid.find('_') + 1));
            byId.at(r.at("thread_id"))
                .messages.push_back(Message{std::stoi(r.at("created_time")), mid, r.at("thread_id"), seq,
                                            r.at("author_id"), r.at("body")});
            authors.insert(r.at("author_id"));
        }
        for (auto& [id, thread] : byId) {
            std::sort(thread.messages.begin(), thread.messages.end(), [](Message const& a, Message const& b) {
                return a.time != b.time ? a.time > b.time : a.seq > b.seq;
            });
            threads.push_back(thread);
        }
        std::sort(threads.begin(), threads.end(), [](Thread const& a, Thread const& b) {
            return a.updated != b.updated ? a.updated > b.updated : std::stoll(a.tid) > std::stoll(b.tid);
        });
        std::string list;
        for (std::string const& a : authors) list += (list.empty() ? "" : ",") + a;
        for (Row const& r : fql("select uid, name from user where uid in (" + list + ")", "user")) {
            names[r.at("uid")] = r.at("name");
        }
        host->emulator().log().clear();
    }

    // Every message sent at or after `bound` (after it when `exclusive`), in the cursor's order.
    static std::vector<Message> expectedMessages(int bound, bool exclusive) {
        std::vector<Message> all;
        for (Thread const& t : threads) {
            for (Message const& m : t.messages) {
                if (m.time > bound || (m.time == bound && !exclusive)) all.push_back(m);
            }
        }
        std::sort(all.begin(), all.end(), [](Message const& a, Message const& b) {
            return a.time != b.time ? a.time > b.time : a.mid > b.mid;
        });
        return all;
    }

    // The mailbox requests of a reading that stops at the first thread and the first message
    // older than the bound: threads 20 at a time, messages 50 at a time, each offset grown by
    // the length of the page before, each until an empty page.
    static std::vector<Request> expectedRequests(int bound, bool exclusive) {
        auto older = [&](int t) { return t < bound || (t == bound && exclusive); };
        std::vector<Request> requests;
        for (size_t offset = 0;;) {
            requests.emplace_back("mailbox.getInbox", "", static_cast<int>(offset));
            size_t const end = std::min(threads.size(), offset + 20);
            if (offset >= end) return requests;
            for (size_t i = offset; i < end; ++i) {
                Thread const& t = threads[i];
                if (older(t.updated)) return requests;
                std::vector<Message> const& m = t.messages;
                for (size_t start = 0;;) {
                    requests.emplace_back("mailbox.getThreadMessages", t.tid, static_cast<int>(start));
                    size_t const last = std::min(m.size(), start + 50);
                    if (start >= last) break;
                    if (std::any_of(m.begin() + static_cast<long>(start), m.begin() + static_cast<long>(last),
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
            if (r.method.find("mailbox.") == std::string::npos) continue;
            std::string const method = r.method.substr(r.method.find("mailbox."));
            EXPECT_EQ(r.args.at("limit"), method == "mailbox.getInbox" ? "20" : "50");
            auto tid = r.args.find("tid");
            out.emplace_back(method, tid == r.args.end() ? "" : tid->second, std::stoi(r.args.at("start")));
        }
        return out;
    }

    static uError open(std::vector<Constraint> const& extra, Cursor& cursor, Vector<Column> columns = messageOrdering()) {
        Vector<Constraint> constraints{typeIsMessage()};
        for (Constraint const& c : extra) EXPECT_OK(constraints.pushBack(c));
        IQueryItems::StartQueryMessage msg(columns, constraints);
        uError err = source->onMessage(msg);
        cursor = msg.cursor;
        return err;
    }

    // Every record from the current row on, by getRow and seek(1).
    static std::vector<Map<String, Variant>> walk(Cursor const& cursor) {
        std::vector<Map<String, Variant>> rows;
        int moved = 1;
        while (moved == 1) {
            SmartPtr<Map<String, Variant>> row;
            uError err = cursor->getRow(row);
            if (err.code() == kNoData) break;
            EXPECT_OK(err);
            rows.push_back(*row);
            EXPECT_OK(cursor->seek(1, moved));
        }
        return rows;
    }

    static void expectRecordsAre(std::vector<Map<String, Variant>> const& rows, std::vector<Message> const& want) {
        ASSERT_EQ(rows.size(), want.size());
        std::set<GUID> guids;
        for (size_t i = 0; i < rows.size(); ++i) {
            SCOPED_TRACE("row " + std::to_string(i));
            Message const& m = want[i];
            EXPECT_EQ(text(rows[i], "core_event_serviceid"), m.tid + "-" + m.mid);
            EXPECT_EQ(rows[i].search("core_object_time")->asInt32(), m.time);
            EXPECT_EQ(text(rows[i], "core_event_contactid"), m.author);
            EXPECT_EQ(text(rows[i], "core_event_contactname"), names.at(m.author));
            EXPECT_EQ(text(rows[i], "core_event_text"), m.body);
            EXPECT_EQ(text(rows[i], "core_event_subject"), "Subject " + m.tid);
            EXPECT_EQ(rows[i].search("core_object_type")->asInt32(), 10);
            EXPECT_EQ(text(rows[i], "core_event_service"), "Facebook");
            EXPECT_EQ(text(rows[i], "core_object_source"), kSourceName);
            EXPECT_EQ(text(rows[i], "core_object_origin_importcomponent"), kSourceName);
            EXPECT_EQ(text(rows[i], "core_object_origin_servicename"), "Facebook");
            EXPECT_EQ(text(rows[i], "core_object_deleted"), "false");
            guids.insert(rows[i].search("core_object_id")->asGUID());
        }
        EXPECT_EQ(guids.size(), rows.size()) << "every message has a GUID of its own";
    }

    static EmulatorHost* host;
    static FacebookSource* source;
    static std::vector<Thread> threads;               // newest update first
    static std::map<std::string, std::string> names;  // of the authors
};

EmulatorHost* MessageCursorTest::host = nullptr;
FacebookSource* MessageCursorTest::source = nullptr;
std::vector<Thread> MessageCursorTest::threads;
std::map<std::string, std::string> MessageCursorTest::names;

TEST_F(MessageCursorTest, WholeMailboxEveryMessageOnceNewestFirstTiesByDescendingIdNamesInOneLookup) {
    std::vector<Message> const want = expectedMessages(0, false);
    ASSERT_EQ(want.size(), size_t(kThreads * kMessagesPerThread));
    bool sawTie = false;
    for (size_t i = 1; i < want.size(); ++i) sawTie = sawTie || want[i].time == want[i - 1].time;
    ASSERT_TRUE(sawTie) << "the mailbox should hold messages sent in the same second";

    Cursor cursor;
    ASSERT_OK(open({}, cursor));
    expectRecordsAre(walk(cursor), want);
    unsigned count = 0;
    EXPECT_OK(cursor->numRows(count));
    EXPECT_EQ(count, want.size());

    EXPECT_EQ(loggedRequests(), expectedRequests(0, false));
    // One statement names every author once, in text order.
    std::string list;
    for (auto const& [uid, name] : names) list += (list.empty() ? "" : ",") + uid;
    EXPECT_EQ(host->fqlStatements(), std::vector<std::string>{"select uid,name from user where uid in (" + list + ")"});
}

TEST_F(MessageCursorTest, TimeBoundKeepsOrDropsTheMessageAtTheBoundAndFetchesNoOlderPage) {
    // A bound inside the mailbox: some threads are read in part, the oldest not at all.
    std::vector<Message> const all = expectedMessages(0, false);
    Message const& atBound = all[all.size() / 3];
    struct Case {
        Constraint::Function function;
        bool exclusive;
    };
    for (Case const c : {Case{Constraint::GreaterOrEqual, false}, Case{Constraint::GreaterThan, true}}) {
        SCOPED_TRACE(c.exclusive ? "greater than" : "greater or equal");
        host->emulator().log().clear();
        Cursor cursor;
        ASSERT_OK(open({timeBound(Variant(atBound.time), c.function)}, cursor));
        std::vector<Message> const want = expectedMessages(atBound.time, c.exclusive);
        bool const keptAtBound = std::any_of(want.begin(), want.end(), [&](Message const& m) { return m.mid == atBound.mid; });
        EXPECT_EQ(keptAtBound, !c.exclusive);
        expectRecordsAre(walk(cursor), want);

        std::vector<Request> const requests = expectedRequests(atBound.time, c.exclusive);
        EXPECT_EQ(loggedRequests(), requests);
        EXPECT_LT(requests.size(), expectedRequests(0, false).size()) << "the bound saves requests";
    }
}

TEST_F(MessageCursorTest, RowOperationsMoveForwardOnlyOverTheOrderedRecords) {
    Cursor cursor;
    ASSERT_OK(open({}, cursor));
    std::vector<Message> const all = expectedMessages(0, false);
    unsigned const n = static_cast<unsigned>(all.size());
    auto idAt = [&]() {
        SmartPtr<Map<String, Variant>> row;
        EXPECT_OK(cursor->getRow(row));
        return row ? text(*row, "core_event_serviceid") : "";
    };
    auto idOf = [&](unsigned i) { return all[i].tid + "-" + all[i].mid; };
    unsigned index = 0;
    int moved = 0;

    EXPECT_EQ(idAt(), idOf(0)) << "a started cursor stands on its first row";
    EXPECT_CODE(cursor->seek(-1, moved), kNotSupported);

    ASSERT_OK(cursor->jump(n - 4));
    EXPECT_OK(cursor->seek(5, moved));
    EXPECT_EQ(moved, 3) << "three rows after the current one";
    EXPECT_EQ(idAt(), idOf(n - 1));
    EXPECT_OK(cursor->curRow(index));
    EXPECT_EQ(index, n - 1);

    ASSERT_OK(cursor->jump(n + 100));
    EXPECT_EQ(idAt(), idOf(n - 1)) << "a jump past the end stops on the last row";
    ASSERT_OK(cursor->jumpEnd());
    EXPECT_OK(cursor->seek(1, moved));
    EXPECT_EQ(moved, 0);

    ASSERT_OK(cursor->jump(10));
    EXPECT_OK(cursor->curRow(index));
    EXPECT_EQ(index, 10u);
    EXPECT_OK(cursor->seek(0, moved));
    EXPECT_EQ(moved, 0);

    // getRows hands out copies from the current row on and does not move.
    Vector<SmartPtr<Map<String, Variant>>> rows;
    ASSERT_OK(cursor->getRows(3, rows));
    ASSERT_EQ(rows.size(), 3u);
    for (unsigned i = 0; i < 3; ++i) EXPECT_EQ(text(*rows[i], "core_event_serviceid"), idOf(10 + i));
    EXPECT_OK(rows[0]->insert("core_event_text", Variant("changed by the host")));
    SmartPtr<Map<String, Variant>> again;
    ASSERT_OK(cursor->getRow(again));
    EXPECT_EQ(text(*again, "core_event_serviceid"), idOf(10));
    EXPECT_EQ(text(*again, "core_event_text"), all[10].body) << "the host's copy is its own";

    ASSERT_OK(cursor->jumpBeginning());
    EXPECT_EQ(idAt(), idOf(0));
    EXPECT_TRUE(host->emulator().log().entriesFor("mailbox.getInbox").size() > 0);
    size_t const requests = host->emulator().log().entries().size();
    ASSERT_OK(cursor->jump(7));
    EXPECT_OK(cursor->numRows(index));
    EXPECT_EQ(host->emulator().log().entries().size(), requests) << "row operations never call the service";
}

TEST_F(MessageCursorTest, BoundBeyondTheNewestMessageGivesAnEmptyCursorAfterOneThreadPage) {
    Cursor cursor;
    ASSERT_OK(open({timeBound(Variant(threads.front().updated), Constraint::GreaterThan)}, cursor));
    EXPECT_EQ(loggedRequests(), (std::vector<Request>{{"mailbox.getInbox", "", 0}}));
    SmartPtr<Map<String, Variant>> row;
    EXPECT_CODE(cursor->getRow(row), kNoData);
    EXPECT_FALSE(row);
    int moved = 5;
    EXPECT_CODE(cursor->seek(1, moved), kNoData);
    EXPECT_EQ(moved, 0);
    unsigned count = 1;
    EXPECT_OK(cursor->numRows(count));
    EXPECT_EQ(count, 0u);
    EXPECT_CODE(cursor->curRow(count), kNoData);
    EXPECT_TRUE(host->fqlStatements().empty()) << "no authors, no name lookup";
}

TEST_F(MessageCursorTest, QueriesTheCursorCannotServeFailBeforeAnyRequest) {
    Vector<Column> ascending = messageOrdering();
    ascending[0].flag = true;
    Vector<Column> shortOrdering{messageOrdering()[0], messageOrdering()[1]};
    Constraint const other{Metadata::Key("core_event_text", TRELM_TYPES::STRING), Variant("x"), Constraint::Equal};
    struct Case {
        char const* name;
        std::vector<Constraint> constraints;
        Vector<Column> columns;
    };
    std::vector<Case> const cases = {
        {"ascending time", {}, ascending},
        {"ordering of two entries", {}, shortOrdering},
        {"no ordering", {}, Vector<Column>{}},
        {"two time bounds",
         {timeBound(Variant(5), Constraint::GreaterOrEqual), timeBound(Variant(6), Constraint::GreaterThan)},
         messageOrdering()},
        {"upper time bound", {timeBound(Variant(5), Constraint::LessThan)}, messageOrdering()},
        {"equal time", {timeBound(Variant(5), Constraint::Equal)}, messageOrdering()},
        {"time that is no number", {timeBound(Variant("soon"), Constraint::GreaterOrEqual)}, messageOrdering()},
        {"another key", {other}, messageOrdering()},
    };
    for (Case const& c : cases) {
        SCOPED_TRACE(c.name);
        Cursor cursor;
        EXPECT_CODE(open(c.constraints, cursor, c.columns), kInvalid);
        EXPECT_FALSE(cursor);
    }
    EXPECT_TRUE(host->emulator().log().entries().empty());
}

}  // namespace
}  // namespace trelm::test
