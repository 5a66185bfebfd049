// trelm-host's listings of status posts and photo events, run as a user runs them against the
// host's own embedded emulator. The expected records are read from a store generated here with
// the same (default) generator options, which holds the same data.
#include <algorithm>
#include <map>
#include <string>
#include <vector>

#include <gtest/gtest.h>
#include <nlohmann/json.hpp>

#include "EmulatorRows.h"
#include "ProgramRunner.h"
#include "Store.h"
#include "XmlNode.h"
#include "trelm/FStreamParseObj.h"

using nlohmann::json;

namespace {

using Row = emu::test::Row;
using Expected = std::map<std::string, json>;  // keys a listed record must show, with their values

std::string const kDemoUid = std::to_string(emu::DemoAccount::uid);

class HostEventQueryTest : public ::testing::Test {
protected:
    static void SetUpTestSuite() {
        std::string error;
        store = emu::Store::open(":memory:", error).release();
        ASSERT_NE(store, nullptr) << error;
        ASSERT_FALSE(store->generate(emu::GeneratorOptions()).has_value());
    }
    static void TearDownTestSuite() {
        delete store;
        store = nullptr;
    }

    static std::vector<Row> fql(std::string const& query) { return emu::test::fqlRows(*store, emu::DemoAccount::uid, query); }
    static std::string nameOf(std::string const& uid) { return fql("select name from user where uid = " + uid).at(0)["name"]; }

    // The first five status posts of the stream from `endTime` down (0: the newest).
    static std::vector<Expected> statuses(int endTime) {
        emu::XmlNode root("stream_get_response");
        EXPECT_FALSE(store->streamGet(emu::DemoAccount::uid, kDemoUid, "0", std::to_string(endTime), "100", root));
        trelm::Vector<trelm::Map<trelm::String, trelm::String>> rows;
        unsigned total = 0;
        EXPECT_TRUE(trelm::FStreamParseObj().parse(emu::renderDocument(root), rows, total).ok());
        std::vector<Expected> out;
        for (auto const& row : rows) {
            if (!row.contains("is_status") || out.size() == 5) continue;
            auto field = [&](char const* name) { return row.search(name)->str(); };
            std::string const id = field("post_id");
            out.push_back({{"core_object_type", 4}, {"core_event_serviceid", id.substr(id.find('_') + 1)},
                           {"core_object_time", std::stoi(field("created_time"))}, {"core_event_text", field("message")},
                           {"core_event_contactid", field("source_id")},
                           {"core_event_contactname", nameOf(field("source_id"))},
                           {"core_event_contactfullname", nameOf(field("source_id"))}});
        }
        return out;
    }

    // The first five of the friends' photos from `endTime` down, newest first, then by id.
    static std::vector<Expected> photos(int endTime) {
        std::vector<Row> rows = fql(
            "select pid,aid,owner,src,caption,created from photo where aid in (select aid from album where owner in "
            "(select uid2 from friend where uid1='" + kDemoUid + "')) and created <= " + std::to_string(endTime));
        std::sort(rows.begin(), rows.end(), [](Row const& a, Row const& b) {
            return std::make_pair(std::stoi(a.at("created")), a.at("pid")) > std::make_pair(std::stoi(b.at("created")), b.at("pid"));
        });
        std::vector<Expected> out;
        for (std::size_t i = 0; i < std::min<std::size_t>(5, rows.size()); ++i) {
            Row& row = rows[i];
            out.push_back({{"core_object_type", 5}, {"core_event_serviceid", row["pid"]},
                           {"core_object_time", std::stoi(row["created"])}, {"core_event_text", row["caption"]},
                           {"core_event_parent_serviceid", row["aid"]}, {"core_event_uri", row["src"]},
                           {"core_event_contactid", row["owner"]}, {"core_event_contactname", nameOf(row["owner"])}});
        }
        return out;
    }

    // Runs the host, which must succeed.
    ProgramRunner::Result host(std::vector<std::string> const& command) {
        std::vector<std::string> args{"--format", "json", "--state-dir", runner_.folder() + "/state",
                                      "--config", TRELM_DEMO_CONFIG, "--plugin", TRELMFACEBOOK_MODULE};
        args.insert(args.end(), command.begin(), command.end());
        ProgramRunner::Result result = runner_.run(TRELM_HOST_PROGRAM, args);
        EXPECT_EQ(result.exitCode, 0) << result.err;
        return result;
    }

    static emu::Store* store;
    ProgramRunner runner_;
};

emu::Store* HostEventQueryTest::store = nullptr;

TEST_F(HostEventQueryTest, StatusAndPhotoListingsShowTheEmulatorsPostsAndPhotos) {
    std::string const recent = "core_object_time<=1277000000";  // within the generated half year
    struct Case {
        std::vector<std::string> command;
        std::vector<Expected> expected;
    };
    std::vector<Case> const cases = {
        {{"query", "status", "--limit", "5"}, statuses(0)},
        {{"query", "photos", "--limit", "5"}, photos(2000000000)},
        {{"query", "status", "--limit", "5", "--where", recent}, statuses(1277000000)},
        {{"query", "photos", "--limit", "5", "--where", recent}, photos(1277000000)},
    };
    for (Case const& c : cases) {
        SCOPED_TRACE(c.command[1] + " " + c.command.back());
        ASSERT_EQ(c.expected.size(), 5u);
        std::vector<json> records = linesOfType(host(c.command), "record");
        ASSERT_EQ(records.size(), 5u);
        for (std::size_t i = 0; i < records.size(); ++i) {
            for (auto const& [key, value] : c.expected[i]) {
                EXPECT_EQ(records[i]["fields"][key], value) << "record " << i + 1 << ", " << key;
            }
            EXPECT_EQ(records[i]["fields"]["core_event_service"], "Facebook");
        }
    }
}

// Every run of the host starts a fresh emulator, which refuses the session the run before
// stored. The stream cursor answers such a refusal as an empty stream; the host still notices
// and signs in again.
TEST_F(HostEventQueryTest, SessionRefusedWhileReadingTheStreamIsRenewed) {
    ASSERT_EQ(linesOfType(host({"query", "status", "--limit", "1"}), "record").size(), 1u);
    std::vector<std::string> types;
    for (std::string const& text : host({"query", "status", "--limit", "2"}).outLines()) {
        json const line = json::parse(text);
        if (line["type"] != "component") types.push_back(line["type"].get<std::string>() + " " + line.value("session", ""));
    }
    EXPECT_EQ(types, (std::vector<std::string>{"plugin ", "endpoint ", "login stored", "login new", "record ", "record ",
                                               "listed "}));
}

}  // namespace
