// Retrieval by GUID of records that listings of every kind produced, against the in-process
// emulator: each kind's records come back equal to the listed ones, and records of different
// kinds never answer for each other, even where the service's ids of two kinds coincide.
#include <gtest/gtest.h>

#include <cstdint>
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

constexpr char const* kSourceName = "facebook";

// One listing: the kind it asks for and how. A kind whose cursor needs an ordering or the
// background flag says so here.
struct Listing {
    char const* name;
    std::vector<int> types;  // "core_object_type": one value, or the list for kinds served together
    std::vector<IQueryItems::Column> ordering;
    bool interactive = true;
};

std::vector<Listing> listings() {
    return {
        {"contacts", {2}, {}},
        {"media", {9}, {}},
        {"albums", {11}, {}},
        {"photo tags", {13}, {}},
        {"media in the background", {9}, {}, false},
    };
}

Cursor open(FacebookSource& source, Listing const& listing) {
    Constraint type{Metadata::Key("core_object_type", TRELM_TYPES::INT32), Variant(listing.types[0]),
                    Constraint::Equal};
    if (listing.types.size() > 1) {
        type.function = Constraint::InList;
        type.value = Variant(Vector<int>{std::vector<int>(listing.types)});
    }
    IQueryItems::StartQueryMessage msg(Vector<IQueryItems::Column>{std::vector<IQueryItems::Column>(listing.ordering)},
                                       Vector<Constraint>{type});
    msg.interactive = listing.interactive;
    EXPECT_OK(source.onMessage(msg));
    return msg.cursor;
}

class RetrieveByGuidTest : public ::testing::Test {
protected:
    static void SetUpTestSuite() {
        host = new EmulatorHost();
        std::string error;
        ASSERT_TRUE(host->start(error)) << error;
        source = &host->addSource(host->demoGroup(kSourceName, true));
    }
    static void TearDownTestSuite() {
        delete host;
        host = nullptr;
    }

    static EmulatorHost* host;
    static FacebookSource* source;
};

EmulatorHost* RetrieveByGuidTest::host = nullptr;
FacebookSource* RetrieveByGuidTest::source = nullptr;

// Every listing stays open while every record it listed is fetched again, so that a GUID shared
// by two kinds (an album and a photo with the same service id, say) would show.
TEST_F(RetrieveByGuidTest, EveryListedRecordOfEveryKindComesBackEqualWhileItsCursorLives) {
    std::vector<Cursor> cursors;
    std::map<GUID, SmartPtr<Record>> listed;
    std::map<std::string, int> perKind;
    for (Listing const& listing : listings()) {
        SCOPED_TRACE(listing.name);
        Cursor cursor = open(*source, listing);
        ASSERT_TRUE(cursor);
        int moved = 1;
        for (int i = 0; i < 20 && moved != 0; ++i) {
            SmartPtr<Record> row;
            ASSERT_OK(cursor->getRow(row));
            GUID const guid = row->search("core_object_id")->asGUID();
            auto const [at, fresh] = listed.emplace(guid, row);
            if (!fresh) {
                // The same object listed twice (the two media listings) keeps its GUID and record.
                EXPECT_EQ(*at->second, *row);
            }
            ++perKind[listing.name];
            ASSERT_TRUE(cursor->seek(1, moved).ok());
        }
        cursors.push_back(cursor);
    }
    for (Listing const& listing : listings()) EXPECT_GT(perKind[listing.name], 1) << listing.name;

    for (auto const& [guid, row] : listed) {
        SCOPED_TRACE(guid.toString().str());
        Record out;
        ASSERT_OK(source->retrieve(guid, out, false));
        EXPECT_EQ(out, *row);
    }

    // Once the cursors are gone their records are too.
    cursors.clear();
    for (auto const& [guid, row] : listed) {
        Record out;
        EXPECT_CODE(source->retrieve(guid, out, false), kNotFound);
    }
}

}  // namespace
}  // namespace trelm::test
