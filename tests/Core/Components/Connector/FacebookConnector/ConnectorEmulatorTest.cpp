// The connector as a host drives it, against the in-process emulator through the host's own
// "HttpRequestFactory": what it asks the service, how many requests it takes, and what it does
// when the service's answer does not fit.
#include <gtest/gtest.h>

#include <algorithm>
#include <functional>
#include <memory>
#include <string>
#include <vector>

#include "ComponentRegistry.h"
#include "Emulator.h"
#include "ErrorAssertions.h"
#include "FacebookConnector.h"
#include "HttpRequestFactory.h"

namespace trelm::test {
namespace {

using Peer = NetworkMetadata::tRELMNetworkPeer;
using Event = NetworkMetadata::tRELMNetworkEvent;
using Row = std::map<std::string, std::string>;

std::string const kDemoUid = std::to_string(emu::DemoAccount::uid);

class ConnectorEmulatorTest : public ::testing::Test {
protected:
    void SetUp() override {
        emu::Emulator::Options options;
        options.generator.users = 90;
        options.generator.demoFriends = 55;
        options.generator.friendsPerUser = 2;
        options.threads = 4;
        emulator = std::make_unique<emu::Emulator>(options);
        std::string error;
        ASSERT_TRUE(emulator->start(error)) << error;
        factory.setCaFile(emulator->caFile());
        factory.setConnectTo({"api.facebook.com:80:127.0.0.1:" + std::to_string(emulator->httpPort()),
                              "api.facebook.com:443:127.0.0.1:" + std::to_string(emulator->httpsPort())});
        ASSERT_OK(registry.add(HttpRequestFactory::kName, &factory));
        registry.activate();
    }

    Map<String, String> demoParams(char const* password = emu::DemoAccount::password) {
        return Map<String, String>{{"FacebookAppKey", emu::DemoAccount::apiKey},
                                   {"FacebookAppSecret", emu::DemoAccount::appSecret},
                                   {"FacebookLogin", emu::DemoAccount::email},
                                   {"FacebookPassword", password}};
    }

    void connect() {
        Map<String, String> params = demoParams();
        ASSERT_OK(connector.makeConnection(params, false));
    }

