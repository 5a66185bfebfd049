// The mapping cache under the work of cursors paging forward: per window of 150 rows, the
// previous window's records are released (clearItems), each row's service id gets its GUID
// (getGuid, creating it the first time) and its record is stored (setItem). A cursor walks 5,000
// ids in 34 windows; when its walk ends it releases its mappings (clearMapping) and starts over,
// as a new cursor would.
//   cache/window/threads:1  one cursor;
//   cache/window/threads:2  two cursors on separate tags and separate ids, one per thread, both on
//                           the one cache: every call contends for the cache's single mutex.
// One iteration is one window. Time is wall time; items are rows, summed over the threads, so
// items_per_second is the cache's throughput. run.sh prints the two-thread throughput as a ratio
// to the one-thread figure.
#include <benchmark/benchmark.h>

#include <cstdio>
#include <cstdlib>
#include <vector>

#include "MappingCache.h"
#include "trelm/Variant.h"

namespace {

using trelm::GUID;
using trelm::Map;
using trelm::SmartPtr;
using trelm::String;
using trelm::Variant;
using Cache = trelm::FacebookSource::MappingCache;
using Record = Map<String, Variant>;

constexpr unsigned kWindow = 150;
constexpr unsigned kFriends = 5000;
constexpr unsigned kWindowsPerWalk = (kFriends + kWindow - 1) / kWindow;

trelm::Metadata::Key const kContactId("core_contact_service_id", trelm::TRELM_TYPES::STRING);

Cache& sharedCache() {
    static Cache* cache = [] {
        auto* made = new Cache;
        if (made->setup().failed()) {
            std::fprintf(stderr, "cache setup failed\n");
            std::abort();
        }
        return made;
    }();
    return *cache;
}

// One thread's cursor: its tag, its ids (disjoint from the other threads'), and one record per
// row of a window, reused from window to window as a cursor's conversion would make them anew.
struct Walker {
    Cache& cache;
    String tag;
    std::vector<Cache::SidMapKey> keys;
    std::vector<SmartPtr<Record>> records;
    unsigned window = 0;

    Walker(Cache& c, int thread) : cache(c) {
        if (cache.getTag(tag).failed()) std::abort();
        for (unsigned i = 0; i < kFriends; ++i)
            keys.emplace_back(kContactId, String::from(100000000ull * (thread + 1) + i));
        for (unsigned i = 0; i < kWindow; ++i) {
            records.push_back(trelm::makeSmart<Record>());
            if (records.back()->insert("core_contact_service_id", Variant(keys[i].sid)).failed()) std::abort();
        }
    }

    bool step() {
        if (window == kWindowsPerWalk) {
            if (cache.clearMapping(tag).failed()) return false;
            window = 0;
        }
        if (cache.clearItems(tag).failed()) return false;
        unsigned const first = window * kWindow;
        for (unsigned row = 0; row < kWindow && first + row < kFriends; ++row) {
            GUID guid;
            if (cache.getGuid(tag, keys[first + row], true, guid).failed()) return false;
            if (records[row]->insert("core_object_id", Variant(guid)).failed()) return false;
            if (cache.setItem(tag, kContactId, records[row]).failed()) return false;
        }
        ++window;
        return true;
    }

    ~Walker() {
        // The benchmark is over; what it leaves in the process-wide cache no longer matters.
        cache.clearMapping(tag).ignore();
        cache.clearItems(tag).ignore();
    }
};

void BM_CacheWindow(benchmark::State& state) {
    Walker walker(sharedCache(), state.thread_index());
    int64_t rows = 0;
    for (auto _ : state) {
        unsigned const first = walker.window % kWindowsPerWalk * kWindow;
        if (!walker.step()) {
            state.SkipWithError("cache operation failed");
            break;
        }
        rows += first + kWindow <= kFriends ? kWindow : kFriends - first;
    }
    state.SetItemsProcessed(rows);
}
BENCHMARK(BM_CacheWindow)->Name("cache/window")->Threads(1)->Threads(2)->UseRealTime()->Unit(benchmark::kMicrosecond);

}  // namespace

BENCHMARK_MAIN();
