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
std::string statusPost(std::string const& id, int time) {
    return "<stream_post><post_id>" + id + "</post_id><source_id>42</source_id><type>46</type><message>said</message>"
           "<attachment/><created_time>" + std::to_string(time) + "</created_time></stream_post>";
}
std::string mediaPost(char const* type, std::string const& photo, int time) {
    return "<stream_post><post_id>9_p" + std::to_string(time) + "</post_id><source_id>9</source_id><type>247</type>"
           "<attachment><media list=\"true\"><stream_media><href>h</href><alt>a</alt><type>" + type +
           "</type><src>s</src>" + photo + "</stream_media></media></attachment><created_time>" + std::to_string(time) +
           "</created_time></stream_post>";
}
String answer(std::string const& rows) { return String("<fql_query_response list=\"true\">" + rows + "</fql_query_response>"); }
String posts(std::string const& posts) {
    return String("<stream_get_response><posts list=\"true\">" + posts + "</posts></stream_get_response>");
}

// Each record's `keys`, blank-joined, with seek(1) until the cursor stops moving.
std::vector<std::string> walk(IQueryItems::ICursor& cursor, std::vector<char const*> const& keys) {
    std::vector<std::string> seen;
    for (int moved = 1; moved == 1;) {
        RecordPtr row;
        EXPECT_OK(cursor.getRow(row));
        std::string line;
        for (char const* key : keys) line += (line.empty() ? "" : " ") + (row ? row->search(key)->asString().str() : "?");
        seen.push_back(line);
        uError const err = cursor.seek(1, moved);
        EXPECT_OK(err);
        if (err.failed()) break;
    }
    return seen;
}

// Cursors over a signed-in client (user 42) whose requests are answered from the queue.
class EventCursorTest : public LibraryFixture {
protected:
    void SetUp() override {
        LibraryFixture::SetUp();
        signIn();
        ASSERT_OK(cache->setup());
    }

    SmartPtr<FStreamCursor> stream(Vector<Constraint> constraints, Vector<Column> ordering = {kTime, kService, kServiceId}) {
        return makeSmart<FStreamCursor>(lib, cache, ordering, constraints, "facebook", true, true);
    }

    SmartPtr<FacebookSource::MappingCache> cache = makeSmart<FacebookSource::MappingCache>();
};

TEST_F(EventCursorTest, StreamStartReadsBoundsAndKindsOrRefusesWithExactCode) {
    struct Case {
        char const* name;
        Vector<Column> ordering;
        Vector<Constraint> constraints;
        unsigned code;
        int startTime = 0, endTime = 0;
        bool status = false, photo = false;
    };
    Vector<Column> const fixed{kTime, kService, kServiceId};
    // clang-format off
    std::vector<Case> const cases = {
        {"no constraints asks for nothing", fixed, {}, kSuccess},
        {"ordering of two entries", {kTime, kService}, {}, kInvalid},
        {"time ascending", {column("core_object_time", TRELM_TYPES::INT32, true), kService, kServiceId}, {}, kInvalid},
        {"entries after the third are free",
         {kTime, kService, kServiceId, column("core_event_text", TRELM_TYPES::STRING, true)}, {}, kSuccess},
        {"greater than", fixed, {timeIs(Constraint::GreaterThan, 1000)}, kSuccess, 1001, 0},
        {"less than", fixed, {timeIs(Constraint::LessThan, 1000)}, kSuccess, 0, 999},
        {"equal", fixed, {timeIs(Constraint::Equal, 1000)}, kSuccess, 1000, 1000},
        {"not equal", fixed, {timeIs(Constraint::NotEqual, 1000)}, kInvalid},
        {"time that is no number", fixed, {timeIs(Constraint::LessThan, "soon")}, kInvalid},
        {"status", fixed, {typeIs(Constraint::Equal, 4)}, kSuccess, 0, 0, true, false},
        {"photos", fixed, {typeIs(Constraint::Equal, 5)}, kSuccess, 0, 0, false, true},
        {"both and an unknown kind", fixed, {typeIs(Constraint::InList, Vector<int>{9, 5, 4})}, kSuccess, 0, 0, true,
         true},
        {"a kind the stream lacks", fixed, {typeIs(Constraint::Equal, 2)}, kNotSupported},
        {"other comparison on the kind is passed over", fixed, {typeIs(Constraint::GreaterThan, 4)}, kSuccess},
        {"another key", fixed, {where("core_event_text", TRELM_TYPES::STRING, "x", Constraint::Equal)}, kInvalid},
    };
    // clang-format on
    for (Case const& c : cases) {
        SCOPED_TRACE(c.name);
        SmartPtr<FStreamCursor> cursor = stream(c.constraints, c.ordering);
        EXPECT_CODE(cursor->start(), c.code);
        if (c.code != kSuccess) continue;
        EXPECT_EQ(cursor->startTime(), c.startTime);
        EXPECT_EQ(cursor->endTime(), c.endTime);
        EXPECT_EQ(cursor->includeStatus(), c.status);
        EXPECT_EQ(cursor->includePhoto(), c.photo);
    }
    EXPECT_TRUE(http.exchanges().empty()) << "starting asks the service nothing";
}

