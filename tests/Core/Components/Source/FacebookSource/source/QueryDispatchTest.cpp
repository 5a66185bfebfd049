#include <gtest/gtest.h>

#include "ErrorAssertions.h"

#include <cstdint>
#include <string>
#include <vector>

#include "ContactCursor.h"
#include "PhotoLibraryCursor.h"
#include "FacebookSource.h"
#include "IQueryItems.h"
#include "trelm/Configuration.h"

namespace trelm {
namespace {

using Constraint = IQueryItems::Constraint;

constexpr char const* kSourceName = "facebook";
constexpr int kNone = 0;  // no type chosen: the case fails

Constraint typeIs(Variant value) {
    return Constraint{Metadata::Key("core_object_type", TRELM_TYPES::INT32), std::move(value), Constraint::Equal};
}
Constraint typeIn(Vector<int> types) {
    return Constraint{Metadata::Key("core_object_type", TRELM_TYPES::INT32), Variant(types), Constraint::InList};
}
Constraint typeInValue(Variant value) {
    return Constraint{Metadata::Key("core_object_type", TRELM_TYPES::INT32), std::move(value), Constraint::InList};
}
Constraint typeCompared(int type, Constraint::Function function) {
    return Constraint{Metadata::Key("core_object_type", TRELM_TYPES::INT32), Variant(type), function};
}
Constraint sourceIs(Variant value) {
    return Constraint{Metadata::Key("core_object_source", TRELM_TYPES::STRING), std::move(value), Constraint::Equal};
}
Constraint other() {
    return Constraint{Metadata::Key("core_contact_name", TRELM_TYPES::STRING), Variant("x"), Constraint::Equal};
}

// A source configured with an application and a session (in memory only) and started: no
// message is sent and no request made until a cursor reads.
class QueryDispatchTest : public ::testing::Test {
protected:
    void SetUp() override {
        Configuration::Group const group(kSourceName,
                                         {{"facebook_source_appkey", Variant("key")},
                                          {"facebook_source_appsecret", Variant("secret")},
                                          {"facebook_source_session_user", Variant("100000001")},
                                          {"facebook_source_session_id", Variant("session")},
                                          {"facebook_source_session_secret", Variant("session-secret")}});
        ASSERT_CODE(source.sendConfig(group), kSuccess);
        ASSERT_CODE(source.startup(), kSuccess);
    }

