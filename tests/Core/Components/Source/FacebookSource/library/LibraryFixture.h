#pragma once

#include <gtest/gtest.h>

#include <memory>
#include <string>
#include <vector>

#include "ComponentRegistry.h"
#include "ConnectionInfo.h"
#include "FakeHttpRequestFactory.h"
#include "FakeRuntimeConfiguration.h"
#include "RecordingComponent.h"

namespace trelm::test {

using Fields = std::vector<std::pair<std::string, std::string>>;

inline Fields entries(Map<String, String> const& map) {
    Fields out;
    for (auto const& [key, value] : map) out.emplace_back(key.str(), value.str());
    return out;
}

// A test-owned registry with the two fakes, and a client set up with a ConnectionInfo under the
// tag "fbsource" holding application key "k" and secret "s".
class LibraryFixture : public ::testing::Test {
protected:
    static constexpr char const* kTag = "fbsource";

    void SetUp() override {
        ASSERT_TRUE(registry.add("HttpRequestFactory", &http).ok());
        ASSERT_TRUE(registry.add("RuntimeConfiguration", &store).ok());
        registry.activate();
        info = makeSmart<FacebookLibrary::ConnectionInfo>(kTag);
        ASSERT_TRUE(info->setAppConfig("k", "s").ok());
        ASSERT_TRUE(lib->setup(info).ok());
    }

    // A session in memory only.
    void signIn(String const& session = "SK", String const& secret = "SS", String const& user = "42") {
        ASSERT_TRUE(info->setSessionConfig(session, secret, user, false, false).ok());
    }

    // A component that records wipe, wake-up and status messages into `events`.
    void addRecorder(String const& name, bool fail = false) {
        recorders.push_back(std::make_unique<RecordingComponent>(name, events, fail));
        ASSERT_TRUE(registry.add(name, recorders.back().get()).ok());
    }

    Map<String, String> lastFields() const {
        auto all = http.exchanges();
        return all.empty() ? Map<String, String>() : all.back().fields;
    }

    // Declared first, so destroyed last. The destructor deactivates it.
    ComponentRegistry registry;
    FakeHttpRequestFactory http;
    FakeRuntimeConfiguration store;
    std::shared_ptr<RecordingComponent::Log> events = std::make_shared<RecordingComponent::Log>();
    std::vector<std::unique_ptr<RecordingComponent>> recorders;
    SmartPtr<FacebookLibrary::ConnectionInfo> info;
    SmartPtr<FacebookLibrary> lib = makeSmart<FacebookLibrary>();
};

}  // namespace trelm::test
