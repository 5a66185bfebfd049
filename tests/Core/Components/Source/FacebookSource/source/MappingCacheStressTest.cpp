#include <gtest/gtest.h>

#include "ErrorAssertions.h"

#include <atomic>
#include <chrono>
#include <random>
#include <string>
#include <thread>
#include <vector>

#include "MappingCache.h"

namespace trelm {
namespace {

using Cache = FacebookSource::MappingCache;
using Record = Map<String, Variant>;

Metadata::Key const kKey("core_contact_service_id", TRELM_TYPES::STRING);

// Several threads act like cursors sharing one cache: each takes tags, maps overlapping service
// ids, stores records, reads records of any thread and releases its pages and tags, while a
// checker verifies the invariants between operations. A set of ids pinned under a tag of its own
// for the whole run must keep its GUIDs whoever maps them.
TEST(MappingCacheStressTest, CursorsOnSeveralThreadsKeepCountsAndGuidsConsistent) {
    Cache cache;
    ASSERT_OK(cache.setup());

    constexpr int kThreads = 4;
    constexpr int kCursorsPerThread = 30;
    constexpr int kPagesPerCursor = 4;
    constexpr int kRowsPerPage = 25;
    constexpr int kIdSpace = 200;  // small, so that threads keep hitting the same ids
    constexpr int kPinned = 20;

    String pinTag;
    ASSERT_OK(cache.getTag(pinTag));
    std::vector<GUID> pinned(kPinned);
    for (int i = 0; i < kPinned; ++i) {
        ASSERT_OK(cache.getGuid(pinTag, Cache::SidMapKey(kKey, String::from(i)), true, pinned[i]));
    }

    std::atomic<int> failures{0};
    std::atomic<bool> done{false};
    // Fails the test and stops every cursor on a failed operation.
    auto ok = [&](char const* what, uError const& err) {
        EXPECT_OK(err) << what;
        if (err.failed()) ++failures;
        return err.ok();
    };

    auto cursor = [&](unsigned seed) {
        std::mt19937 rng(seed);
        for (int c = 0; c < kCursorsPerThread && failures == 0; ++c) {
            String tag;
            if (!ok("getTag", cache.getTag(tag))) return;
            for (int page = 0; page < kPagesPerCursor; ++page) {
                // A refill releases the previous page's records, as the FQL cursors do.
                if (!ok("clearItems", cache.clearItems(tag))) return;
                for (int row = 0; row < kRowsPerPage; ++row) {
                    int const id = static_cast<int>(rng() % kIdSpace);
                    GUID g;
                    if (!ok("getGuid", cache.getGuid(tag, Cache::SidMapKey(kKey, String::from(id)), true, g))) return;
                    if (id < kPinned && g != pinned[id]) {
                        ++failures;
                        ADD_FAILURE() << "pinned id " << id << " got another GUID";
                    }
                    auto record = makeSmart<Record>(
                        Record{{"core_object_id", Variant(g)}, {"sid", Variant(String::from(id))}});
                    if (!ok("setItem", cache.setItem(tag, kKey, record))) return;

                    // Whatever record another cursor stored under a GUID must carry that GUID.
                    SmartPtr<Record> other;
                    if (cache.getItem(g, other).ok() && other->search("core_object_id")->asGUID() != g) {
                        ++failures;
                        ADD_FAILURE() << "record stored under the wrong GUID";
                    }
                }
            }
            if (!ok("clearMapping", cache.clearMapping(tag)) || !ok("clearItems", cache.clearItems(tag))) return;
        }
    };

    // The checker pauses between checks: the cache's mutex is not fair, and a checker that takes it
    // again at once starves the cursors (under TSan on two cores, for minutes).
    std::thread checker([&] {
        while (!done && ok("invariants while running", cache.checkInvariants())) {
            std::this_thread::sleep_for(std::chrono::microseconds(200));
        }
    });
    std::vector<std::thread> threads;
    for (int t = 0; t < kThreads; ++t) threads.emplace_back(cursor, 1234u + t);
    for (auto& t : threads) t.join();
    done = true;
    checker.join();
    ASSERT_EQ(failures.load(), 0);

    Cache::Snapshot snapshot;
    ASSERT_OK(cache.checkInvariants(&snapshot));
    // Only the pinned tag still holds anything: its mappings, and no records.
    EXPECT_EQ(snapshot.sidEntries, unsigned(kPinned));
    EXPECT_EQ(snapshot.sidTags, 1u);
    EXPECT_EQ(snapshot.objEntries, 0u);
    EXPECT_EQ(snapshot.objTags, 0u);

    ASSERT_OK(cache.clearMapping(pinTag));
    ASSERT_OK(cache.checkInvariants(&snapshot));
    EXPECT_EQ(snapshot.sidEntries, 0u);
    EXPECT_EQ(snapshot.sidTags, 0u);
}

}  // namespace
}  // namespace trelm
