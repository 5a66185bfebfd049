#include "SessionTable.h"

#include <gtest/gtest.h>

#include <set>

namespace emu {
namespace {

TEST(SessionTableTest, SessionExpiresAtItsExpiryTimeAndIsForgotten) {
    std::int64_t now = 1000;
    SessionTable table([&] { return now; });
    const Session s = table.create(42, 60);
    EXPECT_EQ(s.expires, 1060);
    EXPECT_EQ(s.uid, 42);

    now = 1059;
    EXPECT_EQ(table.use(s.key).check, SessionTable::Check::Valid);
    now = 1060;
    EXPECT_EQ(table.use(s.key).check, SessionTable::Check::Expired);
    // Turning the clock back does not revive it.
    now = 1000;
    EXPECT_EQ(table.use(s.key).check, SessionTable::Check::Unknown);
    EXPECT_EQ(table.size(), 0u);

    // A lifetime of zero never expires.
    const Session forever = table.create(42, 0);
    EXPECT_EQ(forever.expires, 0);
    now = std::int64_t{1} << 40;
    EXPECT_EQ(table.use(forever.key).check, SessionTable::Check::Valid);
}

TEST(SessionTableTest, KeysAndSecretsAreFreshForEverySession) {
    SessionTable table;
    std::set<std::string> keys, secrets;
    for (int i = 0; i < 100; ++i) {
        const Session s = table.create(7, 60);
        keys.insert(s.key);
        secrets.insert(s.secret);
        EXPECT_EQ(s.secret.size(), 32u);
        EXPECT_EQ(s.secret.find_first_not_of("0123456789abcdef"), std::string::npos);
    }
    EXPECT_EQ(keys.size(), 100u);
    EXPECT_EQ(secrets.size(), 100u);
}

TEST(SessionTableTest, CallIdMustGrowWithinEachSession) {
    SessionTable table;
    const Session a = table.create(1, 0);
    const Session b = table.create(2, 0);
    struct Step {
        const Session* s;
        const char* callId;
        bool accepted;
    };
    const std::vector<Step> steps = {
        {&a, "5", true},  {&a, "5", false}, {&a, "4", false},  {&b, "1", true},  {&a, "6", true},
        {&a, "", false},  {&a, "7x", false}, {&a, "+8", false}, {&a, "18446744073709551615", true},
        {&a, "18446744073709551616", true}, {&b, "2", true},
        // Microtime call ids compare as numbers, however many digits either side of the point.
        {&b, "1795457318.1586", true}, {&b, "1795457318.16", true}, {&b, "1795457318.159", false},
        {&b, "1795457318.1600", false}, {&b, "01795457319.5", true}, {&b, "1795457319.50", false},
        {&b, "99999999999999999999999.1", true}, {&b, "1e30", false}, {&b, ".", false}, {&b, "-1", false},
    };
    for (const Step& step : steps) EXPECT_EQ(table.acceptCallId(step.s->key, step.callId), step.accepted) << step.callId;
    EXPECT_FALSE(table.acceptCallId("unknown", "1"));
}

}  // namespace
}  // namespace emu
