#include <functional>

#include "LibraryFixture.h"

namespace trelm::test {
namespace {

using Info = FacebookLibrary::ConnectionInfo;
using ConnectionInfoTest = LibraryFixture;

// Each getter refuses until its own setter ran (a session does not make login data appear), with
// the code that tells a configuration fault from being signed out, and leaves its output alone.
TEST_F(ConnectionInfoTest, GettersRefuseUntilTheirValueIsKnownAndLeaveTheOutputAlone) {
    using Getter = uError (Info::*)(String&) const;
    struct Case {
        Getter get;
        unsigned code;
        char const* value;
    } const cases[] = {
        {&Info::getAppKey, kNotSet, "key"},       {&Info::getAppSecret, kNotSet, "secret"},
        {&Info::getLogin, kNotSet, "me@x.org"},   {&Info::getPassword, kNotSet, "pw"},
        {&Info::getSessionId, kNotSignedIn, ""},  {&Info::getSessionSecret, kNotSignedIn, "ssec"},
        {&Info::getUserId, kNotSignedIn, "7"},
    };
    Info subject(kTag);
    for (Case const& c : cases) {
        String out = "untouched";
        EXPECT_CODE((subject.*c.get)(out), c.code);
        EXPECT_EQ(out, "untouched");
    }
    ASSERT_OK(subject.setAppConfig("key", "secret"));
    ASSERT_OK(subject.setSessionConfig("", "ssec", "7", false, false));  // an empty id is a session
    String out;
    EXPECT_CODE(subject.getLogin(out), kNotSet);
    ASSERT_OK(subject.setLoginConfig("me@x.org", "pw"));
    for (Case const& c : cases) {
        EXPECT_OK((subject.*c.get)(out));
        EXPECT_EQ(out, c.value);
    }
    EXPECT_TRUE(store.records().empty());
}

TEST_F(ConnectionInfoTest, SettersSendExactlyTheirStoreMessages) {
    struct Sent {
        char const* type;
        Fields values;                  // of a store message
        Set<String> keys;               // of a reset message
    };
    char const* const kStore = "RuntimeConfigurationMessage";
    char const* const kReset = "ResetRuntimeConfigurationMessage";
    Fields const session{{"facebook_source_session_id", "sid"},
                         {"facebook_source_session_secret", "ssec"},
                         {"facebook_source_session_user", "7"}};
    Sent const last{kStore, {{"facebook_source_lastuser", "7"}}, {}};
    struct Case {
        char const* name;
        std::function<uError(Info&)> call;
        std::vector<Sent> sent;
    } const cases[] = {
        {"session+last", [](Info& i) { return i.setSessionConfig("sid", "ssec", "7", true, true); },
         {{kStore, session, {}}, last}},
        {"session", [](Info& i) { return i.setSessionConfig("sid", "ssec", "7", true, false); },
         {{kStore, session, {}}}},
        {"last", [](Info& i) { return i.setSessionConfig("sid", "ssec", "7", false, true); }, {last}},
        {"memory", [](Info& i) { return i.setSessionConfig("sid", "ssec", "7", false, false); }, {}},
        {"user+last", [](Info& i) { return i.setUserConfig("7", true, true); },
         {{kStore, {{"facebook_source_session_user", "7"}}, {}}, last}},
        {"user memory", [](Info& i) { return i.setUserConfig("7", false, false); }, {}},
        {"drop all", [](Info& i) { return i.invalidateSessionConfigWithUser(true); },
         {{kReset, {}, {"facebook_source_session_id", "facebook_source_session_secret", "facebook_source_session_user"}}}},
        {"drop all memory", [](Info& i) { return i.invalidateSessionConfigWithUser(false); }, {}},
        {"drop session", [](Info& i) { return i.invalidateSessionConfigWithoutUser(true); },
         {{kReset, {}, {"facebook_source_session_id", "facebook_source_session_secret"}}}},
        {"drop session memory", [](Info& i) { return i.invalidateSessionConfigWithoutUser(false); }, {}},
        {"application", [](Info& i) { return i.setAppConfig("other", "s"); }, {}},
        {"login", [](Info& i) { return i.setLoginConfig("a@b", "pw"); }, {}},
    };
    for (Case const& c : cases) {
        SCOPED_TRACE(c.name);
        store.clearRecords();
        Info subject(kTag);
        ASSERT_OK(c.call(subject));
        auto records = store.records();
        ASSERT_EQ(records.size(), c.sent.size());
        for (size_t n = 0; n < records.size(); ++n) {
            EXPECT_EQ(records[n].type, c.sent[n].type);
            EXPECT_EQ(records[n].tag, kTag);
            EXPECT_EQ(entries(records[n].values), c.sent[n].values);
            EXPECT_TRUE(records[n].keys == c.sent[n].keys);
        }
    }
}

// A session signed for another application is worthless; the same application keeps it. Dropping
// the session alone keeps the user. Memory only.
TEST_F(ConnectionInfoTest, ChangedApplicationDropsSessionAndUserDroppingTheSessionKeepsTheUser) {
    struct Case {
        char const* name;
        std::function<uError(Info&)> change;
        bool keepsSession, keepsUser;
    } const cases[] = {
        {"same application", [](Info& i) { return i.setAppConfig("k", "s"); }, true, true},
        {"other key", [](Info& i) { return i.setAppConfig("k2", "s"); }, false, false},
        {"other secret", [](Info& i) { return i.setAppConfig("k", "s2"); }, false, false},
        {"session dropped", [](Info& i) { return i.invalidateSessionConfigWithoutUser(false); }, false, true},
    };
    for (Case const& c : cases) {
        SCOPED_TRACE(c.name);
        signIn("sid", "ssec", "7");
        store.clearRecords();
        ASSERT_OK(c.change(*info));
        String out;
        EXPECT_EQ(info->getSessionId(out).ok(), c.keepsSession);
        EXPECT_EQ(info->getSessionSecret(out).ok(), c.keepsSession);
        EXPECT_EQ(info->getUserId(out).ok() && out == "7", c.keepsUser);
        EXPECT_TRUE(store.records().empty());
        ASSERT_OK(info->setAppConfig("k", "s"));
    }
}

// A failed store is reported, memory keeps the change, and the second message is not sent.
TEST_F(ConnectionInfoTest, FailedStoreIsReportedWhileMemoryKeepsTheChange) {
    store.failType("RuntimeConfigurationMessage");
    EXPECT_CODE(info->setSessionConfig("sid", "ssec", "7", true, true), kFailure);
    EXPECT_EQ(store.records().size(), 1u) << "a session that could not be stored stops there";
    EXPECT_TRUE(info->hasSession());
    // The user is another matter: the last user is what tells a change of person later, so it is
    // stored even when storing the session's user failed, and the first failure is reported.
    EXPECT_CODE(info->setUserConfig("8", true, true), kFailure);
    EXPECT_EQ(store.records().size(), 3u) << "both stores are tried";
    store.failType("ResetRuntimeConfigurationMessage");
    EXPECT_CODE(info->invalidateSessionConfigWithUser(true), kFailure);
    EXPECT_FALSE(info->hasSession());
}

}  // namespace
}  // namespace trelm::test
