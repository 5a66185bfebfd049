#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "ErrorAssertions.h"
#include "FStreamCursor.h"
#include "LibraryFixture.h"
#include "MappingCache.h"
#include "PhotoEventWrappedCursor.h"

namespace trelm::test {
namespace {

using Column = IQueryItems::Column;
using Constraint = IQueryItems::Constraint;
using RecordPtr = SmartPtr<Map<String, Variant>>;

Column column(char const* key, TRELM_TYPES::TYPES type, bool flag = false) { return Column{Metadata::Key(key, type), flag}; }
Column const kTime = column("core_object_time", TRELM_TYPES::INT32);
Column const kService = column("core_event_service", TRELM_TYPES::STRING);
Column const kServiceId = column("core_event_serviceid", TRELM_TYPES::STRING);

Constraint where(char const* key, TRELM_TYPES::TYPES type, Variant value, Constraint::Function function) {
    return Constraint{Metadata::Key(key, type), std::move(value), function};
}
Constraint timeIs(Constraint::Function function, Variant value) {
    return where("core_object_time", TRELM_TYPES::INT32, std::move(value), function);
}
Constraint typeIs(Constraint::Function function, Variant value) {
    return where("core_object_type", TRELM_TYPES::INT32, std::move(value), function);
}

// Canned answers in the service's shape.
std::string statusPost(std::string const& id, std::string const& author, int time) {
    return "<stream_post><post_id>" + id + "</post_id><source_id>" + author + "</source_id><type>46</type><message>said " +
           id + "</message><attachment/><created_time>" + std::to_string(time) + "</created_time></stream_post>";
}
std::string photoPost(std::string const& pid, std::string const& owner, int time) {
    std::string photo = pid.empty() ? "" : "<photo><aid>" + owner + "_1</aid><pid>" + pid + "</pid><owner>" + owner + "</owner></photo>";
    return "<stream_post><post_id>" + owner + "_p" + std::to_string(time) + "</post_id><source_id>" + owner +
           "</source_id><type>247</type><message>New photos</message><attachment><media list=\"true\"><stream_media>"
           "<href>h</href><alt>caption " + pid + "</alt><type>photo</type><src>http://p/" + pid + ".jpg</src>" + photo +
           "</stream_media></media></attachment><created_time>" + std::to_string(time) + "</created_time></stream_post>";
}
std::string linkPost(std::string const& id, int time) {
    return "<stream_post><post_id>" + id + "</post_id><source_id>7</source_id><type>80</type><attachment><media list=\"true\">"
           "<stream_media><href>h</href><type>link</type><src>s</src></stream_media></media></attachment><created_time>" +
           std::to_string(time) + "</created_time></stream_post>";
}
std::string streamAnswer(std::string const& posts) {
    return "<stream_get_response><posts list=\"true\">" + posts + "</posts></stream_get_response>";
}
std::string users(std::vector<std::pair<std::string, std::string>> const& people) {
    std::string body = "<fql_query_response list=\"true\">";
    for (auto const& [uid, name] : people) body += "<user><uid>" + uid + "</uid><name>" + name + "</name></user>";
    return body + "</fql_query_response>";
}
std::string photos(std::vector<std::pair<std::string, int>> const& rows) {
    std::string body = "<fql_query_response list=\"true\">";
    for (auto const& [pid, time] : rows) {
        body += "<photo><pid>" + pid + "</pid><aid>5_1</aid><owner>5</owner><src>http://p/" + pid +
                ".jpg</src><caption>c</caption><created>" + std::to_string(time) + "</created></photo>";
    }
    return body + "</fql_query_response>";
}

std::string text(RecordPtr const& record, char const* key) {
    Variant const* v = record ? record->search(key) : nullptr;
    return v ? v->asString().str() : "<none>";
}

// Cursors over a signed-in client (user 42) whose requests are answered from the queue.
class EventCursorTest : public LibraryFixture {
protected:
    void SetUp() override {
        LibraryFixture::SetUp();
        signIn();
        ASSERT_OK(cache->setup());
    }

