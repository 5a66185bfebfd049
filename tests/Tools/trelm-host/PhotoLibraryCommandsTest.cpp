// trelm-host listing albums, media and photo tags with conditions, orderings and a since time,
// and fetching a listed record of any kind again by its GUID in one run, against a service
// emulator the test starts itself.
#include <algorithm>
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

std::string const kDemoUser = std::to_string(emu::DemoAccount::uid);

class PhotoLibraryCommandsTest : public ::testing::Test {
protected:
    static void SetUpTestSuite() {
        emulator = new emu::Emulator(emu::Emulator::Options{});
        std::string error;
        ASSERT_TRUE(emulator->start(error)) << error;
    }
    static void TearDownTestSuite() {
        emulator->stop();
        delete emulator;
        emulator = nullptr;
    }

    void SetUp() override {
        json config = {{"components",
                        json::array({{{"name", "facebook"},
                                      {"id", "@trelm.example:/facebooksource"},
                                      {"config",
                                       {{"facebook_source_appkey", emu::DemoAccount::apiKey},
                                        {"facebook_source_appsecret", emu::DemoAccount::appSecret},
                                        {"facebook_source_login", emu::DemoAccount::email},
                                        {"facebook_source_password", emu::DemoAccount::password},
                                        {"wipeComponents", json::array()},
                                        {"wakeupComponents", json::array()}}}}})}};
        config_ = runner_.writeFile("config.json", config.dump());
        emulator->log().clear();
    }

    // Runs the host against the test's emulator with JSON-lines output.
    ProgramRunner::Result host(std::vector<std::string> const& command) {
        std::vector<std::string> args{
            "--format", "json", "--state-dir", runner_.folder() + "/state", "--no-emulator",
            "--connect-to", "api.facebook.com:80:127.0.0.1:" + std::to_string(emulator->httpPort()),
            "--connect-to", "api.facebook.com:443:127.0.0.1:" + std::to_string(emulator->httpsPort()),
            "--ca-file", emulator->caFile(), "--config", config_, "--plugin", TRELMFACEBOOK_MODULE};
        args.insert(args.end(), command.begin(), command.end());
        return runner_.run(TRELM_HOST_PROGRAM, args);
    }

    static std::vector<json> linesOfType(ProgramRunner::Result const& result, std::string const& type) {
        std::vector<json> lines;
        for (std::string const& line : result.outLines()) {
            json object = json::parse(line);
            if (object.at("type") == type) lines.push_back(object);
        }
        return lines;
    }

    // One column of what the service holds, read as the demo user, in answer order.
    static std::vector<std::string> fql(std::string const& query, std::string const& field) {
        emu::XmlNode root("fql_query_response");
        emu::Status status = emulator->store().fqlQuery(emu::DemoAccount::uid, query, root);
        EXPECT_FALSE(status.has_value()) << query << ": " << status->message;
        std::vector<std::string> values;
        for (emu::XmlNode const& row : root.children) {
            for (emu::XmlNode const& f : row.children) {
                if (f.name == field) values.push_back(f.text);
            }
        }
        return values;
    }

    static std::vector<std::string> fieldOf(std::vector<json> const& records, std::string const& key) {
        std::vector<std::string> values;
        for (json const& r : records) values.push_back(r["fields"].value(key, std::string("?")));
        return values;
    }

    static emu::Emulator* emulator;
    ProgramRunner runner_;
    std::string config_;
};

emu::Emulator* PhotoLibraryCommandsTest::emulator = nullptr;

// A listing narrowed by a condition: what it names, and how the service is asked for the same.
struct ConditionCase {
    char const* name;
    char const* kind;
    std::string condition;  // KEY=VALUE, VALUE read from the service by `pick`
    std::string pick;       // one statement whose first answer is VALUE
    std::string pickField;
    std::string expected;   // the service's rows that the listing must hold, %s being VALUE
    std::string idField;    // of `expected`
    std::string idKey;      // the record key holding it
};

void PrintTo(ConditionCase const& c, std::ostream* os) { *os << c.name; }

class ConditionCommandTest : public PhotoLibraryCommandsTest, public ::testing::WithParamInterface<ConditionCase> {};

