// trelm-host sync and items, run as a user runs them against a service emulator the test starts
// itself (its data in a file of the scratch folder, so that the test can take items away between
// runs); what the store holds is checked against the emulator's data and its request log.
#include <signal.h>
#include <sqlite3.h>

#include <fstream>
#include <future>
#include <map>
#include <set>
#include <string>
#include <vector>

#include "EmulatedHost.h"

using nlohmann::json;

namespace {

std::string const kDemo = std::to_string(emu::DemoAccount::uid);
char const* const kContactWindow = "from user where uid in (select uid2 from friend where uid1=";

class SyncCommandTest : public ::testing::Test {
protected:
    void start(emu::GeneratorOptions generator = {}) {
        emu::Emulator::Options options;
        options.databasePath = serviceDatabase();
        options.generator = generator;
        h.restart(options);
    }

    // Each kind's summary line of a sync, by kind.
    static std::map<std::string, json> synced(ProgramRunner::Result const& result) {
        std::map<std::string, json> byKind;
        for (json const& line : linesOfType(result, "synced")) byKind[line["kind"]] = line;
        return byKind;
    }

    // The stored items of `kind`: service id to the item line, without what every run changes.
    std::map<std::string, json> stored(std::string const& kind, bool removed = false) {
        std::vector<std::string> command{"items", kind};
        if (removed) command.push_back("--removed");
        ProgramRunner::Result result = h.run(command);
        EXPECT_EQ(result.exitCode, 0) << result.err;
        std::map<std::string, json> items;
        for (json item : linesOfType(result, "item")) {
            item.erase("index");
            item.erase("last_seen");
            EXPECT_TRUE(items.emplace(item["service_id"], item).second) << "stored twice: " << item["service_id"];
        }
        return items;
    }

    // The service ids of a kind as the emulator holds them for `uid`.
    std::set<std::string> serviceIds(std::string const& kind, std::int64_t uid = emu::DemoAccount::uid) {
        std::set<std::string> ids;
        if (kind == "status") {
            for (auto const& post : h.statusPosts(uid)) {
                std::string const id = post.search("post_id")->str();
                ids.insert(id.substr(id.find('_') + 1));
            }
            return ids;
        }
        // A service id is the row's fields joined, as the source makes it.
        std::string const me = std::to_string(uid);
        std::string const friends = "(select uid2 from friend where uid1 = " + me + ")";
        std::map<std::string, std::string> const statements{
            {"contacts", "select uid from user where uid in " + friends},
            {"photos", "select pid from photo where aid in (select aid from album where owner in " + friends + ")"},
            {"media", "select pid from photo where owner = " + me},
            {"albums", "select aid from album where owner = " + me},
            {"friend-requests", "select uid_from from friend_request where uid_to = " + me},
            {"photo-tags", "select pid, subject from photo_tag where subject = " + me},
            {"messages",
             "select thread_id, message_id from message where thread_id in (select thread_id from thread "
             "where folder_id = 0)"},
        };
        emu::XmlNode root("fql_query_response");
        EXPECT_FALSE(h.emulator->store().fqlQuery(uid, statements.at(kind), root).has_value()) << kind;
        for (emu::XmlNode const& row : root.children) {
            std::string id =
                kind == "friend-requests" ? "FriendRequest: " + row.children[0].text : row.children[0].text;
            if (row.children.size() == 2) id += (kind == "messages" ? "-" : " ") + row.children[1].text;
            ids.insert(id);
        }
        return ids;
    }

    void removeFriend(std::string const& uid) {
        sqlite3* db = nullptr;
        ASSERT_EQ(sqlite3_open(serviceDatabase().c_str(), &db), SQLITE_OK);
        std::string const sql = "DELETE FROM friend WHERE (uid1 = " + kDemo + " AND uid2 = " + uid +
                                ") OR (uid1 = " + uid + " AND uid2 = " + kDemo + ")";
        EXPECT_EQ(sqlite3_exec(db, sql.c_str(), nullptr, nullptr, nullptr), SQLITE_OK) << sqlite3_errmsg(db);
        EXPECT_EQ(sqlite3_changes(db), 2);
        sqlite3_close(db);
    }
    std::string serviceDatabase() const { return h.runner.folder() + "/service.db"; }

