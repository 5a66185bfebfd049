#include "RequestLog.h"

#include <gtest/gtest.h>

namespace emu {
namespace {

LoggedRequest entry(const std::string& method) {
    LoggedRequest e;
    e.method = method;
    return e;
}

TEST(RequestLogTest, FullLogDropsTheOldestButCountsEverything) {
    RequestLog log(3);
    for (const char* m : {"a", "b", "c", "d", "e"}) log.add(entry(m));
    const auto kept = log.entries();
    ASSERT_EQ(kept.size(), 3u);
    EXPECT_EQ(kept[0].method, "c");
    EXPECT_EQ(kept[2].method, "e");
    EXPECT_EQ(log.total(), 5u);
}

TEST(RequestLogTest, DisabledLogKeepsNothing) {
    RequestLog log;
    log.setEnabled(false);
    log.add(entry("fql.query"));
    EXPECT_TRUE(log.entries().empty());
    EXPECT_EQ(log.total(), 0u);
    log.setEnabled(true);
    log.add(entry("fql.query"));
    EXPECT_EQ(log.total(), 1u);
}

TEST(RequestLogTest, ListenerSeesEveryEntryThatIsKept) {
    RequestLog log(1);
    std::vector<std::string> seen;
    log.setListener([&](const LoggedRequest& e) { seen.push_back(e.method); });
    log.add(entry("a"));
    log.add(entry("b"));  // pushes "a" out of the log, but the listener has had it
    log.setEnabled(false);
    log.add(entry("c"));
    EXPECT_EQ(seen, (std::vector<std::string>{"a", "b"}));
}

}  // namespace
}  // namespace emu
