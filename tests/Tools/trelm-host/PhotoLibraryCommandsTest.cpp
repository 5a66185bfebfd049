// trelm-host listing albums, media and photo tags with conditions, an ordering and a since time,
// and fetching a listed record of each kind again by its GUID in one run, against a service
// emulator the test starts itself.
#include <algorithm>
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
    }
    void SetUp() override { emulator->log().clear(); }

    // Runs the host against the test's emulator as the demo user; the records printed, each
    // record's `key`, and the lines of `extra` type.
    std::vector<std::string> host(std::vector<std::string> const& command, std::string const& key,
                                  std::vector<json>* records = nullptr, std::vector<json>* retrieved = nullptr) {
        json const config = {{"components", json::array({{{"name", "facebook"},
                                                          {"id", "@trelm.example:/facebooksource"},
                                                          {"config",
                                                           {{"facebook_source_appkey", emu::DemoAccount::apiKey},
                                                            {"facebook_source_appsecret", emu::DemoAccount::appSecret},
                                                            {"facebook_source_login", emu::DemoAccount::email},
                                                            {"facebook_source_password", emu::DemoAccount::password}}}}})}};
        std::vector<std::string> args{
            "--format", "json", "--state-dir", runner_.folder() + "/state", "--no-emulator",
            "--connect-to", "api.facebook.com:80:127.0.0.1:" + std::to_string(emulator->httpPort()),
            "--connect-to", "api.facebook.com:443:127.0.0.1:" + std::to_string(emulator->httpsPort()),
            "--ca-file", emulator->caFile(), "--config", runner_.writeFile("config.json", config.dump()),
            "--plugin", TRELMFACEBOOK_MODULE};
        args.insert(args.end(), command.begin(), command.end());
        ProgramRunner::Result const result = runner_.run(TRELM_HOST_PROGRAM, args);
        EXPECT_EQ(result.exitCode, 0) << result.err;
        std::vector<std::string> values;
        for (std::string const& line : result.outLines()) {
            json object = json::parse(line);
            if (object["type"] == "record") {
                values.push_back(object["fields"].value(key, std::string("?")));
                if (records != nullptr) records->push_back(object);
            }
            if (object["type"] == "retrieved" && retrieved != nullptr) retrieved->push_back(object);
        }
        return values;
    }

    // One field of what the service holds, read as the demo user, sorted.
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
        std::sort(values.begin(), values.end());
        return values;
    }

    static emu::Emulator* emulator;
    ProgramRunner runner_;
};

emu::Emulator* PhotoLibraryCommandsTest::emulator = nullptr;

// A listing narrowed by KEY=VALUE, VALUE being the first answer of `pick`; it lists under
// `idKey` the `idField`s that `expected` (%s standing for VALUE) answers.
struct ConditionCase {
    char const* name;
    char const* kind;
    std::string condition, pick, pickField, expected, idField, idKey;
};

void PrintTo(ConditionCase const& c, std::ostream* os) { *os << c.name; }

class ConditionCommandTest : public PhotoLibraryCommandsTest, public ::testing::WithParamInterface<ConditionCase> {};

TEST_P(ConditionCommandTest, ListsExactlyTheServicesRowsForTheCondition) {
    ConditionCase const& c = GetParam();
    std::vector<std::string> const picked = fql(c.pick, c.pickField);
    ASSERT_FALSE(picked.empty());
    std::string query = c.expected;
    query.replace(query.find("%s"), 2, picked[0]);
    std::vector<std::string> const expected = fql(query, c.idField);
    ASSERT_FALSE(expected.empty()) << query;

    std::vector<std::string> listed = host({"query", c.kind, "--where", c.condition + picked[0], "--all"}, c.idKey);
    std::sort(listed.begin(), listed.end());
    EXPECT_EQ(listed, expected);
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
                      "facebook_photo_tag_tagged_service_id"}),
    [](auto const& info) { return std::string(info.param.name); });

// In one run: list a kind, then fetch its second record again by the GUID it was listed with.
class RetrieveCommandTest : public PhotoLibraryCommandsTest, public ::testing::WithParamInterface<char const*> {};

TEST_P(RetrieveCommandTest, FetchesTheListedRecordAgainByItsGuid) {
    std::vector<json> records, retrieved;
    host({"retrieve", "#2", "--from", GetParam(), "--limit", "2"}, "core_object_id", &records, &retrieved);
    ASSERT_EQ(records.size(), 2u);
    ASSERT_EQ(retrieved.size(), 1u);
    EXPECT_EQ(retrieved[0]["guid"], records[1]["fields"]["core_object_id"]);
    EXPECT_EQ(retrieved[0]["fields"], records[1]["fields"]);
}

INSTANTIATE_TEST_SUITE_P(Kinds, RetrieveCommandTest, ::testing::Values("contacts", "albums", "media", "photo-tags"),
                         [](auto const& info) { return std::string(info.param).substr(0, 5); });

TEST_F(PhotoLibraryCommandsTest, SinceListsWhatChangedSinceThenInOneStatementInTheAskedOrder) {
    std::vector<std::string> const times = fql("select created from photo where owner = " + kDemoUser, "created");
    ASSERT_GT(times.size(), 3u);
    std::string const since = times[times.size() / 2];
    std::vector<std::string> const expected =
        fql("select pid from photo where owner = " + kDemoUser + " and created >= " + since, "pid");

    EXPECT_EQ(host({"query", "media", "--since", since, "--order", "core_service_id:asc", "--all"}, "core_service_id"),
              expected);
    std::vector<emu::LoggedRequest> const statements = emulator->log().entriesFor("fql.query");
    ASSERT_EQ(statements.size(), 1u);
    EXPECT_EQ(statements[0].fql, "select pid,aid,owner,src_small,src_big,created from photo where owner = " +
                                     kDemoUser + " and created >= " + since + " ORDER BY pid ASC");
}

}  // namespace
