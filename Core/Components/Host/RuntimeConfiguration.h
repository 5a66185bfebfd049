#pragma once

#include <mutex>

#include "Component.h"
#include "trelm/Configuration.h"
#include "trelm/Export.h"
#include "trelm/Map.h"
#include "trelm/Set.h"
#include "trelm/String.h"
#include "trelm/Variant.h"
#include "trelm/uError.h"

struct sqlite3;

namespace trelm {

// The host's built-in component "RuntimeConfiguration": a small persistent store of values that
// components keep across runs (a signed-in session, the last user), as (tag, key, value) rows in
// SQLite. Values are stored as text; a tag is normally the configuration group of the component
// that owns the values, so the rows of different components never mix.
//
// Messages answered:
//   "RuntimeConfigurationMessage"       stores each value (as text) under the tag, replacing an
//                                       existing value of the same key
//   "ResetRuntimeConfigurationMessage"  deletes the keys under the tag (absent keys are fine)
//   "GetRuntimeConfigurationMessage"    fills each key of the caller's map that the store holds
//                                       under the tag with a String Variant; the others are
//                                       left as they are
// Each message is one transaction: when it fails (kFailure wrapping SQLite's message, or kInvalid
// for a value that has no text form) nothing has changed. Other messages are ignored.
//
// Configuration group key (sendConfig):
//   "path"  a file name, or ":memory:" (default) for a store that lives as long as the component.
// A file is created with mode 0600 whatever the umask, and an existing file's mode is narrowed to
// 0600: the store holds session secrets. Values never appear in error texts.
// Without sendConfig or open() the component uses an in-memory store.
//
// Thread safety: every operation may be called from any thread; operations are serialised.
class TRELM_API RuntimeConfiguration : public Component {
public:
    static constexpr char const* kName = "RuntimeConfiguration";

    explicit RuntimeConfiguration(String name = kName, String componentId = kName);
    ~RuntimeConfiguration() override;

    // Closes the current store and opens (creating if needed) the one at `path` (":memory:" for a
    // fresh in-memory store). kInvalid for an empty path; kFailure when the file cannot be
    // created or is not a usable database; the component then has no store, and every operation
    // fails with kFailure until the next successful open() or close().
    uError open(String const& path);
    // Closes the store; the next operation opens an in-memory one.
    void close();

    // The operations behind the three messages, for the host's own use.
    uError store(String const& tag, Set<Configuration::Value> const& values);
    uError reset(String const& tag, Set<String> const& keys);
    uError get(String const& tag, Map<String, Variant>& values);

    // Values held in memory only, for handing settings to a component without persisting them (a
    // password a settings screen passes on for one sign-in): get and
    // "GetRuntimeConfigurationMessage" answer them ahead of the store; nothing writes them to the
    // file, so they are gone when the process ends, however it ends. Replaces held values of the
    // same keys; kInvalid (nothing held) for a value without a text form.
    uError hold(String const& tag, Set<Configuration::Value> const& values);
    // Forgets held values; keys not held are fine.
    void release(String const& tag, Set<String> const& keys);

protected:
    uError sendConfigImpl(Configuration::Group const& group) override;
    uError handleMessage(IMessage& msg) override;

private:
    uError openLocked(String const& path);
    void closeLocked();
    uError ensureOpenLocked();

    // Guards db_, path_, openFailed_ and held_ (and serialises every use of the connection).
    std::mutex mutex_;
    Map<String, Map<String, String>> held_;  // tag -> key -> value, see hold()
    sqlite3* db_ = nullptr;
    String path_;              // of the open store
    bool openFailed_ = false;  // the last open() failed
};

}  // namespace trelm
