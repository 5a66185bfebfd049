#include <gtest/gtest.h>

#include "ErrorAssertions.h"

#include <cstdio>
#include <memory>
#include <string>
#include <utility>
#include <vector>

#include "ConfigurationChangedMessage.h"
#include "EmulatorHost.h"
#include "GetUserSidMessage.h"
#include "IQueryItems.h"
#include "LoginStatusMessage.h"
#include "WakeupMessage.h"
#include "WipeMessage.h"

namespace trelm::test {
namespace {

constexpr char const* kAppKey = "facebook_source_appkey";
constexpr char const* kLogin = "facebook_source_login";
constexpr char const* kPassword = "facebook_source_password";
constexpr char const* kSessionId = "facebook_source_session_id";
constexpr char const* kSessionSecret = "facebook_source_session_secret";
constexpr char const* kSessionUser = "facebook_source_session_user";
constexpr char const* kLastUser = "facebook_source_lastuser";

// Notes the account messages it receives, in arrival order: "status:<code in hex>:<user>",
// "wipe" and "wakeup". They are delivered on the sender's thread: the test's.
class RecordingListener : public Component {
public:
    RecordingListener() : Component("observer", "observer") {}
    std::vector<std::string> events;

protected:
    uError handleMessage(IMessage& msg) override {
        if (msg.type() == WipeMessage::kType) events.push_back("wipe");
        if (msg.type() == WakeupMessage::kType) events.push_back("wakeup");
        if (msg.type() == ILoginStatus::LoginStatusMessage::kType) {
            auto& status = static_cast<ILoginStatus::LoginStatusMessage&>(msg);
            char code[16];
            std::snprintf(code, sizeof code, "%x", status.status);
            events.push_back(std::string("status:") + code + ":" + status.userId.str());
        }
        return TRELM_OK();
    }
};

using Cursor = EmulatorHost::Cursor;
std::string const kDemoUid = std::to_string(emu::DemoAccount::uid);
std::string const kSignedIn = "status:0:" + kDemoUid;
std::string const kSignedOut = "status:8000001c:";

class ConfigurationChangeTest : public EmulatorSuite {
protected:
    static void SetUpTestSuite() {
        startSuite();
        observer = std::make_unique<RecordingListener>();
        host->addComponent("observer", *observer);
    }

