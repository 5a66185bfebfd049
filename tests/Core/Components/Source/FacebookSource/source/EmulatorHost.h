#pragma once

#include <cstdint>
#include <memory>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "ComponentRegistry.h"
#include "Emulator.h"
#include "EmulatorRows.h"
#include "FacebookLibrary.h"
#include "FacebookSource.h"
#include "HttpRequestFactory.h"
#include "IQueryItems.h"
#include "RuntimeConfiguration.h"
#include "trelm/Configuration.h"
#include "trelm/String.h"

namespace trelm::test {

// The in-process service emulator and a host around it: an active registry with the real
// "HttpRequestFactory" (sending the service's host name to the emulator's ports and trusting its
// CA) and an in-memory "RuntimeConfiguration". Sources made here are registered under their name
// and unregistered before they are destroyed.
//
// Lifetime: one per test suite or test; start() before use.
class EmulatorHost {
public:
    explicit EmulatorHost(emu::GeneratorOptions const& generator = {});
    ~EmulatorHost();

    // Starts the emulator and registers the host components. False (with the reason) on failure.
    bool start(std::string& error);

    emu::Emulator& emulator() { return *emulator_; }
    RuntimeConfiguration& runtime() { return runtime_; }

    // The source's configuration group with the demo application, and when `session` is set a
    // fresh session of the demo user.
    Configuration::Group demoGroup(String const& name, bool session);

    // Makes a source named after `group` and registers it; with `configure`, configures it with
    // `group` and starts it.
    FacebookSource& addSource(Configuration::Group const& group, bool configure = true);
    // Registers a component the test owns; it is unregistered at destruction.
    void addComponent(String const& name, Component& component);

    // A client of its own, signed in with a fresh session of the demo user.
    SmartPtr<FacebookLibrary> demoClient();
    // What the service holds: one statement run as the demo user on the emulator's store.
    std::vector<emu::test::Row> fql(std::string const& query) {
        return emu::test::fqlRows(emulator_->store(), emu::DemoAccount::uid, query);
    }

    // The FQL statements the emulator answered since the log was last cleared, in order.
    std::vector<std::string> fqlStatements();

    using Cursor = SmartPtr<IQueryItems::ICursor>;
    using Record = Map<String, Variant>;
    // Starts a query for object `type` (plus `extra` constraints) on `source` as a host would.
    static Cursor open(FacebookSource& source, int type, Vector<IQueryItems::Column> const& columns = {},
                       std::vector<IQueryItems::Constraint> const& extra = {}, std::int64_t position = -1);
    // The records from the current row on, moving by `step` until the cursor stops; in the
    // cursor's order whichever way it went.
    static std::vector<Record> walk(IQueryItems::ICursor& cursor, int step = 1);
    // The record's `key` as text; "<none>" when it lacks the key.
    static std::string text(Record const& record, char const* key);
    // The ordering the event cursors serve: time, service, service id, all descending.
    static Vector<IQueryItems::Column> eventOrdering();

private:
    std::unique_ptr<emu::Emulator> emulator_;
    // Declared before the components: destroyed after them.
    ComponentRegistry registry_;
    HttpRequestFactory http_;
    RuntimeConfiguration runtime_;
    std::vector<std::unique_ptr<FacebookSource>> sources_;
    std::vector<String> registered_;
};

// A test suite's host, started once for the suite with `generator`, and its source "facebook"
// signed in as the demo user. Each test starts with an empty request log.
class EmulatorSuite : public ::testing::Test {
protected:
    static void startSuite(emu::GeneratorOptions const& generator = {}) {
        host = new EmulatorHost(generator);
        std::string error;
        ASSERT_TRUE(host->start(error)) << error;
        source = &host->addSource(host->demoGroup("facebook", true));
    }
    static void TearDownTestSuite() {
        delete host;
        host = nullptr;
        source = nullptr;
    }
    void SetUp() override { host->emulator().log().clear(); }

    static inline EmulatorHost* host = nullptr;
    static inline FacebookSource* source = nullptr;
};

}  // namespace trelm::test
