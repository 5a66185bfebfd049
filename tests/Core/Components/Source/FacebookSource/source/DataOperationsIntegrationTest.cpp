#include <gtest/gtest.h>

#include <algorithm>
#include <filesystem>
#include <fstream>
#include <map>
#include <string>
#include <vector>

#include "EmulatorHost.h"
#include "ErrorAssertions.h"

namespace trelm::test {
namespace {

using Record = Map<String, Variant>;

std::string const kDemoUid = std::to_string(emu::DemoAccount::uid);

// Inserted items reach the service with the arguments their record gives, each optional one sent
// only when present; a new photo's id comes back into the record and the service holds the photo
// with that caption in that album; a status writes nothing back; a failed upload leaves the record
// without a service id.
TEST(DataOperationsIntegrationTest, InsertedItemsArePublishedAndNewPhotoIdsWrittenBack) {
    EmulatorHost host;
    std::string error;
    ASSERT_TRUE(host.start(error)) << error;
    FacebookSource& source = host.addSource(host.demoGroup("facebook", true));
    std::string const photo = ::testing::TempDir() + "trelm-source-photo.jpg";
    std::ofstream(photo, std::ios::binary) << std::string("\xff\xd8\xff\xe0 not really a picture", 26);
    std::string const album = host.fqlColumn("select aid from album where owner='" + kDemoUid + "'", "album", "aid").at(0);
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
        {"photo whose upload fails", upload, "photos.upload", {}, kServiceUnavailable},
    };
    ASSERT_OK(cases[2].record.insert("media_notes", Variant("at the sea")));
    ASSERT_OK(cases[2].record.insert("facebook_media_album_service_id", Variant(String(album))));
    for (Case& c : cases) {
        SCOPED_TRACE(c.name);
        host.emulator().log().clear();
        if (c.code == kServiceUnavailable) {
            emu::FaultRule unavailable;
            unavailable.errorCode = 2;
            host.emulator().faults().set(c.method, unavailable);
        }
        EXPECT_CODE(source.insert(c.record), c.code);
        auto const calls = host.emulator().log().entriesFor(c.method);
        ASSERT_EQ(calls.size(), 1u);
        for (auto const& [key, value] : c.args) {
            EXPECT_EQ(calls[0].args.count(key) ? calls[0].args.at(key) : "", value) << key;
        }
        Variant const* id = c.record.search("core_service_id");
        if (c.code != kSuccess || c.record.search("core_event_text") != nullptr) {
            EXPECT_EQ(id, nullptr);
            continue;
        }
        EXPECT_TRUE(calls[0].hadFile);
        EXPECT_EQ(calls[0].fileSize, std::filesystem::file_size(photo));
        ASSERT_NE(id, nullptr);
        auto const rows = host.fqlRows("select caption, aid from photo where pid='" + id->asString().str() + "'", "photo");
        ASSERT_EQ(rows.size(), 1u);
        EXPECT_EQ(rows[0].at("caption"), c.args["caption"]);
        if (!c.args["aid"].empty()) {
            EXPECT_EQ(rows[0].at("aid"), album);
        }
    }
    std::filesystem::remove(photo);
    auto const posts = host.fqlColumn("select message from stream where source_id='" + kDemoUid + "'", "stream", "message");
    EXPECT_NE(std::find(posts.begin(), posts.end(), status), posts.end()) << "the status is in the stream";
}

}  // namespace
}  // namespace trelm::test
