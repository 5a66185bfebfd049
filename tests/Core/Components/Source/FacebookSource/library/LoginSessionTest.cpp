#include <gtest/gtest.h>

#include "ConnectionInfo.h"
#include "LibraryFixture.h"
#include "trelm/MD5.h"

namespace trelm::test {
namespace {

using Fields = std::vector<std::pair<std::string, std::string>>;
using Events = std::vector<String>;

String loginAnswer(char const* uid, char const* withSecret = "SS") {
    String doc = String("<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n<auth_login_response "
                        "xmlns=\"http://api.facebook.com/1.0/\"><session_key>SK</session_key><uid>") +
                 uid + "</uid>";
    if (withSecret) doc += String("<secret>") + withSecret + "</secret>";
    return doc + "<expires>0</expires></auth_login_response>";
}

String errorAnswer(char const* code) {
    return String("<error_response><error_code>") + code + "</error_code><error_msg>m</error_msg></error_response>";
}

class LoginSessionTest : public LibraryFixture {
protected:
    void SetUp() override {
        LibraryFixture::SetUp();
        ASSERT_TRUE(info->setLoginConfig("me@example.org", "pw").ok());
    }

    // Wipe list A, B; wake-up list C; all three record what they receive.
    void addLists() {
        addRecorder("A");
        addRecorder("B");
        addRecorder("C");
        ASSERT_TRUE(info->setWipeComponents({"A", "B"}).ok());
        ASSERT_TRUE(info->setWakeupComponents({"C"}).ok());
    }

    // The status message as each of A, B, C records it.
    static Events statusEvents(char const* code, char const* user) {
        Events out;
        for (char const* name : {"A", "B", "C"}) {
            out.push_back(String(name) + ":status:" + kTag + ":" + code + ":" + user);
        }
        return out;
    }
    static Events concat(Events a, Events const& b) {
        a.insert(a.end(), b.begin(), b.end());
        return a;
    }
    Events const kWipeAndWake{"A:wipe:fbsource", "B:wipe:fbsource", "C:wakeup:fbsource"};

