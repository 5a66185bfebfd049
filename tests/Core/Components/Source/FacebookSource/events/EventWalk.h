#pragma once

#include <functional>
#include <initializer_list>
#include <ostream>
#include <string>
#include <utility>
#include <vector>

#include "IQueryItems.h"

namespace trelm::test {

// One record of the stream or photo-event cursors, compared by kind, service id and time.
struct EventRow {
    int type = 0;
    std::string id;
    int time = 0;
    std::string author;      // "core_event_contactid"
    std::string authorName;  // "core_event_contactname"
    std::string guid;

    static EventRow of(int type, std::string id, int time) {
        EventRow row;
        row.type = type;
        row.id = std::move(id);
        row.time = time;
        return row;
    }
    friend bool operator==(EventRow const& a, EventRow const& b) {
        return a.type == b.type && a.id == b.id && a.time == b.time;
    }
};
std::ostream& operator<<(std::ostream& os, EventRow const& row);

// The ordering the event cursors serve (time, service, service id, all descending) and the
// kinds a query asks for.
Vector<IQueryItems::Column> eventOrdering();
IQueryItems::Constraint typeIn(std::initializer_list<int> types);

// Reads `cursor` from its beginning with getRow and seek(1) until it stops moving. `afterSeek`
// is called after every seek with the row read before it.
std::vector<EventRow> walkEvents(IQueryItems::ICursor& cursor,
                                 std::function<void(EventRow const& previous)> const& afterSeek = {});

}  // namespace trelm::test
