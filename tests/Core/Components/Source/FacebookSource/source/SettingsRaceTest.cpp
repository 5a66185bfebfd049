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
    emu::GeneratorOptions data;
    data.users = 1000;
    data.demoFriends = 400;
    EmulatorHost host(data);
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
    std::atomic<bool> failed{false};
    std::atomic<int> walking{2};
    auto walk = [&](int index) {
        for (int round = 0; round < kWalks && !failed; ++round) {
            IQueryItems::StartQueryMessage query(
                Vector<IQueryItems::Column>(),
                Vector<IQueryItems::Constraint>{IQueryItems::Constraint{
                    Metadata::Key("core_object_type", TRELM_TYPES::INT32), Variant(2),
                    IQueryItems::Constraint::Equal}});
            uError err = source.onMessage(query);
            if (err.failed()) {
                ADD_FAILURE() << "cursor " << index << " could not start:\n" << err;
                failed = true;
                break;
            }
            unsigned rows = 0;
            for (;;) {
                SmartPtr<Map<String, Variant>> row;
                err = query.cursor->getRow(row);
                if (err.code() == kNoData) break;
                if (err.failed()) {
                    ADD_FAILURE() << "cursor " << index << " failed after " << rows << " rows:\n" << err;
                    failed = true;
                    break;
                }
                ++rows;
                int moved = 0;
                err = query.cursor->seek(1, moved);
                if (err.ok() && moved == 0) break;
                if (err.failed()) {
                    ADD_FAILURE() << "cursor " << index << " could not move past row " << rows << ":\n" << err;
                    failed = true;
                    break;
                }
            }
            if (!failed) {
                EXPECT_EQ(rows, 400u) << "cursor " << index;
            }
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
    EXPECT_FALSE(failed);
}

}  // namespace
}  // namespace trelm::test
