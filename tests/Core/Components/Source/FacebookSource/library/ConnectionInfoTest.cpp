#include <gtest/gtest.h>

#include <functional>

#include "ConnectionInfo.h"
#include "LibraryFixture.h"

namespace trelm::test {
namespace {

using Info = FacebookLibrary::ConnectionInfo;

class ConnectionInfoTest : public LibraryFixture {
protected:
    // A fresh object, apart from the fixture's (which already has application data).
    Info fresh{kTag};
};

// Each getter refuses until its own setter ran, with the code that tells a configuration fault
// from being signed out, and leaves the out-parameter alone when it refuses.
TEST_F(ConnectionInfoTest, GettersRefuseUntilTheirValueIsKnownAndLeaveTheOutputAlone) {
    struct Case {
        char const* name;
        std::function<uError(Info&, String&)> get;
        unsigned code;
        char const* expected;  // after every setter ran
    };
    Case const cases[] = {
        {"appKey", [](Info& i, String& o) { return i.getAppKey(o); }, kNotSet, "key"},
        {"appSecret", [](Info& i, String& o) { return i.getAppSecret(o); }, kNotSet, "secret"},
        {"login", [](Info& i, String& o) { return i.getLogin(o); }, kNotSet, "me@example.org"},
        {"password", [](Info& i, String& o) { return i.getPassword(o); }, kNotSet, "pw"},
        {"sessionId", [](Info& i, String& o) { return i.getSessionId(o); }, kNotSignedIn, "sid"},
        {"sessionSecret", [](Info& i, String& o) { return i.getSessionSecret(o); }, kNotSignedIn, "ssec"},
        {"userId", [](Info& i, String& o) { return i.getUserId(o); }, kNotSignedIn, "7"},
    };
    for (Case const& c : cases) {
        SCOPED_TRACE(c.name);
        String out = "untouched";
        EXPECT_EQ(c.get(fresh, out).code(), c.code);
        EXPECT_EQ(out, "untouched");
    }

    ASSERT_TRUE(fresh.setAppConfig("key", "secret").ok());
    ASSERT_TRUE(fresh.setLoginConfig("me@example.org", "pw").ok());
    ASSERT_TRUE(fresh.setSessionConfig("sid", "ssec", "7", false, false).ok());
    for (Case const& c : cases) {
        SCOPED_TRACE(c.name);
        String out;
        EXPECT_TRUE(c.get(fresh, out).ok());
        EXPECT_EQ(out, c.expected);
    }
    EXPECT_TRUE(store.records().empty());
}

// A session must not make login data appear: the login call needs both.
TEST_F(ConnectionInfoTest, LoginIsNotSetBySigningIn) {
    ASSERT_TRUE(fresh.setSessionConfig("sid", "ssec", "7", false, false).ok());
    String out;
    EXPECT_EQ(fresh.getLogin(out).code(), kNotSet);
    EXPECT_EQ(fresh.getPassword(out).code(), kNotSet);
}

// What each setter tells the runtime-configuration store, message by message.
TEST_F(ConnectionInfoTest, SettersSendExactlyTheirStoreMessages) {
    using Values = std::vector<std::pair<std::string, std::string>>;
    struct Expected {
        char const* type;
        Values values;                   // store messages
        std::vector<std::string> keys;  // reset messages
    };
    char const* const kStore = "RuntimeConfigurationMessage";
    char const* const kReset = "ResetRuntimeConfigurationMessage";
    Values const session = {{"facebook_source_session_id", "sid"},
                            {"facebook_source_session_secret", "ssec"},
                            {"facebook_source_session_user", "7"}};
    Values const last = {{"facebook_source_lastuser", "7"}};
    struct Case {
        char const* name;
        std::function<uError(Info&)> call;
        std::vector<Expected> sent;
    };
    Case const cases[] = {
        {"session stored with last user", [](Info& i) { return i.setSessionConfig("sid", "ssec", "7", true, true); },
         {{kStore, session, {}}, {kStore, last, {}}}},
        {"session stored alone", [](Info& i) { return i.setSessionConfig("sid", "ssec", "7", true, false); },
         {{kStore, session, {}}}},
        {"last user alone", [](Info& i) { return i.setSessionConfig("sid", "ssec", "7", false, true); },
         {{kStore, last, {}}}},
        {"session in memory", [](Info& i) { return i.setSessionConfig("sid", "ssec", "7", false, false); }, {}},
        {"user stored with last user", [](Info& i) { return i.setUserConfig("7", true, true); },
         {{kStore, {{"facebook_source_session_user", "7"}}, {}}, {kStore, last, {}}}},
        {"user in memory", [](Info& i) { return i.setUserConfig("7", false, false); }, {}},
        {"drop with user, stored",
         [](Info& i) { return i.invalidateSessionConfigWithUser(true); },
         {{kReset, {}, {"facebook_source_session_id", "facebook_source_session_secret", "facebook_source_session_user"}}}},
        {"drop with user, memory", [](Info& i) { return i.invalidateSessionConfigWithUser(false); }, {}},
        {"drop keeping user, stored",
         [](Info& i) { return i.invalidateSessionConfigWithoutUser(true); },
         {{kReset, {}, {"facebook_source_session_id", "facebook_source_session_secret"}}}},
        {"drop keeping user, memory", [](Info& i) { return i.invalidateSessionConfigWithoutUser(false); }, {}},
        {"new application", [](Info& i) { return i.setAppConfig("other", "s"); }, {}},
        {"login", [](Info& i) { return i.setLoginConfig("a@b", "pw"); }, {}},
        {"lists", [](Info& i) { return i.setWipeComponents({"A"}); }, {}},
    };
    for (Case const& c : cases) {
        SCOPED_TRACE(c.name);
        store.clearRecords();
        Info subject(kTag);
        ASSERT_TRUE(c.call(subject).ok());
        auto records = store.records();
        ASSERT_EQ(records.size(), c.sent.size());
        for (size_t n = 0; n < records.size(); ++n) {
            EXPECT_EQ(records[n].type, c.sent[n].type);
            EXPECT_EQ(records[n].tag, kTag);
            EXPECT_EQ(entries(records[n].values), c.sent[n].values);
            std::vector<std::string> keys;
            for (String const& key : records[n].keys) keys.push_back(key.str());
            EXPECT_EQ(keys, c.sent[n].keys);
        }
    }
}

TEST_F(ConnectionInfoTest, SameApplicationKeepsTheSessionAnotherDropsSessionAndUserInMemoryOnly) {
    struct Case {
        char const* key;
        char const* secret;
        bool keeps;
    };
    Case const cases[] = {{"k", "s", true}, {"k2", "s", false}, {"k", "s2", false}};
    for (Case const& c : cases) {
        SCOPED_TRACE(std::string(c.key) + "/" + c.secret);
        Info subject(kTag);
        ASSERT_TRUE(subject.setAppConfig("k", "s").ok());
        ASSERT_TRUE(subject.setSessionConfig("sid", "ssec", "7", false, false).ok());
        store.clearRecords();
        ASSERT_TRUE(subject.setAppConfig(c.key, c.secret).ok());
        String out;
        EXPECT_EQ(subject.getSessionId(out).ok(), c.keeps);
        EXPECT_EQ(subject.getUserId(out).ok(), c.keeps);
        EXPECT_TRUE(store.records().empty());
        ASSERT_TRUE(subject.getAppKey(out).ok());
        EXPECT_EQ(out, c.key);
    }
}

TEST_F(ConnectionInfoTest, DroppingTheSessionWithoutUserKeepsTheUser) {
    ASSERT_TRUE(fresh.setSessionConfig("sid", "ssec", "7", false, false).ok());
    ASSERT_TRUE(fresh.invalidateSessionConfigWithoutUser(false).ok());
    String out;
    EXPECT_TRUE(fresh.getUserId(out).ok());
    EXPECT_EQ(out, "7");
    EXPECT_EQ(fresh.getSessionId(out).code(), kNotSignedIn);
    EXPECT_EQ(fresh.getSessionSecret(out).code(), kNotSignedIn);

    ASSERT_TRUE(fresh.invalidateSessionConfigWithUser(false).ok());
    EXPECT_EQ(fresh.getUserId(out).code(), kNotSignedIn);
}

TEST_F(ConnectionInfoTest, EmptySessionIdStillCountsAsASession) {
    ASSERT_TRUE(fresh.setSessionConfig("", "", "7", false, false).ok());
    String out = "x";
    EXPECT_TRUE(fresh.getSessionId(out).ok());
    EXPECT_EQ(out, "");
    EXPECT_TRUE(fresh.hasSession());
}

// The store failing must not lose the new session in memory, and the second message is not sent.
TEST_F(ConnectionInfoTest, FailedStoreIsReportedButMemoryKeepsTheNewSession) {
    store.failType("RuntimeConfigurationMessage");
    EXPECT_EQ(fresh.setSessionConfig("sid", "ssec", "7", true, true).code(), kFailure);
    EXPECT_EQ(store.records().size(), 1u);
    String out;
    ASSERT_TRUE(fresh.getSessionId(out).ok());
    EXPECT_EQ(out, "sid");

    store.failType("ResetRuntimeConfigurationMessage");
    EXPECT_EQ(fresh.invalidateSessionConfigWithUser(true).code(), kFailure);
    EXPECT_EQ(fresh.getSessionId(out).code(), kNotSignedIn);
}

TEST_F(ConnectionInfoTest, ComponentListsAreReplacedWhole) {
    ASSERT_TRUE(fresh.setWipeComponents({"A", "B"}).ok());
    ASSERT_TRUE(fresh.setWipeComponents({"C"}).ok());
    ASSERT_TRUE(fresh.setWakeupComponents({"D", "E"}).ok());
    Vector<String> wipe;
    Vector<String> wakeup;
    ASSERT_TRUE(fresh.getWipeComponents(wipe).ok());
    ASSERT_TRUE(fresh.getWakeupComponents(wakeup).ok());
    EXPECT_EQ(wipe, (Vector<String>{"C"}));
    EXPECT_EQ(wakeup, (Vector<String>{"D", "E"}));
}

}  // namespace
}  // namespace trelm::test
