#include "Faults.h"

#include <gtest/gtest.h>

#include <tuple>

namespace emu {
namespace {

auto fields(const FaultRule& f) {
    return std::tuple(f.every, f.probability, f.seed, f.delayMs, f.drop, f.httpStatus, f.errorCode, f.truncate,
                      f.malformed, f.expireAfter, f.rate, f.burst);
}

TEST(FaultsRuleTest, CommandLineTextsParse) {
    struct Case {
        const char* text;
        const char* method;
        FaultRule rule;
    };
    auto r = [](auto fill) {
        FaultRule rule;
        fill(rule);
        return rule;
    };
    const std::vector<Case> cases = {
        {"fql.query:error=2,every=3", "fql.query", r([](FaultRule& f) { f.errorCode = 2; f.every = 3; })},
        {"*:rate=1,burst=5", "*", r([](FaultRule& f) { f.rate = 1; f.burst = 5; })},
        {"stream.get:delay_ms=200", "stream.get", r([](FaultRule& f) { f.delayMs = 200; })},
        {"facebook.users.setStatus:drop,p=0.25,seed=9", "users.setStatus",
         r([](FaultRule& f) { f.drop = true; f.probability = 0.25; f.seed = 9; })},
        {"*:status=503,truncate=1,malformed=true,expire_after=4", "*",
         r([](FaultRule& f) { f.httpStatus = 503; f.truncate = true; f.malformed = true; f.expireAfter = 4; })},
        {"*:rate=0.5", "*", r([](FaultRule& f) { f.rate = 0.5; })},
    };
    for (const Case& c : cases) {
        SCOPED_TRACE(c.text);
        std::string method, error;
        FaultRule rule;
        ASSERT_TRUE(Faults::parse(c.text, method, rule, error)) << error;
        EXPECT_EQ(method, c.method);
        EXPECT_EQ(fields(rule), fields(c.rule));
    }
}

TEST(FaultsRuleTest, BadTextsAreRejectedWithAReason) {
    for (const char* text : {"fql.query", ":error=2", "fql.query:error=", "fql.query:error=two", "fql.query:every=0",
                             "fql.query:p=1.5", "fql.query:p=0", "fql.query:status=42", "fql.query:delay_ms=-1",
                             "fql.query:rate=-1", "fql.query:explode=1", "fql.query:error=2x"}) {
        std::string method, error;
        FaultRule rule;
        EXPECT_FALSE(Faults::parse(text, method, rule, error)) << text;
        EXPECT_FALSE(error.empty()) << text;
    }
}

TEST(FaultsRuleTest, BucketRefillsAtItsRateUpToItsBurst) {
    std::chrono::steady_clock::time_point t{};
    Faults faults([&] { return t; });
    FaultRule rule;
    rule.rate = 2;
    rule.burst = 3;
    faults.set("*", rule);

    auto allowed = [&](int calls) {
        int n = 0;
        for (int i = 0; i < calls; ++i) n += faults.decide("fql.query").rateLimited ? 0 : 1;
        return n;
    };
    EXPECT_EQ(allowed(5), 3);  // the full burst, then nothing
    t += std::chrono::milliseconds(500);
    EXPECT_EQ(allowed(5), 1);  // half a second at 2/s
    t += std::chrono::milliseconds(250);
    EXPECT_EQ(allowed(5), 0);  // half a token is not a call
    t += std::chrono::milliseconds(250);
    EXPECT_EQ(allowed(5), 1);
    t += std::chrono::hours(1);
    EXPECT_EQ(allowed(5), 3);  // an idle hour still holds only a burst
}

TEST(FaultsRuleTest, MethodRuleAndCatchAllBothCountEveryCall) {
    Faults faults;
    FaultRule own;
    own.errorCode = 2;
    own.every = 2;
    own.delayMs = 10;
    faults.set("fql.query", own);
    FaultRule all;
    all.errorCode = 1;
    all.every = 3;
    all.delayMs = 30;
    all.expireAfter = 5;
    faults.set("*", all);

    std::vector<int> codes, delays;
    for (int i = 0; i < 6; ++i) {
        FaultDecision d = faults.decide("fql.query");
        codes.push_back(d.errorCode);
        delays.push_back(d.delayMs);
        EXPECT_EQ(d.expireAfter, 5);
    }
    // Call 6 is hit by both; the method's own code wins, the longer delay wins.
    EXPECT_EQ(codes, (std::vector<int>{0, 2, 1, 2, 0, 2}));
    EXPECT_EQ(delays, (std::vector<int>{0, 10, 30, 10, 0, 30}));

    // Other methods see only the catch-all, counted on from its 6 calls so far.
    EXPECT_EQ(faults.decide("stream.get").errorCode, 0);
    EXPECT_EQ(faults.decide("stream.get").errorCode, 0);
    EXPECT_EQ(faults.decide("stream.get").errorCode, 1);

    faults.clear("*");
    EXPECT_EQ(faults.decide("stream.get").any(), false);

    // Setting a rule again starts its counters afresh: fql.query has had 6 calls, every second hit.
    faults.set("fql.query", own);
    EXPECT_EQ(faults.decide("fql.query").errorCode, 0);
    EXPECT_EQ(faults.decide("fql.query").errorCode, 2);
}

}  // namespace
}  // namespace emu
