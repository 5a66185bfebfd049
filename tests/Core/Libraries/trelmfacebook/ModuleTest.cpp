#include <cstdio>
#include <set>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "ErrorAssertions.h"

#include "ModuleHandle.h"
#include "trelm/Metadata.h"

using trelm::Component;
using trelm::String;
using trelm::TRELM_TYPES::TYPES;

namespace {

Component* foreignFactory(String) { return nullptr; }

// Into a table that already holds the module's identifiers (with other factories) and a foreign
// entry, and however often it is called: the module's two factories under their identifiers, the
// foreign entry left as it was. Into an empty table: ModuleOutOfMemoryTest's round without failure.
TEST(ModuleTest, TableGetsTheSourceAndTheConnectorAndOtherEntriesStay) {
    ModuleHandle module(TRELMFACEBOOK_MODULE);
    ASSERT_EQ(module.error(), "");
    char const* const kOther = "@other.example:/thing";
    ModuleHandle::Table table;
    for (char const* id : {kSourceId, kConnectorId, kOther}) ASSERT_OK(table.insert(id, &foreignFactory));
    for (int call = 0; call < 3; ++call) ASSERT_OK(module.getComponents(table)) << "call " << call;
    EXPECT_EQ(idsOf(table), (std::vector<std::string>{kOther, kConnectorId, kSourceId}));
    EXPECT_EQ(*table.search(kSourceId), module.sourceFactory);
    EXPECT_EQ(*table.search(kConnectorId), module.connectorFactory);
    EXPECT_EQ(*table.search(kOther), &foreignFactory);
}

TEST(ModuleTest, LoadingRegistersTheSixteenKeysWithTheirTypes) {
    ModuleHandle module(TRELMFACEBOOK_MODULE);
    ASSERT_EQ(module.error(), "");
    struct Expected {
        char const* name;
        TYPES type;
    };
    // Coordinates and the modification time are text keys on purpose; only the photo count is a
    // number.
    TYPES const text = trelm::TRELM_TYPES::STRING;
    Expected const keys[] = {{"facebook_media_owner_service_id", text},
                             {"facebook_media_album_service_id", text},
                             {"facebook_media_thumb_uri", text},
                             {"facebook_photo_tag_photo_service_id", text},
                             {"facebook_photo_tag_tagged_service_id", text},
                             {"facebook_photo_tag_x", text},
                             {"facebook_photo_tag_y", text},
                             {"facebook_photo_tag_text", text},
                             {"facebook_album_owner_service_id", text},
                             {"facebook_album_modified", text},
                             {"facebook_album_location", text},
                             {"facebook_album_link", text},
                             {"facebook_album_notes", text},
                             {"facebook_album_photocount", trelm::TRELM_TYPES::INT32},
                             {"facebook_album_cover_service_id", text},
                             {"facebook_album_type", text}};
    for (Expected const& key : keys) {
        TYPES type = trelm::TRELM_TYPES::NONE;
        EXPECT_OK(trelm::Metadata::getType(key.name, type)) << key.name;
        EXPECT_EQ(type, key.type) << key.name;
    }
}

// Anything else the module exported could bind a host's or another plug-in's symbol to the
// module's private copy.
TEST(ModuleExportsTest, OnlyTheThreeEntryPointsAreExported) {
    std::string command = std::string("nm -D --defined-only '") + TRELMFACEBOOK_MODULE + "'";
    FILE* pipe = popen(command.c_str(), "r");
    ASSERT_NE(pipe, nullptr);
    std::set<std::string> exported;
    char line[4096];
    while (std::fgets(line, sizeof line, pipe) != nullptr) {
        std::string text(line);
        while (!text.empty() && (text.back() == '\n' || text.back() == ' ')) text.pop_back();
        std::size_t space = text.rfind(' ');
        exported.insert(space == std::string::npos ? text : text.substr(space + 1));
    }
    ASSERT_EQ(pclose(pipe), 0) << command;
    EXPECT_EQ(exported,
              (std::set<std::string>{"getComponents", "FacebookSource_component", "FacebookConnector_component"}));
}

}  // namespace
