#include <gtest/gtest.h>

#include "ErrorAssertions.h"

#include <memory>

#include "BaseSource.h"
#include "ComponentRegistry.h"
#include "ConfigurationChangedMessage.h"
#include "GetUserSidMessage.h"
#include "WakeupMessage.h"

extern "C" trelm::Component* hiddenModuleComponent(trelm::String name);
extern "C" unsigned hiddenModuleAskUserSid(char const* target, trelm::String* result);

namespace trelm {
namespace {

class SidAnswerer : public Component {
public:
    SidAnswerer() : Component("host", "@test:/host") {}

protected:
    uError handleMessage(IMessage& msg) override {
        auto* ask = dynamic_cast<IServiceSource::GetUserSidMessage*>(&msg);
        if (ask == nullptr) return TRELM_ERROR(kNotSupported);
        ask->result = "4711";
        return TRELM_OK();
    }
};

// Messages cross between libtrelm, a module built with hidden visibility and the host program;
// each side must recognise the other's message classes.
TEST(ModuleBoundaryTest, MessagesAreRecognisedAcrossAHiddenVisibilityModule) {
    ComponentRegistry registry;
    registry.activate();
    std::unique_ptr<Component> module(hiddenModuleComponent("module"));
    SidAnswerer host;
    ASSERT_OK(registry.add("module", module.get()));
    ASSERT_OK(registry.add("host", &host));

    WakeupMessage wakeup;
    ASSERT_OK(wakeup.send("module"));
    ASSERT_NE(wakeup.params.search("answered_by"), nullptr);
    EXPECT_EQ(*wakeup.params.search("answered_by"), "module");

    ConfigurationChangedMessage changed(Set<String>{"module_key"});
    EXPECT_OK(changed.send("module"));

    String sid;
    EXPECT_EQ(hiddenModuleAskUserSid("host", &sid), kSuccess);
    EXPECT_EQ(sid, "4711");
    EXPECT_NE(dynamic_cast<BaseSource*>(module.get()), nullptr);
}

}  // namespace
}  // namespace trelm
