// trelm-host's listings of status posts and photo events, run as a user runs them against the
// host's own embedded emulator. The expected records are read from a store generated here with
// the same (default) generator options, which holds the same data.
#include <algorithm>
#include <map>
#include <memory>
#include <string>
#include <vector>

#include <gtest/gtest.h>
#include <nlohmann/json.hpp>

#include "ProgramRunner.h"
#include "Store.h"
#include "XmlNode.h"
#include "trelm/FStreamParseObj.h"

using nlohmann::json;

namespace {

using Row = std::map<std::string, std::string>;

std::string const kDemoUid = std::to_string(emu::DemoAccount::uid);

std::string config() {
    json config = {
        {"components",
         json::array({{{"name", "facebook"},
                       {"id", "@trelm.example:/facebooksource"},
                       {"config",
                        {{"facebook_source_appkey", emu::DemoAccount::apiKey},
                         {"facebook_source_appsecret", emu::DemoAccount::appSecret},
                         {"facebook_source_login", emu::DemoAccount::email},
                         {"facebook_source_password", emu::DemoAccount::password},
                         {"wipeComponents", json::array()},
                         {"wakeupComponents", json::array()},
                         {"haveExtendedApi", true}}}}})}};
    return config.dump(2);
}

std::string withoutOwner(std::string const& id) {
    std::size_t const underscore = id.find('_');
    return underscore == std::string::npos ? id : id.substr(underscore + 1);
}

// One expected record: the keys a listing must show, and their values.
using Expected = std::map<std::string, json>;

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

    static std::vector<Row> fql(std::string const& query) {
        emu::XmlNode root("fql_query_response");
        emu::Status status = store->fqlQuery(emu::DemoAccount::uid, query, root);
        EXPECT_FALSE(status.has_value()) << query << ": " << status->message;
        std::vector<Row> rows;
        for (emu::XmlNode const& element : root.children) {
            Row row;
            for (emu::XmlNode const& field : element.children) row[field.name] = field.text;
            rows.push_back(row);
        }
        return rows;
    }

    static std::string nameOf(std::string const& uid) {
        std::vector<Row> rows = fql("select name from user where uid = " + uid);
        return rows.empty() ? "" : rows[0]["name"];
    }

    // The stream's status posts from `endTime` down (0: the newest), as the service answers it.
    static std::vector<Expected> statuses(int endTime, std::size_t count) {
        emu::XmlNode root("stream_get_response");
        EXPECT_FALSE(store->streamGet(emu::DemoAccount::uid, kDemoUid, "0", std::to_string(endTime), "1000", root)
                         .has_value());
        trelm::Vector<trelm::Map<trelm::String, trelm::String>> rows;
        unsigned total = 0;
        EXPECT_TRUE(trelm::FStreamParseObj().parse(emu::renderDocument(root), rows, total).ok());
        std::vector<Expected> out;
        for (auto const& row : rows) {
            if (out.size() == count) break;
            if (!row.contains("is_status")) continue;
            auto field = [&](char const* name) { return row.search(name)->str(); };
            out.push_back({{"core_object_type", 4},
                           {"core_event_serviceid", withoutOwner(field("post_id"))},
                           {"core_object_time", std::stoi(field("created_time"))},
                           {"core_event_text", field("message")},
                           {"core_event_contactid", field("source_id")},
                           {"core_event_contactname", nameOf(field("source_id"))},
                           {"core_event_contactfullname", nameOf(field("source_id"))},
                           {"core_event_service", "Facebook"}});
        }
        return out;
    }

    // The friends' photos from `endTime` down, newest first and by id within a second.
    static std::vector<Expected> photos(int endTime, std::size_t count) {
        std::vector<Row> rows = fql(
            "select pid,aid,owner,src,caption,created from photo where aid in (select aid from album where owner in "
            "(select uid2 from friend where uid1='" + kDemoUid + "')) and created <= " + std::to_string(endTime));
        std::sort(rows.begin(), rows.end(), [](Row const& a, Row const& b) {
            return a.at("created") != b.at("created") ? std::stoi(a.at("created")) > std::stoi(b.at("created"))
                                                      : a.at("pid") > b.at("pid");
        });
        std::vector<Expected> out;
        for (Row const& row : rows) {
            if (out.size() == count) break;
            out.push_back({{"core_object_type", 5},
                           {"core_event_serviceid", row.at("pid")},
                           {"core_object_time", std::stoi(row.at("created"))},
                           {"core_event_text", row.at("caption")},
                           {"core_event_parent_serviceid", row.at("aid")},
                           {"core_event_uri", row.at("src")},
                           {"core_event_contactid", row.at("owner")},
                           {"core_event_contactname", nameOf(row.at("owner"))},
                           {"core_event_service", "Facebook"}});
        }
        return out;
    }

