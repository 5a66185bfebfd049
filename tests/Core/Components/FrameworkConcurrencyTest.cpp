#include <gtest/gtest.h>

#include "ErrorAssertions.h"

#include <atomic>
#include <string>
#include <thread>
#include <vector>

#include "Component.h"
#include "ComponentRegistry.h"
#include "IMessage.h"
#include "trelm/Metadata.h"
#include "trelm/SmartPtr.h"

namespace trelm {
namespace {

constexpr int kThreads = 4;

class Counter : public Component {
public:
    explicit Counter(String name) : Component(name, "@test:/counter") {}
    std::atomic<int> received{0};

protected:
    uError handleMessage(IMessage&) override {
        received.fetch_add(1);
        return TRELM_OK();
    }
};

TEST(FrameworkConcurrencyTest, MessagesFlowWhileComponentsComeAndGo) {
    ComponentRegistry registry;
    registry.activate();
    Counter stable("stable");
    ASSERT_OK(registry.add("stable", &stable));
    // The churning components stay alive for the whole test: only their registration changes.
    std::vector<std::unique_ptr<Counter>> churn;
    for (int i = 0; i < kThreads; ++i) churn.push_back(std::make_unique<Counter>("churn" + String::from(i)));

    constexpr int kRounds = 500;
    std::vector<std::thread> threads;
    std::atomic<int> failures{0};
    for (int t = 0; t < kThreads; ++t) {
        threads.emplace_back([&, t] {
            Counter* mine = churn[t].get();
            for (int i = 0; i < kRounds; ++i) {
                IMessage targeted("Ping");
                IMessage broadcast("Ping");
                registry.names();
                if (registry.add(mine->name(), mine).failed() || targeted.send("stable").failed() ||
                    broadcast.send("").failed() || registry.remove(mine->name()).failed()) {
                    failures.fetch_add(1);
                }
            }
        });
    }
    for (auto& th : threads) th.join();
    EXPECT_EQ(failures.load(), 0);
    // Each round delivers one targeted and one broadcast message to "stable".
    EXPECT_EQ(stable.received.load(), 2 * kThreads * kRounds);
    for (auto const& c : churn) EXPECT_GE(c->received.load(), kRounds);
    EXPECT_EQ(registry.names(), (Vector<String>{"stable"}));
}

TEST(FrameworkConcurrencyTest, ConcurrentRegistrationKeepsOneTypePerName) {
    constexpr int kNames = 200;
    std::vector<std::vector<TRELM_TYPES::TYPES>> seen(kThreads, std::vector<TRELM_TYPES::TYPES>(kNames));
    std::vector<std::thread> threads;
    for (int t = 0; t < kThreads; ++t) {
        threads.emplace_back([&, t] {
            // Each thread proposes a different type for the same names.
            auto type = t % 2 ? TRELM_TYPES::STRING : TRELM_TYPES::INT32;
            for (int i = 0; i < kNames; ++i) {
                std::string name = "concurrency_key_" + std::to_string(i);
                seen[t][i] = trelm_RegisterMetadataType(name.c_str(), type).type();
            }
        });
    }
    for (auto& th : threads) th.join();
    for (int i = 0; i < kNames; ++i) {
        TRELM_TYPES::TYPES stored = TRELM_TYPES::NONE;
        ASSERT_OK(Metadata::getType(String("concurrency_key_") + String::from(i), stored));
        for (int t = 0; t < kThreads; ++t) EXPECT_EQ(seen[t][i], stored) << i;
    }
}

TEST(FrameworkConcurrencyTest, SharedPointerCopiesAcrossThreadsDeleteOnce) {
    struct Tracked {
        explicit Tracked(std::atomic<int>* deletions) : deletions_(deletions) {}
        ~Tracked() { deletions_->fetch_add(1); }
        std::atomic<int>* deletions_;
    };
    std::atomic<int> deletions{0};
    for (int round = 0; round < 50; ++round) {
        SmartPtr<Tracked> shared(new Tracked(&deletions));
        std::vector<std::thread> threads;
        for (int t = 0; t < kThreads; ++t) {
            threads.emplace_back([copy = shared] {
                for (int i = 0; i < 1000; ++i) {
                    SmartPtr<Tracked> local = copy;
                    SmartPtr<Tracked>(local).reset();
                }
            });
        }
        shared.reset();
        for (auto& th : threads) th.join();
        EXPECT_EQ(deletions.load(), round + 1);
    }
}

}  // namespace
}  // namespace trelm
