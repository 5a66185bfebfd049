// Copies of one long String share its text between threads: taking, reading, changing and
// releasing copies in several threads at once must neither race nor free the text early (run under
// TSan).
#include <gtest/gtest.h>

#include <atomic>
#include <memory>
#include <string>
#include <thread>
#include <vector>

#include "trelm/String.h"

namespace trelm {
namespace {

std::string const kText = "core_object_origin_importcomponent";

TEST(StringSharingConcurrencyTest, CopiesTakenChangedAndReleasedInSeveralThreads) {
    constexpr int kThreads = 4;
    constexpr int kRounds = 2000;
    struct Case {
        char const* name;
        // The original stays while the threads run, and half of them copy it; otherwise it is
        // released first and the thread that lets go last frees the text.
        bool originalKept;
    } const cases[] = {{"copies of a String every thread reads", true}, {"the last copy released in a thread", false}};
    for (Case const& c : cases) {
        auto original = std::make_unique<String>(kText);
        std::vector<String> handed(kThreads, *original);
        std::atomic<bool> go{false};
        std::vector<int> wrong(kThreads, 0);
        std::vector<std::thread> threads;
        for (int t = 0; t < kThreads; ++t) {
            threads.emplace_back([&, t] {
                String mine = std::move(handed[t]);
                while (!go.load()) std::this_thread::yield();
                for (int i = 0; i < kRounds; ++i) {
                    String copy = c.originalKept && t % 2 == 1 ? *original : mine;
                    if (copy.str() != kText) ++wrong[t];
                    copy += 'x';  // a private copy: the shared text stays
                    copy.erase(0, 5);
                    if (copy.view() != kText.substr(5) + "x") ++wrong[t];
                }
                if (mine.str() != kText) ++wrong[t];
            });
        }
        if (!c.originalKept) original.reset();
        go = true;
        for (std::thread& thread : threads) thread.join();
        for (int t = 0; t < kThreads; ++t) EXPECT_EQ(wrong[t], 0) << c.name << ", thread " << t;
        if (original) {
            EXPECT_EQ(original->str(), kText) << c.name;
        }
    }
}

}  // namespace
}  // namespace trelm
