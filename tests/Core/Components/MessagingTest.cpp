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

TEST_F(MessagingTest, TargetedMessageReachesOnlyThatComponentAndReturnsItsResult) {
    Recorder a("a", log_), b("b", log_, TRELM_ERROR(kNotSignedIn));
    ASSERT_OK(registry_.add("a", &a));
    ASSERT_OK(registry_.add("b", &b));
    WipeMessage msg;
    EXPECT_CODE(msg.send("b"), kNotSignedIn);
    EXPECT_EQ(log_, (std::vector<std::string>{"b:WipeMessage"}));
}

TEST_F(MessagingTest, UnknownTargetOrNoActiveRegistryIsNotFound) {
    Recorder a("a", log_);
    ASSERT_OK(registry_.add("a", &a));
    WipeMessage msg;
    EXPECT_CODE(msg.send("RuntimeConfiguration"), kNotFound);
    registry_.deactivate();
    EXPECT_CODE(msg.send("a"), kNotFound);
    EXPECT_CODE(msg.send(""), kNotFound);
    EXPECT_TRUE(log_.empty());
}

TEST_F(MessagingTest, BroadcastReachesEveryoneInOrderAndReturnsTheFirstFailure) {
    Recorder a("a", log_), b("b", log_, TRELM_ERROR(kInvalid)), c("c", log_),
        d("d", log_, TRELM_ERROR(kFailure));
    for (Recorder* r : {&c, &a, &b, &d}) ASSERT_OK(registry_.add(r->name(), r));
    WipeMessage msg;
    EXPECT_CODE(msg.send(""), kInvalid);
    EXPECT_EQ(log_, (std::vector<std::string>{"c:WipeMessage", "a:WipeMessage", "b:WipeMessage",
                                              "d:WipeMessage"}));
}

// On a WipeMessage, sends a second message to `next` (and to everyone), and registers a new
// component, all from inside the handler: nothing may deadlock.
class Forwarder : public Component {
public:
    Forwarder(String name, String next, std::vector<std::string>& log, ComponentRegistry& registry,
              Component* late)
        : Component(name, "@test:/forwarder"),
          next_(next),
          log_(log),
          registry_(registry),
          late_(late) {}

protected:
    uError handleMessage(IMessage& msg) override {
        log_.push_back(name().str() + ":" + msg.type().str());
        if (msg.type() != "WipeMessage") return TRELM_OK();
        TRELM_RETURN_IF_ERROR(registry_.add(late_->name(), late_));
        IMessage inner("Inner");
        TRELM_RETURN_IF_ERROR(inner.send(next_));
        IMessage everyone("Everyone");
        return everyone.send("");
    }

private:
    String next_;
    std::vector<std::string>& log_;
    ComponentRegistry& registry_;
    Component* late_;
};

TEST_F(MessagingTest, HandlerMaySendAndRegisterReentrantly) {
    Recorder late("late", log_);
    Recorder b("b", log_);
    Forwarder a("a", "b", log_, registry_, &late);
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
