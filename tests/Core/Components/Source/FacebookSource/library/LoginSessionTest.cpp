#include <cstdio>
#include <memory>
#include <utility>
#include <vector>

#include "LibraryFixture.h"
#include "LoginStatusMessage.h"
#include "WakeupMessage.h"
#include "WipeMessage.h"

namespace trelm::test {
namespace {

using Events = std::vector<String>;

// Writes the wipe, wake-up and login-status messages it receives into a log shared by several
// components, as "<name>:wipe:<keys>", "<name>:wakeup:<keys>", "<name>:status:<tag>:<hex code>:<user>".
// With `fail` it answers each of them with kFailure.
class Recorder : public Component {
public:
    Recorder(String const& name, Events& log, bool fail) : Component(name, "Recording"), log_(log), fail_(fail) {}

protected:
    uError handleMessage(IMessage& msg) override {
        if (auto* wipe = dynamic_cast<WipeMessage*>(&msg)) {
            log_.push_back(name() + ":wipe:" + keys(wipe->params));
        } else if (auto* wakeup = dynamic_cast<WakeupMessage*>(&msg)) {
            log_.push_back(name() + ":wakeup:" + keys(wakeup->params));
        } else if (auto* status = dynamic_cast<ILoginStatus::LoginStatusMessage*>(&msg)) {
            char code[16];
            std::snprintf(code, sizeof code, "%x", status->status);
            log_.push_back(name() + ":status:" + status->tag + ":" + code + ":" + status->userId);
        } else {
            return TRELM_OK();
        }
        return fail_ ? TRELM_ERROR(kFailure) : TRELM_OK();
    }

private:
    static String keys(Map<String, String> const& params) {
        String out;
        for (auto const& [key, value] : params) out += (out.empty() ? "" : ",") + key;
        return out;
    }

    Events& log_;
    bool const fail_;
};

String loginAnswer(char const* uid, bool withSecret = true) {
    return String("<auth_login_response xmlns=\"http://api.facebook.com/1.0/\"><session_key>SK</session_key><uid>") +
           uid + "</uid>" + (withSecret ? "<secret>SS</secret>" : "") + "<expires>0</expires></auth_login_response>";
}

String errorAnswer(char const* code) {
    return String("<error_response><error_code>") + code + "</error_code><error_msg>m</error_msg></error_response>";
}

// Wipe list A, B and wake-up list C, each recording what it receives.
class LoginSessionTest : public LibraryFixture {
protected:
    void SetUp() override {
        LibraryFixture::SetUp();
        ASSERT_OK(info->setLoginConfig("me@example.org", "pw"));
        for (char const* name : {"A", "B", "C"}) addRecorder(name);
        ASSERT_OK(info->setWipeComponents({"A", "B"}));
        ASSERT_OK(info->setWakeupComponents({"C"}));
    }

    // The events of one sign-in: wipes and wake-ups first if the user changed, then the status
    // message as each of A, B, C receives it.
    static Events expected(bool wipes, char const* code, char const* user, bool wakeups = true) {
        Events out;
        if (wipes) out = {"A:wipe:fbsource", "B:wipe:fbsource"};
        if (wipes && wakeups) out.push_back("C:wakeup:fbsource");
        for (char const* name : {"A", "B", "C"}) out.push_back(String(name) + ":status:fbsource:" + code + ":" + user);
        return out;
    }
    void addRecorder(String const& name, bool fail = false) {
        recorders.push_back(std::make_unique<Recorder>(name, events, fail));
        ASSERT_OK(registry.add(name, recorders.back().get()));
    }
    Events takeEvents() { return std::exchange(events, Events()); }

