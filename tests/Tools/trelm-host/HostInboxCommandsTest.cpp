// trelm-host listing inbox messages and friend requests with the demo configuration, run as a user
// runs it against a service emulator that the test starts itself; the records are checked
// against the emulator's data.
#include <algorithm>
#include <map>
#include <memory>
#include <set>
#include <string>
#include <vector>

#include <gtest/gtest.h>
#include <nlohmann/json.hpp>

#include "Emulator.h"
#include "ProgramRunner.h"

using nlohmann::json;

namespace {

using Row = std::map<std::string, std::string>;

class HostInboxCommandsTest : public ::testing::Test {
protected:
    void SetUp() override {
        emu::Emulator::Options options;
        options.threads = 4;
        options.generator.users = 600;
        options.generator.friendRequests = 180;  // more than one page of 150
        options.generator.threadsPerUser = 12;
        options.generator.messagesPerThread = 7;
        emulator_ = std::make_unique<emu::Emulator>(options);
        std::string error;
        ASSERT_TRUE(emulator_->start(error)) << error;
    }

    // Runs the host with JSON-lines output; the records it listed.
    std::vector<json> records(std::vector<std::string> const& command) {
        std::vector<std::string> args{
            "--format", "json", "--state-dir", runner_.folder() + "/state", "--no-emulator",
            "--connect-to", "api.facebook.com:80:127.0.0.1:" + std::to_string(emulator_->httpPort()),
            "--connect-to", "api.facebook.com:443:127.0.0.1:" + std::to_string(emulator_->httpsPort()),
            "--ca-file", emulator_->caFile(), "--config", TRELM_DEMO_CONFIG, "--plugin", TRELMFACEBOOK_MODULE};
        args.insert(args.end(), command.begin(), command.end());
        ProgramRunner::Result result = runner_.run(TRELM_HOST_PROGRAM, args);
        EXPECT_EQ(result.exitCode, 0) << result.err;
        std::vector<json> lines;
        for (std::string const& line : result.outLines()) {
            json object = json::parse(line);
            if (object.at("type") == "record") lines.push_back(object["fields"]);
        }
        return lines;
    }

    // What the service holds, read as the demo user.
    std::vector<Row> fql(std::string const& query) {
        emu::XmlNode root("fql_query_response");
        EXPECT_FALSE(emulator_->store().fqlQuery(emu::DemoAccount::uid, query, root).has_value()) << query;
        std::vector<Row> rows;
        for (emu::XmlNode const& element : root.children) {
            Row& row = rows.emplace_back();
            for (emu::XmlNode const& field : element.children) row[field.name] = field.text;
        }
        return rows;
    }

    std::string nameOf(std::string const& uid) { return fql("select name from user where uid = " + uid).at(0)["name"]; }

    ProgramRunner runner_;
    std::unique_ptr<emu::Emulator> emulator_;
};

TEST_F(HostInboxCommandsTest, MessagesNewestFirstAndEveryFriendRequestOnceWithNames) {
    std::vector<json> messages = records({"query", "messages", "--limit", "5"});
    std::vector<Row> inbox = fql("select message_id, thread_id, author_id, body, created_time from message where "
                                 "thread_id in (select thread_id from thread where folder_id = 0)");
    std::sort(inbox.begin(), inbox.end(), [](Row& a, Row& b) {
        return std::make_pair(std::stoi(b["created_time"]), b["message_id"]) <
               std::make_pair(std::stoi(a["created_time"]), a["message_id"]);
    });
    ASSERT_EQ(messages.size(), 5u);
    for (size_t i = 0; i < messages.size(); ++i) {
        SCOPED_TRACE("message " + std::to_string(i + 1));
        Row& m = inbox[i];
        EXPECT_EQ(messages[i]["core_event_serviceid"], m["thread_id"] + "-" + m["message_id"]);
        EXPECT_EQ(messages[i]["core_object_time"], std::stoi(m["created_time"]));
        EXPECT_EQ(messages[i]["core_event_text"], m["body"]);
        EXPECT_EQ(messages[i]["core_event_contactid"], m["author_id"]);
        EXPECT_EQ(messages[i]["core_event_contactname"], nameOf(m["author_id"]));
    }

    std::multiset<std::string> listed, pending;
    for (json const& f : records({"query", "friend-requests", "--all"})) {
        std::string const uid = f["core_event_contactid"];
        listed.insert(uid);
        EXPECT_EQ(f["core_event_serviceid"], "FriendRequest: " + uid);
        EXPECT_EQ(f["core_event_contactname"], nameOf(uid)) << uid;
    }
    for (Row& r : fql("select uid_from from friend_request where uid_to = me()")) pending.insert(r["uid_from"]);
    ASSERT_EQ(pending.size(), 180u);
    EXPECT_EQ(listed, pending) << "every requester exactly once";
}

}  // namespace
