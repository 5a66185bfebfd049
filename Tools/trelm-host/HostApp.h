#pragma once

#include <ostream>
#include <string>
#include <vector>

#include "HostOptions.h"
#include "trelm/uError.h"

namespace trelm {
namespace host {

// The trelm-host program: reads the command line and runs one command.
//
//   trelm-host [options]                        load, configure and start; print what was loaded
//   trelm-host [options] state set TAG KEY VALUE  keep a value in the runtime store under TAG
//   trelm-host [options] state reset TAG KEY...   forget values of the runtime store under TAG
//
// Exit status: 0 when everything asked for worked; 1 when the host could not be set up (state
// folder, configuration file, plug-in, endpoint, built-in component, runtime store); 2 when a
// configured component could not be made, configured or started; CLI11's codes for a malformed
// command line. Failures are written to `err` as uError chains.
//
// Lifetime: `out` and `err` must outlive the object. Thread safety: one run at a time.
class HostApp {
public:
    static constexpr int kExitOk = 0;
    static constexpr int kExitSetupFailed = 1;
    static constexpr int kExitComponentFailed = 2;

    HostApp(std::ostream& out, std::ostream& err);

    int run(int argc, char const* const* argv);

private:
    int runStart(HostOptions const& options);
    int runStateSet(HostOptions const& options, std::string const& tag, std::string const& key,
                    std::string const& value);
    int runStateReset(HostOptions const& options, std::string const& tag,
                      std::vector<std::string> const& keys);
    void report(uError const& error);

    std::ostream& out_;
    std::ostream& err_;
};

}  // namespace host
}  // namespace trelm
