#pragma once

#include "trelm/Export.h"
#include "trelm/String.h"
#include "trelm/uError.h"

namespace trelm {

// Creates `path` with mode 0600 when it does not exist, or narrows an existing file to 0600, so
// that a store opened on it afterwards (SQLite would create it 0644 minus the umask) is never
// readable by others. Symbolic links are refused. kFailure with the path and the reason.
// Thread safety: touches the file system only.
TRELM_API uError createPrivateFile(String const& path);

}  // namespace trelm
