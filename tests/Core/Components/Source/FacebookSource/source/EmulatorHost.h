#pragma once

#include <memory>
#include <string>
#include <vector>

#include "ComponentRegistry.h"
#include "FacebookLibrary.h"
#include "Emulator.h"
#include "FacebookSource.h"
#include "HttpRequestFactory.h"
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
    ComponentRegistry& registry() { return registry_; }
    RuntimeConfiguration& runtime() { return runtime_; }

    // The source's configuration group with the demo application, and when `session` is set a
    // fresh session of the demo user.
    Configuration::Group demoGroup(String const& name, bool session);

    // Makes a source, registers it, configures it with `group` and starts it.
    FacebookSource& addSource(Configuration::Group const& group);
    // Makes a source and registers it, nothing more.
    FacebookSource& addBareSource(String const& name);
    // Registers a component the test owns; it is unregistered at destruction.
    void addComponent(String const& name, Component& component);

    // A client of its own, signed in with a fresh session of the demo user, for reading what the
    // service holds independently of the source.
    SmartPtr<FacebookLibrary> demoClient();
    // Runs one statement with demoClient(); the rows' `field` values in answer order.
    std::vector<std::string> fqlColumn(std::string const& query, std::string const& table, std::string const& field);

    // The FQL statements the emulator answered since the log was last cleared, in order.
    std::vector<std::string> fqlStatements();

private:
    std::unique_ptr<emu::Emulator> emulator_;
    // Declared before the components: destroyed after them.
    ComponentRegistry registry_;
    HttpRequestFactory http_;
    RuntimeConfiguration runtime_;
    std::vector<std::unique_ptr<FacebookSource>> sources_;
    std::vector<String> registered_;
};

}  // namespace trelm::test
