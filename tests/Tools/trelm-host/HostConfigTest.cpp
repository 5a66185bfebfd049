#include <ostream>
#include <string>

#include <cstdio>
#include <fstream>

#include <gtest/gtest.h>

#include "ErrorAssertions.h"

#include "HostConfig.h"

using trelm::String;
using trelm::Variant;
using trelm::Vector;
using trelm::host::HostConfig;

namespace {

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
    EXPECT_EQ(b.config, (trelm::Map<String, Variant>{{"text", Variant("t")}, {"flag", Variant(false)},
                                                     {"small", Variant(-7)}, {"big", Variant(5000000000LL)},
                                                     {"list", Variant(Vector<String>{"p", "q"})},
                                                     {"none", Variant(Vector<String>{})}}));
    EXPECT_EQ(b.runtimeKeys, HostConfig::defaultRuntimeKeys());
    EXPECT_EQ(config.components()[1].runtimeKeys, (Vector<String>{"k"}));
    EXPECT_TRUE(config.namesEndpoint());
    EXPECT_EQ(*config.runtime().search("path"), Variant(":memory:"));
}

TEST(HostConfigTest, EmptyDocumentNamesNoEndpointAndNoComponents) {
    HostConfig config;
    ASSERT_OK(HostConfig::parse("{}", "test", config));
    EXPECT_FALSE(config.namesEndpoint());
    EXPECT_TRUE(config.components().empty());
}

struct BadConfig {
    char const* name;
    char const* text;
    char const* place;  // expected in the message
};

void PrintTo(BadConfig const& c, std::ostream* os) { *os << c.name; }

class HostConfigRejectTest : public ::testing::TestWithParam<BadConfig> {};

// Every mistake is refused with kInvalid and the place, and the output is left alone.
TEST_P(HostConfigRejectTest, IsRefusedWithThePlace) {
    HostConfig config;
    ASSERT_OK(HostConfig::parse(R"({"components": [{"name": "keep", "id": "@x:/k"}]})", "t", config));
    trelm::uError e = HostConfig::parse(GetParam().text, "file.json", config);
    EXPECT_CODE(e, trelm::kInvalid);
    std::string message = e.message().str();
    EXPECT_NE(message.find("file.json: "), std::string::npos) << message;
    EXPECT_NE(message.find(GetParam().place), std::string::npos) << message;
    ASSERT_EQ(config.components().size(), 1u);
    EXPECT_EQ(config.components()[0].name, "keep");
}

INSTANTIATE_TEST_SUITE_P(
    Mistakes, HostConfigRejectTest,
    ::testing::Values(
        BadConfig{"MalformedJson", R"({"components": [)", "JSON"},
        BadConfig{"NotAnObject", R"([1, 2])", "top level"},
        BadConfig{"UnknownSection", R"({"htpp": {}})", "htpp: unknown section"},
        BadConfig{"ComponentsNotAList", R"({"components": {}})", "components: must be a list"},
        BadConfig{"ComponentWithoutName", R"({"components": [{"id": "@x:/a"}]})",
                  "components[0]: needs a non-empty string \"name\""},
        BadConfig{"ComponentWithEmptyId", R"({"components": [{"name": "a", "id": ""}]})",
                  "components[0]: needs a non-empty string \"id\""},
        BadConfig{"MisspelledField",
                  R"({"components": [{"name": "a", "id": "@x:/a", "confg": {}}]})",
                  "unknown field \"confg\""},
        BadConfig{"DuplicateName",
                  R"({"components": [{"name": "a", "id": "@x:/a"}, {"name": "a", "id": "@x:/b"}]})",
                  "components[1]: a component named \"a\" already exists"},
        BadConfig{"FractionalNumber",
                  R"({"components": [{"name": "a", "id": "@x:/a", "config": {"n": 1.5}}]})",
                  "components[0].config.n: numbers must be integers"},
        BadConfig{"NullValue", R"({"http": {"ca_file": null}})", "http.ca_file: unsupported value"},
        BadConfig{"NestedObject", R"({"runtime": {"path": {"a": 1}}})", "runtime.path: unsupported value"},
        BadConfig{"MixedList", R"({"http": {"connect_to": ["a", 1]}})",
                  "http.connect_to: lists may hold strings only"},
        BadConfig{"HugeInteger", R"({"http": {"timeout_ms": 18446744073709551615}})",
                  "http.timeout_ms: integer out of range"},
        BadConfig{"RuntimeKeysNotAList",
                  R"({"components": [{"name": "a", "id": "@x:/a", "runtime_keys": "k"}]})",
                  "components[0].runtime_keys: must be a list of strings"}),
    [](auto const& info) { return std::string(info.param.name); });

// A missing file and one too large to be a configuration are named (folders and devices: in the
// program's tests).
TEST(HostConfigTest, PathThatIsNoConfigurationFileIsRefusedWithItsName) {
    std::string const big = ::testing::TempDir() + "big-config.json";
    {
        std::ofstream out(big);
        out << "{\"http\": {}, \"pad\": \"" << std::string(HostConfig::kMaxFileBytes, 'x') << "\"}";
    }
    struct Case {
        std::string path;
        trelm::ErrorCode code;
        std::string words;
    } const cases[] = {
        {"/nonexistent/config.json", trelm::kNotFound, "cannot read configuration file /nonexistent/config.json"},
        {big, trelm::kInvalid, "is larger than 1 MiB"},
    };
    for (Case const& c : cases) {
        HostConfig config;
        trelm::uError e = HostConfig::load(c.path, config);
        EXPECT_CODE(e, c.code);
        EXPECT_NE(e.message().str().find(c.words), std::string::npos) << e.message().str();
    }
    std::remove(big.c_str());
}

}  // namespace