TEST_P(ConditionCommandTest, ListsExactlyTheServicesRowsForTheCondition) {
    ConditionCase const& c = GetParam();
    std::vector<std::string> picked = fql(c.pick, c.pickField);
    ASSERT_FALSE(picked.empty());
    std::string expectedQuery = c.expected;
    expectedQuery.replace(expectedQuery.find("%s"), 2, picked[0]);
    std::vector<std::string> expected = fql(expectedQuery, c.idField);
    ASSERT_FALSE(expected.empty()) << expectedQuery;

    auto result = host({"query", c.kind, "--where", c.condition + picked[0], "--all"});
    ASSERT_EQ(result.exitCode, 0) << result.err;
    auto records = linesOfType(result, "record");
    std::vector<std::string> listed = fieldOf(records, c.idKey);
    std::sort(listed.begin(), listed.end());
    std::sort(expected.begin(), expected.end());
    EXPECT_EQ(listed, expected);
    auto done = linesOfType(result, "listed");
    ASSERT_EQ(done.size(), 1u);
    EXPECT_EQ(done[0]["total"], expected.size());
}

INSTANTIATE_TEST_SUITE_P(
    Kinds, ConditionCommandTest,
    ::testing::Values(
        ConditionCase{"MediaOfAnAlbum", "media", "facebook_media_album_service_id=",
                      "select aid from album where owner = " + kDemoUser, "aid",
                      "select pid from photo where aid = '%s'", "pid", "core_service_id"},
        ConditionCase{"AlbumsOfAFriend", "albums", "facebook_album_owner_service_id=",
                      "select uid2 from friend where uid1 = " + kDemoUser, "uid2",
                      "select aid from album where owner = %s", "aid", "core_service_id"},
        ConditionCase{"TagsOfAPhoto", "photo-tags", "facebook_photo_tag_photo_service_id=",
                      "select pid from photo where owner = " + kDemoUser, "pid",
                      "select subject from photo_tag where pid = '%s'", "subject",
                      "facebook_photo_tag_tagged_service_id"},
        ConditionCase{"MediaOfAFriend", "media", "facebook_media_owner_service_id=",
                      "select uid2 from friend where uid1 = " + kDemoUser, "uid2",
                      "select pid from photo where owner = %s", "pid", "core_service_id"}),
    [](auto const& info) { return std::string(info.param.name); });

// In one run: list a kind, then fetch its N-th record again by the GUID it was listed with.
class RetrieveCommandTest : public PhotoLibraryCommandsTest, public ::testing::WithParamInterface<char const*> {};

TEST_P(RetrieveCommandTest, FetchesTheListedRecordAgainByItsGuid) {
    auto result = host({"retrieve", "#2", "--from", GetParam(), "--limit", "2"});
    ASSERT_EQ(result.exitCode, 0) << result.err;
    auto records = linesOfType(result, "record");
    ASSERT_EQ(records.size(), 2u) << result.out;
    auto retrieved = linesOfType(result, "retrieved");
    ASSERT_EQ(retrieved.size(), 1u) << result.out;
    EXPECT_EQ(retrieved[0]["guid"], records[1]["fields"]["core_object_id"]);
    EXPECT_EQ(retrieved[0]["fields"], records[1]["fields"]);
}

INSTANTIATE_TEST_SUITE_P(Kinds, RetrieveCommandTest, ::testing::Values("contacts", "albums", "media", "photo-tags"),
                         [](auto const& info) {
                             std::string name = info.param;
                             name.erase(std::remove(name.begin(), name.end(), '-'), name.end());
                             return name;
                         });

TEST_F(PhotoLibraryCommandsTest, RetrieveWithoutAListingIsRefusedOnTheCommandLine) {
    auto result = host({"retrieve", "#1"});
    EXPECT_NE(result.exitCode, 0);
    EXPECT_NE(result.err.find("--from"), std::string::npos) << result.err;
}

TEST_F(PhotoLibraryCommandsTest, SinceListsWhatChangedSinceThenInOneStatementInTheAskedOrder) {
    std::vector<std::string> times = fql("select created from photo where owner = " + kDemoUser, "created");
    ASSERT_GT(times.size(), 3u);
    std::sort(times.begin(), times.end());
    std::string const since = times[times.size() / 2];
    std::vector<std::string> expected =
        fql("select pid from photo where owner = " + kDemoUser + " and created >= " + since, "pid");
    std::sort(expected.begin(), expected.end());

    auto result = host({"query", "media", "--since", since, "--order", "core_service_id:asc", "--all"});
    ASSERT_EQ(result.exitCode, 0) << result.err;
    EXPECT_EQ(fieldOf(linesOfType(result, "record"), "core_service_id"), expected);
    std::vector<std::string> statements;
    for (emu::LoggedRequest const& r : emulator->log().entriesFor("fql.query")) statements.push_back(r.fql);
    ASSERT_EQ(statements.size(), 1u);
    EXPECT_EQ(statements[0], "select pid,aid,owner,src_small,src_big,created from photo where owner = " + kDemoUser +
                                 " and created >= " + since + " ORDER BY pid ASC");
}

}  // namespace
