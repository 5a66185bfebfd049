#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include <CLI/CLI.hpp>

#include "HostSession.h"
#include "ItemQuery.h"
#include "ItemStore.h"
#include "SourceClient.h"
#include "SyncReport.h"
#include "trelm/uError.h"

namespace trelm {
namespace host {

// `trelm-host sync [KIND ...]`: copies every item of each kind (default: every kind the source
// serves) into the host's item store, the way a device fills its store from a data source.
//
// For each kind it opens the query and walks every row. A cursor step that made the source go to
// the service began a new window, so every row read before that step is committed at once, in
// one transaction with the pass's progress. Progress is a condition that continues the walk in
// the cursor's own statement: the contacts after the last one committed (their keyset), or the
// rows at or before the last committed time for the kinds that come newest first (status posts,
// photo posts, media, albums, photo tags; the rows of that very second are read again and count
// once). A sync that stopped (a service error after the host's retries, an interrupt, a killed
// process) is continued from there by the next one, which says so. Inbox messages (read whole
// when the query starts) and friend requests (a cursor that takes no such condition) start
// again from their first row, and the sync says that too.
//
// After a complete walk, items of the kind that the pass did not see are marked removed; a walk
// that stopped marks nothing. The stream cursor pages with an upper bound one second below the
// last post it delivered, so posts sharing that second beyond the window's end are never
// delivered: the sync notes the second at each of its windows' ends and, after the walk, asks
// for exactly that second again and stores what was missing.
//
// Lifetime: `app` must outlive the object. Thread safety: used by the host's controlling thread.
class SyncCommand {
public:
    explicit SyncCommand(CLI::App& app);
    SyncCommand(SyncCommand const&) = delete;
    SyncCommand& operator=(SyncCommand const&) = delete;

    bool parsed() const { return command_->parsed(); }

    // Syncs the kinds named on the command line. Every kind is tried; the first failure is
    // returned (wrapped, naming how many kinds stopped) after the summary was reported.
    // REQUIRES: parsed(), client.open() succeeded, the session's item store started.
    uError run(SourceClient& client, HostSession& session, SyncReport& report);

private:
    // How a kind is continued after a stop, and how its rows are keyed.
    struct Plan {
        enum class Resume { Restart, AfterId, UpToTime };
        Resume resume;
        bool boundaries;  // the stream's boundary seconds are asked for again
        std::vector<std::string> firstSeenKeys;
    };

    static Plan planOf(int type);
    static uError serviceId(int type, ItemQuery::Record const& row, String& id);

    // One kind, from its open pass to its summary.
    uError syncKind(ItemQuery::Kind const& kind, SourceClient& client, HostSession& session, SyncReport& report,
                    String const& account);
    // Walks `query` from its start and commits each window into `pass`; rows read and what the
    // store made of them go to `summary`. The main walk moves the pass's resume point and notes
    // boundary seconds; a second look at one second does neither.
    uError walk(ItemQuery const& query, Plan const& plan, SourceClient& client, HostSession& session,
                ItemStore::Scope const& scope, ItemStore::Pass& pass, SyncReport::KindSummary& summary,
                SyncReport& report, bool mainWalk);

    CLI::App* command_ = nullptr;
    std::vector<std::string> kinds_;
};

}  // namespace host
}  // namespace trelm