    Events events;
    std::vector<std::unique_ptr<Recorder>> recorders;
};

TEST_F(LoginSessionTest, SetupIsOnceOnlyAndKeepsTheFirstSettings) {
    signIn("SK", "SS", "42");
    EXPECT_CODE(lib->setup(makeSmart<FacebookLibrary::ConnectionInfo>("other")), kInvalid);
    EXPECT_CODE(lib->setup(SmartPtr<FacebookLibrary::ConnectionInfo>()), kInvalid);
    String user;
    ASSERT_OK(lib->getUserId(user));
    EXPECT_EQ(user, "42");

    FacebookLibrary unset;
    EXPECT_CODE(unset.getUserId(user), kNotSet);
    EXPECT_CODE(unset.connect(), kNotSet);
    EXPECT_CODE(unset.resetAccount(true), kNotSet);
}

// A refused or unreadable login changes nothing, in memory or in the store.
TEST_F(LoginSessionTest, FailedLoginsAnswerTheirCodeAndChangeNothing) {
    struct Case {
        FakeHttpRequestFactory::Answer answer;
        unsigned code;
    } const cases[] = {
        {{200, errorAnswer("100"), {}}, kNotSignedIn},  // wrong e-mail or password
        {{200, errorAnswer("4"), {}}, kRequestLimit},   // other codes: ServiceTransportTest
        {{200, "<error_response><error_msg>m</error_msg></error_response>", {}}, kFailure},
        {{200, "<auth_login_response><session_key>SK</session_key></auth_login_response>", {}}, kFailure},
        {{200, "<auth_login_response><uid>42</uid></auth_login_response>", {}}, kFailure},
        {{200, "<users_getInfo_response/>", {}}, kFailure},
        {{200, "<auth_login_response><uid>42</ui", {}}, kFailure},
        {{500, loginAnswer("42"), {}}, kFailure},
    };
    for (Case const& c : cases) {
        SCOPED_TRACE(c.answer.body);
        http.queue(c.answer);
        String session, secret, user = "-";
        EXPECT_CODE(lib->connectInternal(session, secret, user), c.code);
        EXPECT_EQ(user, "-");
        EXPECT_FALSE(info->hasSession());
        EXPECT_TRUE(store.received().empty());
    }
}

TEST_F(LoginSessionTest, SessionWithoutSecretSignsWithTheApplicationSecret) {
    http.queue(loginAnswer("42", false));
    ASSERT_OK(lib->connect());
    http.queue(String("<users_setStatus_response>1</users_setStatus_response>"));
    ASSERT_OK(lib->setStatus("hi", false));
    EXPECT_TRUE(lastFields().contains("session_key"));
    EXPECT_TRUE(signedWith(lastFields(), "s"));
}

// Who hears what when user 42 signs in, by what the store remembers of the last user.
TEST_F(LoginSessionTest, ConnectWipesAndWakesOnlyWhenAnotherUserSignsIn) {
    struct Case {
        char const* name;
        char const* lastUser;  // null: none stored
        bool readFails;
        bool wipes;
    } const cases[] = {
        {"first sign-in", nullptr, false, false},
        {"same user", "42", false, false},
        {"another user", "7", false, true},
        {"last user unreadable", "7", true, false},
    };
    for (Case const& c : cases) {
        SCOPED_TRACE(c.name);
        ASSERT_OK(store.reset(kTag, {"facebook_source_lastuser", "facebook_source_session_id"}));
        if (c.lastUser) put("facebook_source_lastuser", c.lastUser);
        store.failing = c.readFails ? "GetRuntimeConfigurationMessage" : "";
        http.queue(loginAnswer("42"));
        EXPECT_OK(lib->connect());
        EXPECT_EQ(takeEvents(), expected(c.wipes, "0", "42"));
        EXPECT_EQ(stored("facebook_source_lastuser") + stored("facebook_source_session_id") +
                      stored("facebook_source_session_secret") + stored("facebook_source_session_user"),
                  "42SKSS42");
    }
}

// Without credentials nothing is sent; a refused login keeps the last user. Either way everyone
// hears "not signed in" without a user, and nothing is wiped.
TEST_F(LoginSessionTest, FailedConnectAnnouncesNotSignedInWithoutUserAndWipesNothing) {
    for (bool const configured : {true, false}) {
        SCOPED_TRACE(configured ? "refused login" : "no credentials");
        size_t const sent = http.exchanges().size();
        put("facebook_source_lastuser", "7");
        if (configured) {
            http.queue(errorAnswer("100"));
        } else {
            lib = makeSmart<FacebookLibrary>();
            auto noLogin = makeSmart<FacebookLibrary::ConnectionInfo>(kTag);
            ASSERT_OK(noLogin->setAppConfig("k", "s"));
            ASSERT_OK(lib->setup(noLogin));
        }
        uError const err = lib->connect();
        EXPECT_CODE(err, kNotSignedIn);
        EXPECT_EQ(err.cause() ? err.cause()->code() : 0u, configured ? 0u : unsigned(kNotSet));
        EXPECT_EQ(http.exchanges().size() - sent, configured ? 1u : 0u);
        EXPECT_EQ(takeEvents(), expected(false, "8000001c", ""));
        EXPECT_EQ(stored("facebook_source_lastuser"), "7");
    }
}

TEST_F(LoginSessionTest, AppliedSessionStaysInMemoryWhileTheLastUserIsStored) {
    put("facebook_source_lastuser", "7");
    ASSERT_OK(lib->applySession("SK", "SS", "42"));
    EXPECT_EQ(stored("facebook_source_lastuser") + stored("facebook_source_session_id"), "42-");
    EXPECT_EQ(takeEvents(), expected(true, "0", "42"));
    String session;
    ASSERT_OK(info->getSessionId(session));
    EXPECT_EQ(session, "SK");
}

// After a log-out the last user is remembered: the same person back wipes nothing, another does.
TEST_F(LoginSessionTest, ResetForgetsTheSessionButRemembersTheLastUser) {
    http.queue(loginAnswer("42"));
    ASSERT_OK(lib->connect());
    takeEvents();

    ASSERT_OK(lib->resetAccount(true));
    EXPECT_EQ(stored("facebook_source_session_id") + stored("facebook_source_session_secret") +
                  stored("facebook_source_session_user") + stored("facebook_source_lastuser"),
              "---42");
    EXPECT_EQ(takeEvents(), expected(true, "8000001c", "", false));  // nobody is woken for a log-out
    String user;
    EXPECT_CODE(lib->getUserId(user), kNotSignedIn);

    http.queue(loginAnswer("42"));
    ASSERT_OK(lib->connect());
    EXPECT_EQ(takeEvents(), expected(false, "0", "42"));
}

// One component failing or missing must not spare the others their wipe.
TEST_F(LoginSessionTest, FailedWipeDoesNotStopTheOthers) {
    addRecorder("Failing", true);
    ASSERT_OK(info->setWipeComponents({"Missing", "Failing", "A"}));
    uError err = lib->sendWipes(true);
    EXPECT_CODE(err, kFailure);
    ASSERT_NE(err.cause(), nullptr);
    EXPECT_EQ(err.cause()->code(), kNotFound);  // the first failure: the missing component
    EXPECT_EQ(takeEvents(), (Events{"Failing:wipe:fbsource", "A:wipe:fbsource", "C:wakeup:fbsource"}));
}

}  // namespace
}  // namespace trelm::test
