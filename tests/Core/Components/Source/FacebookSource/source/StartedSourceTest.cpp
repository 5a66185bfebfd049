// A source configured with an application and a session (in memory only) and started, without a
// network: how it chooses the cursor for a query, what the cursors make of a query when they start,
// and the data operations it refuses before asking the service (no HTTP factory is registered, so
// a request would fail with another code).
#include <gtest/gtest.h>

#include <cstdint>
#include <string>
#include <vector>

#include "ConfigurationChangedMessage.h"
#include "ErrorAssertions.h"
#include "FacebookSource.h"
#include "GetUserSidMessage.h"
#include "IQueryItems.h"
#include "PhotoLibraryCursor.h"
#include "RecordDump.h"
#include "trelm/Configuration.h"
#include "trelm/GUID.h"

namespace trelm {
namespace {

using Constraint = IQueryItems::Constraint;
using Record = Map<String, Variant>;

constexpr char const* kSourceName = "facebook";
constexpr int kNone = 0;  // no type chosen: the case fails

Constraint where(char const* key, Variant value, Constraint::Function function = Constraint::Equal,
                 TRELM_TYPES::TYPES type = TRELM_TYPES::STRING) {
    return Constraint{Metadata::Key(key, type), std::move(value), function};
}
Constraint typeIs(Variant value, Constraint::Function function = Constraint::Equal) {
    return where("core_object_type", std::move(value), function, TRELM_TYPES::INT32);
}
Constraint typeIn(Vector<int> types) { return typeIs(Variant(types), Constraint::InList); }
Constraint other() { return where("core_contact_name", Variant("x")); }

Record record(std::initializer_list<std::pair<char const*, Variant>> entries) {
    Record r;
    for (auto const& [key, value] : entries) EXPECT_OK(r.insert(key, value));
    return r;
}

class QueryDispatchTest : public ::testing::Test {
protected:
    void SetUp() override {
        ASSERT_OK(source.sendConfig(Configuration::Group(kSourceName,
                                                         {{"facebook_source_appkey", Variant("key")},
                                                          {"facebook_source_appsecret", Variant("secret")},
                                                          {"facebook_source_session_user", Variant("100000001")},
                                                          {"facebook_source_session_id", Variant("session")},
                                                          {"facebook_source_session_secret", Variant("s")}})));
        ASSERT_OK(source.startup());
    }

