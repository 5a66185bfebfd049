// trelm-host's listings of status posts, photo events, inbox messages and friend requests, checked
// against the emulator's data.
#include <algorithm>
#include <map>
#include <set>
#include <string>
#include <vector>

#include "EmulatedHost.h"

using nlohmann::json;

namespace {

using emu::test::Row;
using Expected = std::map<std::string, json>;  // keys a listed record must show, with their values

// Against the host's own embedded emulator: the expected records are read from an emulator
// started here with the same (default) generator options, which holds the same data.
TEST(HostEventQueryTest, StatusAndPhotoListingsShowTheEmulatorsPostsAndPhotos) {
    EmulatedHost h;
    // The first five status posts of the stream from `endTime` down (0: the newest).
    auto statuses = [&h](int endTime) {
        std::vector<Expected> out;
        for (auto const& post : h.statusPosts(emu::DemoAccount::uid, endTime)) {
            if (out.size() == 5) break;
            auto field = [&](char const* name) { return post.search(name)->str(); };
            std::string const id = field("post_id");
            out.push_back({{"core_object_type", 4},
                           {"core_event_serviceid", id.substr(id.find('_') + 1)},
                           {"core_object_time", std::stoi(field("created_time"))},
                           {"core_event_text", field("message")},
                           {"core_event_contactid", field("source_id")},
                           {"core_event_contactname", h.nameOf(field("source_id"))},
                           {"core_event_contactfullname", h.nameOf(field("source_id"))}});
        }
        return out;
    };
    // The first five of the friends' photos from `endTime` down, newest first, then by id.
    auto photos = [&h](int endTime) {
        std::vector<Row> rows = h.fql(
            "select pid,aid,owner,src,caption,created from photo where aid in (select aid from album where owner in "
            "(select uid2 from friend where uid1=me())) and created <= " +
            std::to_string(endTime));
        std::sort(rows.begin(), rows.end(), [](Row const& a, Row const& b) {
            return std::make_pair(std::stoi(a.at("created")), a.at("pid")) >
                   std::make_pair(std::stoi(b.at("created")), b.at("pid"));
        });
        std::vector<Expected> out;
        for (std::size_t i = 0; i < std::min<std::size_t>(5, rows.size()); ++i) {
            Row& row = rows[i];
            out.push_back({{"core_object_type", 5},
                           {"core_event_serviceid", row["pid"]},
                           {"core_object_time", std::stoi(row["created"])},
                           {"core_event_text", row["caption"]},
                           {"core_event_parent_serviceid", row["aid"]},
                           {"core_event_uri", row["src"]},
                           {"core_event_contactid", row["owner"]},
                           {"core_event_contactname", h.nameOf(row["owner"])}});
        }
        return out;
    };
    std::string const recent = "core_object_time<=1277000000";  // within the generated half year
    struct Case {
        std::vector<std::string> command;
        std::vector<Expected> expected;
    };
    std::vector<Case> const cases = {
        {{"query", "status", "--limit", "5"}, statuses(0)},
        {{"query", "photos", "--limit", "5"}, photos(2000000000)},
        {{"query", "status", "--limit", "5", "--where", recent}, statuses(1277000000)},
        {{"query", "photos", "--limit", "5", "--where", recent}, photos(1277000000)},
    };
    for (Case const& c : cases) {
        SCOPED_TRACE(c.command[1] + " " + c.command.back());
        ASSERT_EQ(c.expected.size(), 5u);
        std::vector<std::string> args{"--format",        "json",     "--state-dir",       h.stateDir(), "--config",
                                      TRELM_DEMO_CONFIG, "--plugin", TRELMFACEBOOK_MODULE};
        args.insert(args.end(), c.command.begin(), c.command.end());
        ProgramRunner::Result const result = h.runner.run(TRELM_HOST_PROGRAM, args);
        ASSERT_EQ(result.exitCode, 0) << result.err;
        std::vector<json> records = linesOfType(result, "record");
        ASSERT_EQ(records.size(), 5u);
        for (std::size_t i = 0; i < records.size(); ++i) {
            for (auto const& [key, value] : c.expected[i]) {
                EXPECT_EQ(records[i]["fields"][key], value) << "record " << i + 1 << ", " << key;
            }
            EXPECT_EQ(records[i]["fields"]["core_event_service"], "Facebook");
        }
    }
}

emu::Emulator::Options inboxOptions() {
    emu::Emulator::Options options;
    options.generator.users = 600;
    options.generator.friendRequests = 180;  // more than one page of 150
    options.generator.threadsPerUser = 12;
    options.generator.messagesPerThread = 7;
    return options;
}

TEST(HostInboxCommandsTest, MessagesNewestFirstAndEveryFriendRequestOnceWithNames) {
    EmulatedHost host(inboxOptions());
    std::vector<json> messages = host.records({"query", "messages", "--limit", "5"});
    std::vector<Row> inbox = host.fql(
        "select message_id, thread_id, author_id, body, created_time from message where "
        "thread_id in (select thread_id from thread where folder_id = 0)");
    std::sort(inbox.begin(), inbox.end(), [](Row& a, Row& b) {
        return std::make_pair(std::stoi(b["created_time"]), b["message_id"]) <
               std::make_pair(std::stoi(a["created_time"]), a["message_id"]);
    });
    ASSERT_EQ(messages.size(), 5u);
    for (size_t i = 0; i < messages.size(); ++i) {
        Row& m = inbox[i];
        json const expected = {{"core_event_serviceid", m["thread_id"] + "-" + m["message_id"]},
                               {"core_object_time", std::stoi(m["created_time"])},
                               {"core_event_text", m["body"]},
                               {"core_event_contactid", m["author_id"]},
                               {"core_event_contactname", host.nameOf(m["author_id"])}};
        for (auto const& [key, value] : expected.items()) EXPECT_EQ(messages[i][key], value) << i << " " << key;
    }

    std::multiset<std::string> listed, pending;
    for (json const& f : host.records({"query", "friend-requests", "--all"})) {
        std::string const uid = f["core_event_contactid"];
        listed.insert(uid);
        EXPECT_EQ(f["core_event_serviceid"], "FriendRequest: " + uid);
        EXPECT_EQ(f["core_event_contactname"], host.nameOf(uid)) << uid;
    }
    for (Row& r : host.fql("select uid_from from friend_request where uid_to = me()")) pending.insert(r["uid_from"]);
    ASSERT_EQ(pending.size(), 180u);
    EXPECT_EQ(listed, pending) << "every requester exactly once";
}

}  // namespace
