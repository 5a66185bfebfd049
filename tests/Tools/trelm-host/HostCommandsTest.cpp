// trelm-host's demo, item commands and shell, run as a user runs them against a service emulator
// that the test starts itself (--no-emulator --connect-to ... --ca-file ...), so that what the
// host did can be checked in the emulator's request log and data.
#include <signal.h>
#include <string.h>
#include <sys/stat.h>

#include <filesystem>
#include <fstream>
#include <iterator>
#include <ostream>
#include <set>
#include <sstream>
#include <string>
#include <vector>

#include "EmulatedHost.h"

using nlohmann::json;

namespace {

constexpr char const* kDemoUser = "100000001";

// The demo configuration with only the data source, so that every request in the log is the
// source's.
std::string sourceOnly(std::string const& password = emu::DemoAccount::password,
                       std::string const& login = emu::DemoAccount::email) {
    json config = json::parse(std::ifstream(TRELM_DEMO_CONFIG));
    config["components"].erase(1);
    config["components"][0]["config"]["facebook_source_login"] = login;
    config["components"][0]["config"]["facebook_source_password"] = password;
    return config.dump();
}

class HostCommandsTest : public ::testing::Test {
protected:
    void SetUp() override { h.useConfig(sourceOnly()); }

    ProgramRunner::Result host(std::vector<std::string> const& command, int signal = 0, int afterMs = 0) {
        ProgramRunner::Result result = h.run(command, "json", {}, signal, afterMs);
        EXPECT_EQ(result.err.find("rows/s"), std::string::npos) << "no progress line off a terminal";
        return result;
    }

