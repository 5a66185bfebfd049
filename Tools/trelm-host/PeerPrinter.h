#pragma once

#include <cstddef>
#include <ostream>
#include <string>
#include <vector>

#include "NetworkMetadata.h"
#include "Printer.h"
#include "trelm/String.h"

namespace trelm {
namespace host {

// Writes what the host learnt from a network connector, in the host's two formats (see
// Printer): aligned tables for a person, JSON lines for programs.
//
// JSON lines written:
//   {"type":"connection","name":N,"user":U}           (U: the "FacebookID" the connector wrote back)
//   {"type":"peer","index":N,"uid":U,"first_name":F,"last_name":L,"name":FULL,"profile_url":P}
//   {"type":"peers","count":N}
//   {"type":"peer_status","uid":U,"status":TEXT,"time":T}   (T: seconds since the epoch, 0 for none)
//   {"type":"status_set","name":N,"text":TEXT}
// Tables: one row per peer (UID, FIRST NAME, LAST NAME, NAME, PROFILE) or per status (UID, TIME
// in UTC or "-" for none, STATUS), gathered and written by finish() so that the columns line up.
//
// Lifetime: `out` must outlive the printer. Thread safety: none; the controlling thread's.
class PeerPrinter {
public:
    PeerPrinter(Printer::Format format, std::ostream& out);

    void connection(String const& name, String const& userId);
    void peer(unsigned index, NetworkMetadata::tRELMNetworkPeer const& peer);
    void peersListed(std::size_t count);
    void status(String const& uid, NetworkMetadata::tRELMNetworkEvent const& event);
    void statusSet(String const& name, String const& text);
    // Writes the gathered table; call once at the end.
    void finish();

private:
    void gather(std::vector<std::string> header, std::vector<std::string> row);

    Printer::Format const format_;
    std::ostream& out_;
    std::vector<std::vector<std::string>> rows_;  // table rows waiting for finish(), header first
};

}  // namespace host
}  // namespace trelm
