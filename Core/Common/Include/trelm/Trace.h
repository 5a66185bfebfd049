#pragma once

#include <functional>

#include "trelm/Export.h"
#include "trelm/String.h"

namespace trelm {

// The host's trace: where a component reports what it cannot act on (an error it formats with
// uError::format and drops, a failed notification). One line per call, no trailing newline.
// Never pass secrets (passwords, session secrets) to it.
//
// By default a line goes to stderr, and only when the environment variable TRELM_TRACE is set
// (it is read once, at the first trace); otherwise lines are dropped.
//
// Thread safety: trace and setTraceSink may be called from any thread. The sink is copied out
// under a lock and called without it, so a sink may itself trace; a sink must be thread-safe.
using TraceSink = std::function<void(String const& line)>;

TRELM_API void trace(String const& line);

class uError;

// Reports an error that `who` goes on without: one trace line per level of the chain,
//   "<who>: <what>: 0x80000001 at Core/.../FacebookLibrary:120"
//   "<who>:   caused by 0x80000010 at Core/Common/Include/trelm/Map:70"
// `what` names the step that failed. The chain holds codes, locations and the messages the code
// gave them, so what is traced is only as secret as those messages (none carries a credential).
TRELM_API void traceError(char const* who, char const* what, uError const& err);

// Installs `sink` for every later trace (an empty function restores the default) and returns
// the sink it replaces (empty when that was the default).
TRELM_API TraceSink setTraceSink(TraceSink sink);

}  // namespace trelm
