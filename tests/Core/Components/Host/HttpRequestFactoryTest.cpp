#include "HttpRequestFactory.h"

#include <gtest/gtest.h>

#include "ErrorAssertions.h"

namespace trelm {
namespace {

TEST(HttpRequestFactoryTest, ConfigurationSetsEveryKey) {
    HttpRequestFactory factory;
    Configuration::Group group("HttpRequestFactory",
                               {{"connect_timeout_ms", Variant(250)},
                                {"timeout_ms", Variant("1500")},
                                {"ca_file", Variant("/etc/ca.pem")},
                                {"connect_to", Variant("api.facebook.com:80:127.0.0.1:8080")}});
    ASSERT_OK(factory.sendConfig(group));
    HttpRequest::Settings s = factory.settings();
    EXPECT_EQ(String::from(s.connectTimeoutMs) + " " + String::from(s.timeoutMs) + " " + s.caFile,
              "250 1500 /etc/ca.pem");
    EXPECT_EQ(s.connectTo, Vector<String>{"api.facebook.com:80:127.0.0.1:8080"});
}

TEST(HttpRequestFactoryTest, BadValueFailsConfigurationAndChangesNothing) {
    struct Case {
        char const* key;
        Variant value;
    } cases[] = {
        {"connect_timeout_ms", Variant(0)},
        {"timeout_ms", Variant(-5)},
        {"timeout_ms", Variant("soon")},
        {"ca_file", Variant(Vector<String>{"a", "b"})},
        {"connect_to", Variant(true)},
    };
    for (auto const& c : cases) {
        HttpRequestFactory factory;
        // A valid key next to the bad one must not be applied either.
        Configuration::Group group("HttpRequestFactory", {{"ca_file", Variant("/x.pem")}});
        ASSERT_OK(group.set(c.key, c.value));
        EXPECT_CODE(factory.sendConfig(group), kInvalid) << c.key << " " << c.value;
        EXPECT_EQ(factory.settings().caFile, "") << c.key;
        EXPECT_EQ(factory.settings().timeoutMs, 60000) << c.key;
    }
}

}  // namespace
}  // namespace trelm
