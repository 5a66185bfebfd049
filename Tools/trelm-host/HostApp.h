#pragma once

#include <functional>
#include <istream>
#include <ostream>
#include <string>
#include <vector>

#include "HostOptions.h"
#include "HostSession.h"
#include "Printer.h"
#include "SourceClient.h"
#include "trelm/uError.h"

namespace trelm {
namespace host {

// The trelm-host program: reads the command line and runs one command.
//
//   trelm-host [options]                        load, configure and start; print what was loaded
//   trelm-host [options] state set TAG KEY VALUE  keep a value in the runtime store under TAG
//   trelm-host [options] state reset TAG KEY...   forget values of the runtime store under TAG
//   trelm-host [options] demo [--friends N] [--status TEXT] [--photo FILE]   the tour (DemoTour)
//   trelm-host [options] query|insert ...         one item command (ItemCommands)
//   trelm-host [options] shell                    item commands read from `in` (HostShell)
//   trelm-host [options] sync [KIND ...]          every item into the host's item store (SyncCommand)
//   trelm-host [options] items KIND [--where ...] what sync stored, without the service (ItemsCommand)
//   trelm-host [options] peers|peer-status|set-status ...   through the first network connector
//                                                (PeerCommands)
// The item commands and the demo work on the first configured data source, which the host
// signs in first when it has no stored session (SourceClient).
//
// Exit status: 0 when everything asked for worked; 1 when the host could not be set up (state
// folder, configuration file, plug-in, endpoint, built-in component, runtime store); 2 when a
// configured component could not be made, configured or started; 3 when an item command, a
// step of the demo, the sign-in or a line of the shell failed; CLI11's codes for a malformed
// command line. Failures are written to `err` as uError chains.
//
// Lifetime: the streams must outlive the object. Thread safety: one run at a time.
class HostApp {
public:
    static constexpr int kExitOk = 0;
    static constexpr int kExitSetupFailed = 1;
    static constexpr int kExitComponentFailed = 2;
    static constexpr int kExitCommandFailed = 3;

    HostApp(std::istream& in, std::ostream& out, std::ostream& err);

    int run(int argc, char const* const* argv);

private:
    int runStart(HostOptions const& options);
    // Opens a session, runs `command` with a client of its data source, shuts down.
    int runWithSource(HostOptions const& options,
                      std::function<uError(SourceClient& client, Printer& printer, HostSession& session)> const& command);
    int runStateSet(HostOptions const& options, std::string const& tag, std::string const& key,
                    std::string const& value);
    int runStateReset(HostOptions const& options, std::string const& tag,
                      std::vector<std::string> const& keys);
    void report(uError const& error);

    std::istream& in_;
    std::ostream& out_;
    std::ostream& err_;
    bool verbose_ = false;  // --verbose: errors name their source locations
};

}  // namespace host
}  // namespace trelm
