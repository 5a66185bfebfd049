// trelm-host's demo, item commands and shell, run as a user runs them against a service emulator
// that the test starts itself (--no-emulator --connect-to ... --ca-file ...), so that what the
// host did can be checked in the emulator's request log and data.
#include <filesystem>
#include <map>
#include <memory>
#include <ostream>
#include <string>
#include <vector>

#include <gtest/gtest.h>
#include <nlohmann/json.hpp>

#include "Emulator.h"
#include "ProgramRunner.h"

using nlohmann::json;

namespace {

using Row = std::map<std::string, std::string>;

constexpr char const* kDemoUser = "100000001";

// The demo account with only the data source, so that every request in the log is the source's.
std::string configWithPassword(std::string const& password) {
    json config = {
        {"components",
         json::array({{{"name", "facebook"},
                       {"id", "@trelm.example:/facebooksource"},
                       {"config",
                        {{"facebook_source_appkey", emu::DemoAccount::apiKey},
                         {"facebook_source_appsecret", emu::DemoAccount::appSecret},
                         {"facebook_source_login", emu::DemoAccount::email},
                         {"facebook_source_password", password},
                         {"wipeComponents", json::array()},
                         {"wakeupComponents", json::array()},
                         {"haveExtendedApi", true}}}}})}};
    return config.dump(2);
}

class HostCommandsTest : public ::testing::Test {
protected:
    void SetUp() override {
        emu::Emulator::Options options;
        options.threads = 4;
        emulator_ = std::make_unique<emu::Emulator>(options);
        std::string error;
        ASSERT_TRUE(emulator_->start(error)) << error;
        useConfig(configWithPassword(emu::DemoAccount::password));
    }

    void useConfig(std::string const& text) { config_ = runner_.writeFile("config.json", text); }
    std::string stateDir() const { return runner_.folder() + "/state"; }

    // Runs the host against the test's emulator with JSON-lines output. No password may show.
    ProgramRunner::Result host(std::vector<std::string> const& command, std::string const& input = {}) {
        std::vector<std::string> args{
            "--format", "json", "--state-dir", stateDir(), "--no-emulator",
            "--connect-to", "api.facebook.com:80:127.0.0.1:" + std::to_string(emulator_->httpPort()),
            "--connect-to", "api.facebook.com:443:127.0.0.1:" + std::to_string(emulator_->httpsPort()),
            "--ca-file", emulator_->caFile(), "--config", config_, "--plugin", TRELMFACEBOOK_MODULE};
        args.insert(args.end(), command.begin(), command.end());
        ProgramRunner::Result result = runner_.run(TRELM_HOST_PROGRAM, args, input);
        for (std::string const& text : {result.out, result.err}) {
            EXPECT_EQ(text.find(emu::DemoAccount::password), std::string::npos) << text;
        }
        return result;
    }


    // What the service holds, read as the demo user; nested columns become "parent.child".
    std::vector<Row> fql(std::string const& query) {
        emu::XmlNode root("fql_query_response");
        emu::Status status = emulator_->store().fqlQuery(emu::DemoAccount::uid, query, root);
        EXPECT_FALSE(status.has_value()) << query << ": " << status->message;
        std::vector<Row> rows;
        for (emu::XmlNode const& element : root.children) {
            Row row;
            for (emu::XmlNode const& field : element.children) {
                row[field.name] = field.text;
                for (emu::XmlNode const& part : field.children) row[field.name + "." + part.name] = part.text;
            }
            rows.push_back(row);
        }
        return rows;
    }

    std::vector<emu::LoggedRequest> requests(std::string const& method) {
        return emulator_->log().entriesFor(method);
    }

