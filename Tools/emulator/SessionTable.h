// The emulated service's sessions, kept in memory for the life of the emulator.
#pragma once

#include <cstdint>
#include <functional>
#include <mutex>
#include <optional>
#include <string>
#include <unordered_map>
#include <utility>

namespace emu {

// One signed-in session, as the login answer hands it to the client.
struct Session {
    std::string key;            // "session_key"
    std::string secret;         // the session secret; never logged
    std::int64_t uid = 0;
    std::int64_t expires = 0;   // Unix time; 0 = never
};

// Thread safety: every member may be called from any thread; one mutex guards the table.
class SessionTable {
public:
    // Unix time in seconds; tests inject their own to move time forward.
    using Clock = std::function<std::int64_t()>;

    // `clock` empty: the system clock.
    explicit SessionTable(Clock clock = {});

    // Makes a session for `uid` with a random key and secret, expiring `lifetimeSeconds` from now
    // (0 or less: never), and keeps it.
    Session create(std::int64_t uid, std::int64_t lifetimeSeconds);

    // What a call presenting `key` may do.
    enum class Check { Valid, Unknown, Expired };
    struct Lookup {
        Check check = Check::Unknown;
        Session session;          // set when Valid
        std::int64_t calls = 0;   // calls made with the session, this one included (when Valid)
    };
    // Looks up `key` and, when valid, counts one call on it. An expired session is forgotten.
    Lookup use(const std::string& key);

    // Strict call_id: accepts `callId` when it is a non-negative decimal number, with or without a
    // fraction ("7", "1795457318.1586": the era's clients sent microtime(true)), greater as a
    // number than the last one accepted for this session (any number is greater than none), and
    // remembers it. Compared exactly, digit by digit, whatever the length.
    bool acceptCallId(const std::string& key, const std::string& callId);

    // Forgets a session; later calls with it get Unknown.
    void remove(const std::string& key);

    std::size_t size() const;
    std::int64_t now() const { return clock_(); }

private:
    struct Entry {
        Session session;
        std::int64_t calls = 0;
        // The last accepted call_id as (integer digits, fraction digits), without leading zeros of
        // the integer part or trailing zeros of the fraction; unset before the first.
        std::optional<std::pair<std::string, std::string>> lastCallId;
    };

    const Clock clock_;  // constant after construction

    mutable std::mutex mutex_;  // guards entries_
    std::unordered_map<std::string, Entry> entries_;
};

}  // namespace emu
