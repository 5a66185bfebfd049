#pragma once

#include <cstdint>
#include <mutex>
#include <string>
#include <vector>

#include "Component.h"
#include "trelm/Map.h"
#include "trelm/String.h"
#include "trelm/Variant.h"
#include "trelm/uError.h"

struct sqlite3;

namespace trelm {
namespace host {

// The host's built-in component "ItemStore": the device's local copy of the items its data
// sources deliver, filled by `trelm-host sync` and read by `trelm-host items`, in a SQLite file
// of the state folder (created with mode 0600 whatever the umask).
//
// An item is keyed by (account user id, object type, service id). At first sight it gets a host
// id, a GUID that never changes afterwards, so other parts of a device can refer to it across
// runs, restarts and re-syncs. Beside its fields (the record as the source delivered it, as a
// JSON object) it keeps the time it was first and last seen, a deleted flag and the pass that saw
// it last.
//
// A pass is one complete walk of one kind for one account, made of windows that are committed
// one transaction each, so an interrupted walk keeps what it committed. The pass's progress (a
// resume point the sync understands, the boundary seconds it noted, the rows so far) is written
// in the same transaction as the window's items. completePass() then marks removed every item
// of the kind that the pass did not see; an open pass marks nothing.
//
// Messages answered: "WipeMessage" (sent by a source when another person signs in): every item
// and pass of each configuration tag named in the message is deleted. Other messages are ignored.
//
// Configuration group key (sendConfig): "path", the database file (default ":memory:"). The file
// is opened (and made) by the first operation that needs it, so a host command that never syncs
// neither makes it nor depends on it being usable; list() and wipe() of a store that was never
// made find nothing and make nothing.
//
// Thread safety: every operation may be called from any thread; operations are serialised.
class ItemStore : public Component {
public:
    static constexpr char const* kName = "ItemStore";
    using Record = Map<String, Variant>;

    // Where an item lives.
    struct Scope {
        String source;   // the source's configuration tag
        String account;  // the signed-in user's service id
        int type = 0;    // "core_object_type"
    };

    // The state of a pass as the store keeps it between windows and runs.
    struct Pass {
        std::int64_t id = 0;      // counts the passes of the scope from 1
        bool continued = false;   // openPass found it open: an earlier run stopped inside it
        std::string resume;       // where the next window starts; empty: from the first row
        std::vector<std::int64_t> boundaries;  // seconds the walk noted for a second look
        std::int64_t rows = 0;    // rows committed in this pass so far
    };

    struct Counts {
        unsigned added = 0;
        unsigned changed = 0;
        unsigned unchanged = 0;
        unsigned removed = 0;
    };

    // One row a window delivered.
    struct Incoming {
        String serviceId;
        Record fields;
    };

    // One stored item.
    struct Item {
        String hostId;
        String account;
        int type = 0;
        String serviceId;
        std::string fields;  // JSON object
        std::int64_t firstSeen = 0;
        std::int64_t lastSeen = 0;
        bool deleted = false;
    };

    // A wipe the store carried out for a "WipeMessage".
    struct Wipe {
        String source;
        unsigned items = 0;
    };

    explicit ItemStore(String name = kName, String componentId = kName);
    ~ItemStore() override;

    // Closes the current database and opens (creating) the one at `path` now. kFailure with the
    // path and SQLite's reason when it cannot; the operations then try the path again.
    uError open(String const& path);
    // Closes the database; operations fail until the next open() or sendConfig().
    void close();
    // Whether the database file exists (or is open, or is in memory).
    bool exists() const;
    // The database file configured.
    String path() const;

    // The open pass of `scope`, or a new one after the last complete pass (ids count up).
    uError openPass(Scope const& scope, Pass& pass);
    // Writes `rows` and the pass's progress `pass` in one transaction. A row new to the store is
    // added with a new host id; a known one keeps its host id and is counted changed when its
    // fields differ from the stored ones (or it was marked removed), unchanged otherwise; a row
    // this pass already saw is not counted again. Keys in `firstSeenKeys` keep the value stored
    // at first sight (values the source makes up anew at each reading). Nothing is written when
    // it fails.
    uError commitWindow(Scope const& scope, Pass const& pass, std::vector<Incoming> const& rows,
                        std::vector<std::string> const& firstSeenKeys, Counts& counts);
    // Marks removed the items of `scope` that `pass` did not see, and closes the pass; adds the
    // number marked to `counts.removed`.
    uError completePass(Scope const& scope, Pass const& pass, Counts& counts);

    // The items of `type`, of `account` (empty: every account), oldest first; removed ones only
    // when `withRemoved`.
    uError list(String const& account, int type, bool withRemoved, std::vector<Item>& out);
    // Deletes every item and pass of `source`; `items` receives how many items went.
    uError wipe(String const& source, unsigned& items);
    // The wipes made for "WipeMessage" since the component was made, oldest first.
    std::vector<Wipe> wipes() const;

    // A record as the JSON object the store keeps (keys in order; GUIDs as text).
    static std::string encode(Record const& fields);

protected:
    uError sendConfigImpl(Configuration::Group const& group) override;
    uError handleMessage(IMessage& msg) override;

private:
    // Opens path_ unless open.
    uError openLocked();
    void closeLocked();
    bool existsLocked() const;

    // Guards db_, path_ and wipes_ (and serialises every use of the connection).
    mutable std::mutex mutex_;
    sqlite3* db_ = nullptr;
    String path_;
    std::vector<Wipe> wipes_;
};

}  // namespace host
}  // namespace trelm
