#include <gtest/gtest.h>

#include "ErrorAssertions.h"

#include <functional>
#include <map>
#include <string>
#include <vector>

#include "BaseConnector.h"
#include "BaseSource.h"
#include "ConfigurationChangedMessage.h"
#include "IQueryItems.h"
#include "WakeupMessage.h"
#include "WipeMessage.h"

namespace trelm {
namespace {

using Log = std::vector<std::string>;

// A source that records each hook it runs and answers what the test sets for that hook
// (success unless told otherwise).
class RecordingSource : public BaseSource {
public:
    RecordingSource() : BaseSource("source", "@test:/source") {}

    Log log;
    std::map<std::string, uError> answers;

protected:
    uError hook(std::string const& name) {
        log.push_back(name);
        auto it = answers.find(name);
        return it == answers.end() ? TRELM_OK() : it->second;
    }

    uError sendConfigImpl(Configuration::Group const&) override { return hook("sendConfigImpl"); }
    uError startupImpl() override { return hook("startupImpl"); }
    uError shutdownImpl() override { return hook("shutdownImpl"); }
    uError preMessageImpl(IMessage&) override { return hook("preMessageImpl"); }
    uError postMessageImpl(IMessage&, uError const& result) override {
        log.push_back("postMessageImpl(" + std::to_string(result.code()) + ")");
        return TRELM_OK();
    }
    uError configurationChangedImpl(ConfigurationChangedMessage& msg) override {
        return hook("configurationChangedImpl(" + std::to_string(msg.keys.size()) + ")");
    }
    uError manageInputDataImpl(Record&, bool flag) override {
        return hook(std::string("manageInputDataImpl(") + (flag ? "true" : "false") + ")");
    }
    uError manageUpdateDataImpl(Record&, Record const& previous) override {
        return hook("manageUpdateDataImpl(" + std::to_string(previous.size()) + ")");
    }
    uError modifyRetrievedData(Record&) override { return hook("modifyRetrievedData"); }
    uError insertData(Record&) override { return hook("insertData"); }
    uError postInsert(Record const&) override { return hook("postInsert"); }
    uError updateData(Record&) override { return hook("updateData"); }
    uError postUpdate(Record const&) override { return hook("postUpdate"); }
    uError markDataInvisible(GUID const&) override { return hook("markDataInvisible"); }
    uError postMarkInvisible(GUID const&) override { return hook("postMarkInvisible"); }
    uError removeData(GUID const&, bool) override { return hook("removeData"); }
    uError postRemove(GUID const&) override { return hook("postRemove"); }
    uError retrieveData(GUID const&, Record&, bool) override { return hook("retrieveData"); }
    uError checkQuery(IQueryItems::StartQueryMessage const&, bool interactive) override {
        return hook(std::string("checkQuery(") + (interactive ? "true" : "false") + ")");
    }
    uError doStartQuery(IQueryItems::StartQueryMessage&, bool) override {
        return hook("doStartQuery");
    }
};

struct SequenceCase {
    char const* name;
    std::function<uError(RecordingSource&)> call;
    Log expected;
};

class SourceSequenceTest : public testing::TestWithParam<SequenceCase> {};

// Each hook in turn fails (none at first); the sequence runs up to the failing hook and returns
// its error. The post-message hook's answer is ignored by design.
TEST_P(SourceSequenceTest, HooksRunInOrderAndTheFirstFailingOneStopsThemAndIsReturned) {
    Log const& expected = GetParam().expected;
    for (std::size_t failing = 0; failing <= expected.size(); ++failing) {
        RecordingSource source;
        if (failing == expected.size()) {
            EXPECT_OK(GetParam().call(source));
            EXPECT_EQ(source.log, expected);
            continue;
        }
        if (expected[failing].rfind("postMessageImpl", 0) == 0) continue;
        source.answers[expected[failing]] = TRELM_ERROR(kServiceError);
        EXPECT_CODE(GetParam().call(source), kServiceError) << expected[failing];
        Log prefix(expected.begin(), expected.begin() + failing + 1);
        if (expected.front() == "preMessageImpl" && failing > 0)
            prefix.push_back("postMessageImpl(" + std::to_string(unsigned(kServiceError)) + ")");
        EXPECT_EQ(source.log, prefix) << "failing " << expected[failing];
    }
}

BaseSource::Record someRecord() {
    return BaseSource::Record{{"core_object_type", 4}};
}

// A message-driven entry point: the message's own hooks between the pre- and post-message hooks.
template <class Message>
std::function<uError(RecordingSource&)> sending(std::function<void(Message&)> prepare = {}) {
    return [prepare](RecordingSource& s) {
        Message msg;
        if (prepare) prepare(msg);
        return s.onMessage(msg);
    };
}

INSTANTIATE_TEST_SUITE_P(
    Table, SourceSequenceTest,
    testing::Values(
        SequenceCase{"sendConfig", [](RecordingSource& s) { return s.sendConfig(Configuration::Group("g")); },
                     {"sendConfigImpl"}},
        SequenceCase{"startup", [](RecordingSource& s) { return s.startup(); }, {"startupImpl"}},
        SequenceCase{"shutdown", [](RecordingSource& s) { return s.shutdown(); }, {"shutdownImpl"}},
        SequenceCase{"insert", [](RecordingSource& s) { auto r = someRecord(); return s.insert(r); },
                     {"manageInputDataImpl(false)", "insertData", "postInsert"}},
        SequenceCase{"update", [](RecordingSource& s) { auto r = someRecord(); return s.update(r); },
                     {"manageUpdateDataImpl(0)", "updateData", "postUpdate"}},
        SequenceCase{"remove", [](RecordingSource& s) { return s.remove(GUID(), true); }, {"removeData", "postRemove"}},
        SequenceCase{"markInvisible", [](RecordingSource& s) { return s.markInvisible(GUID()); },
                     {"markDataInvisible", "postMarkInvisible"}},
        SequenceCase{"retrieve", [](RecordingSource& s) { BaseSource::Record r; return s.retrieve(GUID(), r, false); },
                     {"retrieveData", "modifyRetrievedData"}},
        SequenceCase{"startQueryMessage",
                     sending<IQueryItems::StartQueryMessage>([](auto& m) { m.interactive = false; }),
                     {"preMessageImpl", "checkQuery(false)", "doStartQuery", "postMessageImpl(0)"}},
        SequenceCase{"interactiveStartQueryMessage",
                     sending<IQueryItems::StartQueryMessage>([](auto& m) { m.interactive = true; }),
                     {"preMessageImpl", "checkQuery(true)", "doStartQuery", "postMessageImpl(0)"}},
        SequenceCase{"configurationChangedMessage",
                     sending<ConfigurationChangedMessage>([](auto& m) { m.keys = Set<String>{"a", "b"}; }),
                     {"preMessageImpl", "configurationChangedImpl(2)", "postMessageImpl(0)"}},
        SequenceCase{"otherMessage", sending<WipeMessage>(), {"preMessageImpl", "postMessageImpl(0)"}}),
    [](testing::TestParamInfo<SequenceCase> const& info) { return info.param.name; });

TEST(BaseSourceTest, MessageWithAKnownNameButAnotherClassIsRefused) {
    RecordingSource source;
    IMessage impostor(ConfigurationChangedMessage::kType);
    EXPECT_CODE(source.onMessage(impostor), kInvalid);
    EXPECT_EQ(source.log, (Log{"preMessageImpl", "postMessageImpl(2147483652)"}));
}

TEST(ComponentTest, StateFollowsTheEntryPointsThatSucceeded) {
    RecordingSource source;
    using State = Component::State;
    source.answers["sendConfigImpl"] = TRELM_ERROR(kInvalid);
    auto configure = [&] { return source.sendConfig(Configuration::Group("g")); };
    std::vector<State> states{source.state()};
    EXPECT_CODE(configure(), kInvalid);
    states.push_back(source.state());
    source.answers.clear();
    for (auto const& step : std::vector<std::function<uError()>>{configure, [&] { return source.startup(); }, configure,
                                                                 [&] { return source.stop(); },
                                                                 [&] { return source.shutdown(); }}) {
        EXPECT_OK(step());
        states.push_back(source.state());
    }
    EXPECT_EQ(states, (std::vector<State>{State::Created, State::Created, State::Configured, State::Started,
                                          State::Started, State::Stopped, State::ShutDown}));
}

// The connector's own message: its hook answers for the message (the hooks around every message
// run as the source's table shows).
TEST(BaseConnectorTest, WakeupMessageReachesWakeupImpl) {
    struct Connector : BaseConnector {
        Connector() : BaseConnector("connector", "@test:/connector") {}
        String account;
        uError wakeupImpl(WakeupMessage* msg) override {
            account = msg->params.empty() ? String("none") : msg->params.begin()->first;
            return TRELM_ERROR(kNoData);
        }
    } connector;
    WakeupMessage msg(Map<String, String>{{"source", ""}});
    EXPECT_CODE(connector.onMessage(msg), kNoData);
    EXPECT_EQ(connector.account, "source");
}

}  // namespace
}  // namespace trelm
