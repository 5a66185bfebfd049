#include <gtest/gtest.h>

#include "ErrorAssertions.h"

#include <algorithm>
#include <map>
#include <numeric>
#include <string>
#include <vector>

#include "MappingCache.h"

namespace trelm {
namespace {

using Cache = FacebookSource::MappingCache;
using Record = Map<String, Variant>;

// One operation of a scenario and the code it must answer.
//   Guid   getGuid(tag, {key, type}, "1001", create). A label seen before must give that label's
//          GUID; a new label a GUID different from every earlier one.
//   Store  setItem(tag, record) with "core_object_id" = GUID of `label` (an integer when null).
//   Fetch  getItem(GUID of label): must give the very record stored last with `version`.
struct Step {
    enum Op { Guid, Store, Fetch, ClearMap, ClearItems } op;
    char const* tag;
    char const* label = nullptr;
    unsigned code = kSuccess;
    bool create = true;
    char const* key = "core_contact_service_id";
    TRELM_TYPES::TYPES type = TRELM_TYPES::STRING;
    int version = 0;
};

Step guid(char const* tag, char const* label, bool create = true, unsigned code = kSuccess) {
    return Step{Step::Guid, tag, label, code, create};
}
Step guidOf(char const* tag, char const* label, char const* key, TRELM_TYPES::TYPES type) {
    return Step{Step::Guid, tag, label, kSuccess, true, key, type};
}
Step store(char const* tag, char const* label, int version, unsigned code = kSuccess) {
    return Step{Step::Store, tag, label, code, true, "", TRELM_TYPES::NONE, version};
}
Step fetch(char const* label, int version, unsigned code = kSuccess) {
    return Step{Step::Fetch, "", label, code, true, "", TRELM_TYPES::NONE, version};
}
Step clearMap(char const* tag) { return Step{Step::ClearMap, tag}; }
Step clearItems(char const* tag) { return Step{Step::ClearItems, tag}; }

struct Scenario {
    char const* name;
    std::vector<Step> steps;
};

class MappingCacheScenario : public ::testing::TestWithParam<Scenario> {};

TEST_P(MappingCacheScenario, AnswersExactCodesAndKeepsItsInvariants) {
    Cache cache;
    String tag;
    EXPECT_CODE(cache.getTag(tag), kNotSet) << "nothing runs before setup";
    ASSERT_OK(cache.setup());
    EXPECT_CODE(cache.setup(), kInvalid);
    std::map<std::string, GUID> labels;
    std::map<int, SmartPtr<Record>> stored;
    for (size_t i = 0; i < GetParam().steps.size(); ++i) {
        Step const& s = GetParam().steps[i];
        SCOPED_TRACE("step " + std::to_string(i));
        uError err;
        if (s.op == Step::Guid) {
            GUID g;
            err = cache.getGuid(s.tag, Cache::SidMapKey(Metadata::Key(s.key, s.type), "1001"), s.create, g);
            if (err.ok() && labels.count(s.label) != 0) {
                EXPECT_EQ(g, labels[s.label]) << s.label;
            } else if (err.ok()) {
                for (auto const& [name, other] : labels) EXPECT_NE(g, other) << name;
                labels[s.label] = g;
            }
        } else if (s.op == Step::Store) {
            auto record = makeSmart<Record>();
            ASSERT_OK(record->insert("core_object_id", s.label ? Variant(labels.at(s.label)) : Variant(5)));
            err = cache.setItem(s.tag, Metadata::Key(), record);
            if (err.ok()) stored[s.version] = record;
        } else if (s.op == Step::Fetch) {
            SmartPtr<Record> item;
            err = cache.getItem(labels.at(s.label), item);
            EXPECT_EQ(item, err.ok() ? stored.at(s.version) : SmartPtr<Record>());
        } else {
            err = s.op == Step::ClearMap ? cache.clearMapping(s.tag) : cache.clearItems(s.tag);
        }
        EXPECT_CODE(err, s.code);
        uError inv = cache.checkInvariants();
        EXPECT_OK(inv);
    }
}

INSTANTIATE_TEST_SUITE_P(
    Behaviour, MappingCacheScenario,
    ::testing::Values(
        Scenario{"SameTagTwiceCountsOnce",
                 {guid("0", "A"), guid("0", "A"), clearMap("0"), guid("1", nullptr, false, kNotFound), guid("0", "B")}},
        Scenario{"SecondTagKeepsTheMapping",
                 {guid("0", "A"), guid("1", "A"), clearMap("0"), guid("1", "A", false), clearMap("1"),
                  guid("1", nullptr, false, kNotFound)}},
        Scenario{"KeyTypeCodeIsIgnored",
                 {guidOf("0", "A", "core_contact_service_id", TRELM_TYPES::STRING),
                  guidOf("0", "A", "core_contact_service_id", TRELM_TYPES::INT32), clearMap("0"),
                  guid("0", nullptr, false, kNotFound)}},
        Scenario{"KeyNameSeparatesEqualSids",
                 {guidOf("0", "A", "core_contact_service_id", TRELM_TYPES::STRING),
                  guidOf("0", "B", "facebook_album_service_id", TRELM_TYPES::STRING)}},
        Scenario{"UnknownKeyWithoutCreateChangesNothing",
                 {guid("0", nullptr, false, kNotFound), clearMap("0"), clearItems("7"), guid("0", "A")}},
        Scenario{"StoringTwiceReplacesAndCountsOnce",
                 {guid("0", "A"), store("0", "A", 1), store("0", "A", 2), fetch("A", 2), clearItems("0"),
                  fetch("A", 0, kNotFound)}},
        Scenario{"SecondTagKeepsTheRecord",
                 {guid("0", "A"), store("0", "A", 1), store("1", "A", 1), clearItems("0"), fetch("A", 1),
                  clearItems("1"), fetch("A", 0, kNotFound)}},
        Scenario{"MappingAndRecordAreIndependent",
                 {guid("0", "A"), fetch("A", 0, kNotFound), store("0", "A", 1), clearMap("0"), fetch("A", 1),
                  guid("0", "B")}},
        Scenario{"RecordWithoutGuidIsRefused", {store("0", nullptr, 1, kInvalid), clearItems("0")}}),
    [](auto const& info) { return std::string(info.param.name); });

Metadata::Key const kKey("core_contact_service_id", TRELM_TYPES::STRING);

// Four cursors hold one service id and one record; they let go in every possible order. Each
// release must keep the GUID and the last stored record for the tags still holding them, and
// only the last release may drop them: whichever holder goes first, last or in between.
TEST(MappingCacheTest, SharedEntriesLiveUntilTheirLastHolderLetsGoInAnyOrder) {
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
