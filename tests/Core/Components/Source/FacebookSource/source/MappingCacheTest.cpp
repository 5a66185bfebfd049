#include <gtest/gtest.h>

#include "ErrorAssertions.h"

#include <map>
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

}  // namespace
}  // namespace trelm