    EmulatedHost h{std::nullopt};
};

std::set<std::string> keys(std::map<std::string, json> const& items) {
    std::set<std::string> out;
    for (auto const& [id, item] : items) out.insert(id);
    return out;
}

// A kind's summary as [complete, added, changed, unchanged, removed].
json counts(json const& s) { return {s["complete"], s["added"], s["changed"], s["unchanged"], s["removed"]}; }

// The third call of the method fails with a service error (after the host's retries).
emu::FaultRule const kThirdCallFails{.every = 3, .errorCode = 1};

TEST_F(SyncCommandTest, FirstSyncStoresEveryItemOnceAndTheSecondChangesNothingAndKeepsHostIds) {
    start();
    ProgramRunner::Result first = h.run({"sync"});
    ASSERT_EQ(first.exitCode, 0) << first.err;
    std::map<std::string, json> const summaries = synced(first);
    ASSERT_EQ(summaries.size(), 8u);
    std::map<std::string, std::map<std::string, json>> before;
    for (auto const& [kind, summary] : summaries) {
        SCOPED_TRACE(kind);
        std::set<std::string> const expected = serviceIds(kind);
        EXPECT_FALSE(expected.empty());
        EXPECT_EQ(counts(summary), json({true, expected.size(), 0, 0, 0}));
        before[kind] = stored(kind);
        EXPECT_EQ(keys(before[kind]), expected);
    }

    // Two syncs of one store at once: the second waits for the first, and neither spoils the
    // other's passes.
    ProgramRunner otherRunner;
    std::vector<std::string> args = h.arguments({"--format", "json", "sync"});
    auto other = std::async(std::launch::async, [&] { return otherRunner.run(TRELM_HOST_PROGRAM, args); });
    ProgramRunner::Result second = h.run({"sync"});
    ProgramRunner::Result const third = other.get();
    ASSERT_EQ(second.exitCode, 0) << second.err;
    ASSERT_EQ(third.exitCode, 0) << third.err;
    for (auto const& [kind, summary] : synced(second)) {
        SCOPED_TRACE(kind);
        EXPECT_EQ(counts(summary), json({true, 0, 0, before[kind].size(), 0}));
        EXPECT_EQ(stored(kind), before[kind]) << "the same host ids, fields and first-seen times";
    }
}

TEST_F(SyncCommandTest, RemovedFriendIsMarkedOnlyAfterACompletePass) {
    emu::GeneratorOptions generator;
    generator.demoFriends = 400;  // windows of 150, 150 and 100
    generator.users = 1000;
    start(generator);
    ASSERT_EQ(h.run({"sync", "contacts"}).exitCode, 0);
    std::map<std::string, json> const before = stored("contacts");
    ASSERT_EQ(before.size(), 400u);
    std::string const gone = before.begin()->first;
    removeFriend(gone);

    // The third window fails and the pass stops there: nothing may be marked removed.
    h.emulator->faults().set("fql.query", kThirdCallFails);
    ProgramRunner::Result partial = h.run({"sync", "contacts"});
    EXPECT_EQ(partial.exitCode, 3);
    EXPECT_NE(partial.err.find("the next sync continues where each stopped"), std::string::npos) << partial.err;
    EXPECT_EQ(counts(synced(partial)["contacts"]), json({false, 0, 0, 300, 0}));
    EXPECT_TRUE(stored("contacts").count(gone));

    h.emulator->faults().clearAll();
    ProgramRunner::Result rest = h.run({"sync", "contacts"});
    ASSERT_EQ(rest.exitCode, 0) << rest.err;
    EXPECT_EQ(counts(synced(rest)["contacts"]), json({true, 0, 0, 99, 1}));
    std::map<std::string, json> const after = stored("contacts", true);
    ASSERT_EQ(after.size(), 400u);
    EXPECT_TRUE(after.at(gone)["deleted"]);
    EXPECT_EQ(after.at(gone)["host_id"], before.at(gone)["host_id"]);
    EXPECT_EQ(stored("contacts").size(), 399u);
}

// How a sync is stopped: a service error on the third use of `method`, or SIGKILL while the
// windows come slowly. Contacts (5,000 of them) continue after the last id committed; the kinds
// that come newest first at the time of the last row committed.
struct Interruption {
    char const* name;
    char const* kind;
    char const* method;
    bool kill;
    int postsPerSecond = 0;  // not 0: posts share seconds at window boundaries
};

class InterruptedSyncTest : public SyncCommandTest, public ::testing::WithParamInterface<Interruption> {};

TEST_P(InterruptedSyncTest, NextSyncAsksOnlyForTheWindowsNotCommittedAndStoresEachItemOnce) {
    Interruption const& c = GetParam();
    bool const contacts = std::string(c.kind) == "contacts";
    emu::GeneratorOptions generator;
    if (contacts) {
        generator.demoFriends = 5000;
        generator.users = 10100;
    }
    if (c.postsPerSecond != 0) {
        generator.postsPerSecond = c.postsPerSecond;
        generator.postsPerUser = 8;
    }
    start(generator);
    h.emulator->faults().set(c.method, c.kill ? emu::FaultRule{.delayMs = 150} : kThirdCallFails);
    ProgramRunner::Result stopped = h.run({"sync", c.kind}, "json", {}, c.kill ? SIGKILL : 0, 1500);
    EXPECT_EQ(stopped.exitCode, c.kill ? -1 : 3);
    std::map<std::string, json> const committed = stored(c.kind);
    std::set<std::string> const expected = serviceIds(c.kind);
    ASSERT_GT(committed.size(), 0u);
    ASSERT_LT(committed.size(), expected.size());

    h.emulator->faults().clearAll();
    h.emulator->log().clear();
    ProgramRunner::Result rest = h.run({"sync", c.kind});
    ASSERT_EQ(rest.exitCode, 0) << rest.err;
    json const begun = linesOfType(rest, "sync").at(0);
    EXPECT_TRUE(begun["continued"]);
    EXPECT_EQ(synced(rest)[c.kind]["added"], expected.size() - committed.size());
    EXPECT_EQ(keys(stored(c.kind)), expected);
    if (!contacts) {
        EXPECT_EQ(begun["from"].get<std::string>().rfind("core_object_time<=", 0), 0u) << begun;
        return;
    }
    if (!c.kill) {
        EXPECT_EQ(committed.size(), 300u) << "the two windows before the failed one";
    }
    std::string const last = *keys(committed).rbegin();  // the windows come in the text order of the ids
    EXPECT_EQ(begun["from"], "core_contact_service_id>" + last);
    std::vector<std::string> windows;
    for (emu::LoggedRequest const& request : h.requests("fql.query")) {
        if (request.fql.find(kContactWindow) != std::string::npos) windows.push_back(request.fql);
    }
    EXPECT_EQ(windows.size(), (5000 - committed.size()) / 150 + 1);
    for (std::string const& statement : windows) {
        EXPECT_NE(statement.find("concat(uid,' ') > '" + last + " '"), std::string::npos)
            << "a committed window asked again: " << statement;
    }
}

INSTANTIATE_TEST_SUITE_P(Stops, InterruptedSyncTest,
                         ::testing::Values(Interruption{"ServiceError", "contacts", "fql.query", false},
                                           Interruption{"Killed", "contacts", "fql.query", true},
                                           Interruption{"StatusServiceError", "status", "stream.get", false, 6},
                                           Interruption{"PhotosServiceError", "photos", "fql.query", false}),
                         [](auto const& info) { return std::string(info.param.name); });

TEST_F(SyncCommandTest, PostsSharingASecondWithAWindowsLastPostAreStoredOnce) {
    emu::GeneratorOptions generator;
    generator.postsPerSecond = 6;
    generator.postsPerUser = 8;
    start(generator);
    ProgramRunner::Result result = h.run({"sync", "status"});
    ASSERT_EQ(result.exitCode, 0) << result.err;
    json const summary = synced(result)["status"];
    EXPECT_GT(summary["boundary_seconds"], 0);
    EXPECT_GT(summary["recovered"], 0) << "the cursor alone leaves posts of its windows' last seconds out";
    std::set<std::string> const expected = serviceIds("status");
    EXPECT_EQ(summary["added"], expected.size());
    EXPECT_EQ(keys(stored("status")), expected);
}

TEST_F(SyncCommandTest, AnotherPersonsSignInWipesTheStoreAndTheSameOneAgainDoesNot) {
    start();
    ASSERT_EQ(h.run({"sync", "contacts"}).exitCode, 0);
    std::size_t const demoContacts = stored("contacts").size();

    json config = json::parse(std::ifstream(TRELM_DEMO_CONFIG));
    config["components"][0]["config"]["facebook_source_login"] = emu::SecondAccount::email;
    config["components"][0]["config"]["facebook_source_password"] = emu::SecondAccount::password;
    h.useConfig(config.dump());
    std::int64_t const secondUid =
        *h.emulator->store().checkLogin(emu::SecondAccount::email, emu::SecondAccount::password);

    ProgramRunner::Result switched = h.run({"sync", "contacts"});
    ASSERT_EQ(switched.exitCode, 0) << switched.err;
    std::vector<json> wiped = linesOfType(switched, "wiped");
    ASSERT_EQ(wiped.size(), 1u);
    EXPECT_EQ(wiped[0]["items"], demoContacts);
    std::map<std::string, json> const theirs = stored("contacts");
    EXPECT_EQ(keys(theirs), serviceIds("contacts", secondUid));
    for (auto const& [id, item] : theirs) EXPECT_EQ(item["account"], std::to_string(secondUid)) << id;
    EXPECT_EQ(synced(switched)["contacts"]["added"], theirs.size());

    // The same person signing in again (the stored session dropped) keeps every item.
    ASSERT_EQ(h.run({"state", "reset", "facebook", "facebook_source_session_id"}).exitCode, 0);
    ProgramRunner::Result again = h.run({"sync", "contacts"});
    ASSERT_EQ(again.exitCode, 0) << again.err;
    EXPECT_EQ(linesOfType(again, "login").at(0)["session"], "new");
    EXPECT_TRUE(linesOfType(again, "wiped").empty());
    EXPECT_EQ(synced(again)["contacts"]["unchanged"], theirs.size());
    EXPECT_EQ(stored("contacts"), theirs);
}

}  // namespace