// The owner prefix of an id goes up to the first '_' only; posts without a photo id, and posts
// of other kinds, are left out.
TEST_F(EventCursorTest, StreamKeepsStatusAndPhotoPostsWithTheIdAfterTheFirstUnderscore) {
    http.queue(posts(statusPost("42_123", 900) +
                      mediaPost("photo", "<photo><aid>9_1</aid><pid>9_1_5</pid><owner>9</owner></photo>", 890) +
                      mediaPost("photo", "", 880) + mediaPost("link", "", 870) + statusPost("777", 860)));
    http.queue(answer("<user><uid>42</uid><name>Ann</name></user><user><uid>9</uid><name>Bo</name></user>"));
    http.queue(posts(""));
    SmartPtr<FStreamCursor> cursor = stream({typeIs(Constraint::InList, Vector<int>{4, 5})});
    ASSERT_OK(cursor->start());
    EXPECT_EQ(walk(*cursor, {"core_event_serviceid", "core_object_type"}),
              (std::vector<std::string>{"123 4", "1_5 5", "777 4"}));
}

TEST_F(EventCursorTest, PhotoEventsOfOneSecondComeInTheQueryOrderNotTheServiceOrder) {
    // The service orders by time only: the three photos of second 500 arrive unsorted.
    std::string photos;
    for (auto const& [pid, time] : {std::pair{"1_2", 500}, {"1_3", 500}, {"1_1", 500}, {"123_456", 400}}) {
        photos += std::string("<photo><pid>") + pid + "</pid><aid>5_1</aid><owner>5</owner><src>s</src><caption>c</caption>"
                  "<created>" + std::to_string(time) + "</created></photo>";
    }
    http.queue(answer(photos));
    http.queue(answer("<user><uid>5</uid><name>Di</name></user>"));
    Vector<Column> const ordering{kTime, kService, kServiceId};
    Vector<Constraint> const constraints{typeIs(Constraint::Equal, 5), timeIs(Constraint::GreaterOrEqual, 300)};
    auto inner = makeSmart<PhotoEventCursor>(lib, cache, ordering, constraints, "facebook", true, true);
    auto cursor = makeSmart<PhotoEventWrappedCursor>(inner, lib, cache, ordering, constraints, "facebook", true);
    ASSERT_OK(cursor->start());
    // Descending service ids within the second; the photo id keeps its prefix.
    EXPECT_EQ(walk(*cursor, {"core_event_serviceid"}), (std::vector<std::string>{"1_3", "1_2", "1_1", "123_456"}));
}

}  // namespace
}  // namespace trelm::test
