// The connector as a host drives it, against the in-process emulator through the host's own
// "HttpRequestFactory": what it asks the service, how many requests it takes, and what it does
// when the service's answer does not fit.
#include <gtest/gtest.h>

#include <algorithm>
#include <string>
#include <vector>

#include "EmulatorHost.h"
#include "EmulatorRows.h"
#include "ErrorAssertions.h"
#include "FacebookConnector.h"

namespace trelm::test {
namespace {

using Peer = NetworkMetadata::tRELMNetworkPeer;
using Event = NetworkMetadata::tRELMNetworkEvent;

std::string const kDemoUid = std::to_string(emu::DemoAccount::uid);

Map<String, String> demoParams(char const* password = emu::DemoAccount::password) {
    return Map<String, String>{{"FacebookAppKey", emu::DemoAccount::apiKey},
                               {"FacebookAppSecret", emu::DemoAccount::appSecret},
                               {"FacebookLogin", emu::DemoAccount::email},
                               {"FacebookPassword", password}};
}

// The demo user has 55 friends; every fourth has never set a status.
class ConnectorEmulatorTest : public ::testing::Test {
protected:
    void SetUp() override {
        std::string error;
        ASSERT_TRUE(host.start(error)) << error;
        emulator = &host.emulator();
    }

    void connect() {
        Map<String, String> params = demoParams();
        ASSERT_OK(connector.makeConnection(params, false));
    }

    // In ascending order.
    Vector<String> friendIds() {
        Vector<String> ids;
        for (auto& row : emu::test::fqlRows(emulator->store(), emu::DemoAccount::uid,
                                            "SELECT uid2 FROM friend WHERE uid1 = me()")) {
            EXPECT_OK(ids.pushBack(String(row["uid2"])));
        }
        std::sort(ids.begin(), ids.end());
        return ids;
    }

