#pragma once

#include <gtest/gtest.h>

#include "ErrorAssertions.h"

#include "ComponentRegistry.h"
#include "ConnectionInfo.h"
#include "FakeHttpRequestFactory.h"
#include "FakeRuntimeConfiguration.h"
#include "ServiceTransport.h"

namespace trelm::test {

// True when the "sig" of the request `fields` is their signature with `secret`.
inline bool signedWith(Map<String, String> fields, String const& secret) {
    String const* sig = fields.search("sig");
    String const given = sig != nullptr ? *sig : String();
    return fields.remove("sig").ok() && ServiceTransport::signature(fields, secret) == given;
}

// A test-owned registry with the two fakes, and a client set up with a ConnectionInfo under the
// tag "fbsource" holding application key "k" and secret "s".
class LibraryFixture : public ::testing::Test {
protected:
    static constexpr char const* kTag = "fbsource";

    void SetUp() override {
        ASSERT_OK(registry.add("HttpRequestFactory", &http));
        ASSERT_OK(registry.add("RuntimeConfiguration", &store));
        registry.activate();
        info = makeSmart<FacebookLibrary::ConnectionInfo>(kTag);
        ASSERT_OK(info->setAppConfig("k", "s"));
        ASSERT_OK(lib->setup(info));
    }

    // A session in memory only.
    void signIn(String const& session = "SK", String const& secret = "SS", String const& user = "42") {
        ASSERT_OK(info->setSessionConfig(session, secret, user, false, false));
    }

    // The store's value of `key` under kTag, or "-".
    String stored(char const* key) {
        Map<String, Variant> values{{key, Variant()}};
        EXPECT_OK(store.get(kTag, values));
        Variant const& value = *values.search(key);
        return value.empty() ? String("-") : value.asString();
    }
    void put(char const* key, String const& value) {
        ASSERT_OK(store.store(kTag, {Configuration::Value(key, Variant(value))}));
    }

    Map<String, String> lastFields() const {
        auto all = http.exchanges();
        return all.empty() ? Map<String, String>() : all.back();
    }

    // Declared first, so destroyed last. The destructor deactivates it.
    ComponentRegistry registry;
    FakeHttpRequestFactory http;
    FakeRuntimeConfiguration store;
    SmartPtr<FacebookLibrary::ConnectionInfo> info;
    SmartPtr<FacebookLibrary> lib = makeSmart<FacebookLibrary>();
};

}  // namespace trelm::test
