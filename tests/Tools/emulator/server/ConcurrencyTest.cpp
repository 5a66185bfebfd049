// Many clients at once: answers, sessions, fault counters and the log stay consistent.
#include <set>
#include <thread>

#include "EmulatorFixture.h"

namespace emu::test {
namespace {

using ConcurrencyTest = EmulatorFixture;

TEST_F(ConcurrencyTest, ParallelClientsAreEachAnsweredAndCountedOnce) {
    constexpr int kThreads = 6;
    constexpr int kCalls = 40;
    emulator->faults().set("fql.query", FaultRule{.every = 5, .errorCode = 2});

    // Each thread has its own session (the call_id counter of a session belongs to one client).
    std::vector<Session> sessions;
    for (int t = 0; t < kThreads; ++t) sessions.push_back(emulator->loginDemo());

    std::atomic<int> ok{0}, injected{0}, other{0};
    std::mutex loginsMutex;  // guards logins
    std::set<std::string> logins;
    std::vector<std::thread> threads;
    for (int t = 0; t < kThreads; ++t) {
        threads.emplace_back([&, t] {
            TestClient http, https;
            useHttps(https);
            for (int i = 0; i < kCalls; ++i) {
                Fields f{{"method", "fql.query"},
                         {"v", "1.0"},
                         {"api_key", DemoAccount::apiKey},
                         {"session_key", sessions[t].key},
                         {"call_id", std::to_string(i + 1)},
                         {"query", kFql}};
                const Reply r = http.postForm(emulator->httpUrl(), sign(f, sessions[t].secret));
                const int code = r.code == CURLE_OK ? r.errorCode() : -1;
                (code == 0 ? ok : code == 2 ? injected : other)++;
            }
            const Reply login = https.postForm(kHttpsUrl, loginFields());
            std::lock_guard lock(loginsMutex);
            logins.insert(elementText(login.body, "session_key"));
        });
    }
    for (std::thread& t : threads) t.join();

    EXPECT_EQ(other.load(), 0);
    EXPECT_EQ(injected.load(), kThreads * kCalls / 5);
    EXPECT_EQ(ok.load() + injected.load(), kThreads * kCalls);
    EXPECT_EQ(logins.size(), static_cast<std::size_t>(kThreads));
    EXPECT_EQ(logins.count(""), 0u);
    EXPECT_EQ(emulator->log().total(), static_cast<std::uint64_t>(kThreads * (kCalls + 1)));
    EXPECT_EQ(emulator->log().entriesFor("fql.query").size(), static_cast<std::size_t>(kThreads * kCalls));
}

}  // namespace
}  // namespace emu::test
