#include <string>

#include <gtest/gtest.h>

#include "ErrorAssertions.h"

#include "ComponentHost.h"
#include "GetRuntimeConfigurationMessage.h"
#include "trelm/Set.h"

using trelm::Component;
using trelm::Map;
using trelm::String;
using trelm::Variant;
using trelm::Vector;
using trelm::host::ComponentHost;
using trelm::host::HostConfig;
using trelm::host::PluginLoader;

namespace {

// A plug-in component that keeps the configuration group it was given, can be told to fail its
// start-up, and while it shuts down notes whether the runtime store still runs and answers.
class RecordingComponent : public Component {
public:
    static inline Map<String, Variant> lastConfig;
    static inline unsigned startupCode = trelm::kSuccess;
    static inline trelm::uError shutdownQuery;
    static inline Component::State storeStateAtShutdown = Component::State::Created;

    explicit RecordingComponent(String name) : Component(std::move(name), "@test:/recording") {}

    static Component* make(String name) { return new RecordingComponent(std::move(name)); }

protected:
    trelm::uError sendConfigImpl(trelm::Configuration::Group const& group) override {
        lastConfig = group.values();
        return trelm::uError();
    }
    trelm::uError startupImpl() override {
        return startupCode == trelm::kSuccess ? trelm::uError() : TRELM_ERROR(startupCode);
    }
    trelm::uError shutdownImpl() override {
        Map<String, Variant> values{{"key", Variant()}};
        trelm::GetRuntimeConfigurationMessage msg(name(), values);
        shutdownQuery = msg.send("RuntimeConfiguration");
        if (Component* store = trelm::ComponentRegistry::active()->find("RuntimeConfiguration")) {
            storeStateAtShutdown = store->state();
        }
        return trelm::uError();
    }
};

class ComponentHostTest : public ::testing::Test {
protected:
    void SetUp() override {
        RecordingComponent::lastConfig.clear();
        RecordingComponent::startupCode = trelm::kSuccess;
        RecordingComponent::shutdownQuery = TRELM_ERROR(trelm::kFailure);
        RecordingComponent::storeStateAtShutdown = Component::State::Created;
        ASSERT_OK(table_.insert("@test:/recording", &RecordingComponent::make));
        ASSERT_OK(host_.startBuiltins({}, {{"path", Variant(":memory:")}}, "unused"));
    }

    void store(String const& tag, String const& key, String const& value) {
        trelm::Set<trelm::Configuration::Value> values;
        ASSERT_OK(values.insert(trelm::Configuration::Value(key, Variant(value))));
        ASSERT_OK(host_.runtimeConfiguration().store(tag, values));
    }

    static HostConfig::ComponentEntry entry(String name, String id = "@test:/recording") {
        HostConfig::ComponentEntry e;
        e.name = std::move(name);
        e.id = std::move(id);
        return e;
    }

    PluginLoader::Table table_;
    ComponentHost host_;
};

// The file gives the first values; what the store holds for the component's keys wins, so a
// session kept by one run reaches the component in the next. Keys the component does not use
// stay in the store.
TEST_F(ComponentHostTest, StoredValuesOfTheComponentsKeysOverrideTheFile) {
    store("rec", "login", "stored-login");
    store("rec", "session", "stored-session");
    store("rec", "unrelated", "x");
    store("other", "password", "other-component");

    auto e = entry("rec");
    ASSERT_OK(e.config.insert("login", Variant("file-login")));
    ASSERT_OK(e.config.insert("password", Variant("file-password")));
    ASSERT_OK(e.config.insert("polltime", Variant(300)));
    e.runtimeKeys = Vector<String>{"session"};

    ComponentHost::Instance made = host_.addComponent(e, table_);
    ASSERT_OK(made.error) << made.error;
    ASSERT_NE(made.component, nullptr);
    EXPECT_EQ(made.component->state(), Component::State::Started);
    EXPECT_EQ(made.restored, (Vector<String>{"login", "session"}));

    Map<String, Variant> expected{{"login", Variant("stored-login")},
                                  {"password", Variant("file-password")},
                                  {"polltime", Variant(300)},
                                  {"session", Variant("stored-session")}};
    EXPECT_EQ(RecordingComponent::lastConfig, expected);
}

TEST_F(ComponentHostTest, FailureIsRecordedWithTheCauseAndTheStateReached) {
    struct Case {
        char const* componentName;
        char const* id;
        unsigned startupCode;
        bool made;
        Component::State state;  // when made
        unsigned code;
        unsigned causeCode;  // 0: no cause
    } const cases[] = {
        {"ghost", "@test:/unknown", trelm::kSuccess, false, Component::State::Created, trelm::kNotFound, 0},
        {"RuntimeConfiguration", "@test:/recording", trelm::kSuccess, true, Component::State::Created,
         trelm::kFailure, trelm::kInvalid},  // a name taken by a built-in
        {"rec", "@test:/recording", trelm::kNotSignedIn, true, Component::State::Configured, trelm::kFailure,
         trelm::kNotSignedIn},
    };
    for (std::size_t i = 0; i < std::size(cases); ++i) {
        auto const& c = cases[i];
        SCOPED_TRACE(c.componentName + std::string(" ") + c.id);
        RecordingComponent::startupCode = c.startupCode;
        ComponentHost::Instance made = host_.addComponent(entry(c.componentName, c.id), table_);
        EXPECT_CODE(made.error, c.code) << made.error;
        EXPECT_EQ(made.error.cause() ? made.error.cause()->code() : 0u, c.causeCode);
        ASSERT_EQ(made.component != nullptr, c.made);
        if (c.made) {
            EXPECT_EQ(made.component->state(), c.state);
        }
        ASSERT_EQ(host_.instances().size(), i + 1);
        EXPECT_CODE(host_.instances()[i].error, c.code);
    }
}

// Components may still talk to the built-ins while they shut down.
TEST_F(ComponentHostTest, ComponentsShutDownBeforeTheBuiltinsGo) {
    ASSERT_OK(host_.addComponent(entry("rec"), table_).error);
    host_.shutdownAll();
    EXPECT_OK(RecordingComponent::shutdownQuery)
        << RecordingComponent::shutdownQuery;
    EXPECT_EQ(RecordingComponent::storeStateAtShutdown, Component::State::Started);
    EXPECT_EQ(host_.instances()[0].component->state(), Component::State::ShutDown);
}

}  // namespace
