// A record of the requests the emulator answered, for tests that assert what a client sent.
#pragma once

#include <atomic>
#include <cstddef>
#include <cstdint>
#include <deque>
#include <functional>
#include <mutex>
#include <string>
#include <string_view>
#include <vector>

#include "Signature.h"

namespace emu {

// One request as it arrived, and how it was answered.
struct LoggedRequest {
    std::string method;       // "method" as sent (with a "facebook." prefix if the client used one)
    Arguments args;           // every argument; a login password reads "***"; never the file bytes
    std::string fql;          // "query" of an fql.query call, else empty
    bool https = false;
    bool hadFile = false;     // a multipart file part came with the request
    std::size_t fileSize = 0;
    int errorCode = 0;        // the service error answered; 0 for a success document
    int httpStatus = 200;     // the HTTP status answered; 0 when the connection was dropped
    std::string fault;        // the transport fault applied: "", "drop", "http_status", "truncate", "malformed"
    std::string internalError;  // an emulator fault (exception text) the request ran into; answered as code 1
};

// A bounded log: when full, the oldest entry makes room. Thread safety: every member may be called
// from any thread; one mutex guards the entries and the count.
class RequestLog {
public:
    explicit RequestLog(std::size_t capacity = 10000);

    // A disabled log keeps and counts nothing (benchmarks switch it off).
    void setEnabled(bool enabled);
    bool enabled() const;

    void add(LoggedRequest entry);

    // Called with every entry added while the log is enabled, in the order they are added, on the
    // thread that adds it and under the log's lock: it must be quick and must not call back into
    // the log. Empty: no listener. The program uses it to print requests as they come.
    using Listener = std::function<void(const LoggedRequest&)>;
    void setListener(Listener listener);

    // Copies of the kept entries, oldest first.
    std::vector<LoggedRequest> entries() const;
    // Kept entries whose method, without a "facebook." prefix, is `method`.
    std::vector<LoggedRequest> entriesFor(const std::string& method) const;
    // Requests added since the last clear, including any that no longer fit.
    std::uint64_t total() const;

    void clear();

private:
    const std::size_t capacity_;  // constant after construction

    std::atomic<bool> enabled_{true};  // read without the mutex: a disabled log costs no lock

    mutable std::mutex mutex_;  // guards entries_, total_ and listener_
    Listener listener_;
    std::deque<LoggedRequest> entries_;
    std::uint64_t total_ = 0;
};

}  // namespace emu
