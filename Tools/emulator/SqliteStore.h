// The emulated service's data kept in SQLite: the Store behind every REST method.
#pragma once

#include <cstdint>
#include <functional>
#include <memory>
#include <mutex>
#include <string>
#include <vector>

#include "Store.h"

namespace emu {

class SqliteDatabase;
class FqlEngine;

// Answers (see Store.h for the common contract):
// - stream.get: posts whose source is the viewer or a friend, created within [start, end]
//   (0 = unbounded), newest first (ties: higher post id first), at most `limit` (default 30);
//   then <profiles> of every user the posts name and <albums> of every photo medium's album.
// - mailbox.getInbox: the viewer's inbox threads, latest update first, from `start` (default 0),
//   at most `limit` (default 20). mailbox.getThreadMessages: one of those threads' messages,
//   newest first (default limit 50).
// - users.setStatus: the viewer's status becomes {message, time, status_id} and a status post
//   (type 46) joins the stream; "clear" empties the status without a post.
// - photos.upload: 324 without an image, 120 for an album that is not the viewer's, 321 for a
//   full album (60 photos, 1000 in the application's default album, made on first use).
// - users.getInfo, friends.get (the viewer's own friends only).
// Argument texts are checked strictly: numbers are plain decimal digits; anything else is 100.
//
// Thread safety: every public member may be called from any thread; one mutex serialises all
// use of the connection.
class SqliteStore : public Store {
public:
    // Opens `path` (":memory:" for a private database), creating the schema when absent.
    static std::unique_ptr<SqliteStore> openDatabase(const std::string& path, std::string& error);
    ~SqliteStore() override;

    Status generate(const GeneratorOptions& options) override;
    std::optional<std::string> appSecret(const std::string& apiKey) override;
    std::optional<std::int64_t> checkLogin(const std::string& email, const std::string& password) override;
    using Store::fqlQuery;
    Status fqlQuery(std::int64_t viewer, const std::string& query, AnswerWriter& out) override;
    Status streamGet(std::int64_t viewer, const std::string& viewerId, const std::string& startTime,
                     const std::string& endTime, const std::string& limit, XmlNode& root) override;
    Status getInbox(std::int64_t viewer, const std::string& start, const std::string& limit, XmlNode& root) override;
    Status getThreadMessages(std::int64_t viewer, const std::string& threadId, const std::string& start,
                             const std::string& limit, XmlNode& root) override;
    Status setStatus(std::int64_t viewer, const std::string& status, const std::string& includesVerb,
                     const std::string& clear, XmlNode& root) override;
    Status uploadPhoto(std::int64_t viewer, const std::string& aid, const std::string& caption,
                       const std::string& imageBytes, bool haveImage, XmlNode& root) override;
    Status usersGetInfo(std::int64_t viewer, const std::string& uids, const std::string& fields,
                        XmlNode& root) override;
    Status friendsGet(std::int64_t viewer, const std::string& uid, XmlNode& root) override;

    // The SQL that `query` runs as for `viewer`, and SQLite's plan for it (one line per step,
    // as EXPLAIN QUERY PLAN words it). For tests and tuning.
    Status explainFql(std::int64_t viewer, const std::string& query, std::string& sql, std::vector<std::string>& plan);

    // The clock for now(), new posts, photos and statuses (seconds since 1970). Default: the
    // system clock.
    void setClock(std::function<std::int64_t()> clock);

private:
    explicit SqliteStore(std::unique_ptr<SqliteDatabase> db);

    std::int64_t now() const;
    Status nextId(const char* sequence, std::int64_t& id);
    Status defaultAlbum(std::int64_t viewer, std::string& aid);
    Status writePosts(std::int64_t viewer, std::int64_t start, std::int64_t end, std::int64_t limit, XmlNode& root);
    // Turns the nil "status" of each answered user whose status the viewer may see (one never set)
    // into an empty status at time 0. REQUIRES: mutex_ held.
    Status showUnsetStatuses(std::int64_t viewer, XmlNode& root);

    mutable std::mutex mutex_;  // guards db_, engine_ and clock_, and every statement of db_
    std::unique_ptr<SqliteDatabase> db_;
    std::unique_ptr<FqlEngine> engine_;
    std::function<std::int64_t()> clock_;
};

}  // namespace emu
