#include <gtest/gtest.h>

#include "ErrorAssertions.h"

#include <algorithm>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <string>
#include <vector>

#include "EmulatorHost.h"
#include "IQueryItems.h"

namespace trelm::test {
namespace {

using Record = Map<String, Variant>;

std::string const kDemoUid = std::to_string(emu::DemoAccount::uid);

class DataOperationsIntegrationTest : public EmulatorSuite {
protected:
    static void SetUpTestSuite() {
        startSuite();
        char pattern[] = "/tmp/trelm-source-test-XXXXXX";
        ASSERT_NE(mkdtemp(pattern), nullptr);
        directory = pattern;
        photo = directory + "/holiday photo.jpg";
        std::ofstream(photo, std::ios::binary) << std::string("\xff\xd8\xff\xe0 not really a picture", 26);
    }
    static void TearDownTestSuite() {
        std::filesystem::remove_all(directory);
        EmulatorSuite::TearDownTestSuite();
    }
    void SetUp() override {
        EmulatorSuite::SetUp();
        host->emulator().faults().clearAll();
    }

    static SmartPtr<IQueryItems::ICursor> openContacts() { return EmulatorHost::open(*source, 2); }

    static inline std::string directory;
    static inline std::string photo;
};

TEST_F(DataOperationsIntegrationTest, InsertedStatusIsPostedAndAppearsInTheStream) {
    std::string const text = "reading about keyset paging";
    Record status{{"core_object_type", Variant(4)}, {"core_event_text", Variant(text.c_str())}};
    uError err = source->insert(status);
    ASSERT_OK(err);

    auto calls = host->emulator().log().entriesFor("users.setStatus");
    ASSERT_EQ(calls.size(), 1u);
    EXPECT_EQ(calls[0].args.at("status"), text);
    EXPECT_EQ(calls[0].args.at("status_includes_verb"), "1");
    EXPECT_EQ(status.search("core_service_id"), nullptr) << "nothing is written back for a status";

    std::vector<std::string> messages =
        host->fqlColumn("select message from stream where source_id='" + kDemoUid + "'", "stream", "message");
    EXPECT_NE(std::find(messages.begin(), messages.end(), text), messages.end());
}

// Optional caption and album: each present or absent, sent only when present; the new photo's id
// comes back into the record and the service holds the photo with that caption in that album.
TEST_F(DataOperationsIntegrationTest, InsertedPhotoIsUploadedAndItsIdWrittenBack) {
    std::vector<std::string> const albums =
        host->fqlColumn("select aid from album where owner='" + kDemoUid + "'", "album", "aid");
    ASSERT_FALSE(albums.empty());
    struct Case {
        char const* name;
        char const* caption;  // null: no "media_notes"
        bool intoAlbum;       // "facebook_media_album_service_id" = an album of the user
    };
    Case const cases[] = {
        {"neither caption nor album", nullptr, false},
        {"caption only", "at the lake", false},
        {"album only", nullptr, true},
        {"caption and album", "at the sea", true},
    };
    for (Case const& c : cases) {
        SCOPED_TRACE(c.name);
        host->emulator().log().clear();
        Record media{{"core_object_type", Variant(9)}, {"media_uri", Variant(String("file://" + photo))}};
        if (c.caption != nullptr) {
            ASSERT_OK(media.insert("media_notes", Variant(c.caption)));
        }
        if (c.intoAlbum) {
            ASSERT_OK(media.insert("facebook_media_album_service_id", Variant(String(albums[0]))));
        }
        uError err = source->insert(media);
        ASSERT_OK(err);

        auto uploads = host->emulator().log().entriesFor("photos.upload");
        ASSERT_EQ(uploads.size(), 1u);
        EXPECT_TRUE(uploads[0].hadFile);
        EXPECT_EQ(uploads[0].fileSize, std::filesystem::file_size(photo));
        EXPECT_EQ(uploads[0].args.count("caption"), c.caption ? 1u : 0u);
        EXPECT_EQ(uploads[0].args.count("aid"), c.intoAlbum ? 1u : 0u);

        Variant const* id = media.search("core_service_id");
        ASSERT_NE(id, nullptr);
        std::string const pid = id->asString().str();
        ASSERT_FALSE(pid.empty());
        std::string const where = " from photo where pid='" + pid + "'";
        EXPECT_EQ(host->fqlColumn("select caption" + where, "photo", "caption"),
                  std::vector<std::string>{c.caption ? c.caption : ""});
        if (c.intoAlbum) {
            EXPECT_EQ(host->fqlColumn("select aid" + where, "photo", "aid"), std::vector<std::string>{albums[0]});
        }
    }
}

TEST_F(DataOperationsIntegrationTest, FailedUploadLeavesTheRecordWithoutServiceId) {
    emu::FaultRule unavailable;
    unavailable.errorCode = 2;
    host->emulator().faults().set("photos.upload", unavailable);
    Record media{{"core_object_type", Variant(9)}, {"media_uri", Variant(String(photo))}};
    EXPECT_CODE(source->insert(media), kServiceUnavailable);
    EXPECT_EQ(media.search("core_service_id"), nullptr);
}

// A record stays retrievable by its GUID while some cursor that produced it is alive.
TEST_F(DataOperationsIntegrationTest, RetrieveFindsListedRecordsUntilTheLastCursorHoldingThemIsGone) {
    SmartPtr<IQueryItems::ICursor> first = openContacts();
    SmartPtr<IQueryItems::ICursor> second = openContacts();
    SmartPtr<Record> row;
    ASSERT_OK(first->getRow(row));
    SmartPtr<Record> same;
    ASSERT_OK(second->getRow(same));
    GUID const guid = row->search("core_object_id")->asGUID();
    ASSERT_EQ(same->search("core_object_id")->asGUID(), guid) << "one GUID per friend while both cursors live";

    Record out{{"caller_key", Variant("kept")}};
    uError err = source->retrieve(guid, out, false);
    ASSERT_OK(err);
    for (auto const& [key, value] : *row) EXPECT_EQ(*out.search(key), value) << key;
    EXPECT_EQ(out.search("caller_key")->asString(), "kept");
    EXPECT_EQ(out.size(), row->size() + 1);

    first.reset();
    Record again;
    EXPECT_OK(source->retrieve(guid, again, false)) << "the second cursor still holds it";
    second.reset();
    Record gone;
    EXPECT_CODE(source->retrieve(guid, gone, false), kNotFound);
    EXPECT_TRUE(gone.empty());
}

}  // namespace
}  // namespace trelm::test
