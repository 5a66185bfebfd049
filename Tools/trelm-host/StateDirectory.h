#pragma once

#include <string>

#include "trelm/uError.h"

namespace trelm {
namespace host {

// The folder where the host keeps what outlives a run: the runtime-configuration store, which
// holds the sessions that components obtained.
//
// Thread safety: the functions touch the file system only; callers serialise uses of one folder.
class StateDirectory {
public:
    // Resolves `requested` (empty: "$HOME/.trelm-host", or the account's home folder when HOME is
    // unset) into `path` and creates the folder, with its missing parents, when it does not exist;
    // a folder made here gets mode 0700 whatever the umask. An existing folder is used as it is.
    // kFailure, with the path, the reason and a remedy, when it cannot be made, is not a folder or
    // cannot be written.
    static uError prepare(std::string const& requested, std::string& path);

    // The runtime-configuration store inside the folder.
    static std::string runtimeStorePath(std::string const& folder);
    // The item store inside the folder.
    static std::string itemStorePath(std::string const& folder);
};

}  // namespace host
}  // namespace trelm
