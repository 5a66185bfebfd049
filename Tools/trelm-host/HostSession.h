#pragma once

#include <string>

#include "ComponentHost.h"
#include "EmbeddedEmulator.h"
#include "HostConfig.h"
#include "HostOptions.h"
#include "LoginListener.h"
#include "PluginLoader.h"
#include "Printer.h"
#include "trelm/uError.h"

namespace trelm {
namespace host {

// Everything a host command works with, brought up in order: the state folder, the
// configuration file, the plug-ins, the endpoint (the embedded emulator or the configured
// routing), the built-in components, the host's login-status listener and then every configured
// component. Commands that act on components (listing them, queries and data operations) open a
// session and use host() afterwards.
//
// Ownership: owns the loader, the emulator, the login listener and the component host. Members
// are ordered so that the components go first, then the listener they broadcast to, then the
// emulator they may talk to, then the plug-in modules whose code they run.
// Thread safety: used by the host's controlling thread.
class HostSession {
public:
    explicit HostSession(HostOptions options);
    ~HostSession();
    HostSession(HostSession const&) = delete;
    HostSession& operator=(HostSession const&) = delete;

    // Brings everything up, reporting each plug-in, the endpoint and each component to `printer`
    // as it goes. Returns the first failure that kept the components from being made (state
    // folder, configuration, plug-in, emulator, built-in component). A component that fails is
    // not a session failure: see allStarted() and host().instances().
    uError open(Printer& printer);

    // True when every configured component reached the started state.
    bool allStarted() const;

    ComponentHost& host() noexcept { return host_; }
    LoginListener& loginListener() noexcept { return loginListener_; }
    // The configuration file's entry of the component named `name`, or null.
    HostConfig::ComponentEntry const* entry(String const& name) const;
    HostConfig const& config() const noexcept { return config_; }
    HostOptions const& options() const noexcept { return options_; }
    std::string const& stateDir() const noexcept { return stateDir_; }

private:
    uError prepareEndpoint(Printer& printer, Map<String, Variant>& http);
    // kInvalid, naming the file and what to do, unless `path` is a readable file with a PEM
    // certificate in its first 64 KiB.
    static uError checkCaFile(std::string const& path);

    HostOptions const options_;
    HostConfig config_;
    std::string stateDir_;

    // Destroyed in reverse order: host_, then loginListener_, emulator_, plugins_.
    PluginLoader plugins_;
    EmbeddedEmulator emulator_;
    LoginListener loginListener_;
    ComponentHost host_;
};

}  // namespace host
}  // namespace trelm
