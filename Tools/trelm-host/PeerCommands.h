#pragma once

#include <string>
#include <vector>

#include <CLI/CLI.hpp>

#include "ConnectorClient.h"
#include "PeerPrinter.h"
#include "trelm/uError.h"

namespace trelm {
namespace host {

// The commands that work through the first configured network connector:
//
//   peers                  the friends with first name, last name, full name and profile address
//   peer-status UID...     the status of each friend named, in one request
//   set-status TEXT...     sets the user's status (words are joined with blanks)
//
// Each connects the connector first (ConnectorClient::open) and prints a "connection" line.
//
// Lifetime: `app` must outlive the object; the values the options write live in the object.
// Thread safety: used by the host's controlling thread.
class PeerCommands {
public:
    explicit PeerCommands(CLI::App& app);
    PeerCommands(PeerCommands const&) = delete;
    PeerCommands& operator=(PeerCommands const&) = delete;

    // True when the parsed command line names one of the commands.
    bool parsed() const;

    // Connects and runs the parsed command. Errors: the connection's (see ConnectorClient::open)
    // and whatever the connector answers. REQUIRES: parsed().
    uError run(ConnectorClient& client, PeerPrinter& printer);

private:
    CLI::App* peers_ = nullptr;
    CLI::App* peerStatus_ = nullptr;
    CLI::App* setStatus_ = nullptr;

    std::vector<std::string> ids_;
    std::vector<std::string> words_;
};

}  // namespace host
}  // namespace trelm