    ProgramRunner::Result host(std::vector<std::string> const& command) {
        std::vector<std::string> args{"--format", "json", "--state-dir", runner_.folder() + "/state", "--config",
                                      runner_.writeFile("config.json", config()), "--plugin", TRELMFACEBOOK_MODULE};
        args.insert(args.end(), command.begin(), command.end());
        return runner_.run(TRELM_HOST_PROGRAM, args);
    }

    static std::vector<json> linesOfType(ProgramRunner::Result const& result, std::string const& type) {
        std::vector<json> lines;
        for (std::string const& line : result.outLines()) {
            json object = json::parse(line);
            if (object.at("type") == type) lines.push_back(object);
        }
        return lines;
    }

    static emu::Store* store;
    ProgramRunner runner_;
};

emu::Store* HostEventQueryTest::store = nullptr;

TEST_F(HostEventQueryTest, StatusAndPhotoListingsShowTheEmulatorsPostsAndPhotos) {
    int const recent = 1277000000;  // within the generated half year
    struct Case {
        std::vector<std::string> command;
        std::vector<Expected> expected;
        int type;
    };
    std::vector<Case> const cases = {
        {{"query", "status", "--limit", "5"}, statuses(0, 5), 4},
        {{"query", "photos", "--limit", "5"}, photos(2000000000, 5), 5},
        {{"query", "status", "--limit", "5", "--where", "core_object_time<=" + std::to_string(recent)},
         statuses(recent, 5), 4},
        {{"query", "photos", "--limit", "5", "--where", "core_object_time<=" + std::to_string(recent)},
         photos(recent, 5), 5},
    };
    for (Case const& c : cases) {
        SCOPED_TRACE(c.command[1] + (c.command.size() > 4 ? " " + c.command.back() : ""));
        ASSERT_EQ(c.expected.size(), 5u);
        ProgramRunner::Result result = host(c.command);
        ASSERT_EQ(result.exitCode, 0) << result.err;
        std::vector<json> records = linesOfType(result, "record");
        ASSERT_EQ(records.size(), 5u) << result.out;
        for (std::size_t i = 0; i < records.size(); ++i) {
            json const& fields = records[i]["fields"];
            for (auto const& [key, value] : c.expected[i]) {
                EXPECT_EQ(fields[key], value) << "record " << i + 1 << ", " << key;
            }
            EXPECT_EQ(fields["core_object_id"].get<std::string>().size(), 36u);
        }
        std::vector<json> listed = linesOfType(result, "listed");
        ASSERT_EQ(listed.size(), 1u);
        EXPECT_EQ(listed[0]["object_type"], c.type);
        EXPECT_EQ(listed[0]["rows"], 5);
        EXPECT_EQ(listed[0]["total"], nullptr);
    }
}

// Every run of the host starts a fresh emulator, which refuses the session the run before
// stored. The stream cursor answers such a refusal as an empty stream; the host still notices
// and signs in again.
TEST_F(HostEventQueryTest, SessionRefusedWhileReadingTheStreamIsRenewed) {
    ASSERT_EQ(host({"query", "status", "--limit", "1"}).exitCode, 0);
    ProgramRunner::Result again = host({"query", "status", "--limit", "2"});
    ASSERT_EQ(again.exitCode, 0) << again.err;
    std::vector<json> logins = linesOfType(again, "login");
    ASSERT_EQ(logins.size(), 2u) << again.out;
    EXPECT_EQ(logins[0]["session"], "stored");
    EXPECT_EQ(logins[1]["session"], "new");
    EXPECT_EQ(linesOfType(again, "record").size(), 2u) << again.out;
}

}  // namespace
