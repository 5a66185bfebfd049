// trelm-host's peers, peer-status and set-status, run as a user runs them against a service
// emulator that the test starts itself, so that what the connector did can be checked in the
// emulator's request log and data.
#include <algorithm>
#include <fstream>
#include <string>
#include <vector>

#include "EmulatedHost.h"

using nlohmann::json;

namespace {

using Row = emu::test::Row;

constexpr char const* kDemoUser = "100000001";

class PeerCommandsTest : public ::testing::Test {
protected:
    EmulatedHost h;
};

TEST_F(PeerCommandsTest, PeersListsEveryFriendWithProfileFromTwoRequests) {
    auto result = h.run({"peers"});
    ASSERT_EQ(result.exitCode, 0) << result.err;
    EXPECT_EQ(linesOfType(result, "connection").at(0)["user"], kDemoUser);
    std::vector<Row> listed;
    for (json peer : linesOfType(result, "peer")) {
        peer.erase("type");
        peer.erase("index");
        listed.push_back(peer.get<Row>());
    }
    std::vector<Row> expected = h.fql(
        "SELECT uid, first_name, last_name, name, profile_url FROM user "
        "WHERE uid IN (SELECT uid2 FROM friend WHERE uid1 = me())");
    std::sort(listed.begin(), listed.end());
    std::sort(expected.begin(), expected.end());
    EXPECT_EQ(listed, expected);
    EXPECT_EQ(linesOfType(result, "peers").at(0)["count"], expected.size());
    EXPECT_EQ(h.requests("friends.get").size() + h.requests("users.getInfo").size(), 2u);
    EXPECT_EQ(h.emulator->log().total(), 3u) << "one login, and the data source sent nothing";
}

// One friend with a status, one who never set one, asked for in one request; the table shows the
// time in UTC, or "-" for none.
TEST_F(PeerCommandsTest, PeerStatusAsksOnceForAllIdsInBothFormats) {
    std::vector<Row> all =
        h.fql("SELECT uid, status FROM user WHERE uid IN (SELECT uid2 FROM friend WHERE uid1 = me())");
    auto with = std::find_if(all.begin(), all.end(), [](Row& r) { return r.count("status.time") != 0; });
    auto without = std::find_if(all.begin(), all.end(), [](Row& r) { return r.count("status.time") == 0; });
    ASSERT_TRUE(with != all.end() && without != all.end());
    std::string const a = (*with)["uid"];
    std::string const b = (*without)["uid"];

    auto result = h.run({"peer-status", a, b});
    ASSERT_EQ(result.exitCode, 0) << result.err;
    auto statuses = linesOfType(result, "peer_status");
    ASSERT_EQ(statuses.size(), 2u) << result.out;
    EXPECT_EQ(statuses[0], json({{"type", "peer_status"},
                                 {"uid", a},
                                 {"status", (*with)["status.message"]},
                                 {"time", std::stoll((*with)["status.time"])}}));
    EXPECT_EQ(statuses[1], json({{"type", "peer_status"}, {"uid", b}, {"status", ""}, {"time", 0}}));
    auto calls = h.requests("users.getInfo");
    ASSERT_EQ(calls.size(), 1u);
    EXPECT_EQ(calls[0].args["uids"], a + "," + b);

    auto table = h.run({"peer-status", b}, "table");
    ASSERT_EQ(table.exitCode, 0) << table.err;
    auto lines = table.outLines();
    ASSERT_GE(lines.size(), 2u);
    EXPECT_EQ(lines[lines.size() - 2].rfind("UID", 0), 0u) << table.out;
    EXPECT_EQ(lines.back().rfind(b + "  -", 0), 0u) << table.out;
}

// What the connector set is the user's status, and the data source's stream query lists it as
// the newest status post.
TEST_F(PeerCommandsTest, StatusSetThroughTheConnectorIsReadBackByTheSourcesStatusQuery) {
    std::string const text = "is testing the connector from the host";
    auto result = h.run({"set-status", "is", "testing", "the", "connector", "from", "the", "host"});
    ASSERT_EQ(result.exitCode, 0) << result.err;
    EXPECT_EQ(linesOfType(result, "status_set").at(0)["text"], text);
    EXPECT_EQ(h.requests("users.setStatus").size(), 1u);
    std::vector<json> const records = h.records({"query", "status", "--limit", "1"});
    ASSERT_EQ(records.size(), 1u);
    EXPECT_EQ(records[0]["core_event_text"], text);
    EXPECT_EQ(records[0]["core_event_contactid"], kDemoUser);
}

// A failed connection or command ends the run with status 3 and says why.
TEST_F(PeerCommandsTest, ConnectionFailuresEndTheCommandWithTheReason) {
    struct Case {
        char const* key;    // the connector's configuration key changed ...
        char const* value;  // ... to this; null removes it
        std::vector<std::string> command;
        char const* says;  // in the error output
    } const cases[] = {{"FacebookPassword", "not the password", {"peers"}, "service error 100"},
                       {"FacebookLogin", nullptr, {"set-status", "hi"}, "has no FacebookLogin"}};
    for (Case const& c : cases) {
        json config = json::parse(std::ifstream(TRELM_DEMO_CONFIG));
        json& connector = config.at("components").at(1).at("config");
        c.value ? void(connector[c.key] = c.value) : void(connector.erase(c.key));
        h.useConfig(config.dump());
        auto result = h.run(c.command);
        EXPECT_EQ(result.exitCode, 3) << result.out << result.err;
        EXPECT_NE(result.err.find(c.says), std::string::npos) << result.err;
    }
    EXPECT_EQ(h.requests("users.setStatus").size(), 0u);
}

}  // namespace