    String lastUser() {
        String out;
        return store.get(kTag, "facebook_source_lastuser", out) ? out : String("<none>");
    }
};

TEST_F(LoginSessionTest, SetupIsOnceOnlyAndKeepsTheFirstSettings) {
    signIn("SK", "SS", "42");
    auto other = makeSmart<FacebookLibrary::ConnectionInfo>("other");
    EXPECT_EQ(lib->setup(other).code(), kInvalid);
    EXPECT_EQ(lib->setup(SmartPtr<FacebookLibrary::ConnectionInfo>()).code(), kInvalid);
    String user;
    ASSERT_TRUE(lib->getUserId(user).ok());
    EXPECT_EQ(user, "42");

    FacebookLibrary unset;
    EXPECT_EQ(unset.setup(SmartPtr<FacebookLibrary::ConnectionInfo>()).code(), kInvalid);
    EXPECT_EQ(unset.getUserId(user).code(), kNotSet);
    EXPECT_EQ(unset.connect().code(), kNotSet);
    EXPECT_EQ(unset.resetAccount(true).code(), kNotSet);
}

// md5("api_key=kemail=me@example.orgmethod=facebook.auth.loginpassword=pwv=1.0s").
TEST_F(LoginSessionTest, LoginPostsCredentialsOverHttpsAndStoresTheSession) {
    http.queue(loginAnswer("42"));
    String session, secret, user;
    ASSERT_TRUE(lib->connectInternal(session, secret, user).ok());
    EXPECT_EQ(session, "SK");
    EXPECT_EQ(secret, "SS");
    EXPECT_EQ(user, "42");

    auto sent = http.exchanges();
    ASSERT_EQ(sent.size(), 1u);
    EXPECT_EQ(sent[0].url, "https://api.facebook.com/restserver.php");
    EXPECT_EQ(entries(sent[0].fields), (Fields{{"api_key", "k"},
                                               {"email", "me@example.org"},
                                               {"method", "facebook.auth.login"},
                                               {"password", "pw"},
                                               {"sig", "5697f76f44ccb154732267ab67afb620"},
                                               {"v", "1.0"}}));

    String out;
    ASSERT_TRUE(info->getSessionSecret(out).ok());
    EXPECT_EQ(out, "SS");
    ASSERT_TRUE(store.get(kTag, "facebook_source_session_id", out));
    EXPECT_EQ(out, "SK");
    ASSERT_TRUE(store.get(kTag, "facebook_source_session_user", out));
    EXPECT_EQ(out, "42");
    EXPECT_EQ(lastUser(), "42");
}

// A failed or unreadable login changes nothing, neither in memory nor in the store.
TEST_F(LoginSessionTest, FailedLoginsAnswerTheirCodeAndChangeNothing) {
    struct Case {
        char const* name;
        FakeHttpRequestFactory::Answer answer;
        unsigned code;
    };
    Case const cases[] = {
        {"wrong password", {200, errorAnswer("100"), {}}, kNotSignedIn},
        {"throttled", {200, errorAnswer("4"), {}}, kRequestLimit},
        {"unavailable", {200, errorAnswer("2"), {}}, kServiceUnavailable},
        {"bad api key", {200, errorAnswer("101"), {}}, kServiceError},
        {"error without code", {200, "<error_response><error_msg>m</error_msg></error_response>", {}}, kFailure},
        {"error code not a number", {200, errorAnswer("x"), {}}, kFailure},
        {"no uid", {200, "<auth_login_response><session_key>SK</session_key></auth_login_response>", {}}, kFailure},
        {"no session key", {200, "<auth_login_response><uid>42</uid></auth_login_response>", {}}, kFailure},
        {"other document", {200, "<users_getInfo_response/>", {}}, kFailure},
        {"truncated", {200, "<auth_login_response><uid>42</ui", {}}, kFailure},
        {"http status", {500, loginAnswer("42"), {}}, kFailure},
    };
    for (Case const& c : cases) {
        SCOPED_TRACE(c.name);
        http.queue(c.answer);
        String session = "-", secret = "-", user = "-";
        EXPECT_EQ(lib->connectInternal(session, secret, user).code(), c.code);
        EXPECT_EQ(user, "-");
        EXPECT_FALSE(info->hasSession());
        String out;
        EXPECT_EQ(info->getUserId(out).code(), kNotSignedIn);
        EXPECT_TRUE(store.records().empty());
    }
}

TEST_F(LoginSessionTest, LoginWithoutConfiguredCredentialsIsNotSignedInAndSendsNothing) {
    auto noLogin = makeSmart<FacebookLibrary::ConnectionInfo>(kTag);
    ASSERT_TRUE(noLogin->setAppConfig("k", "s").ok());
    FacebookLibrary client;
    ASSERT_TRUE(client.setup(noLogin).ok());
    String session, secret, user;
    uError err = client.connectInternal(session, secret, user);
    EXPECT_EQ(err.code(), kNotSignedIn);
    ASSERT_NE(err.cause(), nullptr);
    EXPECT_EQ(err.cause()->code(), kNotSet);
    EXPECT_TRUE(http.exchanges().empty());
}

// A login answer without "secret": later session calls are signed with the application secret.
TEST_F(LoginSessionTest, SessionWithoutSecretSignsWithTheApplicationSecret) {
    http.queue(loginAnswer("42", nullptr));
    ASSERT_TRUE(lib->connect().ok());
    http.queue(String("<users_setStatus_response>1</users_setStatus_response>"));
    ASSERT_TRUE(lib->setStatus("hi", false).ok());
    auto fields = lastFields();
    ASSERT_TRUE(fields.contains("session_key"));
    String text;
    for (auto const& [key, value] : fields) {
        if (key != "sig") text += key + "=" + value;
    }
    EXPECT_EQ(*fields.search("sig"), md5Hex(text + "s"));
}

// Who hears what when someone signs in, by what the store remembers of the last user.
TEST_F(LoginSessionTest, ConnectWipesAndWakesOnlyWhenAnotherUserSignsIn) {
    struct Case {
        char const* name;
        char const* storedLastUser;  // null: none
        bool storeReadFails;
        bool wipes;
    };
    Case const cases[] = {
        {"first sign-in", nullptr, false, false},
        {"same user", "42", false, false},
        {"another user", "7", false, true},
        {"last user unreadable", "7", true, false},
    };
    addLists();
    for (Case const& c : cases) {
        SCOPED_TRACE(c.name);
        FakeRuntimeConfiguration fresh;
        ASSERT_TRUE(registry.remove("RuntimeConfiguration").ok());
        ASSERT_TRUE(registry.add("RuntimeConfiguration", &fresh).ok());
        if (c.storedLastUser) fresh.put(kTag, "facebook_source_lastuser", c.storedLastUser);
        if (c.storeReadFails) fresh.failType("GetRuntimeConfigurationMessage");
        events->clear();

        http.queue(loginAnswer("42"));
        EXPECT_TRUE(lib->connect().ok());
        Events expected = statusEvents("0", "42");
        if (c.wipes) expected = concat(kWipeAndWake, expected);
        EXPECT_EQ(events->events(), expected);
        String last;
        ASSERT_TRUE(fresh.get(kTag, "facebook_source_lastuser", last));
        EXPECT_EQ(last, "42");

        ASSERT_TRUE(registry.remove("RuntimeConfiguration").ok());
        ASSERT_TRUE(registry.add("RuntimeConfiguration", &store).ok());
    }
}

TEST_F(LoginSessionTest, FailedConnectAnnouncesTheCodeWithoutUserAndWipesNothing) {
    addLists();
    store.put(kTag, "facebook_source_lastuser", "7");
    http.queue(errorAnswer("100"));
    EXPECT_EQ(lib->connect().code(), kNotSignedIn);
    EXPECT_EQ(events->events(), statusEvents("8000001c", ""));
    EXPECT_EQ(lastUser(), "7");
}

TEST_F(LoginSessionTest, AppliedSessionStaysInMemoryWhileTheLastUserIsStored) {
    addLists();
    store.put(kTag, "facebook_source_lastuser", "7");
    ASSERT_TRUE(lib->applySession("SK", "SS", "42").ok());

    auto records = store.records();
    ASSERT_EQ(records.size(), 2u);
    EXPECT_EQ(records[0].type, "GetRuntimeConfigurationMessage");
    EXPECT_EQ(records[1].type, "RuntimeConfigurationMessage");
    EXPECT_EQ(entries(records[1].values), (Fields{{"facebook_source_lastuser", "42"}}));
    EXPECT_EQ(events->events(), concat(kWipeAndWake, statusEvents("0", "42")));

    http.queue(String("<users_setStatus_response>1</users_setStatus_response>"));
    ASSERT_TRUE(lib->setStatus("x", true).ok());
    EXPECT_EQ(*lastFields().search("session_key"), "SK");
}

// After a log-out the last user is remembered: the same person back wipes nothing, another does.
TEST_F(LoginSessionTest, ResetForgetsTheSessionButRemembersTheLastUser) {
    addLists();
    http.queue(loginAnswer("42"));
    ASSERT_TRUE(lib->connect().ok());
    events->clear();
    store.clearRecords();

    ASSERT_TRUE(lib->resetAccount(true).ok());
    auto records = store.records();
    ASSERT_EQ(records.size(), 1u);
    EXPECT_EQ(records[0].type, "ResetRuntimeConfigurationMessage");
    EXPECT_EQ(records[0].keys, (Set<String>{"facebook_source_session_id", "facebook_source_session_secret",
                                            "facebook_source_session_user"}));
    // Wipes only: nobody is woken for a log-out.
    EXPECT_EQ(events->events(), concat({"A:wipe:fbsource", "B:wipe:fbsource"}, statusEvents("8000001c", "")));
    String out;
    EXPECT_EQ(lib->getUserId(out).code(), kNotSignedIn);
    EXPECT_EQ(lastUser(), "42");

    events->clear();
    http.queue(loginAnswer("42"));
    ASSERT_TRUE(lib->connect().ok());
    EXPECT_EQ(events->events(), statusEvents("0", "42"));

    ASSERT_TRUE(lib->resetAccount(false).ok());
    events->clear();
    http.queue(loginAnswer("43"));
    ASSERT_TRUE(lib->connect().ok());
    EXPECT_EQ(events->events(), concat(kWipeAndWake, statusEvents("0", "43")));
}

TEST_F(LoginSessionTest, ResetWithEmptyListsSendsOnlyTheStatus) {
    addRecorder("Listener");
    signIn();
    store.clearRecords();
    ASSERT_TRUE(lib->resetAccount(false).ok());
    EXPECT_EQ(events->events(), (Events{"Listener:status:fbsource:8000001c:"}));
    EXPECT_TRUE(store.records().empty());
}

// One component failing its wipe must not spare the others theirs.
TEST_F(LoginSessionTest, FailedWipeDoesNotStopTheOthers) {
    addRecorder("A");
    addRecorder("B", true);
    addRecorder("C");
    ASSERT_TRUE(info->setWipeComponents({"A", "Missing", "B"}).ok());
    ASSERT_TRUE(info->setWakeupComponents({"C"}).ok());
    uError err = lib->sendWipes(true);
    EXPECT_EQ(err.code(), kFailure);
    ASSERT_NE(err.cause(), nullptr);
    EXPECT_EQ(err.cause()->code(), kNotFound);  // the first failure: the missing component
    EXPECT_EQ(events->events(), (Events{"A:wipe:fbsource", "B:wipe:fbsource", "C:wakeup:fbsource"}));
}

}  // namespace
}  // namespace trelm::test
