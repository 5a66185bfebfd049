#pragma once

#include <optional>
#include <string>
#include <vector>

#include "Pacing.h"
#include "Printer.h"

namespace trelm {
namespace host {

// The command line's settings shared by every command of the host.
struct HostOptions {
    std::vector<std::string> plugins;  // empty: PluginLoader::defaultPluginPath()
    std::string configPath;            // empty: no components, no http/runtime settings
    Printer::Format format = Printer::Format::Table;
    std::string stateDir;              // empty: StateDirectory's default
    std::optional<bool> emulator;      // unset: on unless an endpoint is named
    std::vector<std::string> connectTo;  // replaces the routing when not empty
    std::string caFile;                // replaces the trusted CA file when not empty
    long long emulatorFriends = 0;
    Pacing pacing;                     // waits out a throttled or unavailable service     // friends of the embedded emulator's demo user; 0: its default
};

}  // namespace host
}  // namespace trelm
