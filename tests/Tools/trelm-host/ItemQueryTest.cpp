#include <optional>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "ErrorAssertions.h"

#include "ItemQuery.h"
#include "trelm/GUID.h"

using trelm::GUID;
using trelm::Map;
using trelm::SmartPtr;
using trelm::String;
using trelm::uError;
using trelm::Variant;
using trelm::Vector;
using trelm::host::ItemQuery;
using Constraint = trelm::IQueryItems::Constraint;
namespace Types = trelm::TRELM_TYPES;

namespace {

ItemQuery contacts() { return ItemQuery(*ItemQuery::findKind("contacts")); }

GUID const kGuid = [] {
    GUID g;
    (void)GUID::fromString("0f1e2d3c-4b5a-4978-8695-a4b3c2d1e0f9", g);
    return g;
}();

// The condition follows the type the key was registered with: a number compared as text (or
// text as a number) would make the source's cursors refuse or misread it. A malformed condition is
// invalid, says why, and adds nothing.
TEST(ConditionTest, BecomesAConstraintOfTheKeysTypeOrIsRefusedWithTheReason) {
    using F = Constraint::Function;
    struct Case {
        char const* text;
        char const* refused;  // why, or null when it is taken
        char const* key = "";
        Types::TYPES type = Types::STRING;
        F function = F::Equal;
        Variant value = {};
    } const cases[] = {
        {"core_contact_name=Anna Moreau", nullptr, "core_contact_name", Types::STRING, F::Equal,
         Variant("Anna Moreau")},
        {"core_object_time>=1000", nullptr, "core_object_time", Types::INT32, F::GreaterOrEqual, Variant(1000)},
        {"core_object_time<5", nullptr, "core_object_time", Types::INT32, F::LessThan, Variant(5)},
        {"core_contact_service!=Facebook", nullptr, "core_contact_service", Types::STRING, F::NotEqual,
         Variant("Facebook")},
        {"core_contact_service_id=12,34", nullptr, "core_contact_service_id", Types::STRING, F::InList,
         Variant(Vector<String>{"12", "34"})},
        {"core_object_type=2,11", nullptr, "core_object_type", Types::INT32, F::InList, Variant(Vector<int>{2, 11})},
        {"core_object_id=0F1E2D3C-4B5A-4978-8695-A4B3C2D1E0F9", nullptr, "core_object_id", Types::GUID_TYPE, F::Equal,
         Variant(kGuid)},
        {"no_such_key<=7", nullptr, "no_such_key", Types::STRING, F::LessOrEqual, Variant("7")},  // unregistered: text
        {"core_event_text=a=b", nullptr, "core_event_text", Types::STRING, F::Equal, Variant("a=b")},
        {"core_contact_name", "needs an operator"},
        {"=5", "needs a key"},
        {"core_object_time>soon", "does not fit the key"},
        {"core_object_time<-5", "cannot be negative"},
        {"core_object_type=2,x", "\"x\" does not fit the key"},
        {"core_object_id=not-a-guid", "does not fit the key"},
    };
    for (auto const& c : cases) {
        SCOPED_TRACE(c.text);
        ItemQuery query = contacts();
        uError const e = query.where(c.text);
        trelm::IQueryItems::StartQueryMessage msg;
        ASSERT_CODE(query.fill(msg), trelm::kSuccess);
        EXPECT_EQ(msg.constraints[0].key.name(), "core_object_type");
        EXPECT_EQ(msg.constraints[0].value, Variant(2));
        if (c.refused != nullptr) {
            EXPECT_CODE(e, trelm::kInvalid);
            EXPECT_NE(e.toText().find(c.refused), std::string::npos) << e;
            EXPECT_NE(e.toText().find(c.text), std::string::npos) << e;
            EXPECT_EQ(msg.constraints.size(), 1u);
            continue;
        }
        ASSERT_OK(e);
        ASSERT_EQ(msg.constraints.size(), 2u);
        Constraint const& added = msg.constraints[1];
        EXPECT_EQ(added.key.name(), c.key);
        EXPECT_EQ(added.key.type(), c.type);
        EXPECT_EQ(added.function, c.function);
        EXPECT_EQ(added.value, c.value);
    }
}

// --since becomes the query's position for the kinds whose cursors list what changed since a time;
// for the others, and for a time before 1970, it is refused with the reason.
TEST(SinceTest, IsThePositionOfAlbumMediaAndPhotoTagQueriesOnly) {
    struct Case {
        char const* kind;
        std::int64_t since;
        char const* refused;  // why, or null when it is taken
    } const cases[] = {
        {"media", 0, nullptr},
        {"albums", 1700000000, nullptr},
        {"photo-tags", 5, nullptr},
        {"media", -5, "a time is in seconds since 1970 and cannot be negative"},
        {"contacts", 5, "list contacts without it"},
        {"messages", 5, "list messages without it"},
    };
    for (Case const& c : cases) {
        SCOPED_TRACE(std::string(c.kind) + " " + std::to_string(c.since));
        ItemQuery query(*ItemQuery::findKind(c.kind));
        query.since = c.since;
        trelm::IQueryItems::StartQueryMessage msg;
        uError const e = query.fill(msg);
        if (c.refused != nullptr) {
            EXPECT_CODE(e, trelm::kInvalid);
            EXPECT_NE(e.toText().find(c.refused), std::string::npos) << e;
            continue;
        }
        ASSERT_OK(e);
        EXPECT_EQ(msg.position, c.since);
    }
}

// A cursor over `rows` records {"n": i} that moves only by seek(1), like the stream cursor, and
// can be told to fail reading one row.
class StepCursor : public trelm::IQueryItems::ICursor {
public:
    StepCursor(int rows, int failAt) : rows_(rows), failAt_(failAt) {}

