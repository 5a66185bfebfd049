// Faults the emulator injects into its answers, switchable per method while it runs.
#pragma once

#include <chrono>
#include <cstdint>
#include <functional>
#include <map>
#include <mutex>
#include <random>
#include <string>
#include <vector>

namespace emu {

// What to do to the calls of one method (or of every method, under the name "*").
//
// The trigger picks the calls that are hit: every `every`-th call when `every` > 0, else each call
// with `probability` (drawn from a generator seeded with `seed`) when it is > 0, else every call.
// A hit call is delayed by `delayMs`, then, in this order of precedence: the connection is closed
// without an answer (`drop`), the HTTP status `httpStatus` is answered with no document, or the
// service error `errorCode` is answered once the request has passed validation. A document sent
// for a hit call is cut short by closing the connection (`truncate`) or sent whole but broken
// (`malformed`).
//
// Independent of the trigger: `expireAfter` > 0 lets a session make that many calls; its next call
// answers 102 and the session is gone. `rate` > 0 is a token bucket of `rate` calls per second
// holding at most `burst` calls (at least 1); a call finding it empty answers 4.
struct FaultRule {
    int every = 0;
    double probability = 0;
    std::uint64_t seed = 1;

    int delayMs = 0;
    bool drop = false;
    int httpStatus = 0;
    int errorCode = 0;
    bool truncate = false;
    bool malformed = false;

    int expireAfter = 0;
    double rate = 0;
    int burst = 0;
};

// The faults that apply to one request, as decided when it arrives.
struct FaultDecision {
    int delayMs = 0;
    bool drop = false;
    int httpStatus = 0;
    int errorCode = 0;
    bool truncate = false;
    bool malformed = false;
    bool rateLimited = false;
    int expireAfter = 0;

    bool any() const {
        return delayMs || drop || httpStatus || errorCode || truncate || malformed || rateLimited || expireAfter;
    }
};

// The rule table. Thread safety: every member may be called from any thread; one mutex guards
// the rules and their counters, so decisions for concurrent calls are serialised (each every-k
// counter and each bucket sees every call exactly once).
class Faults {
public:
    using Clock = std::function<std::chrono::steady_clock::time_point()>;

    // `clock` empty: the steady clock. Tests inject their own to refill buckets without waiting.
    explicit Faults(Clock clock = {});

    // Installs `rule` for `method` ("fql.query", or "*" for every method), replacing the rule it had
    // and starting its counters, generator and bucket afresh.
    void set(const std::string& method, const FaultRule& rule);
    void clear(const std::string& method);
    void clearAll();

    // Decides the faults for one call of `method` (without the "facebook." prefix; empty when the
    // request named none: only "*" applies). The method's own rule and the "*" rule both count the
    // call; where both set the same effect, the method's rule wins (the longer delay, the smaller
    // expireAfter).
    FaultDecision decide(const std::string& method);

    // Parses "method:key=value,key,..." as the command line gives it. Keys: every, probability (or
    // p), seed, delay_ms, drop, http_status (or status), error, truncate, malformed, expire_after,
    // rate, burst. Returns false and sets `error` for an unknown key or a bad value.
    static bool parse(const std::string& text, std::string& method, FaultRule& rule, std::string& error);

private:
    struct Active {
        FaultRule rule;
        std::uint64_t calls = 0;
        std::mt19937_64 random;
        double tokens = 0;
        std::chrono::steady_clock::time_point refilled;
    };

    // Counts one call on `a` and adds its effects to `d`; `d` already holds the effects of a rule
    // that takes precedence.
    void apply(Active& a, FaultDecision& d, std::chrono::steady_clock::time_point now);

    const Clock clock_;  // constant after construction

    std::mutex mutex_;  // guards rules_ (the rules, their counters, generators and buckets)
    std::map<std::string, Active> rules_;
};

}  // namespace emu
