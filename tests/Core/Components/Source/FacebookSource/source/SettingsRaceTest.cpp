#include <gtest/gtest.h>

#include <atomic>
#include <string>
#include <thread>
#include <vector>

#include "ConfigurationChangedMessage.h"
#include "EmulatorHost.h"
#include "ErrorAssertions.h"
#include "IQueryItems.h"

namespace trelm::test {
namespace {

// The account settings are shared between the source, which changes them when the host says
// the login changed, and every cursor, which reads them to sign each request. Two cursors page
// through the demo user's friends on their own threads while the host announces a new login
// again and again; under TSan an unguarded write of the settings is reported as a race. Every
// page must still be read: the same account is configured each time, so each request is signed
// with the old or the new settings, both valid.
TEST(SettingsRaceTest, LoginChangesWhileCursorsPageAreSerialisedWithTheirSigning) {
    EmulatorHost host({.users = 1000, .demoFriends = 400});
    std::string error;
    ASSERT_TRUE(host.start(error)) << error;

    String const name("race");
    Configuration::Group group = host.demoGroup(name, true);
    ASSERT_OK(group.set("facebook_source_login", Variant(emu::DemoAccount::email)));
    ASSERT_OK(group.set("facebook_source_password", Variant(emu::DemoAccount::password)));
    FacebookSource& source = host.addSource(group);

    // What the settings screen would have stored: the same account, so every sign-in succeeds.
    Set<Configuration::Value> account{
        Configuration::Value("facebook_source_appkey", Variant(emu::DemoAccount::apiKey)),
        Configuration::Value("facebook_source_appsecret", Variant(emu::DemoAccount::appSecret)),
        Configuration::Value("facebook_source_login", Variant(emu::DemoAccount::email)),
        Configuration::Value("facebook_source_password", Variant(emu::DemoAccount::password)),
    };
    ASSERT_OK(host.runtime().store(name, account));

    constexpr int kWalks = 3;
    std::atomic<int> walking{2};
    auto walk = [&](int index) {
        for (int round = 0; round < kWalks; ++round) {
            EmulatorHost::Cursor cursor = EmulatorHost::open(source, 2);
            if (!cursor) break;
            EXPECT_EQ(EmulatorHost::walk(*cursor).size(), 400u) << "cursor " << index;
        }
        --walking;
    };

    std::vector<std::thread> cursors;
    for (int i = 0; i < 2; ++i) cursors.emplace_back(walk, i);
    int changes = 0;
    while (walking > 0) {
        ConfigurationChangedMessage changed(Set<String>{"facebook_source_appkey", "facebook_source_login"});
        EXPECT_OK(source.onMessage(changed));
        ++changes;
    }
    for (std::thread& t : cursors) t.join();
    EXPECT_GT(changes, 0);
}

}  // namespace
}  // namespace trelm::test