    SmartPtr<FStreamCursor> stream(Vector<Constraint> constraints, unsigned window = 75,
                                   Vector<Column> ordering = {kTime, kService, kServiceId}) {
        auto cursor = makeSmart<FStreamCursor>(lib, cache, ordering, constraints, "facebook", true, true);
        cursor->setWindowSize(window);
        return cursor;
    }

    // The value of `field` in every request made with `method`, in order.
    std::vector<std::string> sent(char const* method, char const* field) const {
        std::vector<std::string> out;
        for (auto const& exchange : http.exchanges()) {
            String const* m = exchange.fields.search("method");
            String const* value = exchange.fields.search(field);
            if (m != nullptr && *m == method) out.push_back(value ? value->str() : "<none>");
        }
        return out;
    }

    SmartPtr<FacebookSource::MappingCache> cache = makeSmart<FacebookSource::MappingCache>();
};

TEST_F(EventCursorTest, StreamStartReadsBoundsAndKindsOrRefusesWithExactCode) {
    struct Case {
        char const* name;
        Vector<Column> ordering;
        Vector<Constraint> constraints;
        unsigned code;
        int startTime, endTime;
        bool status, photo;
    };
    Vector<Column> const fixed{kTime, kService, kServiceId};
    std::vector<Case> const cases = {
        {"no constraints asks for nothing", fixed, {}, kSuccess, 0, 0, false, false},
        {"ordering of two entries", {kTime, kService}, {}, kInvalid, 0, 0, false, false},
        {"time ascending", {column("core_object_time", TRELM_TYPES::INT32, true), kService, kServiceId}, {}, kInvalid,
         0, 0, false, false},
        {"entries after the third are free", {kTime, kService, kServiceId, column("core_event_text", TRELM_TYPES::STRING, true)},
         {}, kSuccess, 0, 0, false, false},
        {"greater than", fixed, {timeIs(Constraint::GreaterThan, 1000)}, kSuccess, 1001, 0, false, false},
        {"less than", fixed, {timeIs(Constraint::LessThan, 1000)}, kSuccess, 0, 999, false, false},
        {"equal", fixed, {timeIs(Constraint::Equal, 1000)}, kSuccess, 1000, 1000, false, false},
        {"not equal", fixed, {timeIs(Constraint::NotEqual, 1000)}, kInvalid, 0, 0, false, false},
        {"time that is no number", fixed, {timeIs(Constraint::LessThan, "soon")}, kInvalid, 0, 0, false, false},
        {"status", fixed, {typeIs(Constraint::Equal, 4)}, kSuccess, 0, 0, true, false},
        {"photos", fixed, {typeIs(Constraint::Equal, 5)}, kSuccess, 0, 0, false, true},
        {"both and an unknown kind", fixed, {typeIs(Constraint::InList, Vector<int>{9, 5, 4})}, kSuccess, 0, 0, true, true},
        {"a kind the stream lacks", fixed, {typeIs(Constraint::Equal, 2)}, kNotSupported, 0, 0, false, false},
        {"other comparison on the kind is passed over", fixed, {typeIs(Constraint::GreaterThan, 4)}, kSuccess, 0, 0,
         false, false},
        {"another key", fixed, {where("core_event_text", TRELM_TYPES::STRING, "x", Constraint::Equal)}, kInvalid, 0, 0,
         false, false},
    };
    for (Case const& c : cases) {
        SCOPED_TRACE(c.name);
        SmartPtr<FStreamCursor> cursor = stream(c.constraints, 75, c.ordering);
        EXPECT_CODE(cursor->start(), c.code);
        if (c.code != kSuccess) continue;
        EXPECT_EQ(cursor->startTime(), c.startTime);
        EXPECT_EQ(cursor->endTime(), c.endTime);
        EXPECT_EQ(cursor->includeStatus(), c.status);
        EXPECT_EQ(cursor->includePhoto(), c.photo);
    }
    EXPECT_TRUE(http.exchanges().empty()) << "starting asks the service nothing";
}

TEST_F(EventCursorTest, StreamRowsBecomeStatusAndPhotoRecordsWithNamesFromOneLookup) {
    http.queue(String(streamAnswer(statusPost("42_123", "42", 900) + photoPost("9_1_5", "9", 890) + photoPost("", "9", 880) +
                             linkPost("7_8", 870) + statusPost("777", "42", 860))));
    http.queue(String(users({{"42", "Ann"}, {"9", "Bo"}})));
    http.queue(String(streamAnswer("")));
    SmartPtr<FStreamCursor> cursor = stream({typeIs(Constraint::InList, Vector<int>{4, 5})});
    ASSERT_OK(cursor->start());

    // The owner prefix goes up to the first '_' only; posts without a photo id, and posts of
    // other kinds, are left out.
    std::vector<std::string> const expected = {
        "123 4 42 Ann Ann said 42_123 <none> <none>",
        "1_5 5 9 Bo Bo caption 9_1_5 http://p/9_1_5.jpg 9_1",
        "777 4 42 Ann Ann said 777 <none> <none>",
    };
    std::vector<std::string> seen;
    std::vector<GUID> guids;
    for (int moved = 1; moved == 1;) {
        RecordPtr row;
        ASSERT_OK(cursor->getRow(row));
        std::string summary;
        for (char const* key : {"core_event_serviceid", "core_object_type", "core_event_contactid", "core_event_contactname",
                                "core_event_contactfullname", "core_event_text", "core_event_uri",
                                "core_event_parent_serviceid"}) {
            summary += (summary.empty() ? "" : " ") + text(row, key);
        }
        seen.push_back(summary);
        EXPECT_EQ(text(row, "core_object_source"), "facebook");
        guids.push_back(row->search("core_object_id")->asGUID());
        ASSERT_OK(cursor->seek(1, moved));
    }
    EXPECT_EQ(seen, expected);
    GUID again;
    ASSERT_OK(cache->getGuid(cursor->tag(), {kServiceId.key, "1_5"}, false, again));
    EXPECT_EQ(again, guids[1]);

    // Both posts of author 42 list it: the ids are not de-duplicated.
    EXPECT_EQ(sent("facebook.fql.query", "query"),
              std::vector<std::string>{"select uid,name from user where uid in (42,9,42)"});
}

TEST_F(EventCursorTest, PhotoEventsOfOneSecondComeInTheQueryOrderNotTheServiceOrder) {
    // The service orders by time only: the three photos of second 500 arrive unsorted.
    http.queue(String(photos({{"1_2", 500}, {"1_3", 500}, {"1_1", 500}, {"123_456", 400}})));
    http.queue(String(users({{"5", "Di"}})));
    Vector<Column> const ordering{kTime, kService, kServiceId};
    Vector<Constraint> const constraints{typeIs(Constraint::Equal, 5), timeIs(Constraint::GreaterOrEqual, 300)};
    auto inner = makeSmart<PhotoEventCursor>(lib, cache, ordering, constraints, "facebook", true, true);
    auto cursor = makeSmart<PhotoEventWrappedCursor>(inner, lib, cache, ordering, constraints, "facebook", true);
    ASSERT_OK(cursor->start());

    std::vector<std::string> seen;
    int moved = 1;
    while (moved == 1) {
        RecordPtr row;
        ASSERT_OK(cursor->getRow(row));
        seen.push_back(text(row, "core_event_serviceid"));
        EXPECT_EQ(text(row, "core_event_contactname"), "Di");
        EXPECT_EQ(text(row, "core_event_contactfullname"), "<none>");
        ASSERT_OK(cursor->seek(1, moved));
    }
    // Descending service ids within the second; the photo id keeps its prefix.
    EXPECT_EQ(seen, (std::vector<std::string>{"1_3", "1_2", "1_1", "123_456"}));
}

}  // namespace
}  // namespace trelm::test
