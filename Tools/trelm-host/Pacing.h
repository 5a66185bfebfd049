#pragma once

#include <functional>
#include <ostream>

#include "trelm/uError.h"

namespace trelm {
namespace host {

// How the host rides out a throttled or briefly unavailable service: a step that fails with the
// service's request limit (kRequestLimit, service codes 4 and 613) or "service unavailable"
// (kServiceUnavailable, code 2), anywhere in its error chain, is tried again after a wait that
// doubles each time (from `firstWaitSeconds`, at most `maxWaitSeconds`), with random jitter of up
// to half the wait so that several hosts do not come back in step. It gives up after `attempts`
// tries in all or once the waits would pass `maxTotalSeconds`, returning the last failure.
struct Pacing {
    unsigned attempts = 6;
    double firstWaitSeconds = 0.5;
    double maxWaitSeconds = 8;
    double maxTotalSeconds = 60;

    // True when `error` is worth waiting out.
    static bool transient(uError const& error);

    // Runs `step` until it succeeds, fails otherwise than transiently, or the pacing is spent.
    // Each wait is reported on `log` as one line naming `what`, the reason, the wait and the
    // attempt. `sleep` waits the given seconds (the real clock unless a test gives another).
    uError run(char const* what, std::function<uError()> const& step, std::ostream& log,
               std::function<void(double)> const& sleep = {}) const;
};

}  // namespace host
}  // namespace trelm
