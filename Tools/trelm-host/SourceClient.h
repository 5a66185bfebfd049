#pragma once

#include <cstddef>
#include <filesystem>
#include <functional>
#include <optional>
#include <string>
#include <vector>

#include "BaseSource.h"
#include "HostSession.h"
#include "IQueryItems.h"
#include "ItemQuery.h"
#include "Printer.h"
#include "SourceSignIn.h"
#include "trelm/GUID.h"
#include "trelm/Map.h"
#include "trelm/SmartPtr.h"
#include "trelm/String.h"
#include "trelm/Variant.h"
#include "trelm/uError.h"

namespace trelm {
namespace host {

// The host's side of one data source: makes sure it is signed in, runs queries, inserts and
// retrievals through BaseSource's public entry points, and keeps the last query's cursor open so
// that the records it listed can be fetched again by GUID.
//
// When the service refuses the session (kNotSignedIn anywhere in an operation's error chain)
// and the host can sign the source in, it signs in once more and repeats the operation once.
//
// Ownership: the last cursor is held until the next query or destruction; it runs plug-in code,
// so the client must be destroyed before the session that loaded the plug-in.
// Lifetime: `session` and `printer` must outlive the client.
// Thread safety: used by the host's controlling thread.
class SourceClient {
public:
    using Record = Map<String, Variant>;

    // What a query listed.
    struct Listing {
        std::vector<Record> rows;
        std::optional<unsigned> total;  // the source's count, for kinds that can count
    };

    SourceClient(HostSession& session, Printer& printer);
    ~SourceClient();
    SourceClient(SourceClient const&) = delete;
    SourceClient& operator=(SourceClient const&) = delete;

    // Checks that `path` names a photo the service would take: kNotFound for a missing or
    // unreadable file; kInvalid for a folder, an empty file or one whose first bytes are not
    // those of a JPEG, PNG, GIF, BMP or TIFF image. `file` receives the absolute path.
    static uError checkPhotoFile(std::string const& path, std::filesystem::path& file);

    // Takes the first configured component that is a data source and has started. When the
    // runtime store holds no session for it and its configuration allows, signs it in
    // (SourceSignIn); otherwise reports the stored session's user. Prints a login line either
    // way. kNotFound when no data source started; the sign-in's error when it fails.
    uError open();

    // REQUIRES: open() succeeded (for all four below).
    // Starts `query` at the source, walks the cursor and, for kinds that count, asks for the
    // total. The previous cursor is released first; on success the new one is kept. The source's
    // refusal (kNotSupported for a kind it does not serve yet) is returned as it is.
    // `arrived` (optional) is told of each row as it is read, once per row even when the query is
    // made again after a new sign-in; kinds whose rows the host completes afterwards (friend
    // requests get their names) are told at the end instead.
    // Told the source's count of the query's rows before the walk starts (kinds that can count).
    using Counted = std::function<void(unsigned total)>;
    uError query(ItemQuery const& query, Listing& listing, ItemQuery::RowSink const& arrived = {},
                 Counted const& counted = {});
    // BaseSource::insert; `record` receives what the source writes back ("core_service_id").
    uError insert(Record& record);
    // Inserts a status post (object type 4, "core_event_text" = `text`).
    uError postStatus(String const& text);
    // Inserts a photo (object type 9) from the local file `path` (made absolute), with an
    // optional caption ("media_notes") and album ("facebook_media_album_service_id"); `serviceId`
    // receives the "core_service_id" the source writes back. Fails before any request, naming
    // the file (checkPhotoFile); kFailure when the source wrote back no id.
    uError uploadPhoto(std::string const& path, String const& caption, String const& albumId,
                       String& serviceId);
    // BaseSource::retrieve of a record a still-open cursor produced (a friend request with its
    // requester's name, as listed); kNotFound from the source otherwise. `record` is unchanged on
    // failure.
    uError retrieve(GUID const& guid, Record& record);

    // For walks the caller drives itself (sync). Starts `query` under the session's pacing and
    // hands its cursor over; the last listing's cursor is released first.
    uError start(ItemQuery const& query, SmartPtr<IQueryItems::ICursor>& cursor);
    // Runs one cursor step under the session's pacing; `what` names it in the reports of waits.
    uError step(char const* what, std::function<uError()> const& op) { return paced(what, op); }
    // Runs `operation`; after a refused session, signs in again and runs it once more.
    uError withSession(std::function<uError()> const& operation);
    // Friend requests carry only the requester's id ("core_event_contactid"); this sets
    // "core_event_contactname" on each of `rows` from one contact query for those ids, so that a
    // listing says who asked. The query's cursor is released at once; the last listing's is kept.
    uError addContactNames(std::vector<Record>& rows);

    // The n-th record (from 1) of the last successful listing, or null.
    Record const* listed(std::size_t n) const;
    String const& sourceName() const noexcept { return name_; }
    // Sign-ins the host made for the source (at open() and after refusals).
    int signIns() const noexcept { return signIns_; }

private:
    uError signIn();
    // Runs `operation`; after a refused session, signs in again and runs it once more.
    // Runs `step` under the session's pacing, waits reported on standard error.
    uError paced(char const* what, std::function<uError()> const& step);
    template <class Operation>
    uError retrying(Operation operation);

    HostSession& session_;
    Printer& printer_;
    String name_;
    BaseSource* source_ = nullptr;  // owned by the session's host
    std::optional<SourceSignIn> signIn_;
    int signIns_ = 0;
    SmartPtr<IQueryItems::ICursor> cursor_;  // of the last successful query
    std::vector<Record> listed_;             // what it listed
};

}  // namespace host
}  // namespace trelm
