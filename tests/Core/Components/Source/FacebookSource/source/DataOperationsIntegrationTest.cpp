// Inserts and retrieval by GUID against the in-process emulator.
#include <gtest/gtest.h>

#include <filesystem>
#include <fstream>
#include <map>
#include <string>
#include <vector>

#include "EmulatorHost.h"
#include "ErrorAssertions.h"
#include "trelm/GUID.h"

namespace trelm::test {
namespace {

using Record = Map<String, Variant>;

std::string const kDemoUid = std::to_string(emu::DemoAccount::uid);

// The default data set; the source "facebook" is signed in as the demo user.
class DataOperationsIntegrationTest : public EmulatorSuite {
protected:
    static void SetUpTestSuite() { startSuite(); }
};
using RetrieveByGuidTest = DataOperationsIntegrationTest;

// Inserted items reach the service with the arguments their record gives, each optional one sent
// only when present; a new photo's id comes back into the record and the service holds the photo
// with that caption in that album; a status writes nothing back; a failed upload leaves the record
// without a service id.
TEST_F(DataOperationsIntegrationTest, InsertedItemsArePublishedAndNewPhotoIdsWrittenBack) {
    std::string const photo = ::testing::TempDir() + "trelm-source-photo.jpg";
    std::ofstream(photo, std::ios::binary) << std::string("\xff\xd8\xff\xe0 not really a picture", 26);
    std::string const album = host->fql("select aid from album where owner='" + kDemoUid + "'").at(0)["aid"];
    std::string const status = "reading about keyset paging";
    Record const upload{{"core_object_type", Variant(9)}, {"media_uri", Variant(String("file://" + photo))}};
    struct Case {
        char const* name;
        Record record;
        char const* method;
        std::map<std::string, std::string> args;  // "": must be absent
        unsigned code = kSuccess;
    };
    std::vector<Case> cases = {
        {"status", {{"core_object_type", Variant(4)}, {"core_event_text", Variant(status.c_str())}}, "users.setStatus",
         {{"status", status}, {"status_includes_verb", "1"}}},
        {"photo without caption or album", upload, "photos.upload", {{"caption", ""}, {"aid", ""}}},
        {"photo with caption and album", upload, "photos.upload", {{"caption", "at the sea"}, {"aid", album}}},
        {"photo into an album without caption", upload, "photos.upload", {{"caption", ""}, {"aid", album}}},
        {"photo whose upload fails", upload, "photos.upload", {}, kServiceUnavailable},
    };
    ASSERT_OK(cases[2].record.insert("media_notes", Variant("at the sea")));
    for (int i : {2, 3}) ASSERT_OK(cases[i].record.insert("facebook_media_album_service_id", Variant(String(album))));
    for (Case& c : cases) {
        SCOPED_TRACE(c.name);
        host->emulator().log().clear();
        if (c.code == kServiceUnavailable) {
            emu::FaultRule unavailable;
            unavailable.errorCode = 2;
            host->emulator().faults().set(c.method, unavailable);
        }
        EXPECT_CODE(source->insert(c.record), c.code);
        auto const calls = host->emulator().log().entriesFor(c.method);
        ASSERT_EQ(calls.size(), 1u);
        for (auto const& [key, value] : c.args) {
            EXPECT_EQ(calls[0].args.count(key) ? calls[0].args.at(key) : "", value) << key;
        }
        Variant const* id = c.record.search("core_service_id");
        if (c.code != kSuccess || c.record.search("core_event_text") != nullptr) {
            EXPECT_EQ(id, nullptr);
            continue;
        }
        ASSERT_NE(id, nullptr);
        auto const rows = host->fql("select caption, aid from photo where pid='" + id->asString().str() + "'");
        ASSERT_EQ(rows.size(), 1u);
        EXPECT_EQ(rows[0].at("caption"), c.args["caption"]);
        if (!c.args["aid"].empty()) {
            EXPECT_EQ(rows[0].at("aid"), album);
        }
    }
    std::filesystem::remove(photo);
}

// Records that listings of every kind produced come back by their GUID equal to the listed ones.
// Every listing stays open while every record it listed is fetched again, so that a GUID shared
// by two kinds (an album and a photo with the same service id, say) would show. The cursors then
// go one by one: a record goes with the last cursor that listed it (media is listed twice), and
// retrieval adds its keys to what the caller's record holds.
TEST_F(RetrieveByGuidTest, EveryListedRecordOfEveryKindComesBackEqualWhileACursorHoldingItLives) {
    struct Listing {
        char const* name;
        int type;
        Vector<IQueryItems::Column> ordering;
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
        {"messages", 10, events},
    };
    std::vector<EmulatorHost::Cursor> cursors;
    std::map<GUID, SmartPtr<Record>> listed;
    std::map<GUID, std::size_t> holder;  // the last listing that listed it
    for (std::size_t i = 0; i < listings.size(); ++i) {
        SCOPED_TRACE(listings[i].name);
        EmulatorHost::Cursor cursor = EmulatorHost::open(*source, listings[i].type, listings[i].ordering);
        ASSERT_TRUE(cursor);
        // What every record of this source carries whatever its kind.
        Record const common{{"core_object_type", Variant(listings[i].type)},
                            {"core_object_source", Variant("facebook")},
                            {"core_object_origin_importcomponent", Variant("facebook")},
                            {"core_object_origin_servicename", Variant("Facebook")},
                            {"core_object_deleted", Variant(false)}};
        int rows = 0;
        for (int moved = 1; rows < 20 && moved != 0; ++rows) {
            SmartPtr<Record> row;
            ASSERT_OK(cursor->getRow(row));
            for (auto const& [key, value] : common)
                EXPECT_EQ(row->search(key) ? *row->search(key) : Variant(), value) << key;
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
            if (holder[guid] < gone) {
                EXPECT_CODE(source->retrieve(guid, out, false), kNotFound);
                continue;
            }
            ASSERT_OK(source->retrieve(guid, out, false));
            Record expected = *row;
            ASSERT_OK(expected.insert("caller_key", Variant("kept")));
            EXPECT_EQ(out, expected);
        }
        if (gone < cursors.size()) cursors[gone].reset();
    }
}

}  // namespace
}  // namespace trelm::test
