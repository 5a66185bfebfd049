#pragma once

#include <gtest/gtest.h>

#include <memory>

#include "ComponentRegistry.h"
#include "FacebookLibrary.h"
#include "FakeHttpRequestFactory.h"
#include "FakeRuntimeConfiguration.h"
#include "RecordingComponent.h"
#include "trelm/SmartPtr.h"

namespace trelm::test {

// A test-owned registry with the fake "HttpRequestFactory" and "RuntimeConfiguration", a
// ConnectionInfo under the tag "fbsource" with application key "k" and secret "s", and a client
// set up with it. Components the test adds are removed at tear-down.
class LibraryFixture : public ::testing::Test {
protected:
    static constexpr char const* kTag = "fbsource";

    void SetUp() override {
        ASSERT_TRUE(registry.add("HttpRequestFactory", &http).ok());
        ASSERT_TRUE(registry.add("RuntimeConfiguration", &store).ok());
        registry.activate();
        info = makeSmart<FacebookLibrary::ConnectionInfo>(kTag);
        ASSERT_TRUE(info->setAppConfig("k", "s").ok());
        lib = makeSmart<FacebookLibrary>();
        ASSERT_TRUE(lib->setup(info).ok());
    }

    void TearDown() override { registry.deactivate(); }

    // A session in memory only (no store message).
    void signIn(String const& session = "SK", String const& secret = "SS", String const& user = "42") {
        ASSERT_TRUE(info->setSessionConfig(session, secret, user, false, false).ok());
    }

    // Adds a component that records wipe, wake-up and status messages into `events`.
    RecordingComponent& addRecorder(String const& name, bool fail = false) {
        recorders.push_back(std::make_unique<RecordingComponent>(name, events, fail));
        EXPECT_TRUE(registry.add(name, recorders.back().get()).ok());
        return *recorders.back();
    }

    // The last exchange's fields (empty when none was made).
    Map<String, String> lastFields() const {
        auto all = http.exchanges();
        return all.empty() ? Map<String, String>() : all.back().fields;
    }

    // Declared first: destroyed last, after the components it points to are gone from it.
    ComponentRegistry registry;
    FakeHttpRequestFactory http;
    FakeRuntimeConfiguration store;
    std::shared_ptr<EventLog> events = std::make_shared<EventLog>();
    std::vector<std::unique_ptr<RecordingComponent>> recorders;
    SmartPtr<FacebookLibrary::ConnectionInfo> info;
    SmartPtr<FacebookLibrary> lib;
};

// gtest printing of the framework's values.
inline std::vector<std::pair<std::string, std::string>> entries(Map<String, String> const& map) {
    std::vector<std::pair<std::string, std::string>> out;
    for (auto const& [key, value] : map) out.emplace_back(key.str(), value.str());
    return out;
}

}  // namespace trelm::test
