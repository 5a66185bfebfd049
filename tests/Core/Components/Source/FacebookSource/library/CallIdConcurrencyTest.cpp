#include <gtest/gtest.h>

#include "ErrorAssertions.h"

#include <set>
#include <thread>
#include <vector>

#include "LibraryFixture.h"

namespace trelm::test {
namespace {

using CallIdConcurrencyTest = LibraryFixture;

// Calls on many threads at once: each signed request gets its own "call_id", no value is skipped
// or repeated, and each signature covers the request's own call id.
TEST_F(CallIdConcurrencyTest, ConcurrentCallsGetDistinctCallIdsAndMatchingSignatures) {
    signIn("SK", "SS");
    constexpr int kThreads = 8;
    constexpr int kCalls = 50;
    std::vector<std::thread> threads;
    std::vector<int> failures(kThreads, 0);
    for (int t = 0; t < kThreads; ++t) {
        threads.emplace_back([&, t] {
            for (int n = 0; n < kCalls; ++n) {
                Map<String, String> args;
                String response;
                if (lib->makeBaseArgs("m", args).failed() ||
                    lib->runFacebookRequest(args, SmartPtr<InputDataStream>(), response).failed()) {
                    ++failures[t];
                }
            }
        });
    }
    for (auto& thread : threads) thread.join();
    EXPECT_EQ(failures, std::vector<int>(kThreads, 0));

    std::set<unsigned> ids;
    for (auto const& exchange : http.exchanges()) {
        unsigned id = 0;
        ASSERT_OK(exchange.search("call_id")->to(id));
        ids.insert(id);
        EXPECT_TRUE(signedWith(exchange, "SS"));
    }
    ASSERT_EQ(ids.size(), static_cast<size_t>(kThreads * kCalls));
    EXPECT_EQ(*ids.begin(), 1u);
    EXPECT_EQ(*ids.rbegin(), static_cast<unsigned>(kThreads * kCalls));
}

}  // namespace
}  // namespace trelm::test
