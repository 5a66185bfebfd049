#include <gtest/gtest.h>

#include "ErrorAssertions.h"

#include <string>
#include <vector>

#include "Component.h"
#include "ComponentRegistry.h"
#include "IMessage.h"
#include "WipeMessage.h"

namespace trelm {
namespace {

// Records every message it receives into a log shared by the test, as "name:type".
class Recorder : public Component {
public:
    Recorder(String name, std::vector<std::string>& log, uError answer = uError())
        : Component(name, "@test:/recorder"), log_(log), answer_(answer) {}

protected:
    uError handleMessage(IMessage& msg) override {
        log_.push_back(name().str() + ":" + msg.type().str());
        return answer_;
    }

private:
    std::vector<std::string>& log_;
    uError answer_;
};

class MessagingTest : public testing::Test {
protected:
    void SetUp() override { registry_.activate(); }

    std::vector<std::string> log_;
    ComponentRegistry registry_;
};

// Components c, a, b (answering kInvalid), d (kFailure) registered in that order. A target gets
// the message alone; an empty target is everyone in registration order, answered with the first
// failure; an unknown target, or any target without an active registry, is not found.
TEST_F(MessagingTest, MessageReachesItsTargetOrEveryoneAndReturnsTheirResult) {
    struct Case {
        char const* target;
        bool active;
        unsigned code;
        std::vector<std::string> log;
    } const cases[] = {
        {"b", true, kInvalid, {"b:WipeMessage"}},
        {"c", true, kSuccess, {"c:WipeMessage"}},
        {"", true, kInvalid, {"c:WipeMessage", "a:WipeMessage", "b:WipeMessage", "d:WipeMessage"}},
        {"RuntimeConfiguration", true, kNotFound, {}},
        {"a", false, kNotFound, {}},
        {"", false, kNotFound, {}},
    };
    Recorder a("a", log_), b("b", log_, TRELM_ERROR(kInvalid)), c("c", log_), d("d", log_, TRELM_ERROR(kFailure));
    for (Recorder* r : {&c, &a, &b, &d}) ASSERT_OK(registry_.add(r->name(), r));
    for (Case const& k : cases) {
        SCOPED_TRACE(std::string("'") + k.target + (k.active ? "'" : "' inactive"));
        log_.clear();
        if (!k.active) registry_.deactivate();
        WipeMessage msg;
        EXPECT_CODE(msg.send(k.target), k.code);
        EXPECT_EQ(log_, k.log);
        registry_.activate();
    }
}

// On a WipeMessage, "a" registers a new component and sends a message to "b" and one to everyone,
// all from inside its handler: nothing may deadlock.
TEST_F(MessagingTest, HandlerMaySendAndRegisterReentrantly) {
    struct Forwarder : Recorder {
        Forwarder(std::vector<std::string>& log, ComponentRegistry& registry, Component& late)
            : Recorder("a", log), registry(registry), late(late) {}
        uError handleMessage(IMessage& msg) override {
            TRELM_RETURN_IF_ERROR(Recorder::handleMessage(msg));
            if (msg.type() != "WipeMessage") return TRELM_OK();
            TRELM_RETURN_IF_ERROR(registry.add(late.name(), &late));
            IMessage inner("Inner");
            TRELM_RETURN_IF_ERROR(inner.send("b"));
            IMessage everyone("Everyone");
            return everyone.send("");
        }
        ComponentRegistry& registry;
        Component& late;
    };
    Recorder late("late", log_);
    Recorder b("b", log_);
    Forwarder a(log_, registry_, late);
    ASSERT_OK(registry_.add("a", &a));
    ASSERT_OK(registry_.add("b", &b));
    WipeMessage msg;
    ASSERT_OK(msg.send("a"));
    EXPECT_EQ(log_, (std::vector<std::string>{"a:WipeMessage", "b:Inner", "a:Everyone",
                                              "b:Everyone", "late:Everyone"}));
}

TEST(ComponentRegistryTest, NamesAreUniqueAndKeptInRegistrationOrder) {
    std::vector<std::string> log;
    Recorder a("a", log), b("b", log);
    ComponentRegistry registry;
    EXPECT_OK(registry.add("z", &a));
    EXPECT_OK(registry.add("y", &b));
    EXPECT_CODE(registry.add("z", &b), kInvalid);
    EXPECT_CODE(registry.add("", &b), kInvalid);
    EXPECT_CODE(registry.add("x", nullptr), kInvalid);
    EXPECT_EQ(registry.names(), (Vector<String>{"z", "y"}));
    EXPECT_EQ(registry.find("z"), &a);
    EXPECT_OK(registry.remove("z"));
    EXPECT_CODE(registry.remove("z"), kNotFound);
    EXPECT_EQ(registry.find("z"), nullptr);
    EXPECT_OK(registry.add("z", &a));
    EXPECT_EQ(registry.names(), (Vector<String>{"y", "z"}));
}

TEST(ComponentRegistryTest, DestroyingTheActiveRegistryDeactivatesItOnly) {
    ComponentRegistry outer;
    outer.activate();
    {
        ComponentRegistry inner;
        inner.activate();
        EXPECT_EQ(ComponentRegistry::active(), &inner);
    }
    EXPECT_EQ(ComponentRegistry::active(), nullptr);
    outer.activate();
    {
        ComponentRegistry idle;
    }
    EXPECT_EQ(ComponentRegistry::active(), &outer);
    outer.deactivate();
}

}  // namespace
}  // namespace trelm
