#pragma once

#include <istream>
#include <ostream>

#include "Printer.h"
#include "SourceClient.h"

namespace trelm {
namespace host {

// Runs item commands read line by line in one running host, so that a later line can fetch
// again what an earlier one listed (the client keeps the last query's cursor open). Each line is
// one of ItemCommands' commands, written as on the command line (quotes group words); empty
// lines and lines starting with '#' are passed over; "quit" or the end of input ends the shell.
// A line that fails is reported to `err` and the shell goes on with the next.
//
// Lifetime: the streams must outlive the object. Thread safety: one thread.
class HostShell {
public:
    // `verbose`: errors name the source locations that made them.
    HostShell(std::istream& in, std::ostream& out, std::ostream& err, bool verbose = false);

    // Returns the number of lines that failed (malformed or refused).
    // REQUIRES: client.open() succeeded.
    int run(SourceClient& client, Printer& printer);

private:
    std::istream& in_;
    std::ostream& out_;
    std::ostream& err_;
    bool const verbose_;
};

}  // namespace host
}  // namespace trelm