    EmulatorHost host{{.users = 90, .demoFriends = 55, .friendsPerUser = 2}};
    emu::Emulator* emulator = nullptr;
    FacebookConnector connector{"facebook-connector"};
};

TEST_F(ConnectorEmulatorTest, MakeConnectionLogsInOnceOverHttpsAndPeersAreTheDemoUsersFriends) {
    Map<String, String> params = demoParams();
    ASSERT_OK(connector.makeConnection(params, false));
    EXPECT_EQ(params.search("FacebookID") ? params.search("FacebookID")->str() : "none", kDemoUid);
    auto logins = emulator->log().entriesFor("auth.login");
    ASSERT_EQ(logins.size(), 1u);
    EXPECT_TRUE(logins[0].https);

    Map<String, String> again = demoParams("another password");
    EXPECT_OK(connector.makeConnection(again, false));
    EXPECT_EQ(emulator->log().total(), 1u) << "a second connection sends nothing";
    Vector<String> peers;
    ASSERT_OK(connector.getPeers(peers));
    std::sort(peers.begin(), peers.end());
    EXPECT_EQ(peers, friendIds());
}

// The profile fields (mapped alike for one id and for many):
// PeerCommandsTest.PeersListsEveryFriendWithProfileFromTwoRequests.
TEST_F(ConnectorEmulatorTest, PeerInfoComesInTheOrderOfTheIdsFromOneRequestPerCall) {
    connect();
    Vector<String> const friends = friendIds();
    Vector<String> ids{friends[9], friends[1], friends[5]};  // not the service's order
    Vector<Peer> peers;
    ASSERT_OK(connector.getPeerInfoBatch(ids, peers));
    Peer one;
    ASSERT_OK(connector.getPeerInfo(friends[5], one));
    ASSERT_OK(peers.pushBack(one));
    ASSERT_EQ(peers.size(), 4u);
    EXPECT_EQ(peers[0].serviceId + peers[1].serviceId + peers[2].serviceId + peers[3].serviceId,
              ids[0] + ids[1] + ids[2] + ids[2]);
    auto calls = emulator->log().entriesFor("users.getInfo");
    ASSERT_EQ(calls.size(), 2u);
    EXPECT_EQ(calls[0].args["uids"], (ids[0] + "," + ids[1] + "," + ids[2]).str());
}

TEST_F(ConnectorEmulatorTest, StatusesOfFiftyFriendsComeInOneRequestWithTextAndTime) {
    connect();
    Vector<String> ids = friendIds();
    ASSERT_OK(ids.resize(50));
    Vector<Event> events;
    ASSERT_OK(connector.getPeerStatusBatch(ids, events));
    auto calls = emulator->log().entriesFor("users.getInfo");
    ASSERT_EQ(calls.size(), 1u);
    EXPECT_EQ(calls[0].args["fields"], "uid,name,status");
    ASSERT_EQ(events.size(), 50u);
    unsigned never = 0;
    for (unsigned i = 0; i < 50; ++i) {
        auto row = emu::test::fqlRows(emulator->store(), emu::DemoAccount::uid,
                                      "SELECT status FROM user WHERE uid = " + ids[i].str())
                       .at(0);
        std::string const time = row.count("status.time") ? row["status.time"] : "0";
        EXPECT_EQ(events[i].statusText.str() + "@" + std::to_string(events[i].statusTime),
                  row["status.message"] + "@" + time)
            << ids[i];
        never += events[i].statusTime == 0;
    }
    EXPECT_GT(never, 0u);
    EXPECT_LT(never, 50u);
}

// An id the service does not know gets no answer: fewer statuses than ids.
TEST_F(ConnectorEmulatorTest, ShortStatusAnswerFailsAndLeavesTheEventsAsTheyWere) {
    connect();
    Vector<String> const friends = friendIds();
    Vector<String> ids{friends[0], "1", friends[1]};
    Vector<Event> events{Event{"before", 42}};
    EXPECT_CODE(connector.getPeerStatusBatch(ids, events), kFailure);
    ASSERT_EQ(events.size(), 1u);
    EXPECT_EQ(events[0].statusText + String::from(events[0].statusTime), "before42");
    EXPECT_CODE(connector.getPeerStatus("1", events[0]), kFailure);
    EXPECT_EQ(events[0].statusText, "before");
}

// Status queries turn every failure into a general one with the cause kept; a refused session is
// forgotten, so nothing more is sent with it.
TEST_F(ConnectorEmulatorTest, ServiceErrorsReachTheHostWithTheirCodes) {
    connect();
    emulator->faults().set("users.getInfo", emu::FaultRule{.errorCode = 2});
    Vector<String> ids{friendIds()[0]};
    Vector<Event> events;
    uError err = connector.getPeerStatusBatch(ids, events);
    EXPECT_CODE(err, kFailure);
    EXPECT_EQ(err.cause() ? err.cause()->code() : 0u, unsigned(kServiceUnavailable));
    Peer peer;
    EXPECT_CODE(connector.getPeerInfo(ids[0], peer), kServiceUnavailable);

    // The session has made two calls already.
    emulator->faults().set("friends.get", emu::FaultRule{.expireAfter = 1});
    EXPECT_CODE(connector.getPeers(ids), kNotSignedIn);
    std::uint64_t const sent = emulator->log().total();
    EXPECT_CODE(connector.setStatus("after the end"), kNotSignedIn);
    EXPECT_EQ(emulator->log().total(), sent);
}

// Before a connection the queries answer nothing and touch nothing; nothing is sent.
TEST_F(ConnectorEmulatorTest, BeforeConnectionQueriesSucceedWithTheirOutputsUntouched) {
    Vector<String> ids{"untouched"};
    EXPECT_OK(connector.getPeers(ids));
    EXPECT_EQ(ids, (Vector<String>{"untouched"}));
    Peer peer{"u", "f", "l", "n", "p"};
    Vector<Peer> peers{peer};
    Event event{"before", 42};
    Vector<Event> events{event};
    EXPECT_OK(connector.getPeerInfo("1", peer));
    EXPECT_OK(connector.getPeerInfoBatch(ids, peers));
    EXPECT_OK(connector.getPeerStatus("1", event));
    EXPECT_OK(connector.getPeerStatusBatch(ids, events));
    EXPECT_EQ(peer.serviceId + String::from(peers.size()) + event.statusText + String::from(events.size()),
              "u1before1");
    EXPECT_CODE(connector.setStatus("nobody to set it for"), kNotSignedIn);
    EXPECT_OK(connector.publishPhoto("file:///tmp/x.png", "c"));
    EXPECT_EQ(emulator->log().total(), 0u);
}

TEST(ConnectorConfigTest, BothTimesMustReadAsIntegers) {
    struct Case {
        Variant pollTime, maxTime;
        unsigned code;
    } const cases[] = {{300, 3600, kSuccess},
                       {"300", "3600", kSuccess},
                       {"soon", 3600, kFailure},
                       {300, Variant(), kFailure},
                       {true, 3600, kFailure}};
    for (Case const& c : cases) {
        FacebookConnector connector("facebook-connector");
        Map<String, Variant> values{{"facebook_polltime", c.pollTime}, {"facebook_maxtime", c.maxTime}};
        EXPECT_CODE(connector.sendConfig(Configuration::Group("facebook-connector", values)), c.code)
            << c.pollTime << " " << c.maxTime;
        EXPECT_EQ(connector.pollTime() + connector.maxTime(), c.code == kSuccess ? 3900 : 0);
    }
}

}  // namespace
}  // namespace trelm::test
