// The server's parts on their own: the signature check, the session table, the request log and
// the fault rules.
#include <gtest/gtest.h>

#include <set>
#include <tuple>

#include "Faults.h"
#include "RequestLog.h"
#include "SessionTable.h"
#include "Signature.h"

namespace emu {
namespace {

// The digest of "api_key=kmethod=mv=1.0s" in any other spelling, a missing one, or the right one
// with another secret does not match. (Every signed call of the protocol tests checks the digest.)
TEST(SignatureTest, OnlyTheExactLowercaseDigestMatches) {
    Arguments args{{"api_key", "k"}, {"method", "m"}, {"v", "1.0"}};
    for (char const* sig : {"8159B22F8566A82474B00CDE4C690B69", "8159b22f8566a82474b00cde4c690b6", "",
                            " 8159b22f8566a82474b00cde4c690b69"}) {
        args["sig"] = sig;
        EXPECT_FALSE(Signature::matches(args, "s")) << sig;
    }
    args.erase("sig");
    EXPECT_FALSE(Signature::matches(args, "s"));
    args["sig"] = "8159b22f8566a82474b00cde4c690b69";
    EXPECT_FALSE(Signature::matches(args, "S"));
}

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

TEST(SessionTableTest, CallIdMustGrowWithinEachSession) {
    SessionTable table;
    const Session a = table.create(1, 0);
    const Session b = table.create(2, 0);
    struct Step {
        Session const* s;
        char const* callId;
        bool accepted;
    };
    // Microtime call ids (the steps from "1795457318.1586" on) compare as numbers, however many
    // digits either side of the point.
    const std::vector<Step> steps = {{&a, "5", true},
                                     {&a, "5", false},
                                     {&a, "4", false},
                                     {&b, "1", true},
                                     {&a, "6", true},
                                     {&a, "", false},
                                     {&a, "7x", false},
                                     {&a, "+8", false},
                                     {&a, "18446744073709551615", true},
                                     {&a, "18446744073709551616", true},
                                     {&b, "2", true},
                                     {&b, "1795457318.1586", true},
                                     {&b, "1795457318.16", true},
                                     {&b, "1795457318.159", false},
                                     {&b, "1795457318.1600", false},
                                     {&b, "01795457319.5", true},
                                     {&b, "1795457319.50", false},
                                     {&b, "99999999999999999999999.1", true},
                                     {&b, "1e30", false},
                                     {&b, ".", false},
                                     {&b, "-1", false}};
    for (Step const& step : steps)
        EXPECT_EQ(table.acceptCallId(step.s->key, step.callId), step.accepted) << step.callId;
    EXPECT_FALSE(table.acceptCallId("unknown", "1"));
}

LoggedRequest entry(std::string const& method) {
    LoggedRequest e;
    e.method = method;
    return e;
}

// A full log drops the oldest entry but counts everything, and its listener has seen what it
// dropped; a disabled log keeps, counts and passes on nothing.
TEST(RequestLogTest, FullLogDropsTheOldestAndDisabledLogKeepsNothing) {
    RequestLog log(3);
    std::vector<std::string> seen;
    log.setListener([&](LoggedRequest const& e) { seen.push_back(e.method); });
    for (char const* m : {"a", "b", "c", "d", "e"}) log.add(entry(m));
    auto const kept = log.entries();
    ASSERT_EQ(kept.size(), 3u);
    EXPECT_EQ(kept[0].method, "c");
    EXPECT_EQ(kept[2].method, "e");
    EXPECT_EQ(log.total(), 5u);
    EXPECT_EQ(seen, (std::vector<std::string>{"a", "b", "c", "d", "e"}));

    log.setEnabled(false);
    log.add(entry("f"));
    EXPECT_EQ(log.entries().size(), 3u);
    EXPECT_EQ(log.total(), 5u);
    EXPECT_EQ(seen.size(), 5u);
    log.setEnabled(true);
    log.add(entry("g"));
    EXPECT_EQ(log.total(), 6u);
}

auto fields(FaultRule const& f) {
    return std::tuple(f.every, f.probability, f.seed, f.delayMs, f.drop, f.httpStatus, f.errorCode, f.truncate,
                      f.malformed, f.expireAfter, f.rate, f.burst);
}

TEST(FaultsRuleTest, CommandLineTextsParse) {
    struct Case {
        char const* text;
        char const* method;
        FaultRule rule;
    };
    const std::vector<Case> cases = {
        {"fql.query:error=2,every=3", "fql.query", {.every = 3, .errorCode = 2}},
        {"*:rate=1,burst=5", "*", {.rate = 1, .burst = 5}},
        {"stream.get:delay_ms=200", "stream.get", {.delayMs = 200}},
        {"facebook.users.setStatus:drop,p=0.25,seed=9",
         "users.setStatus",
         {.probability = 0.25, .seed = 9, .drop = true}},
        {"*:status=503,truncate=1,malformed=true,expire_after=4",
         "*",
         {.httpStatus = 503, .truncate = true, .malformed = true, .expireAfter = 4}},
        {"*:rate=0.5", "*", {.rate = 0.5}},
    };
    for (Case const& c : cases) {
        SCOPED_TRACE(c.text);
        std::string method, error;
        FaultRule rule;
        ASSERT_TRUE(Faults::parse(c.text, method, rule, error)) << error;
        EXPECT_EQ(method, c.method);
        EXPECT_EQ(fields(rule), fields(c.rule));
    }
}

TEST(FaultsRuleTest, BadTextsAreRejectedWithAReason) {
    for (char const* text : {"fql.query", ":error=2", "fql.query:error=", "fql.query:error=two", "fql.query:every=0",
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
    faults.set("*", FaultRule{.rate = 2, .burst = 3});

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
    FaultRule const own{.every = 2, .delayMs = 10, .errorCode = 2};
    faults.set("fql.query", own);
    faults.set("*", FaultRule{.every = 3, .delayMs = 30, .errorCode = 1, .expireAfter = 5});

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
