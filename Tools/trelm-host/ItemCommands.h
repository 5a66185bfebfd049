#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include <CLI/CLI.hpp>

#include "Printer.h"
#include "SourceClient.h"
#include "trelm/uError.h"

namespace trelm {
namespace host {

// The commands that work on the data source's items, defined once for the program's command
// line and for the lines of the shell:
//
//   query TYPE [--limit N] [--skip N] [--where KEY=VALUE ...] [--order KEY[:asc|:desc]]
//              [--since TIME] [--all]
//   insert status TEXT
//   insert photo FILE [--caption C] [--album AID]
//   retrieve GUID|#N [--from TYPE and the options of query]
//   quit                      (shell only)
//
// TYPE is one of ItemQuery's kind names. A listing prints each record, then a "listed" line; an
// insert prints an "inserted" line (with "core_service_id" for a photo); a retrieval prints the
// record. A retrieval fetches a record of the last listing again, #N being its N-th record;
// with --from it first lists TYPE as query would. The source keeps records only while the
// listing's cursor is open, so on the program's command line, where nothing was listed before,
// --from is required.
//
// Lifetime: `app` must outlive the object; the values the options write live in the object.
// Thread safety: used by the host's controlling thread.
class ItemCommands {
public:
    static constexpr unsigned kDefaultLimit = 20;

    // Adds the commands to `app`; quit only when `shell`.
    ItemCommands(CLI::App& app, bool shell);
    ItemCommands(ItemCommands const&) = delete;
    ItemCommands& operator=(ItemCommands const&) = delete;

    // True when the parsed command line names one of the commands (quit included).
    bool parsed() const;
    bool quitParsed() const;

    // Runs the parsed command. Errors: a malformed condition or GUID (kInvalid), a file that
    // cannot be read (kNotFound), a record number with no record (kNotFound), and whatever the
    // source answers.
    // REQUIRES: parsed(), and client.open() succeeded.
    uError run(SourceClient& client, Printer& printer);

private:
    uError runQuery(SourceClient& client, Printer& printer);
    uError runInsertPhoto(SourceClient& client, Printer& printer);
    uError runRetrieve(SourceClient& client, Printer& printer);
    // The options that shape a listing, for query and for retrieve --from.
    void addListingOptions(CLI::App& command);

    CLI::App* query_ = nullptr;
    CLI::App* insertStatus_ = nullptr;
    CLI::App* insertPhoto_ = nullptr;
    CLI::App* retrieve_ = nullptr;
    CLI::App* quit_ = nullptr;  // shell only

    std::string type_;  // of query, or of retrieve --from (empty: no listing first)
    unsigned limit_ = kDefaultLimit;
    unsigned skip_ = 0;
    std::vector<std::string> where_;
    std::string order_;
    std::optional<std::int64_t> since_;
    bool all_ = false;
    std::vector<std::string> words_;  // of the status text
    std::string file_;
    std::string caption_;
    std::string album_;
    std::string target_;
};

}  // namespace host
}  // namespace trelm