    uError getSchema(Vector<trelm::IQueryItems::Column>&) override { return uError(); }
    uError getRow(SmartPtr<Map<String, Variant>>& row) override {
        if (rows_ == 0) {
            row.reset();
            return TRELM_ERROR(trelm::kNoData);
        }
        if (position_ == failAt_) return TRELM_ERROR(trelm::kServiceUnavailable);
        row = trelm::makeSmart<Map<String, Variant>>();
        return row->insert("n", Variant(position_));
    }
    uError getRows(unsigned, Vector<SmartPtr<Map<String, Variant>>>&) override {
        return TRELM_ERROR(trelm::kNotSupported);
    }
    uError seek(int delta, int& moved) override {
        if (delta != 1) return TRELM_ERROR(trelm::kNotSupported);
        moved = position_ + 1 < rows_ ? 1 : 0;
        position_ += moved;
        return uError();
    }
    uError jumpBeginning() override {
        position_ = 0;
        return uError();
    }
    uError jumpEnd() override { return TRELM_ERROR(trelm::kNotSupported); }
    uError jump(unsigned) override { return TRELM_ERROR(trelm::kNotSupported); }
    uError curRow(unsigned&) override { return TRELM_ERROR(trelm::kNotSupported); }
    uError numRows(unsigned&) override { return TRELM_ERROR(trelm::kNotSupported); }

private:
    int const rows_;
    int const failAt_;
    int position_ = 5;  // not at the beginning: the walk must go there itself
};

TEST(WalkTest, ListsTheRowsBetweenSkipAndLimit) {
    struct Case {
        char const* name;
        int rows;
        unsigned skip;
        std::optional<unsigned> limit;
        std::vector<int> listed;
        unsigned code = trelm::kSuccess;
        int failAt = -1;
    } const cases[] = {
        {"limit beyond the end", 3, 0, 10, {0, 1, 2}},
        {"skip then limit", 10, 4, 3, {4, 5, 6}},
        {"skip to the last row", 5, 4, std::nullopt, {4}},
        {"skip past the end", 5, 5, std::nullopt, {}},
        {"empty result", 0, 0, std::nullopt, {}},
        {"zero limit", 5, 0, 0u, {}},
        {"a failure keeps the rows before", 5, 0, std::nullopt, {0, 1}, trelm::kServiceUnavailable, 2},
    };
    for (auto const& c : cases) {
        ItemQuery query = contacts();
        query.skip = c.skip;
        query.limit = c.limit;
        StepCursor cursor(c.rows, c.failAt);
        std::vector<ItemQuery::Record> rows;
        EXPECT_CODE(query.walk(cursor, rows), c.code) << c.name;
        std::vector<int> listed;
        for (auto const& row : rows) listed.push_back(row.search("n")->asInt32());
        EXPECT_EQ(listed, c.listed) << c.name;
    }
}

}  // namespace
