#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <ostream>
#include <string>
#include <vector>

#include "ItemStore.h"
#include "Printer.h"
#include "ProgressLine.h"

namespace trelm {
namespace host {

// What `sync` and `items` tell the user, as a table or as JSON lines (one object per line with a
// "type"), the format chosen as for the other commands:
//   {"type":"wiped","tag":T,"items":N}                   the store dropped another person's items
//   {"type":"sync","kind":K,"object_type":T,"pass":N,"continued":B,"from":COND|null,
//    "rows_before":N,"restart":B}                        a kind begins (continued: an earlier
//                                                        sync stopped inside this pass)
//   {"type":"synced","kind":K,"object_type":T,"pass":N,"complete":B,"rows":N,"added":N,
//    "changed":N,"unchanged":N,"removed":N,"boundary_seconds":N,"recovered":N,"requests":N,
//    "error":null|TEXT}                                  a kind's summary
//   {"type":"item","index":N,"host_id":G,"account":U,"object_type":T,"service_id":S,
//    "first_seen":T,"last_seen":T,"deleted":B,"fields":{...}}
//   {"type":"items","object_type":T,"count":N}
// The table prints one line per kind as it begins only when it continues an earlier pass, and
// the summaries as one table at the end. On a terminal, in the table format, a progress line per
// kind (rows, the total when known, the rate) is kept up to date on `progress` (standard error);
// never in JSON lines, never when it is not a terminal.
//
// Lifetime: the streams must outlive the object. Thread safety: none.
class SyncReport {
public:
    struct KindSummary {
        std::string kind;
        int type = 0;
        std::int64_t pass = 0;
        bool complete = false;
        std::size_t rows = 0;
        ItemStore::Counts counts;
        std::size_t boundarySeconds = 0;
        std::size_t recovered = 0;
        std::uint64_t requests = 0;
        std::string error;  // empty when the kind went through
    };

    SyncReport(Printer::Format format, std::ostream& out, std::ostream& progress, bool terminal);

    bool showsProgress() const noexcept { return showProgress_; }

    void wiped(String const& tag, unsigned items);
    void begin(std::string const& kind, int type, ItemStore::Pass const& pass, bool restart);
    // Rows so far of the kind being synced (`read` of them in this run, which gives the rate);
    // `total` when the source counted.
    void progress(std::size_t rows, std::size_t read, std::optional<unsigned> total);
    void endProgress();
    void summary(KindSummary const& summary);
    // Writes the gathered summaries (table); call once at the end.
    void finish();

    void item(std::size_t index, ItemStore::Item const& item);
    void items(int type, std::size_t count);
    // The store at `path` was never made: nothing was synced into this state folder yet.
    void nothingStored(std::string const& path);

private:
    Printer::Format const format_;
    std::ostream& out_;
    std::ostream& progress_;
    bool const showProgress_;
    std::string kind_;                  // of the progress line
    std::optional<ProgressLine> line_;  // the current kind's, made by begin()
    std::vector<KindSummary> summaries_;  // table rows waiting for finish()
};

}  // namespace host
}  // namespace trelm
