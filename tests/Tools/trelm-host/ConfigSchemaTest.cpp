// The configuration file as the host reads it, and what a user reads when it is malformed or holds
// a misspelt key, a value of the wrong type or a number out of range: the file, the place, the key
// and what to do.
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "ErrorAssertions.h"
#include "HostConfig.h"

namespace {

using trelm::String;
using trelm::Variant;
using trelm::Vector;
using trelm::host::HostConfig;

std::string source(std::string const& config) {
    return R"({"components": [{"name": "facebook", "id": "@trelm.example:/facebooksource", "config": )" + config +
           "}]}";
}

// Every mistake is refused with kInvalid, the file and the place, and the output is left alone.
TEST(ConfigSchemaTest, BadFilesAreRefusedByPlaceWithWhatToDo) {
    struct Case {
        std::string text;
        std::vector<std::string> said;
    };
    std::vector<Case> const cases = {
        {R"({"components": [)", {"JSON"}},
        {R"([1, 2])", {"top level"}},
        {R"({"htpp": {}})", {"htpp: unknown section"}},
        {R"({"components": {}})", {"components: must be a list"}},
        {R"({"components": [{"id": "@x:/a"}]})", {"components[0]: needs a non-empty string \"name\""}},
        {R"({"components": [{"name": "a", "id": ""}]})", {"components[0]: needs a non-empty string \"id\""}},
        {R"({"components": [{"name": "a", "id": "@x:/a", "confg": {}}]})", {"unknown field \"confg\""}},
        {R"({"components": [{"name": "a", "id": "@x:/a"}, {"name": "a", "id": "@x:/b"}]})",
         {"components[1]: a component named \"a\" already exists"}},
        {R"({"components": [{"name": "a", "id": "@x:/a", "config": {"n": 1.5}}]})",
         {"components[0].config.n: numbers must be integers"}},
        {R"({"http": {"ca_file": null}})", {"http.ca_file: unsupported value"}},
        {R"({"runtime": {"path": {"a": 1}}})", {"runtime.path: unsupported value"}},
        {R"({"http": {"connect_to": ["a", 1]}})", {"http.connect_to: lists may hold strings only"}},
        {R"({"http": {"timeout_ms": 18446744073709551615}})", {"http.timeout_ms: integer out of range"}},
        {R"({"components": [{"name": "a", "id": "@x:/a", "runtime_keys": "k"}]})",
         {"components[0].runtime_keys: must be a list of strings"}},
        // The plug-in's own keys: a value of the wrong type, a misspelt key, a number out of range.
        {source(R"({"haveExtendedApi": "yes"})"),
         {"conf.json: components[0].config.haveExtendedApi must be true or false, not \"yes\""}},
        {source(R"({"facebook_source_pasword": "x"})"),
         {"unknown key \"facebook_source_pasword\"; did you mean \"facebook_source_password\"?"}},
        {R"({"http": {"http.timeout": 5}})", {"conf.json: http: unknown key \"http.timeout\"", "timeout_ms"}},
        {R"({"http": {"timeout_ms": -5}})", {"http.timeout_ms must be between 1 and 3600000, not -5"}},
        {R"({"components": [{"name": "c", "id": "@trelm.example:/facebookconnector", "config": {"facebook_polltime": "300"}}]})",
         {"components[0].config.facebook_polltime must be a whole number, not \"300\""}},
        {source(R"({"wipeComponents": "store"})"), {"wipeComponents must be a list of texts"}},
        {source(R"({"facebook_source_login": 42})"), {"facebook_source_login must be a text in quotes"}},
    };
    for (Case const& c : cases) {
        SCOPED_TRACE(c.text);
        HostConfig config;
        ASSERT_OK(HostConfig::parse(R"({"components": [{"name": "keep", "id": "@x:/k"}]})", "t", config));
        trelm::uError e = HostConfig::parse(c.text, "conf.json", config);
        ASSERT_CODE(e, trelm::kInvalid);
        EXPECT_NE(e.message().str().find("conf.json: "), std::string::npos) << e;
        for (std::string const& words : c.said) EXPECT_NE(e.message().str().find(words), std::string::npos) << e;
        ASSERT_EQ(config.components().size(), 1u) << "a refused file changes nothing";
        EXPECT_EQ(config.components()[0].name, "keep");
    }
}

TEST(HostConfigTest, ValuesKeepTheirKindAndComponentsTheirOrder) {
    HostConfig config;
    trelm::uError e = HostConfig::parse(R"({
        "http": {"connect_to": ["a:80:127.0.0.1:1"], "timeout_ms": 5000},
        "runtime": {"path": ":memory:"},
        "components": [
          {"name": "b", "id": "@x:/b", "config": {
             "text": "t", "flag": false, "small": -7, "big": 5000000000,
             "list": ["p", "q"], "none": []}},
          {"name": "a", "id": "@x:/a", "runtime_keys": ["k"]}]})",
                                        "test", config);
    ASSERT_OK(e);

    ASSERT_EQ(config.components().size(), 2u);
    auto const& b = config.components()[0];
    EXPECT_EQ(b.name, "b");
    EXPECT_EQ(b.id, "@x:/b");
    EXPECT_EQ(b.config, (trelm::Map<String, Variant>{{"text", Variant("t")},
                                                     {"flag", Variant(false)},
                                                     {"small", Variant(-7)},
                                                     {"big", Variant(5000000000LL)},
                                                     {"list", Variant(Vector<String>{"p", "q"})},
                                                     {"none", Variant(Vector<String>{})}}));
    EXPECT_EQ(b.runtimeKeys, HostConfig::defaultRuntimeKeys());
    EXPECT_EQ(config.components()[1].runtimeKeys, (Vector<String>{"k"}));
    EXPECT_TRUE(config.namesEndpoint());
    EXPECT_EQ(*config.runtime().search("path"), Variant(":memory:"));
}

}  // namespace
