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
#include "trelm/GUID.h"

namespace trelm::test {
namespace {

using Record = EmulatorHost::Record;

// Every listing stays open while every record it listed is fetched again, so that a GUID shared
// by two kinds (an album and a photo with the same service id, say) would show. The cursors then
// go one by one: a record goes with the last cursor that listed it (media is listed twice), and
// retrieval adds its keys to what the caller's record holds.
TEST(RetrieveByGuidTest, EveryListedRecordOfEveryKindComesBackEqualWhileACursorHoldingItLives) {
    EmulatorHost host;
    std::string error;
    ASSERT_TRUE(host.start(error)) << error;
    FacebookSource& source = host.addSource(host.demoGroup("facebook", true));

    struct Listing {
        char const* name;
        int type;
        Vector<IQueryItems::Column> ordering;
        bool retrievable = true;
    };
    Vector<IQueryItems::Column> const events = EmulatorHost::eventOrdering();
    std::vector<Listing> const listings = {
        {"contacts", 2, {}},
        {"status posts", 4, events},
        {"photo events", 5, events},
        {"friend requests", 12, {{events[1].key, true}, {events[2].key, true}}},
        {"media", 9, {}},
        {"albums", 11, {}},
        {"photo tags", 13, {}},
        {"media again", 9, {}},
        {"messages", 10, events, false},
    };
    std::vector<EmulatorHost::Cursor> cursors;
    std::map<GUID, SmartPtr<Record>> listed;
    std::map<GUID, std::size_t> holder;  // the last listing that listed it
    for (std::size_t i = 0; i < listings.size(); ++i) {
        SCOPED_TRACE(listings[i].name);
        EmulatorHost::Cursor cursor = EmulatorHost::open(source, listings[i].type, listings[i].ordering);
        ASSERT_TRUE(cursor);
        int rows = 0;
        for (int moved = 1; rows < 20 && moved != 0; ++rows) {
            SmartPtr<Record> row;
            ASSERT_OK(cursor->getRow(row));
            // The same object listed twice keeps its GUID and record.
            auto const [at, fresh] = listed.emplace(row->search("core_object_id")->asGUID(), row);
            holder[at->first] = i;
            EXPECT_TRUE(fresh || *at->second == *row);
            ASSERT_TRUE(cursor->seek(1, moved).ok());
        }
        EXPECT_GT(rows, 1);
        cursors.push_back(cursor);
    }

    for (std::size_t gone = 0; gone <= cursors.size(); ++gone) {
        for (auto const& [guid, row] : listed) {
            Listing const& listing = listings[holder[guid]];
            SCOPED_TRACE(std::string(listing.name) + " " + guid.toString().str() + ", cursors gone: " + std::to_string(gone));
            Record out{{"caller_key", Variant("kept")}};
            if (!listing.retrievable || holder[guid] < gone) {
                EXPECT_CODE(source.retrieve(guid, out, false), kNotFound);
                continue;
            }
            ASSERT_OK(source.retrieve(guid, out, false));
            Record expected = *row;
            ASSERT_OK(expected.insert("caller_key", Variant("kept")));
            EXPECT_EQ(out, expected);
        }
        if (gone < cursors.size()) cursors[gone].reset();
    }
}

}  // namespace
}  // namespace trelm::test
