#include <gtest/gtest.h>

#include "ErrorAssertions.h"

#include <algorithm>
#include <numeric>
#include <string>
#include <vector>

#include "MappingCache.h"

namespace trelm {
namespace {

using Cache = FacebookSource::MappingCache;
using Record = Map<String, Variant>;

Metadata::Key const kKey("core_contact_service_id", TRELM_TYPES::STRING);

// Four cursors hold one service id and one record; they let go in every possible order. Each
// release must keep the GUID and the last stored record for the tags still holding them, and
// only the last release may drop them: whichever holder goes first, last or in between.
TEST(MappingCacheSharingTest, SharedEntriesLiveUntilTheirLastHolderLetsGoInAnyOrder) {
    constexpr int kTags = 4;
    std::vector<int> order(kTags);
    std::iota(order.begin(), order.end(), 0);
    do {
        SCOPED_TRACE("release order " + std::to_string(order[0]) + std::to_string(order[1]) + std::to_string(order[2]) +
                     std::to_string(order[3]));
        Cache cache;
        ASSERT_OK(cache.setup());
        std::vector<String> tags(kTags);
        GUID shared;
        SmartPtr<Record> last;
        for (int t = 0; t < kTags; ++t) {
            ASSERT_OK(cache.getTag(tags[t]));
            GUID g;
            ASSERT_OK(cache.getGuid(tags[t], Cache::SidMapKey(kKey, "1001"), true, g));
            if (t == 0) shared = g;
            ASSERT_EQ(g, shared);
            // An id of the tag's own beside the shared one.
            ASSERT_OK(cache.getGuid(tags[t], Cache::SidMapKey(kKey, String::from(2000 + t)), true, g));
            last = makeSmart<Record>(Record{{"core_object_id", Variant(shared)}});
            ASSERT_OK(cache.setItem(tags[t], kKey, last));
        }
        for (int released = 0; released < kTags; ++released) {
            String const& tag = tags[order[released]];
            ASSERT_OK(cache.clearMapping(tag));
            ASSERT_OK(cache.clearItems(tag));
            Cache::Snapshot snapshot;
            ASSERT_OK(cache.checkInvariants(&snapshot));
            bool const held = released + 1 < kTags;
            EXPECT_EQ(snapshot.sidEntries, unsigned(kTags - released - 1) + (held ? 1u : 0u));
            EXPECT_EQ(snapshot.objEntries, held ? 1u : 0u);
            SmartPtr<Record> item;
            GUID g;
            if (held) {
                String const& holder = tags[order[released + 1]];
                ASSERT_OK(cache.getGuid(holder, Cache::SidMapKey(kKey, "1001"), false, g));
                EXPECT_EQ(g, shared);
                ASSERT_OK(cache.getItem(shared, item));
                EXPECT_EQ(item, last);
            } else {
                EXPECT_CODE(cache.getGuid(tag, Cache::SidMapKey(kKey, "1001"), false, g), kNotFound);
                EXPECT_CODE(cache.getItem(shared, item), kNotFound);
            }
        }
    } while (std::next_permutation(order.begin(), order.end()));
}

}  // namespace
}  // namespace trelm
