#include <gtest/gtest.h>

#include "ErrorAssertions.h"

#include <functional>
#include <string>
#include <vector>

#include "FacebookSource.h"
#include "GetUserSidMessage.h"
#include "RecordDump.h"
#include "trelm/Configuration.h"
#include "trelm/GUID.h"

namespace trelm {
namespace {

using Record = Map<String, Variant>;

constexpr char const* kSourceName = "facebook";

Configuration::Group configuredGroup() {
    return Configuration::Group(kSourceName, {{"facebook_source_appkey", Variant("key")},
                                              {"facebook_source_appsecret", Variant("secret")},
                                              {"facebook_source_session_user", Variant("100000001")},
                                              {"facebook_source_session_id", Variant("session")},
                                              {"facebook_source_session_secret", Variant("session-secret")}});
}

Record record(std::initializer_list<std::pair<char const*, Variant>> entries) {
    Record r;
    for (auto const& [key, value] : entries) EXPECT_OK(r.insert(key, value));
    return r;
}

// Operations that are refused whatever the service would say: none of them reaches the network
// (no HTTP factory is registered, so a request would fail with another code).
TEST(DataOperationsTest, RefusedOperationsAnswerTheirExactCodes) {
    FacebookSource source(kSourceName);
    ASSERT_OK(source.sendConfig(configuredGroup()));
    ASSERT_OK(source.startup());

    struct Case {
        char const* name;
        std::function<uError()> run;
        unsigned code;
    };
    GUID const someGuid = GUID::generate();
    Record scratch;
    std::vector<Case> const cases = {
        {"update", [&] { Record r = record({{"core_object_type", 4}}); return source.update(r); }, kDataOpNotSupported},
        {"remove", [&] { return source.remove(someGuid, false); }, kDataOpNotSupported},
        {"remove with flag", [&] { return source.remove(someGuid, true); }, kDataOpNotSupported},
        {"retrieve with flag", [&] { return source.retrieve(someGuid, scratch, true); }, kDataOpNotSupported},
        {"retrieve of an unknown GUID", [&] { return source.retrieve(someGuid, scratch, false); }, kNotFound},
        {"insert of a contact",
         [&] { Record r = record({{"core_object_type", 2}}); return source.insert(r); }, kInvalid},
        {"insert without a type", [&] { Record r = record({{"core_event_text", "hi"}}); return source.insert(r); },
         kInvalid},
        {"insert of a status without a text", [&] { Record r = record({{"core_object_type", 4}}); return source.insert(r); },
         kInvalid},
        {"insert of a status with empty text",
         [&] { Record r = record({{"core_object_type", 4}, {"core_event_text", ""}}); return source.insert(r); },
         kInvalid},
        {"insert of a photo without uri",
         [&] { Record r = record({{"core_object_type", 9}, {"media_notes", "caption"}}); return source.insert(r); },
         kInvalid},
        {"insert of a photo with another scheme",
         [&] { Record r = record({{"core_object_type", 9}, {"media_uri", "http://x/y.jpg"}}); return source.insert(r); },
         kInvalid},
    };
    for (Case const& c : cases) {
        uError err = c.run();
        EXPECT_CODE(err, c.code) << c.name << ": " << err;
    }
    EXPECT_TRUE(scratch.empty());
}

TEST(DataOperationsTest, OperationsBeforeStartupFailWithNotSet) {
    FacebookSource source(kSourceName);
    Record status = record({{"core_object_type", 4}, {"core_event_text", "hi"}});
    EXPECT_CODE(source.insert(status), kNotSet);
    Record out;
    EXPECT_CODE(source.retrieve(GUID::generate(), out, false), kNotSet);
    IServiceSource::GetUserSidMessage sid;
    EXPECT_CODE(source.onMessage(sid), kNotSet);
    // A query gets no cursor without a client, before and after a configuration.
    IQueryItems::StartQueryMessage query(Vector<IQueryItems::Column>(), Vector<IQueryItems::Constraint>{
        IQueryItems::Constraint{Metadata::Key("core_object_type", TRELM_TYPES::INT32), Variant(2),
                                IQueryItems::Constraint::Equal}});
    EXPECT_CODE(source.onMessage(query), kNotSet);
    // Starting without a configuration is refused too, rather than making a client without settings.
    EXPECT_CODE(source.startup(), kNotSet);
    ASSERT_OK(source.sendConfig(Configuration::Group(kSourceName)));
    EXPECT_CODE(source.onMessage(query), kNotSet);
    EXPECT_FALSE(query.cursor);
}

// The dump pads every key to 30 columns; a longer key gets (length - 30) spaces instead.
TEST(RecordDumpTest, PadsKeysToThirtyColumnsAndRendersByRegisteredType) {
    trelm_RegisterMetadataType("test_dump_unsigned", TRELM_TYPES::UINT32);
    GUID const guid = GUID::generate();
    std::string const key30(30, 'k');
    std::string const key33(33, 'k');
    struct Case {
        Record input;
        std::string text;
    };
    std::vector<Case> const cases = {
        {record({{"core_object_type", 4}}), "core_object_type:" + std::string(14, ' ') + "4\n"},
        {record({{key30.c_str(), "v"}}), key30 + ":v\n"},
        {record({{key33.c_str(), "v"}}), key33 + ":   v\n"},
        {record({{"core_object_id", guid}}), "core_object_id:" + std::string(16, ' ') + guid.toString().str() + "\n"},
        {record({{"test_dump_unsigned", 7u}, {"core_contact_name", "Ann"}}),
         "core_contact_name:" + std::string(13, ' ') + "Ann\n" + "test_dump_unsigned:" + std::string(12, ' ') + "7\n"},
        {Record(), ""},
    };
    for (Case const& c : cases) {
        String out("> ");
        sprintTags(out, c.input);
        EXPECT_EQ(out.str(), "> " + c.text);
    }
}

}  // namespace
}  // namespace trelm
