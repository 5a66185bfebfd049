#include <string>

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

}  // namespace
