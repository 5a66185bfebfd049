// Retrieval by GUID of records that listings of every kind produced, against the in-process
// emulator: each kind's records come back equal to the listed ones, and records of different
// kinds never answer for each other, even where the service's ids of two kinds coincide. The
// message cursor gives its records GUIDs but keeps the records to itself: they are not found.
#include <gtest/gtest.h>

#include <map>
#include <string>
#include <vector>

#include "EmulatorHost.h"
#include "ErrorAssertions.h"
#include "IQueryItems.h"
#include "trelm/GUID.h"

namespace trelm::test {
namespace {

using Constraint = IQueryItems::Constraint;
using Cursor = SmartPtr<IQueryItems::ICursor>;
using Record = Map<String, Variant>;

// One listing per kind, with what its cursor needs (an ordering, the background flag).
struct Listing {
    char const* name;
    int type;
    std::vector<IQueryItems::Column> ordering;
    bool interactive = true;
    bool retrievable = true;
};

IQueryItems::Column const kTime{Metadata::Key("core_object_time", TRELM_TYPES::INT32), false};
Metadata::Key const kService("core_event_service", TRELM_TYPES::STRING);
Metadata::Key const kServiceId("core_event_serviceid", TRELM_TYPES::STRING);
std::vector<IQueryItems::Column> const kEventOrdering{kTime, {kService, false}, {kServiceId, false}};

std::vector<Listing> const kListings = {
    {"contacts", 2, {}},
    {"status posts", 4, kEventOrdering},
    {"photo events", 5, kEventOrdering},
    {"friend requests", 12, {{kService, true}, {kServiceId, true}}},
    {"media", 9, {}},
    {"albums", 11, {}},
    {"photo tags", 13, {}},
    {"media in the background", 9, {}, false},
    {"messages", 10, kEventOrdering, true, false},
};

Cursor open(FacebookSource& source, Listing const& listing) {
    IQueryItems::StartQueryMessage msg(
        Vector<IQueryItems::Column>{std::vector<IQueryItems::Column>(listing.ordering)},
        Vector<Constraint>{{Metadata::Key("core_object_type", TRELM_TYPES::INT32), listing.type}});
    msg.interactive = listing.interactive;
    EXPECT_OK(source.onMessage(msg));
    return msg.cursor;
}

// Every listing stays open while every record it listed is fetched again, so that a GUID shared
// by two kinds (an album and a photo with the same service id, say) would show.
TEST(RetrieveByGuidTest, EveryListedRecordOfEveryKindComesBackEqualWhileItsCursorLives) {
    EmulatorHost host;
    std::string error;
    ASSERT_TRUE(host.start(error)) << error;
    FacebookSource& source = host.addSource(host.demoGroup("facebook", true));

    std::vector<Cursor> cursors;
    std::map<GUID, SmartPtr<Record>> listed;
    std::map<GUID, Listing const*> kindOf;
    for (Listing const& listing : kListings) {
        SCOPED_TRACE(listing.name);
        Cursor cursor = open(source, listing);
        ASSERT_TRUE(cursor);
        int rows = 0;
        for (int moved = 1; rows < 20 && moved != 0; ++rows) {
            SmartPtr<Record> row;
            ASSERT_OK(cursor->getRow(row));
            // The same object listed twice (the two media listings) keeps its GUID and record.
            auto const [at, fresh] = listed.emplace(row->search("core_object_id")->asGUID(), row);
            kindOf.emplace(at->first, &listing);
            EXPECT_TRUE(fresh || *at->second == *row);
            ASSERT_TRUE(cursor->seek(1, moved).ok());
        }
        EXPECT_GT(rows, 1);
        cursors.push_back(cursor);
    }

    for (auto const& [guid, row] : listed) {
        SCOPED_TRACE(std::string(kindOf[guid]->name) + " " + guid.toString().str());
        Record out;
        if (!kindOf[guid]->retrievable) {
            EXPECT_CODE(source.retrieve(guid, out, false), kNotFound);
            continue;
        }
        ASSERT_OK(source.retrieve(guid, out, false));
        EXPECT_EQ(out, *row);
    }

    // Once the cursors are gone their records are too.
    cursors.clear();
    for (auto const& [guid, row] : listed) {
        Record out;
        EXPECT_CODE(source.retrieve(guid, out, false), kNotFound);
    }
}

}  // namespace
}  // namespace trelm::test
