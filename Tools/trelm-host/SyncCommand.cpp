#include "SyncCommand.h"

#include <fcntl.h>
#include <sys/file.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <functional>
#include <iostream>
#include <optional>

#include "ErrorText.h"
#include "GetUserSidMessage.h"
#include "trelm/Metadata.h"
#include "trelm/SmartPtr.h"

namespace trelm {
namespace host {

namespace {

char const* const kTime = "core_object_time";

// Held for the whole of a sync: two syncs of one state folder would close each other's passes.
// The lock is an flock on a file beside the store, so it goes with the process however it ends.
class SyncLock {
public:
    SyncLock() = default;
    SyncLock(SyncLock const&) = delete;
    SyncLock& operator=(SyncLock const&) = delete;
    ~SyncLock() {
        if (fd_ >= 0) ::close(fd_);
    }

    // Takes the lock of `folder`, waiting (and saying so on `err`) while another sync holds it.
    uError take(std::string const& folder, std::ostream& err) {
        std::string const path = folder + "/sync.lock";
        fd_ = ::open(path.c_str(), O_RDWR | O_CREAT | O_CLOEXEC | O_NOFOLLOW, 0600);
        if (fd_ < 0) {
            return TRELM_ERROR_MSG(kFailure, "cannot open " + path + ": " + std::strerror(errno));
        }
        if (::flock(fd_, LOCK_EX | LOCK_NB) == 0) return TRELM_OK();
        err << "another sync of " << folder << " is running; waiting for it to end" << std::endl;
        while (::flock(fd_, LOCK_EX) != 0) {
            if (errno != EINTR) {
                return TRELM_ERROR_MSG(kFailure, "cannot lock " + path + ": " + std::strerror(errno));
            }
        }
        return TRELM_OK();
    }

private:
    int fd_ = -1;
};

std::string kindList() {
    std::string list;
    for (std::string const& name : ItemQuery::kindNames()) list += (list.empty() ? "" : ", ") + name;
    return list;
}

}  // namespace

SyncCommand::SyncCommand(CLI::App& app) {
    command_ = app.add_subcommand("sync", "copy every item of the data source into the host's item store");
    command_->add_option("kinds", kinds_, "the kinds to sync (default: every kind): " + kindList())
        ->check(CLI::IsMember(ItemQuery::kindNames()));
}

SyncCommand::Plan SyncCommand::planOf(int type) {
    switch (type) {
        case Metadata::Object::TYPE_CONTACT: return {Plan::Resume::AfterId, false, {}};
        case Metadata::Object::TYPE_STATUS: return {Plan::Resume::UpToTime, true, {}};
        case Metadata::Object::TYPE_MESSAGE: return {Plan::Resume::Restart, false, {}};
        // A friend request carries the time it was read, not a time of its own.
        case Metadata::Object::TYPE_FRIEND_REQUEST: return {Plan::Resume::Restart, false, {kTime}};
        default: return {Plan::Resume::UpToTime, false, {}};
    }
}

uError SyncCommand::serviceId(int type, ItemQuery::Record const& row, String& id) {
    auto text = [&](char const* key, String& out) -> uError {
        Variant const* value = row.search(key);
        if (value == nullptr) return TRELM_ERROR_MSG(kInvalid, String("a row without ") + key);
        out = value->asString();
        return TRELM_OK();
    };
    switch (type) {
        case Metadata::Object::TYPE_CONTACT: return text("core_contact_service_id", id);
        case Metadata::Object::TYPE_MEDIA:
        case Metadata::Object::TYPE_ALBUM: return text("core_service_id", id);
        case Metadata::Object::TYPE_PHOTO_TAG: {
            // A tag is the pair of its photo and the person tagged.
            String photo, person;
            TRELM_RETURN_IF_ERROR(text("facebook_photo_tag_photo_service_id", photo));
            TRELM_RETURN_IF_ERROR(text("facebook_photo_tag_tagged_service_id", person));
            id = photo + " " + person;
            return TRELM_OK();
        }
        default: return text("core_event_serviceid", id);
    }
}

uError SyncCommand::run(SourceClient& client, HostSession& session, SyncReport& report) {
    SyncLock lock;
    TRELM_RETURN_IF_ERROR(lock.take(session.stateDir(), std::cerr));
    IServiceSource::GetUserSidMessage user;
    uError e = user.send(client.sourceName());
    if (e.failed() || user.result.empty()) {
        return TRELM_WRAP_MSG(kNotSignedIn, e, client.sourceName() + " names no signed-in user to sync for");
    }
    for (ItemStore::Wipe const& wipe : session.host().itemStore().wipes()) report.wiped(wipe.source, wipe.items);

    std::vector<std::string> kinds = kinds_.empty() ? ItemQuery::kindNames() : kinds_;
    unsigned stopped = 0;
    uError first;
    for (std::string const& name : kinds) {
        ItemQuery::Kind const* kind = ItemQuery::findKind(name);
        if (kind == nullptr) return TRELM_ERROR_MSG(kInvalid, "unknown item type " + name);
        e = syncKind(*kind, client, session, report, user.result);
        if (e.failed() && stopped++ == 0) first = e;
    }
    report.finish();
    if (stopped == 0) return TRELM_OK();
    return TRELM_WRAP_MSG(kFailure, first,
                          std::to_string(stopped) + " kind(s) stopped; the next sync continues where each stopped");
}

uError SyncCommand::syncKind(ItemQuery::Kind const& kind, SourceClient& client, HostSession& session,
                             SyncReport& report, String const& account) {
    Plan const plan = planOf(kind.type);
    ItemStore& store = session.host().itemStore();
    HttpRequestFactory& http = session.host().httpRequestFactory();
    ItemStore::Scope const scope{client.sourceName(), account, kind.type};
    ItemStore::Pass pass;
    TRELM_RETURN_IF_ERROR(store.openPass(scope, pass));
    bool const restart = plan.resume == Plan::Resume::Restart;
    report.begin(kind.name, kind.type, pass, restart);
    if (restart) pass.rows = 0;

    SyncReport::KindSummary summary;
    summary.kind = kind.name;
    summary.type = kind.type;
    summary.pass = pass.id;
    std::uint64_t const requestsBefore = http.requestsMade();

    // A session the service refuses midway is renewed once; the walk then continues from the
    // last committed window like any other.
    uError e = client.withSession([&]() -> uError {
        ItemQuery query(kind);
        if (!pass.resume.empty()) TRELM_RETURN_IF_ERROR(query.where(pass.resume));
        return walk(query, plan, client, session, scope, pass, summary, report, true);
    });

    if (e.ok() && plan.boundaries) {
        std::vector<std::int64_t> seconds = pass.boundaries;
        std::sort(seconds.begin(), seconds.end());
        seconds.erase(std::unique(seconds.begin(), seconds.end()), seconds.end());
        summary.boundarySeconds = seconds.size();
        auto seen = [&] { return summary.counts.added + summary.counts.changed + summary.counts.unchanged; };
        std::size_t const before = seen();
        for (std::int64_t second : seconds) {
            e = client.withSession([&]() -> uError {
                ItemQuery query(kind);
                TRELM_RETURN_IF_ERROR(query.where(std::string(kTime) + "=" + std::to_string(second)));
                return walk(query, plan, client, session, scope, pass, summary, report, false);
            });
            if (e.failed()) break;
        }
        summary.recovered = seen() - before;
    }

    // The stream cursor answers a first window it could not fetch as an empty stream: a walk
    // that saw no post at all is not taken as proof that every stored post is gone.
    bool const trustworthy = !(plan.boundaries && pass.rows == 0);
    if (e.ok() && trustworthy) {
        e = store.completePass(scope, pass, summary.counts);
        summary.complete = e.ok();
    }
    summary.requests = http.requestsMade() - requestsBefore;
    if (e.failed()) summary.error = describeError(e, false);
    report.summary(summary);
    if (e.failed()) return TRELM_WRAP_MSG(kFailure, e, client.sourceName() + " cannot sync " + kind.name);
    return TRELM_OK();
}

uError SyncCommand::walk(ItemQuery const& query, Plan const& plan, SourceClient& client, HostSession& session,
                         ItemStore::Scope const& scope, ItemStore::Pass& pass, SyncReport::KindSummary& summary,
                         SyncReport& report, bool mainWalk) {
    HttpRequestFactory& http = session.host().httpRequestFactory();
    ItemStore& store = session.host().itemStore();
    int const type = query.kind().type;
    SmartPtr<IQueryItems::ICursor> cursor;
    TRELM_RETURN_IF_ERROR(client.start(query, cursor));

    std::optional<unsigned> total;
    std::size_t const rowsBefore = static_cast<std::size_t>(pass.rows);
    if (mainWalk && report.showsProgress() && query.kind().countable) {
        unsigned count = 0;
        // Only for the progress line: a kind that cannot count is shown without a total.
        if (client.step("counting the rows", [&] { return cursor->numRows(count); }).ok()) total = rowsBefore + count;
    }

    std::vector<ItemQuery::Record> pending;  // read since the last commit
    auto commit = [&]() -> uError {
        if (pending.empty()) return TRELM_OK();
        if (type == Metadata::Object::TYPE_FRIEND_REQUEST) TRELM_RETURN_IF_ERROR(client.addContactNames(pending));
        std::vector<ItemStore::Incoming> rows;
        rows.reserve(pending.size());
        for (ItemQuery::Record& record : pending) {
            ItemStore::Incoming row;
            TRELM_RETURN_IF_ERROR(serviceId(type, record, row.serviceId));
            // The source's GUIDs live as long as its process; the store's host id is the lasting one.
            record.remove("core_object_id").ignore();
            row.fields = std::move(record);
            rows.push_back(std::move(row));
        }
        if (mainWalk) {
            pass.rows += static_cast<std::int64_t>(rows.size());
            ItemQuery::Record const& last = rows.back().fields;
            if (plan.resume == Plan::Resume::AfterId) {
                pass.resume = "core_contact_service_id>" + rows.back().serviceId.str();
            } else if (Variant const* time = last.search(kTime); plan.resume == Plan::Resume::UpToTime && time) {
                pass.resume = std::string(kTime) + "<=" + std::to_string(time->asInt64());
            }
        }
        pending.clear();
        return store.commitWindow(scope, pass, rows, plan.firstSeenKeys, summary.counts);
    };
    // A step that made the source ask the service began a new window: what was read before it
    // is a whole window and is committed at once.
    bool wentOut = false;
    auto step = [&](char const* what, std::function<uError()> const& op) {
        std::uint64_t const before = http.requestsMade();
        uError result = client.step(what, op);
        wentOut = http.requestsMade() != before;
        return result;
    };
    // Rows read before a failed step are whole rows of an earlier window: they are kept too.
    auto stop = [&](uError const& failure) {
        uError kept = commit();
        if (kept.failed()) return TRELM_WRAP_MSG(kFailure, failure, "the rows read so far were not kept either: " + describeError(kept, false));
        return failure;
    };

    uError e = step("moving to the first row", [&] { return cursor->jumpBeginning(); });
    if (e.failed()) return e;
    while (true) {
        SmartPtr<ItemQuery::Record> row;
        e = step("reading a row", [&] { return cursor->getRow(row); });
        if (e.failed()) return stop(e);
        if (wentOut) TRELM_RETURN_IF_ERROR(commit());
        if (e.code() == kNoData || !row) break;
        pending.push_back(*row);
        ++summary.rows;
        report.progress(rowsBefore + summary.rows, summary.rows, total);
        int moved = 0;
        e = step("moving to the next row", [&] { return cursor->seek(1, moved); });
        if (wentOut && mainWalk && plan.boundaries) {
            // The next window ends one second below this row's: this second may hold more posts.
            if (Variant const* time = pending.back().search(kTime)) pass.boundaries.push_back(time->asInt64());
        }
        if (e.failed()) return stop(e);
        if (wentOut) TRELM_RETURN_IF_ERROR(commit());
        if (moved <= 0) break;
    }
    return commit();
}

}  // namespace host
}  // namespace trelm
