// What a user reads when the configuration file holds a misspelt key, a value of the wrong type
// or a number out of range: the file, the place, the key and what to do.
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "ErrorAssertions.h"
#include "HostConfig.h"

namespace {

using trelm::host::HostConfig;

std::string source(std::string const& config) {
    return R"({"components": [{"name": "facebook", "id": "@trelm.example:/facebooksource", "config": )" + config +
           "}]}";
}

TEST(ConfigSchemaTest, BadValuesAreRefusedByNameWithWhatToDo) {
    struct Case {
        char const* name;
        std::string text;
        std::vector<std::string> said;
    };
    std::vector<Case> const cases = {
        {"a flag given as text", source(R"({"haveExtendedApi": "yes"})"),
         {"conf.json: components[0].config.haveExtendedApi must be true or false, not \"yes\""}},
        {"a misspelt key", source(R"({"facebook_source_pasword": "x"})"),
         {"unknown key \"facebook_source_pasword\"; did you mean \"facebook_source_password\"?"}},
        {"a key of another section", R"({"http": {"http.timeout": 5}})",
         {"conf.json: http: unknown key \"http.timeout\"", "timeout_ms"}},
        {"a number out of range", R"({"http": {"timeout_ms": -5}})",
         {"http.timeout_ms must be between 1 and 3600000, not -5"}},
        {"a number given as text",
         R"({"components": [{"name": "c", "id": "@trelm.example:/facebookconnector", "config": {"facebook_polltime": "300"}}]})",
         {"components[0].config.facebook_polltime must be a whole number, not \"300\""}},
        {"a list given as text", source(R"({"wipeComponents": "store"})"),
         {"wipeComponents must be a list of texts"}},
        {"a login given as a number", source(R"({"facebook_source_login": 42})"),
         {"facebook_source_login must be a text in quotes"}},
    };
    for (Case const& c : cases) {
        SCOPED_TRACE(c.name);
        HostConfig config;
        trelm::uError e = HostConfig::parse(c.text, "conf.json", config);
        ASSERT_CODE(e, trelm::kInvalid);
        for (std::string const& words : c.said) EXPECT_NE(e.message().str().find(words), std::string::npos) << e;
        EXPECT_TRUE(config.components().empty()) << "a refused file changes nothing";
    }
}

TEST(ConfigSchemaTest, ComponentsOfOtherPlugInsAreNotChecked) {
    HostConfig config;
    EXPECT_OK(HostConfig::parse(R"({"components": [{"name": "x", "id": "@other:/x", "config": {"anything": "yes"}}]})",
                                "conf.json", config));
}

}  // namespace
