#include <gtest/gtest.h>

#include <map>
#include <string>
#include <vector>

#include "MappingCache.h"

namespace trelm {
namespace {

using Cache = FacebookSource::MappingCache;
using SidMapKey = Cache::SidMapKey;
using Record = Map<String, Variant>;

constexpr char const* kContactId = "core_contact_service_id";
constexpr char const* kAlbumId = "facebook_album_service_id";

// One operation of a scenario and what it must answer.
//   Guid   getGuid(tag, {key, type}, sid, create): a label seen before must give that label's GUID;
//          a new label must give a GUID different from every earlier one.
//   Store  setItem(tag, record): the record has "core_object_id" = GUID of `label` (none when
//          label is null) and "version" = `version`.
//   Fetch  getItem(GUID of label): version 0 expects kNotFound, else the very record stored with
//          that version.
//   ClearMap / ClearItems  clearMapping(tag) / clearItems(tag).
struct Step {
    enum Op { Guid, Store, Fetch, ClearMap, ClearItems } op;
    char const* tag;
    char const* label;
    unsigned code = kSuccess;
    char const* key = kContactId;
    char const* sid = "1001";
    bool create = true;
    TRELM_TYPES::TYPES type = TRELM_TYPES::STRING;
    int version = 0;
};

struct Scenario {
    char const* name;
    std::vector<Step> steps;
};

Step guid(char const* tag, char const* label, char const* sid = "1001", bool create = true,
          unsigned code = kSuccess) {
    Step s{Step::Guid, tag, label, code};
    s.sid = sid;
    s.create = create;
    return s;
}
Step guidOfKey(char const* tag, char const* label, char const* key, TRELM_TYPES::TYPES type) {
    Step s{Step::Guid, tag, label};
    s.key = key;
    s.type = type;
    return s;
}
Step store(char const* tag, char const* label, int version, unsigned code = kSuccess) {
    Step s{Step::Store, tag, label, code};
    s.version = version;
    return s;
}
Step fetch(char const* label, int version) {
    Step s{Step::Fetch, nullptr, label, version == 0 ? unsigned(kNotFound) : unsigned(kSuccess)};
    s.version = version;
    return s;
}
Step clearMap(char const* tag) { return Step{Step::ClearMap, tag, nullptr}; }
Step clearItems(char const* tag) { return Step{Step::ClearItems, tag, nullptr}; }

class MappingCacheScenario : public ::testing::TestWithParam<Scenario> {};

TEST_P(MappingCacheScenario, AnswersAndInvariantsHold) {
    Cache cache;
    ASSERT_EQ(cache.setup().code(), kSuccess);
    std::map<std::string, GUID> labels;
    std::map<int, SmartPtr<Record>> stored;

    int index = 0;
    for (Step const& step : GetParam().steps) {
        SCOPED_TRACE("step " + std::to_string(index++));
        uError err;
        switch (step.op) {
            case Step::Guid: {
                GUID g;
                err = cache.getGuid(step.tag, SidMapKey(Metadata::Key(step.key, step.type), step.sid), step.create, g);
                if (err.failed() || step.label == nullptr) break;
                auto known = labels.find(step.label);
                if (known != labels.end()) {
                    EXPECT_EQ(g, known->second) << "label " << step.label;
                } else {
                    for (auto const& [name, other] : labels) EXPECT_NE(g, other) << "label " << name;
                    labels[step.label] = g;
                }
                break;
            }
            case Step::Store: {
                auto record = makeSmart<Record>();
                if (step.label != nullptr) record->insert("core_object_id", Variant(labels.at(step.label)));
                else record->insert("core_object_id", Variant(5));
                record->insert("version", Variant(step.version));
                err = cache.setItem(step.tag, Metadata::Key(kContactId, TRELM_TYPES::STRING), record);
                if (err.ok()) stored[step.version] = record;
                break;
            }
            case Step::Fetch: {
                SmartPtr<Record> item;
                err = cache.getItem(labels.at(step.label), item);
                if (err.ok()) {
                    EXPECT_EQ(item, stored.at(step.version)) << "not the record stored last";
                } else {
                    EXPECT_FALSE(item);
                }
                break;
            }
            case Step::ClearMap:
                err = cache.clearMapping(step.tag);
                break;
            case Step::ClearItems:
                err = cache.clearItems(step.tag);
                break;
        }
        EXPECT_EQ(err.code(), step.code) << err;
        uError inv = cache.checkInvariants();
        EXPECT_TRUE(inv.ok()) << inv;
    }
}

INSTANTIATE_TEST_SUITE_P(
    Behaviour, MappingCacheScenario,
    ::testing::Values(
        Scenario{"SameTagTwiceDoesNotCountTwice",
                 {guid("0", "A"), guid("0", "A"), clearMap("0"), guid("1", nullptr, "1001", false, kNotFound),
                  guid("0", "B")}},
        Scenario{"SecondTagKeepsMappingAlive",
                 {guid("0", "A"), guid("1", "A"), clearMap("0"), guid("1", "A", "1001", false), clearMap("1"),
                  guid("1", nullptr, "1001", false, kNotFound)}},
        Scenario{"KeyTypeCodeIsIgnored",
                 {guidOfKey("0", "A", kContactId, TRELM_TYPES::STRING),
                  guidOfKey("0", "A", kContactId, TRELM_TYPES::INT32), clearMap("0"),
                  guid("0", nullptr, "1001", false, kNotFound)}},
        Scenario{"KeyNameSeparatesEqualSids",
                 {guidOfKey("0", "A", kContactId, TRELM_TYPES::STRING),
                  guidOfKey("0", "B", kAlbumId, TRELM_TYPES::STRING)}},
        Scenario{"UnknownKeyWithoutCreateChangesNothing",
                 {guid("0", nullptr, "1001", false, kNotFound), clearMap("0"), guid("0", "A")}},
        Scenario{"UnknownTagClearsAreHarmless", {clearMap("7"), clearItems("7"), guid("0", "A"), clearItems("0")}},
        Scenario{"StoringTwiceReplacesAndCountsOnce",
                 {guid("0", "A"), store("0", "A", 1), store("0", "A", 2), fetch("A", 2), clearItems("0"),
                  fetch("A", 0)}},
        Scenario{"SecondTagKeepsRecordAlive",
                 {guid("0", "A"), store("0", "A", 1), store("1", "A", 1), clearItems("0"), fetch("A", 1),
                  clearItems("1"), fetch("A", 0)}},
        Scenario{"MappingAndRecordAreIndependent",
                 {guid("0", "A"), fetch("A", 0), store("0", "A", 1), clearMap("0"), fetch("A", 1),
                  guid("0", "B")}},
        Scenario{"RecordWithoutGuidIsRefused", {store("0", nullptr, 1, kInvalid), clearItems("0")}}),
    [](auto const& info) { return std::string(info.param.name); });

TEST(MappingCacheTest, TagsCountUpFromZeroAndAreNeverReused) {
    Cache cache;
    ASSERT_EQ(cache.setup().code(), kSuccess);
    std::vector<std::string> tags;
    for (int i = 0; i < 3; ++i) {
        String tag;
        ASSERT_EQ(cache.getTag(tag).code(), kSuccess);
        tags.push_back(tag.str());
    }
    EXPECT_EQ(tags, (std::vector<std::string>{"0", "1", "2"}));
}

TEST(MappingCacheTest, OperationsBeforeSetupFailInsteadOfUsingAnUnmadeMutex) {
    Cache cache;
    String tag;
    GUID g;
    SmartPtr<Record> item;
    EXPECT_EQ(cache.getTag(tag).code(), kNotSet);
    EXPECT_EQ(cache.getGuid("0", SidMapKey(), true, g).code(), kNotSet);
    EXPECT_EQ(cache.getItem(g, item).code(), kNotSet);
    EXPECT_EQ(cache.clearMapping("0").code(), kNotSet);
    ASSERT_EQ(cache.setup().code(), kSuccess);
    EXPECT_EQ(cache.setup().code(), kInvalid);
}

TEST(MappingCacheTest, KeysOrderByNameThenSidBytewise) {
    struct Case {
        char const* leftName;
        char const* leftSid;
        char const* rightName;
        char const* rightSid;
        bool less;
    };
    Case const cases[] = {
        {"a", "9", "b", "1", true},    // the name decides first
        {"b", "1", "a", "9", false},
        {"a", "1", "a", "2", true},    // then the sid
        {"a", "10", "a", "9", true},   // byte order, not numeric
        {"a", "1", "a", "1", false},   // equal
    };
    for (Case const& c : cases) {
        SidMapKey left(Metadata::Key(c.leftName, TRELM_TYPES::STRING), c.leftSid);
        SidMapKey right(Metadata::Key(c.rightName, TRELM_TYPES::INT32), c.rightSid);
        EXPECT_EQ(left < right, c.less) << c.leftName << "/" << c.leftSid << " < " << c.rightName << "/" << c.rightSid;
    }
    EXPECT_TRUE(SidMapKey(Metadata::Key("a", TRELM_TYPES::STRING), "1") ==
                SidMapKey(Metadata::Key("a", TRELM_TYPES::INT64), "1"));
}

}  // namespace
}  // namespace trelm