    FacebookSource source{kSourceName};
};

// Every rule of the dispatch in one table: what the query asks for, the position and the flag,
// and the type chosen (or the code of the refusal). Each case is also run as a start-query
// message through the started source: a chosen type yields its cursor, or kNotSupported while
// that kind has no cursor yet; a refusal yields the same code and no cursor.
TEST_F(QueryDispatchTest, RulesChooseOneObjectTypeOrRefuseWithExactCode) {
    struct Case {
        char const* name;
        std::vector<Constraint> constraints;
        std::int64_t position;
        bool flag;
        int type;       // kNone when refused
        unsigned code;  // of the selection
    };
    std::vector<Case> const cases = {
        {"contact by value", {typeIs(2)}, -1, true, 2, kSuccess},
        {"contact by text value", {typeIs("2")}, -1, true, 2, kSuccess},
        {"stream pair is served by the status cursor", {typeIn({4, 5})}, -1, true, 4, kSuccess},
        {"photo events alone", {typeIn({5})}, -1, true, 5, kSuccess},
        {"two unrelated types", {typeIn({2, 11})}, -1, true, kNone, kNotSupported},
        {"unknown type leaves all eight", {typeIs(3)}, -1, true, kNone, kNotSupported},
        {"unknown list values are ignored", {typeIn({2, 99})}, -1, true, 2, kSuccess},
        {"list then value narrows to one", {typeIn({2, 11}), typeIs(11)}, -1, true, 11, kSuccess},
        {"value then list keeps the value", {typeIs(11), typeIn({2, 11})}, -1, true, 11, kSuccess},
        {"value then another value leaves none", {typeIs(2), typeIs(11)}, -1, true, kNone, kNotSupported},
        {"empty list leaves none", {typeIn({})}, -1, true, kNone, kNotSupported},
        {"no type constraint", {other()}, -1, true, kNone, kNotSupported},
        {"no constraints at all", {}, -1, true, kNone, kNotSupported},
        {"ordering comparison on the type", {typeCompared(2, Constraint::GreaterThan)}, -1, true, kNone,
         kNotSupported},
        {"not-equal on the type", {typeCompared(2, Constraint::NotEqual)}, -1, true, kNone, kNotSupported},
        {"type value that is no number", {typeIs("two")}, -1, true, kNone, kInvalid},
        {"type list that is no number list", {typeInValue(Variant(Vector<String>{"x"}))}, -1, true, kNone, kInvalid},
        {"own source accepted", {sourceIs(kSourceName), typeIs(2)}, -1, true, 2, kSuccess},
        {"other source refused", {typeIs(2), sourceIs("other")}, -1, true, kNone, kNotSupported},
        {"other source refused for any type", {sourceIs("other"), typeIs(9)}, -1, false, kNone, kNotSupported},
        {"source value that is no text", {sourceIs(Variant(Vector<int>{1, 2})), typeIs(2)}, -1, true, kNone,
         kInvalid},
        {"background media query", {typeIs(9)}, -1, false, 9, kSuccess},
        {"background friend requests", {typeIs(12)}, -1, false, 12, kSuccess},
        {"background contact query", {typeIs(2)}, -1, false, kNone, kNoData},
        {"background stream query", {typeIn({4, 5})}, -1, false, kNone, kNoData},
        {"background messages", {typeIs(10)}, -1, false, kNone, kNoData},
        {"several types checked before the flag", {typeIn({2, 9})}, -1, false, kNone, kNotSupported},
        {"position on background media", {typeIs(9)}, 40, false, 9, kSuccess},
        {"position on background albums", {typeIs(11)}, 0, false, 11, kSuccess},
        {"position on background photo tags", {typeIs(13)}, 7, false, 13, kSuccess},
        {"position on interactive media", {typeIs(9)}, 40, true, kNone, kInvalid},
        {"position on a contact query", {typeIs(2)}, 40, false, kNone, kInvalid},
        {"position checked before the type count", {typeIn({2, 9})}, 40, false, kNone, kNotSupported},
        {"position with no usable type", {typeIn({2, 12})}, 40, false, kNone, kInvalid},
        {"interactive photo tags", {typeIs(13)}, -1, true, 13, kSuccess},
    };

    for (Case const& c : cases) {
        SCOPED_TRACE(c.name);
        Vector<Constraint> constraints{std::vector<Constraint>(c.constraints)};
        int type = kNone;
        uError err = FacebookSource::selectObjectType(constraints, c.position, c.flag, kSourceName, type);
        EXPECT_CODE(err, c.code);
        if (c.code == kSuccess) {
            EXPECT_EQ(type, c.type);
        }

        IQueryItems::StartQueryMessage msg(Vector<IQueryItems::Column>(), constraints, c.position);
        msg.interactive = c.flag;
        uError started = source.onMessage(msg);
        if (c.type == kNone) {
            EXPECT_CODE(started, c.code);
            EXPECT_FALSE(msg.cursor);
        } else if (c.type == FacebookSource::kContact) {
            EXPECT_CODE(started, kSuccess);
            EXPECT_NE(dynamic_cast<ContactCursor*>(msg.cursor.get()), nullptr);
        } else if (c.type == FacebookSource::kFriendRequest) {
            // The message gives no columns, so the cursor refuses to start without its ordering.
            EXPECT_EQ(started.code(), kInvalid) << started;
            EXPECT_FALSE(msg.cursor);
        } else if (c.type == FacebookSource::kAlbum || c.type == FacebookSource::kMedia ||
                   c.type == FacebookSource::kPhotoTag) {
            EXPECT_EQ(started.code(), kSuccess) << started;
            auto* cursor = dynamic_cast<PhotoLibraryCursor*>(msg.cursor.get());
            ASSERT_NE(cursor, nullptr);
            EXPECT_EQ(cursor->paged(), c.position == -1);
            EXPECT_EQ(cursor->since(), c.position);
        } else if (c.type == FacebookSource::kStatus || c.type == FacebookSource::kPhotoEvent) {
            // The stream and photo cursors start only with their ordering, which these queries lack.
            EXPECT_EQ(started.code(), kInvalid) << started;
            EXPECT_FALSE(msg.cursor);
        } else {
            EXPECT_CODE(started, kNotSupported);
            EXPECT_FALSE(msg.cursor);
        }
    }
}

// What the cursors make of a query's ordering and constraints when they start, before anything
// is asked of the service (no HTTP factory is registered: a request would fail with another code).
TEST_F(QueryDispatchTest, CursorConstraintsAreReadOrRefusedWithExactCodes) {
    auto key = [](char const* name) { return Metadata::Key(name, TRELM_TYPES::STRING); };
    Metadata::Key const timeKey("core_object_time", TRELM_TYPES::INT32);
    auto column = [&](char const* name, bool flag) { return IQueryItems::Column{key(name), flag}; };
    auto time = [&](Constraint::Function f, Variant v) { return Constraint{timeKey, v, f}; };
    Constraint const contact{key("core_event_contactid"), Variant("4"), Constraint::Equal};
    Vector<IQueryItems::Column> const events{{timeKey, false}, column("core_event_service", false),
                                             column("core_event_serviceid", false)};
    Vector<IQueryItems::Column> const requests{column("core_event_service", true), column("core_event_serviceid", true)};
    struct Case {
        int type;
        std::vector<Constraint> constraints;
        unsigned code;  // of the start; kNoData: started, and answers no rows without asking
        Vector<IQueryItems::Column> columns = {};
    };
    Case const cases[] = {
        {2, {other()}, kNotSupported},
        {2, {{key("core_contact_service_id"), Variant("1 or 1=1"), Constraint::Equal}}, kInvalid},
        {9, {{key("facebook_media_album_service_id"), Variant("1_2"), Constraint::Equal}}, kSuccess},
        {9, {{key("facebook_media_album_service_id"), Variant("1' or '1'='1"), Constraint::Equal}}, kInvalid},
        {11, {{key("facebook_album_owner_service_id"), Variant(Vector<int>{5, 6}), Constraint::InList}}, kSuccess},
        {11, {{key("facebook_album_owner_service_id"), Variant("5 or 1=1"), Constraint::Equal}}, kInvalid},
        {11, {{key("facebook_album_owner_service_id"), Variant("5"), Constraint::GreaterThan}}, kNotSupported},
        {13, {{key("facebook_photo_tag_text"), Variant("x"), Constraint::Equal}}, kNotSupported},
        {13, {time(Constraint::GreaterOrEqual, Variant(1262304000))}, kSuccess},
        {13, {time(Constraint::LessThan, Variant("soon"))}, kInvalid},
        {2, {{key("core_contact_service"), Variant("Other"), Constraint::Equal}}, kNoData},
        {9, {{key("core_service_id"), Variant(Vector<String>{}), Constraint::InList}}, kNoData},
        {11, {{key("core_object_origin_servicename"), Variant("Other"), Constraint::Equal}}, kNoData},
        {13, {{key("core_object_origin_importcomponent"), Variant("elsewhere"), Constraint::Equal}}, kNoData},
        // Messages: newest first only, one lower time bound only, no other key.
        {10, {}, kInvalid, {{timeKey, true}, events[1], events[2]}},
        {10, {time(Constraint::GreaterOrEqual, Variant(5)), time(Constraint::GreaterThan, Variant(6))}, kInvalid, events},
        {10, {time(Constraint::LessThan, Variant(5))}, kInvalid, events},
        {10, {contact}, kInvalid, events},
        // Friend requests: by service and service id, both ascending, and no constraint.
        {12, {}, kInvalid, {column("core_event_service", false), requests[1]}},
        {12, {}, kInvalid, events},
        {12, {contact}, kInvalid, requests},
        // Photo events: the service ids descending like the times.
        {5, {}, kInvalid, {events[0], events[1], column("core_event_serviceid", true)}},
    };
    for (Case const& c : cases) {
        SCOPED_TRACE(std::to_string(c.type) + " " + (c.constraints.empty() ? "" : c.constraints[0].key.name().str()));
        std::vector<Constraint> constraints{typeIs(c.type)};
        constraints.insert(constraints.end(), c.constraints.begin(), c.constraints.end());
        IQueryItems::StartQueryMessage msg(c.columns, Vector<Constraint>{constraints});
        uError const started = source.onMessage(msg);
        if (c.code != kNoData) {
            EXPECT_CODE(started, c.code);
            EXPECT_EQ(bool(msg.cursor), c.code == kSuccess);
            continue;
        }
        ASSERT_OK(started);
        SmartPtr<Map<String, Variant>> row;
        EXPECT_CODE(msg.cursor->getRow(row), kNoData);
        unsigned count = 1;
        EXPECT_OK(msg.cursor->numRows(count));
        EXPECT_EQ(count, 0u);
        EXPECT_CODE(msg.cursor->jumpEnd(), kNoData);
        int moved = 5;
        EXPECT_OK(msg.cursor->seek(3, moved));
        EXPECT_EQ(moved, 0);
    }
}

}  // namespace
}  // namespace trelm
