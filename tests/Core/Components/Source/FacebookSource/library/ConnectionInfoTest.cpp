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
    } const cases[] = {{&Info::getAppKey, kNotSet},         {&Info::getAppSecret, kNotSet},
                       {&Info::getLogin, kNotSet},          {&Info::getPassword, kNotSet},
                       {&Info::getSessionId, kNotSignedIn}, {&Info::getSessionSecret, kNotSignedIn},
                       {&Info::getUserId, kNotSignedIn}};
    Info subject(kTag);
    ASSERT_OK(subject.setSessionConfig("", "ssec", "7", false, false));  // an empty id is a session
    for (Case const& c : cases) {
        String out = "untouched";
        EXPECT_CODE((Info(kTag).*c.get)(out), c.code);
        EXPECT_EQ(out, "untouched");
        // Once the session is set its getters answer; the others still refuse.
        EXPECT_CODE((subject.*c.get)(out), c.code == kNotSignedIn ? kSuccess : c.code);
    }
    EXPECT_TRUE(store.received().empty());
}

// What each setter leaves in the store, which held "old" under the session's keys and the last
// user, and how many messages it sent: only what it is asked to persist is stored or forgotten.
TEST_F(ConnectionInfoTest, SettersStoreAndForgetExactlyTheirKeys) {
    char const* const keys[] = {"facebook_source_session_id", "facebook_source_session_secret",
                                "facebook_source_session_user", "facebook_source_lastuser"};
    char const* const untouched = "old old old old";
    struct Case {
        char const* name;
        std::function<uError(Info&)> call;
        char const* after;  // the four keys' values, "-" for none
        size_t messages;
    } const cases[] = {
        {"session+last", [](Info& i) { return i.setSessionConfig("sid", "ssec", "7", true, true); }, "sid ssec 7 7", 2},
        {"session", [](Info& i) { return i.setSessionConfig("sid", "ssec", "7", true, false); }, "sid ssec 7 old", 1},
        {"last", [](Info& i) { return i.setSessionConfig("sid", "ssec", "7", false, true); }, "old old old 7", 1},
        {"memory", [](Info& i) { return i.setSessionConfig("sid", "ssec", "7", false, false); }, untouched, 0},
        {"user+last", [](Info& i) { return i.setUserConfig("7", true, true); }, "old old 7 7", 2},
        {"user memory", [](Info& i) { return i.setUserConfig("7", false, false); }, untouched, 0},
        {"drop all", [](Info& i) { return i.invalidateSessionConfigWithUser(true); }, "- - - old", 1},
        {"drop all memory", [](Info& i) { return i.invalidateSessionConfigWithUser(false); }, untouched, 0},
        {"drop session", [](Info& i) { return i.invalidateSessionConfigWithoutUser(true); }, "- - old old", 1},
        {"drop session memory", [](Info& i) { return i.invalidateSessionConfigWithoutUser(false); }, untouched, 0},
        {"application", [](Info& i) { return i.setAppConfig("other", "s"); }, untouched, 0},
        {"login", [](Info& i) { return i.setLoginConfig("a@b", "pw"); }, untouched, 0},
    };
    for (Case const& c : cases) {
        SCOPED_TRACE(c.name);
        for (char const* key : keys) put(key, "old");
        store.clearReceived();
        Info subject(kTag);
        ASSERT_OK(c.call(subject));
        String after;
        for (char const* key : keys) after += (after.empty() ? "" : " ") + stored(key);
        EXPECT_EQ(after, c.after);
        EXPECT_EQ(store.received().size(), c.messages);
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
        store.clearReceived();
        ASSERT_OK(c.change(*info));
        String out;
        EXPECT_EQ(info->getSessionId(out).ok(), c.keepsSession);
        EXPECT_EQ(info->getSessionSecret(out).ok(), c.keepsSession);
        EXPECT_EQ(info->getUserId(out).ok() && out == "7", c.keepsUser);
        EXPECT_TRUE(store.received().empty());
        ASSERT_OK(info->setAppConfig("k", "s"));
    }
}

// A failed store is reported, memory keeps the change, and the second message is not sent.
TEST_F(ConnectionInfoTest, FailedStoreIsReportedWhileMemoryKeepsTheChange) {
    store.failing = "RuntimeConfigurationMessage";
    EXPECT_CODE(info->setSessionConfig("sid", "ssec", "7", true, true), kFailure);
    EXPECT_EQ(store.received().size(), 1u) << "a session that could not be stored stops there";
    EXPECT_TRUE(info->hasSession());
    // The user is another matter: the last user is what tells a change of person later, so it is
    // stored even when storing the session's user failed, and the first failure is reported.
    EXPECT_CODE(info->setUserConfig("8", true, true), kFailure);
    EXPECT_EQ(store.received().size(), 3u) << "both stores are tried";
    store.failing = "ResetRuntimeConfigurationMessage";
    EXPECT_CODE(info->invalidateSessionConfigWithUser(true), kFailure);
    EXPECT_FALSE(info->hasSession());
}

}  // namespace
}  // namespace trelm::test
