// trelm-host listing inbox messages and friend requests, run as a user runs it against a service
// emulator that the test starts itself; the records are checked against the emulator's data.
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

constexpr int kRequests = 180;  // more than one page of 150

std::string config() {
    json config = {
        {"components",
         json::array({{{"name", "facebook"},
                       {"id", "@trelm.example:/facebooksource"},
                       {"config",
                        {{"facebook_source_appkey", emu::DemoAccount::apiKey},
                         {"facebook_source_appsecret", emu::DemoAccount::appSecret},
                         {"facebook_source_login", emu::DemoAccount::email},
                         {"facebook_source_password", emu::DemoAccount::password},
                         {"wipeComponents", json::array()},
                         {"wakeupComponents", json::array()},
                         {"haveExtendedApi", true}}}}})}};
    return config.dump(2);
}

struct Message {
    int time;
    std::string mid, tid, author, body;
};

class HostInboxCommandsTest : public ::testing::Test {
protected:
    void SetUp() override {
        emu::Emulator::Options options;
        options.threads = 4;
        options.generator.users = 600;
        options.generator.friendRequests = kRequests;
        options.generator.threadsPerUser = 12;
        options.generator.messagesPerThread = 7;
        emulator_ = std::make_unique<emu::Emulator>(options);
        std::string error;
        ASSERT_TRUE(emulator_->start(error)) << error;
        config_ = runner_.writeFile("config.json", config());
    }

    ProgramRunner::Result host(std::vector<std::string> const& command) {
        std::vector<std::string> args{
            "--format", "json", "--state-dir", runner_.folder() + "/state", "--no-emulator",
            "--connect-to", "api.facebook.com:80:127.0.0.1:" + std::to_string(emulator_->httpPort()),
            "--connect-to", "api.facebook.com:443:127.0.0.1:" + std::to_string(emulator_->httpsPort()),
            "--ca-file", emulator_->caFile(), "--config", config_, "--plugin", TRELMFACEBOOK_MODULE};
        args.insert(args.end(), command.begin(), command.end());
        return runner_.run(TRELM_HOST_PROGRAM, args, "");
    }

    static std::vector<json> linesOfType(ProgramRunner::Result const& result, std::string const& type) {
        std::vector<json> lines;
        for (std::string const& line : result.outLines()) {
            json object = json::parse(line);
            if (object.at("type") == type) lines.push_back(object);
        }
        return lines;
    }

    // What the service holds, read as the demo user.
    std::vector<Row> fql(std::string const& query) {
        emu::XmlNode root("fql_query_response");
        emu::Status status = emulator_->store().fqlQuery(emu::DemoAccount::uid, query, root);
        EXPECT_FALSE(status.has_value()) << query << ": " << status->message;
        std::vector<Row> rows;
        for (emu::XmlNode const& element : root.children) {
            Row row;
            for (emu::XmlNode const& field : element.children) row[field.name] = field.text;
            rows.push_back(row);
        }
        return rows;
    }

    std::string nameOf(std::string const& uid) {
        std::vector<Row> user = fql("select name from user where uid = " + uid);
        return user.empty() ? "" : user[0]["name"];
    }

    // The demo user's inbox messages, newest first, equal times by descending message id.
    std::vector<Message> inbox() {
        std::vector<Message> all;
        for (Row& r : fql("select message_id, thread_id, author_id, body, created_time from message where thread_id "
                          "in (select thread_id from thread where folder_id = 0)")) {
            all.push_back({std::stoi(r["created_time"]), r["message_id"], r["thread_id"], r["author_id"], r["body"]});
        }
        std::sort(all.begin(), all.end(), [](Message const& a, Message const& b) {
            return a.time != b.time ? a.time > b.time : a.mid > b.mid;
        });
        return all;
    }

    ProgramRunner runner_;
    std::unique_ptr<emu::Emulator> emulator_;
    std::string config_;
};

TEST_F(HostInboxCommandsTest, MessagesListNewestFirstWithTheAuthorsNames) {
    auto result = host({"query", "messages", "--limit", "5"});
    ASSERT_EQ(result.exitCode, 0) << result.err;
    std::vector<Message> const want = inbox();
    auto records = linesOfType(result, "record");
    ASSERT_EQ(records.size(), 5u) << result.out;
    for (size_t i = 0; i < records.size(); ++i) {
        SCOPED_TRACE("record " + std::to_string(i + 1));
        json const& f = records[i]["fields"];
        EXPECT_EQ(f["core_event_serviceid"], want[i].tid + "-" + want[i].mid);
        EXPECT_EQ(f["core_object_time"], want[i].time);
        EXPECT_EQ(f["core_event_text"], want[i].body);
        EXPECT_EQ(f["core_event_subject"], "Subject " + want[i].tid);
        EXPECT_EQ(f["core_event_contactid"], want[i].author);
        EXPECT_EQ(f["core_event_contactname"], nameOf(want[i].author));
        EXPECT_EQ(f["core_object_type"], 10);
    }
    auto listed = linesOfType(result, "listed");
    ASSERT_EQ(listed.size(), 1u);
    EXPECT_EQ(listed[0]["rows"], 5);
    EXPECT_EQ(listed[0]["total"], want.size());
}

TEST_F(HostInboxCommandsTest, MessagesSinceATimeReadOnlyThreadsUpdatedSinceThen) {
    std::vector<Message> const all = inbox();
    int const since = all[all.size() / 4].time;
    auto result = host({"query", "messages", "--all", "--where", "core_object_time>=" + std::to_string(since)});
    ASSERT_EQ(result.exitCode, 0) << result.err;
    std::vector<std::string> want, got;
    for (Message const& m : all) {
        if (m.time >= since) want.push_back(m.tid + "-" + m.mid);
    }
    for (json const& r : linesOfType(result, "record")) got.push_back(r["fields"]["core_event_serviceid"]);
    EXPECT_EQ(got, want);

    std::set<std::string> recent;
    for (Row& t : fql("select thread_id, updated_time from thread where folder_id = 0")) {
        if (std::stoi(t["updated_time"]) >= since) recent.insert(t["thread_id"]);
    }
    ASSERT_LT(recent.size(), 12u) << "the bound should leave some threads out";
    std::set<std::string> read;
    for (emu::LoggedRequest const& r : emulator_->log().entriesFor("mailbox.getThreadMessages")) read.insert(r.args.at("tid"));
    EXPECT_EQ(read, recent) << "only threads updated since the bound are read";
}

TEST_F(HostInboxCommandsTest, FriendRequestsListEveryRequesterOnceWithName) {
    auto result = host({"query", "friend-requests", "--all"});
    ASSERT_EQ(result.exitCode, 0) << result.err;
    std::multiset<std::string> listed;
    for (json const& r : linesOfType(result, "record")) {
        json const& f = r["fields"];
        std::string const uid = f["core_event_contactid"];
        listed.insert(uid);
        EXPECT_EQ(f["core_event_serviceid"], "FriendRequest: " + uid);
        EXPECT_EQ(f["core_event_contactname"], nameOf(uid)) << uid;
        EXPECT_EQ(f["core_object_type"], 12);
    }
    std::multiset<std::string> pending;
    for (Row& r : fql("select uid_from from friend_request where uid_to = me()")) pending.insert(r["uid_from"]);
    ASSERT_EQ(pending.size(), size_t(kRequests));
    EXPECT_EQ(listed, pending) << "every requester exactly once";
    auto total = linesOfType(result, "listed");
    ASSERT_EQ(total.size(), 1u);
    EXPECT_EQ(total[0]["total"], kRequests);
}

}  // namespace
