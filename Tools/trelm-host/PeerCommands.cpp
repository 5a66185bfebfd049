#include "PeerCommands.h"

namespace trelm {
namespace host {

PeerCommands::PeerCommands(CLI::App& app) {
    peers_ = app.add_subcommand("peers", "list the friends through the network connector");
    peerStatus_ = app.add_subcommand("peer-status", "show friends' status through the network connector");
    peerStatus_->add_option("uid", ids_, "the friends' user ids")->required();
    setStatus_ = app.add_subcommand("set-status", "set the user's status through the network connector");
    setStatus_->add_option("text", words_, "the status text (words are joined with blanks)")->required();
}

bool PeerCommands::parsed() const { return peers_->parsed() || peerStatus_->parsed() || setStatus_->parsed(); }

uError PeerCommands::run(ConnectorClient& client, PeerPrinter& printer) {
    TRELM_RETURN_IF_ERROR(client.open());
    printer.connection(client.name(), client.userId());
    uError e;
    if (peers_->parsed()) {
        Vector<ConnectorClient::Peer> peers;
        e = client.peers(peers);
        if (e.ok()) {
            for (unsigned i = 0; i < peers.size(); ++i) printer.peer(i + 1, peers[i]);
            printer.peersListed(peers.size());
        }
    } else if (peerStatus_->parsed()) {
        Vector<String> ids;
        for (std::string const& id : ids_) TRELM_RETURN_IF_ERROR(ids.pushBack(String(id)));
        Vector<ConnectorClient::Event> events;
        e = client.peerStatus(ids, events);
        if (e.ok()) {
            for (unsigned i = 0; i < events.size(); ++i) printer.status(ids[i], events[i]);
        }
    } else if (setStatus_->parsed()) {
        std::string text;
        for (std::string const& word : words_) text += (text.empty() ? "" : " ") + word;
        e = client.setStatus(String(text));
        if (e.ok()) printer.statusSet(client.name(), String(text));
    }
    printer.finish();
    return e;
}

}  // namespace host
}  // namespace trelm