    ProgramRunner runner_;
    std::unique_ptr<emu::Emulator> emulator_;
    std::string config_;
};

TEST_F(HostCommandsTest, DemoTourListsTheFriendsPostsUploadsAndFetchesTheFirstFriendAgain) {
    std::string const status = "Status posted by the host test";
    auto result = host({"demo", "--friends", "10", "--status", status});
    ASSERT_EQ(result.exitCode, 0) << result.err;

    auto logins = linesOfType(result, "login");
    ASSERT_EQ(logins.size(), 1u) << result.out;
    EXPECT_EQ(logins[0]["code"], "0x00000000");
    EXPECT_EQ(logins[0]["user"], kDemoUser);
    EXPECT_EQ(logins[0]["session"], "new");
    auto login = requests("auth.login");
    ASSERT_EQ(login.size(), 1u);
    EXPECT_TRUE(login[0].https);

    // The contact cursor pages in the order of the text of the ids.
    auto friends = fql("SELECT uid, name FROM user WHERE uid IN (SELECT uid2 FROM friend WHERE uid1 = me()) "
                       "ORDER BY concat(uid, ' ')");
    ASSERT_GE(friends.size(), 10u);
    auto records = linesOfType(result, "record");
    ASSERT_EQ(records.size(), 10u) << result.out;
    for (std::size_t i = 0; i < records.size(); ++i) {
        json const& fields = records[i]["fields"];
        EXPECT_EQ(fields["core_contact_service_id"], friends[i]["uid"]) << i;
        EXPECT_EQ(fields["core_contact_name"], friends[i]["name"]) << i;
        EXPECT_EQ(fields["core_object_type"], 2) << i;
        EXPECT_TRUE(fields["core_object_id"].is_string()) << i;
    }
    auto listed = linesOfType(result, "listed");
    ASSERT_EQ(listed.size(), 1u);
    EXPECT_EQ(listed[0]["rows"], 10);
    EXPECT_EQ(listed[0]["total"], friends.size());

    auto setStatus = requests("users.setStatus");
    ASSERT_EQ(setStatus.size(), 1u);
    EXPECT_EQ(setStatus[0].args["status"], status);
    EXPECT_EQ(fql(std::string("SELECT status FROM user WHERE uid = ") + kDemoUser).at(0)["status.message"], status);

    auto inserted = linesOfType(result, "inserted");
    ASSERT_EQ(inserted.size(), 2u) << result.out;
    EXPECT_EQ(inserted[0]["object_type"], 4);
    EXPECT_EQ(inserted[1]["object_type"], 9);
    ASSERT_TRUE(inserted[1]["core_service_id"].is_string()) << inserted[1];
    std::string const pid = inserted[1]["core_service_id"];
    auto photo = fql("SELECT pid, owner FROM photo WHERE pid = '" + pid + "'");
    ASSERT_EQ(photo.size(), 1u) << pid;
    EXPECT_EQ(photo[0]["owner"], kDemoUser);
    auto uploads = requests("photos.upload");
    ASSERT_EQ(uploads.size(), 1u);
    EXPECT_TRUE(uploads[0].hadFile);
    EXPECT_EQ(uploads[0].fileSize, std::filesystem::file_size(stateDir() + "/demo-photo.png"));

    auto retrieved = linesOfType(result, "retrieved");
    ASSERT_EQ(retrieved.size(), 1u);
    EXPECT_EQ(retrieved[0]["guid"], records[0]["fields"]["core_object_id"]);
    EXPECT_EQ(retrieved[0]["fields"], records[0]["fields"]);
    auto checks = linesOfType(result, "check");
    ASSERT_EQ(checks.size(), 1u);
    EXPECT_EQ(checks[0]["ok"], true);
}

// The session outlives the run in the state folder; when the service has forgotten it, the host
// signs in once more and the command still succeeds.
TEST_F(HostCommandsTest, StoredSessionIsReusedAndAForgottenOneCostsExactlyOneLogin) {
    auto first = host({"query", "contacts", "--limit", "1"});
    ASSERT_EQ(first.exitCode, 0) << first.err;
    ASSERT_EQ(requests("auth.login").size(), 1u);
    std::string const session = requests("fql.query").back().args["session_key"];
    ASSERT_FALSE(session.empty());

    emulator_->log().clear();
    auto second = host({"query", "contacts", "--limit", "1"});
    ASSERT_EQ(second.exitCode, 0) << second.err;
    EXPECT_TRUE(requests("auth.login").empty());
    auto logins = linesOfType(second, "login");
    ASSERT_EQ(logins.size(), 1u);
    EXPECT_EQ(logins[0]["session"], "stored");
    EXPECT_EQ(logins[0]["user"], kDemoUser);
    for (auto const& request : requests("fql.query")) EXPECT_EQ(request.args.at("session_key"), session);
    auto before = linesOfType(first, "record");
    auto after = linesOfType(second, "record");
    ASSERT_EQ(before.size(), 1u);
    ASSERT_EQ(after.size(), 1u);
    EXPECT_EQ(after[0]["fields"]["core_contact_service_id"], before[0]["fields"]["core_contact_service_id"]);

    emulator_->sessions().remove(session);
    emulator_->log().clear();
    auto third = host({"query", "contacts", "--limit", "3"});
    ASSERT_EQ(third.exitCode, 0) << third.err;
    EXPECT_EQ(requests("auth.login").size(), 1u);
    auto queries = requests("fql.query");
    ASSERT_FALSE(queries.empty());
    EXPECT_EQ(queries.front().errorCode, 102);
    logins = linesOfType(third, "login");
    ASSERT_EQ(logins.size(), 2u) << third.out;
    EXPECT_EQ(logins[0]["session"], "stored");
    EXPECT_EQ(logins[1]["session"], "new");
    EXPECT_EQ(logins[1]["code"], "0x00000000");
    EXPECT_EQ(linesOfType(third, "record").size(), 3u);
}

TEST_F(HostCommandsTest, ShellFetchesRecordsOfTheLastListingAgain) {
    auto result = host({"shell"}, "query contacts --limit 3\n"
                                  "retrieve #1\n"
                                  "# the third, by its number\n"
                                  "retrieve #3\n"
                                  "quit\n"
                                  "query contacts --limit 1\n");
    ASSERT_EQ(result.exitCode, 0) << result.err;
    auto records = linesOfType(result, "record");
    ASSERT_EQ(records.size(), 3u) << result.out;
    auto retrieved = linesOfType(result, "retrieved");
    ASSERT_EQ(retrieved.size(), 2u) << result.out;
    EXPECT_EQ(retrieved[0]["fields"], records[0]["fields"]);
    EXPECT_EQ(retrieved[1]["guid"], records[2]["fields"]["core_object_id"]);
    EXPECT_EQ(retrieved[1]["fields"], records[2]["fields"]);
}

TEST_F(HostCommandsTest, InsertedPhotoArrivesWithItsCaption) {
    std::string const image = runner_.writeFile("image.png", std::string("\x89PNG\r\n\x1a\n", 8) + "not really");
    auto result = host({"insert", "photo", image, "--caption", "Harbour at dusk"});
    ASSERT_EQ(result.exitCode, 0) << result.err;
    auto inserted = linesOfType(result, "inserted");
    ASSERT_EQ(inserted.size(), 1u) << result.out;
    std::string const pid = inserted[0]["core_service_id"];
    auto photo = fql("SELECT caption FROM photo WHERE pid = '" + pid + "'");
    ASSERT_EQ(photo.size(), 1u);
    EXPECT_EQ(photo[0]["caption"], "Harbour at dusk");
    auto uploads = requests("photos.upload");
    ASSERT_EQ(uploads.size(), 1u);
    EXPECT_EQ(uploads[0].args.count("aid"), 0u);
}

struct RefusedCase {
    char const* name;
    std::vector<std::string> command;
    int exitCode;
    std::vector<std::string> expectedInError;
    std::string password = emu::DemoAccount::password;
};

void PrintTo(RefusedCase const& c, std::ostream* os) { *os << c.name; }

class RefusedCommandTest : public HostCommandsTest, public ::testing::WithParamInterface<RefusedCase> {};

TEST_P(RefusedCommandTest, ExitsNonZeroAndSaysWhy) {
    RefusedCase const& c = GetParam();
    useConfig(configWithPassword(c.password));
    auto result = host(c.command);
    EXPECT_EQ(result.exitCode, c.exitCode) << result.err;
    for (std::string const& expected : c.expectedInError) {
        EXPECT_NE(result.err.find(expected), std::string::npos) << expected << "\n" << result.err;
    }
    EXPECT_EQ(result.err.find(c.password), std::string::npos) << result.err;
    EXPECT_EQ(result.out.find(c.password), std::string::npos) << result.out;
    EXPECT_TRUE(linesOfType(result, "record").empty());
    EXPECT_TRUE(linesOfType(result, "inserted").empty());
}

INSTANTIATE_TEST_SUITE_P(
    Commands, RefusedCommandTest,
    ::testing::Values(
        RefusedCase{"QueryForAnotherSource",
                    {"query", "contacts", "--where", "core_object_source=elsewhere"},
                    3,
                    {"facebook cannot list contacts", "caused by 0x80000002"}},
        RefusedCase{"ConditionWithoutOperator",
                    {"query", "contacts", "--where", "core_contact_name"},
                    3,
                    {"0x80000004", "needs an operator"}},
        RefusedCase{"UnknownItemType", {"query", "friends"}, 105, {"friends"}},
        RefusedCase{"MissingPhotoFile",
                    {"insert", "photo", "/nonexistent/photo.png"},
                    3,
                    {"0x80000006", "cannot read the photo /nonexistent/photo.png"}},
        RefusedCase{"WrongPassword",
                    {"query", "contacts"},
                    3,
                    {"the sign-in of facebook failed with 0x8000001c"},
                    "not-the-demo-password"}),
    [](auto const& info) { return std::string(info.param.name); });

}  // namespace
