#include "PeerPrinter.h"

#include <algorithm>
#include <utility>

#include "JsonText.h"
#include "TerminalText.h"

namespace trelm {
namespace host {

PeerPrinter::PeerPrinter(Printer::Format format, std::ostream& out) : format_(format), out_(out) {}

void PeerPrinter::connection(String const& name, String const& userId) {
    if (format_ == Printer::Format::JsonLines) {
        writeJsonLine(out_, {{"type", "connection"}, {"name", name.str()}, {"user", userId.str()}});
        return;
    }
    out_ << "connected " << name << " as " << (userId.empty() ? "?" : userId.str()) << '\n';
}

void PeerPrinter::peer(unsigned index, NetworkMetadata::tRELMNetworkPeer const& peer) {
    if (format_ == Printer::Format::JsonLines) {
        writeJsonLine(out_, {{"type", "peer"},
                         {"index", index},
                         {"uid", peer.serviceId.str()},
                         {"first_name", peer.firstName.str()},
                         {"last_name", peer.lastName.str()},
                         {"name", peer.fullName.str()},
                         {"profile_url", peer.profileUrl.str()}});
        return;
    }
    gather(
        {"UID", "FIRST NAME", "LAST NAME", "NAME", "PROFILE"},
        {peer.serviceId.str(), peer.firstName.str(), peer.lastName.str(), peer.fullName.str(), peer.profileUrl.str()});
}

void PeerPrinter::peersListed(std::size_t count) {
    if (format_ == Printer::Format::JsonLines) {
        writeJsonLine(out_, {{"type", "peers"}, {"count", count}});
        return;
    }
    finish();
    out_ << "listed    " << count << (count == 1 ? " peer" : " peers") << '\n';
}

void PeerPrinter::status(String const& uid, NetworkMetadata::tRELMNetworkEvent const& event) {
    if (format_ == Printer::Format::JsonLines) {
        writeJsonLine(out_, {{"type", "peer_status"},
                         {"uid", uid.str()},
                         {"status", event.statusText.str()},
                         {"time", event.statusTime}});
        return;
    }
    gather({"UID", "TIME (UTC)", "STATUS"}, {uid.str(), event.statusTime == 0 ? "-" : utcText(event.statusTime), event.statusText.str()});
}

void PeerPrinter::statusSet(String const& name, String const& text) {
    if (format_ == Printer::Format::JsonLines) {
        writeJsonLine(out_, {{"type", "status_set"}, {"name", name.str()}, {"text", text.str()}});
        return;
    }
    out_ << "status    set through " << name << ": " << terminalText(text.view()) << '\n';
}

void PeerPrinter::gather(std::vector<std::string> header, std::vector<std::string> row) {
    if (rows_.empty()) rows_.push_back(std::move(header));
    rows_.push_back(std::move(row));
}

void PeerPrinter::finish() {
    writeTable(out_, rows_);
    rows_.clear();
    out_.flush();
}

}  // namespace host
}  // namespace trelm