    static inline std::unique_ptr<RecordingListener> observer;
};

// Each case configures a fresh source (its own configuration tag, so stored values never mix),
// puts values into the runtime-configuration store, announces a change of some keys and checks
// what followed: the account messages the observer (wipe and wake-up lists) received, the sign-in
// requests the service saw, the user the source reports and whether a contact query can read.
TEST_F(ConfigurationChangeTest, ChangedKeysSignInApplySessionsOrResetAsConfigured) {
    struct Case {
        char const* name;
        bool extendedApi;
        bool configuredLogin;    // the group holds the demo login and password
        bool configuredSession;  // the group holds a session of the demo user
        std::vector<std::pair<char const*, std::string>> stored;  // "$session"/"$secret": a fresh session
        std::vector<char const*> changed;
        std::vector<std::string> events;
        int logins;              // auth.login requests
        unsigned code;           // of "IServiceSource::GetUserSidMessage" and a contact query's first row
    };
    std::string const email = emu::DemoAccount::email;
    std::string const password = emu::DemoAccount::password;
    // clang-format off
    std::vector<Case> const cases = {
        {"login and password given sign in", true, false, false,
         {{kLogin, email}, {kPassword, password}}, {kLogin, kPassword}, {kSignedIn}, 1, kSuccess},
        {"another user than the last one wipes and wakes", true, false, false,
         {{kLogin, email}, {kPassword, password}, {kLastUser, "42"}}, {kPassword},
         {"wipe", "wakeup", kSignedIn}, 1, kSuccess},
        {"login and password both emptied reset the account", true, true, true,
         {{kLogin, ""}, {kPassword, ""}}, {kLogin, kPassword}, {"wipe", kSignedOut}, 0, kNotSignedIn},
        {"only the password emptied signs in again", true, true, false,
         {{kPassword, ""}}, {kPassword}, {kSignedOut}, 1, kNotSignedIn},
        {"a new application key drops the session without signing in", true, true, true,
         {{kAppKey, "another-key"}}, {kAppKey}, {}, 0, kNotSignedIn},
        {"login keys are ignored without the extended api", false, false, true,
         {{kLogin, email}, {kPassword, password}}, {kLogin, kPassword}, {}, 0, kSuccess},
        {"session keys apply a session without the extended api", false, false, false,
         {{kSessionId, "$session"}, {kSessionSecret, "$secret"}, {kSessionUser, kDemoUid}}, {kSessionId},
         {kSignedIn}, 0, kSuccess},
        {"one empty session key resets the account", false, false, true,
         {{kSessionId, ""}, {kSessionSecret, "x"}, {kSessionUser, kDemoUid}}, {kSessionSecret},
         {"wipe", kSignedOut}, 0, kNotSignedIn},
        {"a session key missing from the store changes nothing", false, false, true,
         {{kSessionId, "$session"}, {kSessionSecret, "$secret"}}, {kSessionId, kSessionUser}, {}, 0, kSuccess},
        {"session keys are ignored with the extended api", true, false, true,
         {{kSessionId, ""}, {kSessionSecret, ""}, {kSessionUser, ""}}, {kSessionId}, {}, 0, kSuccess},
        {"a change of other keys does nothing", true, true, true,
         {{kLogin, ""}, {kPassword, ""}}, {"wipeComponents"}, {}, 0, kSuccess},
    };
    // clang-format on

    int n = 0;
    for (Case const& c : cases) {
        SCOPED_TRACE(c.name);
        String const name("change" + std::to_string(n++));
        Configuration::Group group = host->demoGroup(name, c.configuredSession);
        ASSERT_OK(group.set("haveExtendedApi", Variant(c.extendedApi)));
        ASSERT_OK(group.set("wipeComponents", Variant(Vector<String>{"observer"})));
        ASSERT_OK(group.set("wakeupComponents", Variant(Vector<String>{"observer"})));
        if (c.configuredLogin) {
            ASSERT_OK(group.set(kLogin, Variant(emu::DemoAccount::email)));
            ASSERT_OK(group.set(kPassword, Variant(emu::DemoAccount::password)));
        }
        FacebookSource& source = host->addSource(group);

        emu::Session fresh = host->emulator().loginDemo();
        Set<Configuration::Value> values;
        for (auto const& [key, value] : c.stored) {
            std::string const text = value == "$session" ? fresh.key : value == "$secret" ? fresh.secret : value;
            ASSERT_OK(values.insert(Configuration::Value(key, Variant(String(text)))));
        }
        ASSERT_OK(host->runtime().store(name, values));
        observer->events.clear();
        host->emulator().log().clear();

        Set<String> changed;
        for (char const* key : c.changed) ASSERT_OK(changed.insert(key));
        ConfigurationChangedMessage msg(changed);
        EXPECT_OK(source.onMessage(msg));

        EXPECT_EQ(observer->events, c.events);
        auto logins = host->emulator().log().entriesFor("auth.login");
        EXPECT_EQ(logins.size(), size_t(c.logins));
        for (auto const& login : logins) EXPECT_TRUE(login.https);

        IServiceSource::GetUserSidMessage sid;
        EXPECT_CODE(source.onMessage(sid), c.code);
        if (c.code == kSuccess) {
            EXPECT_EQ(sid.result.str(), kDemoUid);
        }

        Cursor cursor = EmulatorHost::open(source, 2);
        ASSERT_TRUE(cursor);
        SmartPtr<Map<String, Variant>> row;
        EXPECT_CODE(cursor->getRow(row), c.code);
    }
}

}  // namespace
}  // namespace trelm::test
