// The emulated service's data: applications, accounts, the social graph, photos, the stream and
// the inbox, kept in SQLite, and the operations behind each REST method.
#pragma once

#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "XmlNode.h"

namespace emu {

class AnswerWriter;

// The fixed demo account that the generator always creates (named in the README).
struct DemoAccount {
    static constexpr const char* email = "demo@trelm.example";
    static constexpr const char* password = "demo-password";
    static constexpr const char* apiKey = "4f6b1e0c9a7d4c2e8b3a5d6f7e8c9b0a";
    static constexpr const char* appSecret = "c3d2e1f0a9b8c7d6e5f4a3b2c1d0e9f8";
    static constexpr std::int64_t uid = 100000001;
};

// A second account, for trying a change of user: the second generated user (any dataset of two
// users or more has it), signing in to the same demo application.
struct SecondAccount {
    static constexpr const char* email = "second@trelm.example";
    static constexpr const char* password = "second-password";
};

// Sizes of a generated dataset. The demo user always exists and has `demoFriends` friends; its
// friends (and a few other users with content) get about `friendsPerUser` friends each. The same
// seed and sizes give the same data.
struct GeneratorOptions {
    std::uint64_t seed = 1;
    std::int64_t users = 200;
    std::int64_t demoFriends = 60;
    std::int64_t friendsPerUser = 10;
    std::int64_t albumsPerUser = 2;
    std::int64_t photosPerAlbum = 4;
    std::int64_t tagsPerPhoto = 1;
    std::int64_t postsPerUser = 3;        // stream posts of every kind (status, photo, link, wall)
    std::int64_t threadsPerUser = 5;      // inbox threads of the demo user; others get fewer
    std::int64_t messagesPerThread = 4;
    std::int64_t friendRequests = 5;      // pending requests to the demo user
    // Photos sharing one creation second: every fifth photo closes a run of this many (1 to 5;
    // 1 gives every photo its own second).
    std::int64_t photosPerSecond = 2;
    // Stream posts sharing one second: every sixth post closes a run of this many (1 to 6).
    std::int64_t postsPerSecond = 2;
};

// A service error answer: the code and the text of the service's error table.
struct ServiceError {
    int code = 1;
    std::string message;
};

// The result of an operation: nothing on success (the answer was written into the given root),
// or the service error to answer with.
using Status = std::optional<ServiceError>;

// Thread safety: every member may be called from any thread at any time (the HTTP server runs
// handlers on a pool); the store serialises access to its database itself.
class Store {
public:
    // Opens `path` (":memory:" for a private in-memory database), creating the schema when absent.
    // Returns null and sets `error` on failure.
    static std::unique_ptr<Store> open(const std::string& path, std::string& error);
    virtual ~Store() = default;

    // Fills an empty database from `options`; a database that already holds data is left as is.
    virtual Status generate(const GeneratorOptions& options) = 0;

    // Applications and accounts.
    virtual std::optional<std::string> appSecret(const std::string& apiKey) = 0;
    virtual std::optional<std::int64_t> checkLogin(const std::string& email, const std::string& password) = 0;

    // The methods. `viewer` is the session's user. Each writes the content of the answer into
    // `root`, whose name the caller has already set (e.g. "fql_query_response"); the caller
    // renders it. Argument texts arrive as the client sent them; parsing and range checks
    // (error 100) are the store's.
    // fql.query writes its rows straight into the answer: one element per row inside the open
    // root of `out`. The XmlNode form appends the same rows to `root`, which becomes a list.
    virtual Status fqlQuery(std::int64_t viewer, const std::string& query, AnswerWriter& out) = 0;
    Status fqlQuery(std::int64_t viewer, const std::string& query, XmlNode& root);
    virtual Status streamGet(std::int64_t viewer, const std::string& viewerId, const std::string& startTime,
                             const std::string& endTime, const std::string& limit, XmlNode& root) = 0;
    virtual Status getInbox(std::int64_t viewer, const std::string& start, const std::string& limit,
                            XmlNode& root) = 0;
    virtual Status getThreadMessages(std::int64_t viewer, const std::string& threadId, const std::string& start,
                                     const std::string& limit, XmlNode& root) = 0;
    virtual Status setStatus(std::int64_t viewer, const std::string& status, const std::string& includesVerb,
                             const std::string& clear, XmlNode& root) = 0;
    // `aid` empty: the application's default album of the viewer, created on demand.
    virtual Status uploadPhoto(std::int64_t viewer, const std::string& aid, const std::string& caption,
                               const std::string& imageBytes, bool haveImage, XmlNode& root) = 0;
    virtual Status usersGetInfo(std::int64_t viewer, const std::string& uids, const std::string& fields,
                                XmlNode& root) = 0;
    virtual Status friendsGet(std::int64_t viewer, const std::string& uid, XmlNode& root) = 0;
};

}  // namespace emu
