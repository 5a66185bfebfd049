#include "HttpRequestFactory.h"

#include <gtest/gtest.h>

#include "ErrorAssertions.h"

namespace trelm {
namespace {

// A group of good values sets every key; one bad value among them fails the configuration and
// applies none of them, the good ones included.
TEST(HttpRequestFactoryTest, ConfigurationSetsEveryKeyOrNoneWhenOneIsBad) {
    struct Case {
        char const* key;  // null: the good group alone
        Variant value;
    } const cases[] = {
        {nullptr, Variant()},
        {"connect_timeout_ms", Variant(0)},
        {"timeout_ms", Variant(-5)},
        {"timeout_ms", Variant("soon")},
        {"ca_file", Variant(Vector<String>{"a", "b"})},
        {"connect_to", Variant(true)},
    };
    for (auto const& c : cases) {
        SCOPED_TRACE(c.key ? c.key : "good group");
        HttpRequestFactory factory;
        Configuration::Group group("HttpRequestFactory",
                                   {{"connect_timeout_ms", Variant(250)},
                                    {"timeout_ms", Variant("1500")},
                                    {"ca_file", Variant("/etc/ca.pem")},
                                    {"connect_to", Variant("api.facebook.com:80:127.0.0.1:8080")}});
        if (c.key) {
            ASSERT_OK(group.set(c.key, c.value));
        }
        EXPECT_CODE(factory.sendConfig(group), c.key ? kInvalid : kSuccess);
        HttpRequest::Settings s = factory.settings();
        EXPECT_EQ(String::from(s.connectTimeoutMs) + " " + String::from(s.timeoutMs) + " " + s.caFile,
                  c.key ? "10000 60000 " : "250 1500 /etc/ca.pem");
        EXPECT_EQ(s.connectTo, c.key ? Vector<String>{} : Vector<String>{"api.facebook.com:80:127.0.0.1:8080"});
    }
}

}  // namespace
}  // namespace trelm