    // What the service holds, read as the demo user; nested columns become "parent.child".
    std::vector<Row> fql(std::string const& query) {
        emu::XmlNode root("fql_query_response");
        emu::Status status = emulator->store().fqlQuery(emu::DemoAccount::uid, query, root);
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

    std::vector<std::string> friendIds() {
        std::vector<std::string> ids;
        for (Row& row : fql("SELECT uid2 FROM friend WHERE uid1 = me()")) ids.push_back(row["uid2"]);
        std::sort(ids.begin(), ids.end());
        return ids;
    }

    ComponentRegistry registry;
    HttpRequestFactory factory;
    std::unique_ptr<emu::Emulator> emulator;
    FacebookConnector connector{"facebook-connector"};
};

TEST_F(ConnectorEmulatorTest, MakeConnectionLogsInOnceOverHttpsAndWritesTheUserBack) {
    Map<String, String> params = demoParams();
    ASSERT_OK(connector.makeConnection(params, false));
    ASSERT_NE(params.search("FacebookID"), nullptr);
    EXPECT_EQ(*params.search("FacebookID"), kDemoUid);
    auto logins = emulator->log().entriesFor("auth.login");
    ASSERT_EQ(logins.size(), 1u);
    EXPECT_TRUE(logins[0].https);
    EXPECT_EQ(logins[0].args["email"], emu::DemoAccount::email);

    Map<String, String> again = demoParams("another password");
    EXPECT_OK(connector.makeConnection(again, false));
    EXPECT_EQ(emulator->log().total(), 1u) << "a second connection sends nothing";
}

TEST_F(ConnectorEmulatorTest, WrongPasswordKeepsTheServiceCodeAndLaterCallsAreNotSignedIn) {
    Map<String, String> params = demoParams("not the password");
    EXPECT_CODE(connector.makeConnection(params, false), kNotSignedIn);
    Vector<String> ids{"untouched"};
    EXPECT_CODE(connector.getPeers(ids), kNotSignedIn);
    EXPECT_EQ(ids, (Vector<String>{"untouched"}));
    EXPECT_EQ(emulator->log().total(), 1u) << "no session call goes out without a session";
}

TEST_F(ConnectorEmulatorTest, GetPeersListsExactlyTheDemoUsersFriends) {
    connect();
    Vector<String> peers;
    ASSERT_OK(connector.getPeers(peers));
    std::vector<std::string> ids;
    for (String const& peer : peers) ids.push_back(peer.str());
    std::sort(ids.begin(), ids.end());
    EXPECT_EQ(ids, friendIds());
    EXPECT_EQ(ids.size(), 55u);
}

TEST_F(ConnectorEmulatorTest, PeerInfoComesFromOneRequestPerCallInTheOrderOfTheIds) {
    connect();
    std::vector<std::string> const friends = friendIds();
    auto expected = [&](std::string const& uid) {
        Row row = fql("SELECT uid, first_name, last_name, name, profile_url FROM user WHERE uid = " + uid).at(0);
        return row["uid"] + "|" + row["first_name"] + "|" + row["last_name"] + "|" + row["name"] + "|" +
               row["profile_url"];
    };
    auto text = [](Peer const& p) {
        return (p.serviceId + "|" + p.firstName + "|" + p.lastName + "|" + p.fullName + "|" + p.profileUrl).str();
    };

    Peer one;
    ASSERT_OK(connector.getPeerInfo(String(friends[3]), one));
    EXPECT_EQ(text(one), expected(friends[3]));

    // Asked in an order that is not the service's.
    Vector<String> ids{String(friends[9]), String(friends[1]), String(friends[5])};
    Vector<Peer> peers;
    ASSERT_OK(connector.getPeerInfoBatch(ids, peers));
    ASSERT_EQ(peers.size(), 3u);
    for (unsigned i = 0; i < ids.size(); ++i) EXPECT_EQ(text(peers[i]), expected(ids[i].str())) << i;

    auto calls = emulator->log().entriesFor("users.getInfo");
    ASSERT_EQ(calls.size(), 2u);
    EXPECT_EQ(calls[1].args["fields"], "uid,first_name,last_name,name,profile_url");
    EXPECT_EQ(calls[1].args["uids"], ids[0].str() + "," + ids[1].str() + "," + ids[2].str());
}

// Every fourth friend of the emulator's data has never set a status: the batch covers both kinds.
TEST_F(ConnectorEmulatorTest, StatusesOfFiftyFriendsComeInOneRequestWithTextAndTime) {
    connect();
    std::vector<std::string> const friends = friendIds();
    Vector<String> ids;
    for (unsigned i = 0; i < 50; ++i) ASSERT_OK(ids.pushBack(String(friends[i])));
    Vector<Event> events;
    ASSERT_OK(connector.getPeerStatusBatch(ids, events));

    auto calls = emulator->log().entriesFor("users.getInfo");
    ASSERT_EQ(calls.size(), 1u);
    EXPECT_EQ(calls[0].args["fields"], "uid,name,status");
    ASSERT_EQ(events.size(), 50u);
    unsigned withStatus = 0;
    for (unsigned i = 0; i < 50; ++i) {
        Row row = fql("SELECT status FROM user WHERE uid = " + ids[i].str()).at(0);
        std::string const time = row.count("status.time") ? row["status.time"] : "0";
        EXPECT_EQ(events[i].statusText.str() + "@" + std::to_string(events[i].statusTime),
                  row["status.message"] + "@" + time)
            << ids[i];
        if (events[i].statusTime != 0) ++withStatus;
    }
    EXPECT_GT(withStatus, 0u);
    EXPECT_LT(withStatus, 50u) << "some friends have never set a status";

    Event single{"untouched", 7};
    ASSERT_OK(connector.getPeerStatus(ids[0], single));
    EXPECT_EQ(single.statusText, events[0].statusText);
    EXPECT_EQ(single.statusTime, events[0].statusTime);
}

// The service shows a status that was never set as an empty message at time 0, not as nil.
TEST_F(ConnectorEmulatorTest, UsersGetInfoShowsEveryFriendsStatusWithItsTime) {
    std::string uids;
    for (std::string const& uid : friendIds()) uids += (uids.empty() ? "" : ",") + uid;
    emu::XmlNode root("users_getInfo_response");
    ASSERT_FALSE(emulator->store().usersGetInfo(emu::DemoAccount::uid, uids, "status", root).has_value());
    unsigned unset = 0;
    for (emu::XmlNode const& user : root.children) {
        ASSERT_EQ(user.children.size(), 2u);
        emu::XmlNode const& status = user.children[1];
        ASSERT_FALSE(status.nil) << user.children[0].text;
        ASSERT_EQ(status.children.size(), 3u);
        std::string const shape = status.children[0].name + "," + status.children[1].name + "," +
                                  status.children[2].name;
        EXPECT_EQ(shape, "message,time,status_id");
        bool const never = status.children[1].text == "0";
        EXPECT_EQ(status.children[0].text.empty(), never) << user.children[0].text;
        if (never) ++unset;
    }
    EXPECT_EQ(unset, 55u / 4);
}

// An id the service does not know gets no answer: fewer statuses than ids.
TEST_F(ConnectorEmulatorTest, ShortStatusAnswerFailsAndLeavesTheEventsAsTheyWere) {
    connect();
    std::vector<std::string> const friends = friendIds();
    Vector<String> ids{String(friends[0]), "1", String(friends[1])};
    Vector<Event> events{Event{"before", 42}};
    EXPECT_CODE(connector.getPeerStatusBatch(ids, events), kFailure);
    ASSERT_EQ(events.size(), 1u);
    EXPECT_EQ(events[0].statusText, "before");
    EXPECT_EQ(events[0].statusTime, 42);

    Event single{"before", 42};
    EXPECT_CODE(connector.getPeerStatus("1", single), kFailure);
    EXPECT_EQ(single.statusText, "before");
}

TEST_F(ConnectorEmulatorTest, ServiceFailuresOfStatusQueriesBecomeGeneralFailures) {
    connect();
    emu::FaultRule rule;
    rule.errorCode = 2;
    emulator->faults().set("users.getInfo", rule);
    Vector<String> ids{String(friendIds()[0])};
    Vector<Event> events;
    uError err = connector.getPeerStatusBatch(ids, events);
    EXPECT_CODE(err, kFailure);
    ASSERT_NE(err.cause(), nullptr);
    EXPECT_EQ(err.cause()->code(), kServiceUnavailable);
    Peer peer;
    EXPECT_CODE(connector.getPeerInfo(ids[0], peer), kServiceUnavailable) << "profile failures pass unchanged";
}

TEST_F(ConnectorEmulatorTest, RefusedSessionIsForgottenSoLaterCallsAreNotSignedIn) {
    connect();
    emu::FaultRule rule;
    rule.expireAfter = 1;
    emulator->faults().set("friends.get", rule);
    Vector<String> ids;
    ASSERT_OK(connector.getPeers(ids));
    EXPECT_CODE(connector.getPeers(ids), kNotSignedIn);
    std::uint64_t const sent = emulator->log().total();
    EXPECT_CODE(connector.setStatus("after the end"), kNotSignedIn);
    EXPECT_EQ(emulator->log().total(), sent);
}

TEST_F(ConnectorEmulatorTest, SetStatusIsWhatTheServiceThenShows) {
    connect();
    ASSERT_OK(connector.setStatus("is testing the connector"));
    auto calls = emulator->log().entriesFor("users.setStatus");
    ASSERT_EQ(calls.size(), 1u);
    EXPECT_EQ(calls[0].args["status"], "is testing the connector");
    EXPECT_EQ(calls[0].args["call_id"], "1");
    EXPECT_EQ(fql("SELECT status FROM user WHERE uid = me()").at(0)["status.message"], "is testing the connector");
}

// Before a connection the queries answer nothing and touch nothing; nothing is sent.
TEST_F(ConnectorEmulatorTest, BeforeConnectionQueriesSucceedWithTheirOutputsUntouched) {
    Vector<String> ids{"untouched"};
    EXPECT_OK(connector.getPeers(ids));
    EXPECT_EQ(ids, (Vector<String>{"untouched"}));
    Peer peer{"u", "f", "l", "n", "p"};
    EXPECT_OK(connector.getPeerInfo("1", peer));
    EXPECT_EQ(peer.serviceId + peer.profileUrl, "up");
    Vector<Peer> peers{peer};
    EXPECT_OK(connector.getPeerInfoBatch(ids, peers));
    EXPECT_EQ(peers.size(), 1u);
    Event event{"before", 42};
    EXPECT_OK(connector.getPeerStatus("1", event));
    EXPECT_EQ(event.statusText, "before");
    Vector<Event> events{event};
    EXPECT_OK(connector.getPeerStatusBatch(ids, events));
    EXPECT_EQ(events.size(), 1u);
    EXPECT_CODE(connector.setStatus("nobody to set it for"), kNotSignedIn);
    Vector<String> albums;
    EXPECT_OK(connector.getPhotoAlbums(albums));
    EXPECT_OK(connector.publishPhoto("file:///tmp/x.png", "c"));
    EXPECT_OK(connector.publishPhotoTo("a", "file:///tmp/x.png", "c"));
    EXPECT_OK(connector.closeConnection());
    EXPECT_EQ(emulator->log().total(), 0u);
}

struct ConfigCase {
    char const* name;
    Variant pollTime;
    Variant maxTime;
    unsigned code;
};

void PrintTo(ConfigCase const& c, std::ostream* os) { *os << c.name; }

class ConnectorConfigTest : public ::testing::TestWithParam<ConfigCase> {};

TEST_P(ConnectorConfigTest, BothTimesMustReadAsIntegers) {
    ConfigCase const& c = GetParam();
    FacebookConnector connector("facebook-connector");
    Map<String, Variant> values;
    if (!c.pollTime.empty()) {
        ASSERT_OK(values.insert("facebook_polltime", c.pollTime));
    }
    if (!c.maxTime.empty()) {
        ASSERT_OK(values.insert("facebook_maxtime", c.maxTime));
    }
    uError err = connector.sendConfig(Configuration::Group("facebook-connector", values));
    EXPECT_CODE(err, c.code);
    if (c.code == kSuccess) {
        EXPECT_EQ(connector.pollTime(), 300);
        EXPECT_EQ(connector.maxTime(), 3600);
    } else {
        EXPECT_NE(err.cause(), nullptr) << "the reason is kept";
    }
}

INSTANTIATE_TEST_SUITE_P(
    Values, ConnectorConfigTest,
    ::testing::Values(ConfigCase{"integers", Variant(300), Variant(3600), kSuccess},
                      ConfigCase{"decimal_texts", Variant("300"), Variant("3600"), kSuccess},
                      ConfigCase{"poll_time_not_a_number", Variant("soon"), Variant(3600), kFailure},
                      ConfigCase{"max_time_missing", Variant(300), Variant(), kFailure},
                      ConfigCase{"poll_time_a_flag", Variant(true), Variant(3600), kFailure}),
    [](auto const& info) { return std::string(info.param.name); });

}  // namespace
}  // namespace trelm::test
