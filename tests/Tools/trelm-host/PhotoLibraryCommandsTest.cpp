// trelm-host listing albums, media and photo tags with conditions, an ordering and a since time,
// and fetching a listed record of every kind again by its GUID in one run, against a service
// emulator the test starts itself.
#include <algorithm>
#include <string>
#include <vector>

#include "EmulatedHost.h"

using nlohmann::json;

namespace {

std::string const kDemoUser = std::to_string(emu::DemoAccount::uid);

class PhotoLibraryCommandsTest : public ::testing::Test {
protected:
    static void SetUpTestSuite() { h = new EmulatedHost(); }
    static void TearDownTestSuite() { delete h; }
    void SetUp() override { h->emulator->log().clear(); }

    // Runs the host as the demo user; each printed record's `key`.
    static std::vector<std::string> host(std::vector<std::string> const& command, std::string const& key) {
        std::vector<std::string> values;
        for (json const& fields : h->records(command)) values.push_back(fields.value(key, std::string("?")));
        return values;
    }

    // One field of what the service holds, read as the demo user, sorted.
    static std::vector<std::string> fql(std::string const& query, std::string const& field) {
        std::vector<std::string> values;
        for (emu::test::Row& row : h->fql(query)) values.push_back(row[field]);
        std::sort(values.begin(), values.end());
        return values;
    }

    static EmulatedHost* h;
};

EmulatedHost* PhotoLibraryCommandsTest::h = nullptr;

// A listing narrowed by KEY=VALUE, VALUE being the first answer of `pick`, lists under `idKey` the
// `idField`s that `expected` (%s standing for VALUE) answers.
TEST_F(PhotoLibraryCommandsTest, ConditionListsExactlyTheServicesRowsForIt) {
    struct Case {
        char const* kind;
        std::string condition, pick, pickField, expected, idField, idKey;
    } const cases[] = {
        {"media", "facebook_media_album_service_id=", "select aid from album where owner = " + kDemoUser, "aid",
         "select pid from photo where aid = '%s'", "pid", "core_service_id"},
        {"albums", "facebook_album_owner_service_id=", "select uid2 from friend where uid1 = " + kDemoUser, "uid2",
         "select aid from album where owner = %s", "aid", "core_service_id"},
        {"photo-tags", "facebook_photo_tag_photo_service_id=", "select pid from photo where owner = " + kDemoUser,
         "pid", "select subject from photo_tag where pid = '%s'", "subject", "facebook_photo_tag_tagged_service_id"},
    };
    for (Case const& c : cases) {
        SCOPED_TRACE(c.kind);
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
}

// In one run: list a kind, then fetch listed records again by the GUIDs they were listed with,
// from the command line or in the shell ("#N": the Nth record of the last listing).
TEST_F(PhotoLibraryCommandsTest, RetrieveFetchesTheListedRecordAgainByItsGuid) {
    struct Case {
        std::string name;
        std::vector<std::string> command;
        std::string input;
        std::size_t listed;
        std::vector<std::size_t> fetched;
    };
    std::vector<Case> cases{{"shell", {"shell"}, "query contacts --limit 3\nretrieve #1\n# the third, by its number\n"
                                                 "retrieve #3\nquit\nquery contacts --limit 1\n", 3, {0, 2}}};
    for (std::string kind :
         {"contacts", "status", "photos", "media", "messages", "albums", "friend-requests", "photo-tags"}) {
        cases.push_back({kind, {"retrieve", "#2", "--from", kind, "--limit", "2"}, "", 2, {1}});
    }
    for (Case const& c : cases) {
        SCOPED_TRACE(c.name);
        ProgramRunner::Result const result = h->run(c.command, "json", c.input);
        ASSERT_EQ(result.exitCode, 0) << result.err;
        std::vector<json> const records = linesOfType(result, "record"), retrieved = linesOfType(result, "retrieved");
        ASSERT_EQ(records.size(), c.listed);
        ASSERT_EQ(retrieved.size(), c.fetched.size());
        for (std::size_t i = 0; i < retrieved.size(); ++i) {
            EXPECT_EQ(retrieved[i]["guid"], records[c.fetched[i]]["fields"]["core_object_id"]);
            EXPECT_EQ(retrieved[i]["fields"], records[c.fetched[i]]["fields"]);
        }
    }
}

TEST_F(PhotoLibraryCommandsTest, SinceListsWhatChangedSinceThenInOneStatementInTheAskedOrder) {
    std::vector<std::string> const times = fql("select created from photo where owner = " + kDemoUser, "created");
    ASSERT_GT(times.size(), 3u);
    std::string const since = times[times.size() / 2];
    std::vector<std::string> const expected =
        fql("select pid from photo where owner = " + kDemoUser + " and created >= " + since, "pid");

    EXPECT_EQ(host({"query", "media", "--since", since, "--order", "core_service_id:asc", "--all"}, "core_service_id"),
              expected);
    std::vector<emu::LoggedRequest> const statements = h->requests("fql.query");
    ASSERT_EQ(statements.size(), 1u);
    EXPECT_EQ(statements[0].fql, "select pid,aid,owner,src_small,src_big,created from photo where owner = " +
                                     kDemoUser + " and created >= " + since + " ORDER BY pid ASC");
}

}  // namespace
