#include "trelm/GUID.h"

#include <gtest/gtest.h>

#include "ErrorAssertions.h"

#include <sys/wait.h>
#include <unistd.h>

#include <regex>
#include <set>
#include <thread>
#include <vector>

namespace trelm {
namespace {

// Identifiers are derived in per-thread blocks; threads running at once, each through several
// blocks, must still never meet. Each is a random (version 4) identifier in lowercase text.
TEST(GUIDTest, ConcurrentThreadsNeverProduceTheSameValueAndTextIsCanonical) {
    constexpr int kThreads = 4;
    constexpr int kEach = 3000;
    std::vector<std::vector<GUID>> made(kThreads);
    std::vector<std::thread> threads;
    for (int t = 0; t < kThreads; ++t) {
        threads.emplace_back([&made, t] {
            for (int i = 0; i < kEach; ++i) made[t].push_back(GUID::generate());
        });
    }
    for (std::thread& th : threads) th.join();
    std::regex const form("^[0-9a-f]{8}-[0-9a-f]{4}-4[0-9a-f]{3}-[89ab][0-9a-f]{3}-[0-9a-f]{12}$");
    std::set<GUID> seen;
    for (auto const& list : made) {
        for (GUID const& g : list) EXPECT_TRUE(seen.insert(g).second) << "duplicate " << g;
        for (int i = 0; i < 300; ++i) EXPECT_TRUE(std::regex_match(list[i].toString().str(), form)) << list[i];
    }
    EXPECT_EQ(seen.size(), static_cast<std::size_t>(kThreads * kEach));
}

// A child process inherits the parent's half-used block; it must not hand out the identifiers
// the parent is about to make.
TEST(GUIDTest, ForkedChildDoesNotRepeatTheParentsNextValues) {
    constexpr int kCount = 8;
    (void)GUID::generate();  // the block is live when the process forks
    int fds[2];
    ASSERT_EQ(pipe(fds), 0);
    pid_t const child = fork();
    ASSERT_NE(child, -1);
    if (child == 0) {
        close(fds[0]);
        for (int i = 0; i < kCount; ++i) {
            GUID const g = GUID::generate();
            if (write(fds[1], g.bytes().data(), g.bytes().size()) != 16) _exit(1);
        }
        _exit(0);
    }
    close(fds[1]);
    std::set<GUID> parents;
    for (int i = 0; i < kCount; ++i) parents.insert(GUID::generate());
    int matches = 0;
    int received = 0;
    GUID::Bytes bytes;
    while (read(fds[0], bytes.data(), bytes.size()) == 16) {
        ++received;
        matches += parents.count(GUID(bytes)) != 0;
    }
    close(fds[0]);
    int status = 0;
    ASSERT_EQ(waitpid(child, &status, 0), child);
    EXPECT_TRUE(WIFEXITED(status) && WEXITSTATUS(status) == 0);
    EXPECT_EQ(received, kCount);
    EXPECT_EQ(matches, 0);
}

// Text is read back to the same identifier in lowercase; anything malformed is refused and leaves
// the target untouched.
TEST(GUIDTest, TextIsReadInEitherCaseAndMalformedTextIsRefused) {
    GUID const original = GUID::generate();
    std::string const own = original.toString().str();
    struct Case {
        std::string text;
        char const* canonical;  // null: refused
    } const cases[] = {
        {own, own.c_str()},
        {"0F1E2D3C-4B5A-4978-8695-A4B3C2D1E0F9", "0f1e2d3c-4b5a-4978-8695-a4b3c2d1e0f9"},
        {"", nullptr},
        {"0f1e2d3c4b5a49788695a4b3c2d1e0f9", nullptr},
        {"0f1e2d3c-4b5a-4978-8695-a4b3c2d1e0f", nullptr},
        {"0f1e2d3c-4b5a-4978-8695-a4b3c2d1e0f9a", nullptr},
        {"0f1e2d3c-4b5a-4978-8695_a4b3c2d1e0f9", nullptr},
        {"{0f1e2d3c-4b5a-4978-8695-a4b3c2d1e0f}", nullptr},
        {"0f1e2d3c-4b5a-4978-8695-a4b3c2d1e0fg", nullptr},
    };
    for (Case const& c : cases) {
        GUID target = original;
        EXPECT_CODE(GUID::fromString(String(c.text), target), c.canonical ? kSuccess : kInvalid) << c.text;
        EXPECT_EQ(target.toString().str(), c.canonical ? c.canonical : own) << c.text;
    }
}

TEST(GUIDTest, OrderFollowsTheBytesAndMatchesTheText) {
    GUID a, b;
    ASSERT_OK(GUID::fromString("00000000-0000-0000-0000-0000000000ff", a));
    ASSERT_OK(GUID::fromString("00000000-0000-0000-0000-000000000100", b));
    EXPECT_TRUE(a < b);
    EXPECT_FALSE(b < a);
    EXPECT_TRUE(GUID() < a);
    EXPECT_TRUE(GUID().isNull());
    for (int i = 0; i < 100; ++i) {
        GUID x = GUID::generate(), y = GUID::generate();
        EXPECT_EQ(x < y, x.toString() < y.toString());
    }
}

}  // namespace
}  // namespace trelm