    EmulatedHost h;
};

TEST_F(HostCommandsTest, DemoTourListsTheFriendsPostsUploadsAndFetchesTheFirstFriendAgain) {
    std::string const status = "Status posted by the host test";
    auto result = host({"demo", "--friends", "10", "--status", status});
    ASSERT_EQ(result.exitCode, 0) << result.err;

    EXPECT_EQ(linesOfType(result, "login").at(0)["session"], "new");
    auto records = linesOfType(result, "record");
    ASSERT_EQ(records.size(), 10u) << result.out;
    EXPECT_EQ(linesOfType(result, "listed").at(0)["total"],
              h.fql(std::string("select uid2 from friend where uid1 = ") + kDemoUser).size());

    EXPECT_EQ(h.fql(std::string("SELECT status FROM user WHERE uid = ") + kDemoUser).at(0)["status.message"], status);
    auto inserted = linesOfType(result, "inserted");
    ASSERT_EQ(inserted.size(), 2u) << result.out;
    EXPECT_EQ(inserted[0]["object_type"], 4);
    EXPECT_EQ(inserted[1]["object_type"], 9);
    std::string const pid = inserted[1]["core_service_id"];
    EXPECT_EQ(h.fql("SELECT owner FROM photo WHERE pid = '" + pid + "'").at(0)["owner"], kDemoUser);
    EXPECT_EQ(h.requests("photos.upload").at(0).fileSize, std::filesystem::file_size(h.stateDir() + "/demo-photo.png"));

    auto retrieved = linesOfType(result, "retrieved");
    ASSERT_EQ(retrieved.size(), 1u);
    EXPECT_EQ(retrieved[0]["fields"], records[0]["fields"]);
    EXPECT_EQ(linesOfType(result, "check").at(0)["ok"], true);
}

// The session outlives the run in the state folder; when the service has forgotten it, the host
// signs in once more and the command still succeeds (the stream cursor answers the refusal as an
// empty stream, the contact cursor as an error); a changed login never uses the old session.
TEST_F(HostCommandsTest, StoredSessionIsReusedForgottenCostsOneLoginAndChangedLoginSignsInAnew) {
    ASSERT_EQ(host({"query", "contacts", "--limit", "1"}).exitCode, 0);
    std::string session = h.requests("fql.query").back().args["session_key"];
    ASSERT_FALSE(session.empty());

    h.emulator->log().clear();
    auto second = host({"query", "contacts", "--limit", "1"});
    ASSERT_EQ(second.exitCode, 0) << second.err;
    EXPECT_TRUE(h.requests("auth.login").empty());
    auto logins = linesOfType(second, "login");
    ASSERT_EQ(logins.size(), 1u);
    EXPECT_EQ(logins[0]["session"], "stored");
    EXPECT_EQ(logins[0]["user"], kDemoUser);
    for (auto const& request : h.requests("fql.query")) EXPECT_EQ(request.args.at("session_key"), session);

    for (char const* kind : {"contacts", "status"}) {
        SCOPED_TRACE(kind);
        h.emulator->sessions().remove(session);
        h.emulator->log().clear();
        auto refused = host({"query", kind, "--limit", "3"});
        ASSERT_EQ(refused.exitCode, 0) << refused.err;
        EXPECT_EQ(h.requests("auth.login").size(), 1u);
        std::vector<std::string> sessions;
        for (json const& login : linesOfType(refused, "login")) sessions.push_back(login["session"]);
        EXPECT_EQ(sessions, (std::vector<std::string>{"stored", "new"}));
        EXPECT_EQ(linesOfType(refused, "record").size(), 3u);
        session = h.emulator->log().entries().back().args.at("session_key");
    }

    // A session belongs to its account: after the login changes, the new account signs in, and
    // the photo (with its caption) is the new account's.
    h.useConfig(sourceOnly(emu::SecondAccount::password, emu::SecondAccount::email));
    h.emulator->log().clear();
    std::string const image = h.runner.writeFile("image.png", std::string("\x89PNG\r\n\x1a\n", 8) + "not really");
    auto other = host({"insert", "photo", image, "--caption", "Harbour at dusk"});
    ASSERT_EQ(other.exitCode, 0) << other.err;
    logins = linesOfType(other, "login");
    ASSERT_EQ(logins.size(), 1u) << other.out;
    EXPECT_EQ(logins[0]["session"], "new");
    ASSERT_EQ(h.requests("auth.login").size(), 1u);
    std::string const user = logins[0]["user"], pid = linesOfType(other, "inserted").at(0)["core_service_id"];
    EXPECT_NE(user, kDemoUser);
    EXPECT_EQ(emu::test::fqlRows(h.emulator->store(), std::stoll(user),
                                 "SELECT owner, caption FROM photo WHERE pid = '" + pid + "'"),
              (std::vector<emu::test::Row>{{{"owner", user}, {"caption", "Harbour at dusk"}}}));
}

struct RefusedCase {
    char const* name;
    int exitCode;
    std::string command;  // its words, space-separated
    std::vector<std::string> expectedInError;
    std::string password = emu::DemoAccount::password;
};

void PrintTo(RefusedCase const& c, std::ostream* os) { *os << c.name; }

class RefusedCommandTest : public HostCommandsTest, public ::testing::WithParamInterface<RefusedCase> {};

TEST_P(RefusedCommandTest, ExitsNonZeroAndSaysWhy) {
    RefusedCase const& c = GetParam();
    h.useConfig(sourceOnly(c.password));
    std::vector<std::string> command;
    std::istringstream words(c.command);
    for (std::string word; words >> word;) command.push_back(word);
    auto result = host(command);
    EXPECT_EQ(result.exitCode, c.exitCode) << result.err;
    for (std::string const& expected : c.expectedInError) {
        EXPECT_NE(result.err.find(expected), std::string::npos) << expected << "\n" << result.err;
    }
    EXPECT_EQ(result.err.find(c.password), std::string::npos) << result.err;
    EXPECT_EQ(result.out.find(c.password), std::string::npos) << result.out;
    EXPECT_TRUE(linesOfType(result, "record").empty());
    EXPECT_TRUE(linesOfType(result, "inserted").empty());
    EXPECT_TRUE(h.requests("photos.upload").empty()) << "a refused photo is refused before any request";
}

INSTANTIATE_TEST_SUITE_P(
    Commands, RefusedCommandTest,
    ::testing::ValuesIn(std::vector<RefusedCase>{
        {"QueryForAnotherSource",
         3,
         "query contacts --where core_object_source=elsewhere",
         {"facebook cannot list contacts", "caused by: query for another source: this is not supported [0x80000002]"}},
        {"ConditionWithoutOperator",
         3,
         "query contacts --where core_contact_name",
         {"0x80000004", "needs an operator"}},
        {"UnknownItemType", 105, "query friends", {"friends"}},
        {"SameKeyConstrainedTwice",
         3,
         "query contacts --where core_contact_name=A --where core_contact_name=B",
         {"core_contact_name is already constrained by an earlier --where; give each key once"}},
        {"LimitOutOfRange", 105, "query contacts --limit 2000000", {"--limit", "1000000"}},
        {"MissingPhotoFile",
         3,
         "insert photo /nonexistent/photo.png",
         {"the photo /nonexistent/photo.png does not exist", "[0x80000006]"}},
        {"PhotoIsAFolder", 3, "insert photo /", {"the photo / is not a regular file", "[0x80000004]"}},
        {"EmptyPhotoFile",
         3,
         "insert photo " TRELM_TEST_DATA_DIR "/empty-photo.jpg",
         {"empty-photo.jpg is empty", "[0x80000004]"}},
        {"PhotoThatIsNoImage",
         3,
         "insert photo " TRELM_TEST_DATA_DIR "/xml/error_response.xml",
         {"error_response.xml is not an image the service takes (JPEG, PNG, GIF, BMP or TIFF)", "[0x80000004]"}},
        {"WrongPassword",
         3,
         "query contacts",
         {"the sign-in of facebook failed", "service error 100",
          "not signed in or the session expired; check facebook_source_login and facebook_source_password",
          "[0x8000001c]"},
         "not-the-demo-password"}}),
    [](auto const& info) { return std::string(info.param.name); });

// A host stopped while it signs in (the service holds the login answer back) leaves no credential
// in its state folder: the settings it hands to the source are held in memory only. The folder
// and its state database are private to their owner.
class StoppedSignInTest : public HostCommandsTest, public ::testing::WithParamInterface<int> {};

TEST_P(StoppedSignInTest, LeavesNeitherPasswordNorApplicationSecretInTheStateFolder) {
    h.emulator->faults().set("auth.login", emu::FaultRule{.delayMs = 3000});
    ASSERT_TRUE(host({"query", "contacts"}, GetParam(), 1500).signalled)
        << "the host ended before it could be stopped during its sign-in";
    int files = 0;
    for (auto const& entry : std::filesystem::recursive_directory_iterator(h.stateDir())) {
        if (!entry.is_regular_file()) continue;
        ++files;
        std::ifstream in(entry.path(), std::ios::binary);
        std::string const bytes((std::istreambuf_iterator<char>(in)), std::istreambuf_iterator<char>());
        EXPECT_EQ(bytes.find(emu::DemoAccount::password), std::string::npos) << entry.path();
        EXPECT_EQ(bytes.find(emu::DemoAccount::appSecret), std::string::npos) << entry.path();
    }
    EXPECT_GT(files, 0) << "the state folder holds the host's store";
    struct stat st {};
    ASSERT_EQ(stat(h.stateDir().c_str(), &st), 0);
    EXPECT_EQ(st.st_mode & 0777, 0700u);
    ASSERT_EQ(stat((h.stateDir() + "/runtime-configuration.db").c_str(), &st), 0);
    EXPECT_EQ(st.st_mode & 0777, 0600u);
}

INSTANTIATE_TEST_SUITE_P(Signals, StoppedSignInTest, ::testing::Values(SIGKILL, SIGTERM, SIGINT, SIGHUP),
                         [](auto const& info) { return std::string(sigabbrev_np(info.param)); });

// A throttled or briefly unavailable service is waited out step by step: the listing completes
// with every friend exactly once, and each wait is reported on standard error.
TEST_F(HostCommandsTest, ThrottledOrUnavailableServiceIsWaitedOutAndTheListingCompletes) {
    // Unavailable every third query; the request limit.
    for (char const* fault : {"fql.query:error=2,every=3", "*:rate=4,burst=3"}) {
        SCOPED_TRACE(fault);
        emu::Emulator::Options options;
        options.generator.users = 2500;
        options.generator.demoFriends = 1000;
        h.restart(options);
        std::string method, error;
        emu::FaultRule rule;
        ASSERT_TRUE(emu::Faults::parse(fault, method, rule, error)) << error;
        h.emulator->faults().set(method, rule);
        std::filesystem::remove_all(h.stateDir());

        auto result = host({"query", "contacts", "--all", "--retries", "20", "--retry-time", "120"});
        ASSERT_EQ(result.exitCode, 0) << result.err;
        std::set<std::string> ids;
        for (json const& record : linesOfType(result, "record")) {
            EXPECT_TRUE(ids.insert(record["fields"]["core_contact_service_id"].get<std::string>()).second);
        }
        EXPECT_EQ(ids.size(), 1000u);
        EXPECT_NE(result.err.find("trying again in"), std::string::npos) << result.err;
        int refused = 0;
        for (emu::LoggedRequest const& r : h.emulator->log().entries()) refused += r.errorCode == 2 || r.errorCode == 4;
        EXPECT_GT(refused, 0) << "the fault was hit";
    }
}

}  // namespace

TEST_F(HostCommandsTest, ListingOnATerminalShowsProgressWithTheTotal) {
    // `script` gives the host a terminal on every stream, as a user's shell does.
    std::string command = "exec '" + std::string(TRELM_HOST_PROGRAM) + "'";
    for (std::string const& arg : h.arguments({"query", "contacts", "--all"})) command += " '" + arg + "'";
    auto result = h.runner.run("/usr/bin/script", {"-qec", command, "/dev/null"});
    ASSERT_EQ(result.exitCode, 0) << result.out;
    std::size_t const friends = h.fql("select uid2 from friend where uid1=" + std::string(kDemoUser)).size();
    ASSERT_GT(friends, 0u);
    EXPECT_NE(result.out.find(" of " + std::to_string(friends) + " rows, "), std::string::npos) << result.out;
}