    FacebookSource source{kSourceName};
};
using DataOperationsTest = QueryDispatchTest;

// Every rule of the dispatch in one table: what the query asks for, the position and the flag,
// and the type chosen (or the code of the refusal). Each case is also run as a start-query
// message through the started source: a chosen type yields its cursor; a refusal yields the same
// code and no cursor.
TEST_F(QueryDispatchTest, RulesChooseOneObjectTypeOrRefuseWithExactCode) {
    struct Case {
        char const* name;
        std::vector<Constraint> constraints;
        int type;       // kNone when refused
        unsigned code;  // of the selection
        std::int64_t position = -1;
        bool flag = true;
    };
    // clang-format off
    std::vector<Case> const cases = {
        {"contact by value", {typeIs(2)}, 2, kSuccess},
        {"contact by text value", {typeIs("2")}, 2, kSuccess},
        {"stream pair is served by the status cursor", {typeIn({4, 5})}, 4, kSuccess},
        {"photo events alone", {typeIn({5})}, 5, kSuccess},
        {"two unrelated types", {typeIn({2, 11})}, kNone, kNotSupported},
        {"unknown type leaves all eight", {typeIs(3)}, kNone, kNotSupported},
        {"unknown list values are ignored", {typeIn({2, 99})}, 2, kSuccess},
        {"list then value narrows to one", {typeIn({2, 11}), typeIs(11)}, 11, kSuccess},
        {"value then list keeps the value", {typeIs(11), typeIn({2, 11})}, 11, kSuccess},
        {"value then another value leaves none", {typeIs(2), typeIs(11)}, kNone, kNotSupported},
        {"empty list leaves none", {typeIn({})}, kNone, kNotSupported},
        {"no type constraint", {other()}, kNone, kNotSupported},
        {"no constraints at all", {}, kNone, kNotSupported},
        {"ordering comparison on the type", {typeIs(2, Constraint::GreaterThan)}, kNone, kNotSupported},
        {"not-equal on the type", {typeIs(2, Constraint::NotEqual)}, kNone, kNotSupported},
        {"type value that is no number", {typeIs("two")}, kNone, kInvalid},
        {"type list that is no number list",
         {typeIs(Variant(Vector<String>{"x"}), Constraint::InList)}, kNone, kInvalid},
        {"own source accepted", {where("core_object_source", kSourceName), typeIs(2)}, 2, kSuccess},
        {"other source refused", {typeIs(2), where("core_object_source", "other")}, kNone, kNotSupported},
        {"other source refused for any type",
         {where("core_object_source", "other"), typeIs(9)}, kNone, kNotSupported, -1, false},
        {"source value that is no text",
         {where("core_object_source", Variant(Vector<int>{1, 2})), typeIs(2)}, kNone, kInvalid},
        {"background media query", {typeIs(9)}, 9, kSuccess, -1, false},
        {"background friend requests", {typeIs(12)}, 12, kSuccess, -1, false},
        {"background contact query", {typeIs(2)}, kNone, kNoData, -1, false},
        {"background stream query", {typeIn({4, 5})}, kNone, kNoData, -1, false},
        {"background messages", {typeIs(10)}, kNone, kNoData, -1, false},
        {"several types checked before the flag", {typeIn({2, 9})}, kNone, kNotSupported, -1, false},
        {"position 0 on background albums", {typeIs(11)}, 11, kSuccess, 0, false},
        {"position on interactive media", {typeIs(9)}, kNone, kInvalid, 40},
        {"position on a contact query", {typeIs(2)}, kNone, kInvalid, 40, false},
        {"position checked before the type count", {typeIn({2, 9})}, kNone, kNotSupported, 40, false},
        {"position with no usable type", {typeIn({2, 12})}, kNone, kInvalid, 40, false},
    };
    // clang-format on

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
        // The friend-request, stream and photo cursors start only with their ordering, which these
        // queries lack.
        bool const ordered = c.type == 4 || c.type == 5 || c.type == 12;
        EXPECT_CODE(started, c.type == kNone ? c.code : ordered ? kInvalid : kSuccess);
        EXPECT_EQ(bool(msg.cursor), c.type != kNone && !ordered);
        if (auto* cursor = dynamic_cast<PhotoLibraryCursor*>(msg.cursor.get())) {
            EXPECT_EQ(cursor->paged(), c.position == -1);
            EXPECT_EQ(cursor->since(), c.position);
        }
    }
}

// What the cursors make of a query's ordering and constraints when they start, before anything
// is asked of the service.
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

TEST_F(DataOperationsTest, RefusedOperationsAnswerTheirExactCodes) {
    GUID const someGuid = GUID::generate();
    Record scratch = record({{"core_object_type", 4}});
    EXPECT_CODE(source.update(scratch), kDataOpNotSupported);
    for (bool flag : {false, true}) EXPECT_CODE(source.remove(someGuid, flag), kDataOpNotSupported);
    scratch = Record();
    EXPECT_CODE(source.retrieve(someGuid, scratch, true), kDataOpNotSupported);
    EXPECT_CODE(source.retrieve(someGuid, scratch, false), kNotFound);
    EXPECT_TRUE(scratch.empty());
    // A contact, no type, a status without a text, a photo without a file address.
    for (Record r : {record({{"core_object_type", 2}}), record({{"core_event_text", "hi"}}), record({{"core_object_type", 4}}),
                     record({{"core_object_type", 4}, {"core_event_text", ""}}),
                     record({{"core_object_type", 9}, {"media_notes", "caption"}}),
                     record({{"core_object_type", 9}, {"media_uri", "http://x/y.jpg"}})}) {
        String dump;
        sprintTags(dump, r);
        SCOPED_TRACE(dump.str());
        EXPECT_CODE(source.insert(r), kInvalid);
    }
}

TEST(UnstartedSourceTest, OperationsAndChangesBeforeStartupFailWithNotSet) {
    FacebookSource source(kSourceName);
    Record status = record({{"core_object_type", 4}, {"core_event_text", "hi"}});
    EXPECT_CODE(source.insert(status), kNotSet);
    Record out;
    EXPECT_CODE(source.retrieve(GUID::generate(), out, false), kNotSet);
    IServiceSource::GetUserSidMessage sid;
    EXPECT_CODE(source.onMessage(sid), kNotSet);
    ConfigurationChangedMessage login(Set<String>{"facebook_source_login"});
    EXPECT_CODE(source.onMessage(login), kNotSet) << "no settings yet";
    // A query gets no cursor without a client, before and after a configuration.
    IQueryItems::StartQueryMessage query(Vector<IQueryItems::Column>(), Vector<Constraint>{typeIs(2)});
    EXPECT_CODE(source.onMessage(query), kNotSet);
    // Starting without a configuration is refused too, rather than making a client without settings.
    EXPECT_CODE(source.startup(), kNotSet);
    ASSERT_OK(source.sendConfig(Configuration::Group(kSourceName, {{"facebook_source_appkey", Variant("key")},
                                                                   {"facebook_source_appsecret", Variant("secret")},
                                                                   {"haveExtendedApi", Variant(false)}})));
    EXPECT_CODE(source.onMessage(query), kNotSet);
    EXPECT_FALSE(query.cursor);
    ConfigurationChangedMessage session(Set<String>{"facebook_source_session_id"});
    EXPECT_CODE(source.onMessage(session), kNotSet) << "no client yet";
    ConfigurationChangedMessage unrelated(Set<String>{"wipeComponents"});
    EXPECT_OK(source.onMessage(unrelated));
}

// The dump pads every key to 30 columns; a longer key gets (length - 30) spaces instead.
TEST(RecordDumpTest, PadsKeysToThirtyColumnsAndRendersByRegisteredType) {
    trelm_RegisterMetadataType("test_dump_unsigned", TRELM_TYPES::UINT32);
    GUID const guid = GUID::generate();
    std::string const key30(30, 'k');
    std::string const key33(33, 'k');
    struct Case {
        Record input;
        std::string text;
    };
    std::vector<Case> const cases = {
        {record({{"core_object_type", 4}}), "core_object_type:" + std::string(14, ' ') + "4\n"},
        {record({{key30.c_str(), "v"}}), key30 + ":v\n"},
        {record({{key33.c_str(), "v"}}), key33 + ":   v\n"},
        {record({{"core_object_id", guid}}), "core_object_id:" + std::string(16, ' ') + guid.toString().str() + "\n"},
        {record({{"test_dump_unsigned", 7u}, {"core_contact_name", "Ann"}}),
         "core_contact_name:" + std::string(13, ' ') + "Ann\n" + "test_dump_unsigned:" + std::string(12, ' ') + "7\n"},
        {Record(), ""},
    };
    for (Case const& c : cases) {
        String out("> ");
        sprintTags(out, c.input);
        EXPECT_EQ(out.str(), "> " + c.text);
    }
}

}  // namespace
}  // namespace trelm
