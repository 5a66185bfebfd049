#include "EventWalk.h"

#include <gtest/gtest.h>

#include "ErrorAssertions.h"

namespace trelm::test {

std::ostream& operator<<(std::ostream& os, EventRow const& row) {
    return os << "{type " << row.type << ", id " << row.id << ", time " << row.time << "}";
}

Vector<IQueryItems::Column> eventOrdering() {
    return Vector<IQueryItems::Column>{
        {Metadata::Key("core_object_time", TRELM_TYPES::INT32), false},
        {Metadata::Key("core_event_service", TRELM_TYPES::STRING), false},
        {Metadata::Key("core_event_serviceid", TRELM_TYPES::STRING), false},
    };
}

IQueryItems::Constraint typeIn(std::initializer_list<int> types) {
    return IQueryItems::Constraint{Metadata::Key("core_object_type", TRELM_TYPES::INT32),
                                   Variant(Vector<int>(types)), IQueryItems::Constraint::InList};
}

std::vector<EventRow> walkEvents(IQueryItems::ICursor& cursor,
                                 std::function<void(EventRow const& previous)> const& afterSeek) {
    std::vector<EventRow> rows;
    EXPECT_OK(cursor.jumpBeginning());
    while (true) {
        SmartPtr<Map<String, Variant>> record;
        uError err = cursor.getRow(record);
        EXPECT_OK(err);
        if (err.failed() || err.code() == kNoData || !record) break;
        auto text = [&](char const* key) {
            Variant const* v = record->search(key);
            return v ? v->asString().str() : std::string();
        };
        EventRow row = EventRow::of(record->search("core_object_type")->asInt32(), text("core_event_serviceid"),
                                    record->search("core_object_time")->asInt32());
        row.author = text("core_event_contactid");
        row.authorName = text("core_event_contactname");
        row.guid = text("core_object_id");
        rows.push_back(row);
        int moved = 0;
        err = cursor.seek(1, moved);
        EXPECT_OK(err);
        if (afterSeek) afterSeek(rows.back());
        if (err.failed() || moved <= 0) break;
    }
    return rows;
}

}  // namespace trelm::test
