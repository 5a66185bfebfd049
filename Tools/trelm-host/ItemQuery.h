#pragma once

#include <cstdint>
#include <optional>
#include <functional>
#include <string>
#include <vector>

#include "IQueryItems.h"
#include "trelm/Map.h"
#include "trelm/String.h"
#include "trelm/Variant.h"
#include "trelm/Vector.h"
#include "trelm/uError.h"

namespace trelm {
namespace host {

// One item query as a person asks for it ("contacts, skip 10, at most 5, where X=Y"), turned
// into the start-query message a data source understands, and the walk over the cursor that
// the source answers with.
//
// The message carries the kind's "core_object_type" as an Equal constraint, the conditions
// given with where(), and as its columns the ordering the kind's cursor serves: the event
// cursors (status posts, photo posts, inbox messages) want "core_object_time",
// "core_event_service", "core_event_serviceid", all descending; friend requests want
// "core_event_service", "core_event_serviceid", both ascending; the others take no ordering
// (albums, media and photo tags then come newest first). orderBy() replaces that ordering.
//
// A plain value; not guarded.
class ItemQuery {
public:
    using Record = Map<String, Variant>;

    // One kind of item that can be asked for by name.
    struct Kind {
        char const* name;  // as typed: "contacts", "friend-requests", ...
        int type;          // "core_object_type"
        // The cursor can count its rows: the FQL cursors with a counting statement, the inbox
        // cursor from memory; the stream and photo-event cursors cannot.
        bool countable;
    };

    // The kind named `name`, or null.
    static Kind const* findKind(std::string const& name);
    static Kind const* findKind(int type);
    // Every name, in table order.
    static std::vector<std::string> kindNames();

    explicit ItemQuery(Kind const& kind);

    Kind const& kind() const noexcept { return *kind_; }

    // Adds a condition written KEY=VALUE, KEY!=VALUE, KEY<VALUE, KEY<=VALUE, KEY>VALUE or
    // KEY>=VALUE. The value is read by the key's registered metadata type (integers, GUIDs,
    // booleans; text otherwise); "KEY=A,B,C" asks for any of a list. kInvalid, naming the
    // condition, when it has no operator, no key, or a value its type cannot hold.
    uError where(std::string const& text);

    // Orders by KEY (ascending) or KEY:desc / KEY:asc instead of the kind's own ordering: the
    // message's columns become that one column. kInvalid for an empty key or another suffix.
    uError orderBy(std::string const& text);

    // Rows to pass over before the first one listed.
    unsigned skip = 0;
    // Set: the query's position, which albums, media and photo tags read as a time (seconds since
    // the epoch): only what changed since then, fetched in one go. Such a query is made as a
    // background query, the only kind that may carry a position.
    std::optional<std::int64_t> since;
    bool interactive() const noexcept { return !since; }
    // kInvalid, saying why, for a negative `since` or one given to a kind that cannot use it.
    uError checkSince() const;
    // At most this many rows; unset: every row.
    std::optional<unsigned> limit;

    // Sets the columns, constraints and position of `msg` for this query (the cursor and the
    // interactive flag are left alone); what checkSince refuses, it refuses.
    uError fill(IQueryItems::StartQueryMessage& msg) const;

    // Walks `cursor` from its beginning: passes over `skip` rows, then copies rows into `rows`
    // until `limit` rows are listed or the cursor cannot move on. Moves are seek(1) steps, which
    // every cursor of the source supports. The cursor's failure is returned as it is; `rows`
    // then holds what was read before it.
    // Runs one cursor step (`what` names it for a report); the default runs it once.
    using StepRunner = std::function<uError(char const* what, std::function<uError()> const& step)>;
    // `arrived` (when given) is called with each row's 1-based index as soon as it is read.
    using RowSink = std::function<void(std::size_t index, Record const& row)>;
    uError walk(IQueryItems::ICursor& cursor, std::vector<Record>& rows, StepRunner const& run = {},
                RowSink const& arrived = {}) const;

private:
    Kind const* kind_;
    Vector<IQueryItems::Constraint> conditions_;
    std::optional<IQueryItems::Column> order_;
};

}  // namespace host
}  // namespace trelm
