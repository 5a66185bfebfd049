#include "SqliteStore.h"

#include <charconv>
#include <ctime>
#include <limits>
#include <set>
#include <unordered_set>

#include "AttachmentWriter.h"
#include "DataGenerator.h"
#include "FqlCatalog.h"
#include "FqlEngine.h"
#include "Schema.h"
#include "SqliteDatabase.h"
#include "SqliteStatement.h"
#include "XmlTreeWriter.h"

namespace emu {

namespace {

ServiceError invalidParameter() { return ServiceError{100, "Invalid parameter"}; }
ServiceError unknownError() { return ServiceError{1, "An unknown error occurred"}; }

constexpr std::int64_t kAlbumCapacity = 60;
constexpr std::int64_t kDefaultAlbumCapacity = 1000;

// A plain non-negative decimal number; an empty text gives `fallback`.
bool parseNumber(const std::string& text, std::int64_t fallback, std::int64_t& out) {
    if (text.empty()) {
        out = fallback;
        return true;
    }
    for (char c : text)
        if (c < '0' || c > '9') return false;
    auto [end, ec] = std::from_chars(text.data(), text.data() + text.size(), out);
    return ec == std::errc() && end == text.data() + text.size();
}

bool parseFlag(const std::string& text, bool& out) {
    if (text == "1" || text == "true") out = true;
    else if (text.empty() || text == "0" || text == "false") out = false;
    else return false;
    return true;
}

std::string trim(const std::string& text) {
    const std::size_t first = text.find_first_not_of(' ');
    if (first == std::string::npos) return {};
    return text.substr(first, text.find_last_not_of(' ') - first + 1);
}

std::vector<std::string> splitList(const std::string& text) {
    std::vector<std::string> parts;
    std::size_t start = 0;
    for (;;) {
        const std::size_t comma = text.find(',', start);
        parts.push_back(trim(text.substr(start, comma == std::string::npos ? std::string::npos : comma - start)));
        if (comma == std::string::npos) break;
        start = comma + 1;
    }
    return parts;
}

void addText(XmlNode& parent, const char* name, const SqliteStatement& row, int column) {
    if (row.isNull(column)) parent.addNil(name);
    else parent.add(name, row.getText(column));
}

// Runs a write statement; a BEGIN is rolled back by the guard unless committed.
class Transaction {
public:
    explicit Transaction(SqliteDatabase& db) : db_(db) {
        std::string error;
        open_ = db_.exec("BEGIN IMMEDIATE", error);
    }
    ~Transaction() {
        if (open_) {
            std::string error;
            db_.exec("ROLLBACK", error);
        }
    }
    bool ok() const { return open_; }
    bool commit() {
        std::string error;
        if (!db_.exec("COMMIT", error)) return false;
        open_ = false;
        return true;
    }

private:
    SqliteDatabase& db_;
    bool open_ = false;
};

}  // namespace

std::unique_ptr<Store> Store::open(const std::string& path, std::string& error) {
    return SqliteStore::openDatabase(path, error);
}

Status Store::fqlQuery(std::int64_t viewer, const std::string& query, XmlNode& root) {
    root.list = true;
    XmlTreeWriter rows(root);
    return fqlQuery(viewer, query, rows);
}

std::unique_ptr<SqliteStore> SqliteStore::openDatabase(const std::string& path, std::string& error) {
    std::unique_ptr<SqliteDatabase> db = SqliteDatabase::open(path, error);
    if (!db) return nullptr;
    // A database file is kept between runs, so it keeps SQLite's rollback journal; a sync per
    // commit at the checkpoints that matter is enough for test data.
    if (!db->exec("PRAGMA synchronous = NORMAL", error)) return nullptr;
    if (!Schema::create(*db, error)) return nullptr;
    return std::unique_ptr<SqliteStore>(new SqliteStore(std::move(db)));
}

SqliteStore::SqliteStore(std::unique_ptr<SqliteDatabase> db)
    : db_(std::move(db)), engine_(std::make_unique<FqlEngine>(*db_)) {}

SqliteStore::~SqliteStore() = default;

void SqliteStore::setClock(std::function<std::int64_t()> clock) {
    std::lock_guard<std::mutex> lock(mutex_);
    clock_ = std::move(clock);
}

std::int64_t SqliteStore::now() const { return clock_ ? clock_() : static_cast<std::int64_t>(std::time(nullptr)); }

Status SqliteStore::generate(const GeneratorOptions& options) {
    std::lock_guard<std::mutex> lock(mutex_);
    std::string error;
    bool empty = false;
    if (!Schema::isEmpty(*db_, empty, error)) return ServiceError{1, error};
    if (!empty) return std::nullopt;
    return DataGenerator(*db_, options).run();
}

std::optional<std::string> SqliteStore::appSecret(const std::string& apiKey) {
    std::lock_guard<std::mutex> lock(mutex_);
    std::string error;
    sqlite3_stmt* raw = db_->prepareCached("SELECT secret FROM application WHERE api_key = ?", error);
    if (!raw) return std::nullopt;
    SqliteStatement stmt(raw);
    stmt.bind(1, apiKey);
    if (!stmt.step()) return std::nullopt;
    return stmt.getText(0);
}

std::optional<std::int64_t> SqliteStore::checkLogin(const std::string& email, const std::string& password) {
    std::lock_guard<std::mutex> lock(mutex_);
    std::string error;
    sqlite3_stmt* raw = db_->prepareCached("SELECT uid FROM account WHERE email = ? AND password = ?", error);
    if (!raw) return std::nullopt;
    SqliteStatement stmt(raw);
    stmt.bind(1, email);
    stmt.bind(2, password);
    if (!stmt.step()) return std::nullopt;
    return stmt.getInt(0);
}

Status SqliteStore::fqlQuery(std::int64_t viewer, const std::string& query, AnswerWriter& out) {
    std::lock_guard<std::mutex> lock(mutex_);
    return engine_->run(viewer, now(), query, out);
}

Status SqliteStore::explainFql(std::int64_t viewer, const std::string& query, std::string& sql,
                               std::vector<std::string>& plan) {
    std::lock_guard<std::mutex> lock(mutex_);
    FqlPlan compiled;
    if (Status s = FqlEngine::compile(viewer, now(), query, compiled)) return s;
    sql = compiled.sql;
    std::string error;
    sqlite3_stmt* raw = db_->prepareCached("EXPLAIN QUERY PLAN " + compiled.sql, error);
    if (!raw) return ServiceError{1, error};
    SqliteStatement stmt(raw);
    for (std::size_t i = 0; i < compiled.params.size(); ++i) stmt.bind(static_cast<int>(i + 1), compiled.params[i]);
    plan.clear();
    while (stmt.step()) plan.push_back(stmt.getText(3));
    if (!stmt.ok()) return unknownError();
    return std::nullopt;
}

Status SqliteStore::streamGet(std::int64_t viewer, const std::string& viewerId, const std::string& startTime,
                              const std::string& endTime, const std::string& limit, XmlNode& root) {
    std::int64_t asked = 0, start = 0, end = 0, count = 0;
    if (!parseNumber(viewerId, viewer, asked) || asked != viewer) return invalidParameter();
    if (!parseNumber(startTime, 0, start) || !parseNumber(endTime, 0, end) || !parseNumber(limit, 0, count))
        return invalidParameter();
    if (end == 0) end = std::numeric_limits<std::int64_t>::max();
    if (count == 0) count = 30;
    std::lock_guard<std::mutex> lock(mutex_);
    return writePosts(viewer, start, end, count, root);
}

Status SqliteStore::writePosts(std::int64_t viewer, std::int64_t start, std::int64_t end, std::int64_t limit,
                               XmlNode& root) {
    std::string error;
    sqlite3_stmt* raw = db_->prepareCached(
        "SELECT s.post_id, s.source_id, s.type, s.app_id, s.attribution, s.actor_id, s.target_id, s.message, "
        "s.att_name, s.att_href, s.att_caption, s.att_description, s.updated_time, s.created_time "
        "FROM stream s WHERE s.created_time >= ? AND s.created_time <= ? AND (s.source_id = ? OR EXISTS "
        "(SELECT 1 FROM friend f WHERE f.uid1 = ? AND f.uid2 = s.source_id)) "
        "ORDER BY s.created_time DESC, s.post_id DESC LIMIT ?",
        error);
    if (!raw) return unknownError();
    AttachmentWriter attachments(*db_);
    std::vector<std::int64_t> people;
    std::unordered_set<std::int64_t> seenPeople;
    auto person = [&](const SqliteStatement& row, int column) {
        if (row.isNull(column)) return;
        const std::int64_t id = row.getInt(column);
        if (seenPeople.insert(id).second) people.push_back(id);
    };
    std::vector<std::string> posts;
    XmlNode& list = root.addList("posts");
    {
        SqliteStatement row(raw);
        row.bind(1, start);
        row.bind(2, end);
        row.bind(3, viewer);
        row.bind(4, viewer);
        row.bind(5, limit);
        auto optional = [&](int column) -> std::optional<std::string> {
            if (row.isNull(column)) return std::nullopt;
            return row.getText(column);
        };
        while (row.step()) {
            XmlNode& post = list.add("stream_post");
            const std::string postId = row.getText(0);
            post.add("post_id", postId);
            post.add("viewer_id", std::to_string(viewer));
            post.add("source_id", row.getText(1));
            post.add("type", row.getText(2));
            post.add("app_id", row.getText(3));
            post.add("attribution", row.getText(4));
            post.add("actor_id", row.getText(5));
            post.add("target_id", row.getText(6));
            post.add("message", row.getText(7));
            XmlNode& attachment = post.add("attachment");
            if (!attachments.write(postId, optional(8), optional(9), optional(10), optional(11), attachment, error))
                return unknownError();
            post.add("updated_time", row.getText(12));
            post.add("created_time", row.getText(13));
            post.add("filter_key", "nf");
            post.add("permalink", "http://www.trelm.example/story.php?id=" + postId);
            person(row, 1);
            person(row, 5);
            person(row, 6);
            posts.push_back(postId);
        }
        if (!row.ok()) return unknownError();
    }

    XmlNode& profiles = root.addList("profiles");
    sqlite3_stmt* userRaw = db_->prepareCached("SELECT name FROM user WHERE uid = ?", error);
    if (!userRaw) return unknownError();
    for (std::int64_t id : people) {
        SqliteStatement user(userRaw);
        user.bind(1, id);
        if (!user.step()) continue;
        const std::string uid = std::to_string(id);
        XmlNode& p = profiles.add("profile");
        p.add("id", uid);
        p.add("url", "http://www.trelm.example/profile.php?id=" + uid);
        p.add("name", user.getText(0));
        p.add("pic_square", "http://pics.trelm.example/q/" + uid + ".jpg");
        p.add("type", "user");
    }

    XmlNode& albums = root.addList("albums");
    sqlite3_stmt* mediaRaw = db_->prepareCached(
        "SELECT DISTINCT photo_aid FROM stream_media WHERE post_id = ? AND photo_aid IS NOT NULL ORDER BY idx", error);
    sqlite3_stmt* albumRaw = db_->prepareCached(
        "SELECT aid, owner, cover_pid, name, created, modified, description, location, link, size, visible, type "
        "FROM album WHERE aid = ?",
        error);
    if (!mediaRaw || !albumRaw) return unknownError();
    std::set<std::string> seenAlbums;
    for (const std::string& postId : posts) {
        std::vector<std::string> aids;
        {
            SqliteStatement media(mediaRaw);
            media.bind(1, postId);
            while (media.step()) aids.push_back(media.getText(0));
        }
        for (const std::string& aid : aids) {
            if (!seenAlbums.insert(aid).second) continue;
            SqliteStatement album(albumRaw);
            album.bind(1, aid);
            if (!album.step()) continue;
            XmlNode& a = albums.add("album");
            static const char* const kNames[] = {"aid",         "owner",    "cover_pid", "name", "created", "modified",
                                                 "description", "location", "link",      "size", "visible", "type"};
            for (int c = 0; c < 12; ++c) addText(a, kNames[c], album, c);
        }
    }
    return std::nullopt;
}

Status SqliteStore::getInbox(std::int64_t viewer, const std::string& start, const std::string& limit, XmlNode& root) {
    std::int64_t from = 0, count = 0;
    if (!parseNumber(start, 0, from) || !parseNumber(limit, 0, count)) return invalidParameter();
    if (count == 0) count = 20;
    std::lock_guard<std::mutex> lock(mutex_);
    std::string error;
    sqlite3_stmt* raw = db_->prepareCached(
        "SELECT thread_id, subject, updated_time, unread, message_count FROM thread "
        "WHERE owner = ? AND folder_id = 0 ORDER BY updated_time DESC, thread_id DESC LIMIT ? OFFSET ?",
        error);
    if (!raw) return unknownError();
    SqliteStatement row(raw);
    row.bind(1, viewer);
    row.bind(2, count);
    row.bind(3, from);
    root.list = true;
    while (row.step()) {
        XmlNode& t = root.add("thread");
        t.add("tid", row.getText(0));
        t.add("subject", row.getText(1));
        t.add("last_update", row.getText(2));
        t.add("unread", row.getText(3));
        t.add("message_count", row.getText(4));
    }
    return row.ok() ? Status() : unknownError();
}

Status SqliteStore::getThreadMessages(std::int64_t viewer, const std::string& threadId, const std::string& start,
                                      const std::string& limit, XmlNode& root) {
    std::int64_t tid = 0, from = 0, count = 0;
    if (threadId.empty() || !parseNumber(threadId, 0, tid) || !parseNumber(start, 0, from) ||
        !parseNumber(limit, 0, count))
        return invalidParameter();
    if (count == 0) count = 50;
    std::lock_guard<std::mutex> lock(mutex_);
    std::string error;
    sqlite3_stmt* owner = db_->prepareCached("SELECT 1 FROM thread WHERE thread_id = ? AND owner = ?", error);
    if (!owner) return unknownError();
    {
        SqliteStatement check(owner);
        check.bind(1, tid);
        check.bind(2, viewer);
        if (!check.step()) return invalidParameter();  // no such thread in the viewer's mailbox
    }
    sqlite3_stmt* raw = db_->prepareCached(
        "SELECT message_id, thread_id, author_id, body, created_time, att_href IS NOT NULL FROM message "
        "WHERE thread_id = ? ORDER BY created_time DESC, seq DESC LIMIT ? OFFSET ?",
        error);
    if (!raw) return unknownError();
    SqliteStatement row(raw);
    row.bind(1, tid);
    row.bind(2, count);
    row.bind(3, from);
    root.list = true;
    while (row.step()) {
        XmlNode& m = root.add("message");
        m.add("mid", row.getText(0));
        m.add("tid", row.getText(1));
        m.add("author", row.getText(2));
        m.add("body", row.getText(3));
        m.add("time_sent", row.getText(4));
        m.add("has_attachment", row.getInt(5) ? "true" : "false");
    }
    return row.ok() ? Status() : unknownError();
}

Status SqliteStore::nextId(const char* sequence, std::int64_t& id) {
    std::string error;
    sqlite3_stmt* raw = db_->prepareCached(
        "INSERT INTO sequence(name, value) VALUES (?, 1) "
        "ON CONFLICT(name) DO UPDATE SET value = value + 1 RETURNING value",
        error);
    if (!raw) return unknownError();
    SqliteStatement stmt(raw);
    stmt.bind(1, std::string(sequence));
    if (!stmt.step()) return unknownError();
    id = stmt.getInt(0);
    stmt.run();  // finish the statement so that the change is complete
    return stmt.ok() ? Status() : unknownError();
}

Status SqliteStore::setStatus(std::int64_t viewer, const std::string& status, const std::string& includesVerb,
                              const std::string& clear, XmlNode& root) {
    bool verb = false, clearing = false;
    if (!parseFlag(includesVerb, verb) || !parseFlag(clear, clearing)) return invalidParameter();
    if (!clearing && status.empty()) return invalidParameter();
    std::lock_guard<std::mutex> lock(mutex_);
    Transaction tx(*db_);
    if (!tx.ok()) return unknownError();
    const std::int64_t time = now();
    std::int64_t statusId = 0;
    if (Status s = nextId("status", statusId)) return s;
    const std::string message = clearing ? std::string() : status;
    std::string error;
    sqlite3_stmt* update = db_->prepareCached(
        "UPDATE user SET status_message = ?, status_time = ?, status_id = ? WHERE uid = ?", error);
    if (!update) return unknownError();
    {
        SqliteStatement stmt(update);
        stmt.bind(1, message);
        stmt.bind(2, time);
        stmt.bind(3, statusId);
        stmt.bind(4, viewer);
        if (!stmt.run()) return unknownError();
    }
    if (!clearing) {
        std::int64_t story = 0;
        if (Status s = nextId("story", story)) return s;
        sqlite3_stmt* post = db_->prepareCached(
            "INSERT INTO stream(post_id, source_id, actor_id, target_id, filter_key, type, app_id, attribution, "
            "message, created_time, updated_time) VALUES (?, ?, ?, NULL, 'nf', 46, 0, NULL, ?, ?, ?)",
            error);
        if (!post) return unknownError();
        SqliteStatement stmt(post);
        stmt.bind(1, std::to_string(viewer) + "_" + std::to_string(story));
        stmt.bind(2, viewer);
        stmt.bind(3, viewer);
        stmt.bind(4, message);
        stmt.bind(5, time);
        stmt.bind(6, time);
        if (!stmt.run()) return unknownError();
    }
    if (!tx.commit()) return unknownError();
    root.text = "1";
    return std::nullopt;
}

Status SqliteStore::defaultAlbum(std::int64_t viewer, std::string& aid) {
    std::string error;
    sqlite3_stmt* find = db_->prepareCached("SELECT aid FROM album WHERE owner = ? AND app_default = 1", error);
    if (!find) return unknownError();
    {
        SqliteStatement stmt(find);
        stmt.bind(1, viewer);
        if (stmt.step()) {
            aid = stmt.getText(0);
            return std::nullopt;
        }
    }
    std::string appName = "Application";
    sqlite3_stmt* app = db_->prepareCached("SELECT name FROM application ORDER BY rowid LIMIT 1", error);
    if (!app) return unknownError();
    {
        SqliteStatement stmt(app);
        if (stmt.step()) appName = stmt.getText(0);
    }
    std::int64_t seq = 0;
    if (Status s = nextId("album", seq)) return s;
    aid = std::to_string(viewer) + "_" + std::to_string(seq);
    sqlite3_stmt* insert = db_->prepareCached(
        "INSERT INTO album(aid, owner, cover_pid, name, created, modified, description, location, link, size, "
        "visible, type, app_default) VALUES (?, ?, NULL, ?, ?, ?, '', '', ?, 0, 'everyone', 'app', 1)",
        error);
    if (!insert) return unknownError();
    SqliteStatement stmt(insert);
    const std::int64_t time = now();
    stmt.bind(1, aid);
    stmt.bind(2, viewer);
    stmt.bind(3, appName + " Photos");
    stmt.bind(4, time);
    stmt.bind(5, time);
    stmt.bind(6, "http://www.trelm.example/album.php?aid=" + aid);
    return stmt.run() ? Status() : unknownError();
}

Status SqliteStore::uploadPhoto(std::int64_t viewer, const std::string& aid, const std::string& caption,
                                const std::string& imageBytes, bool haveImage, XmlNode& root) {
    if (!haveImage || imageBytes.empty()) return ServiceError{324, "Missing or invalid image file"};
    std::lock_guard<std::mutex> lock(mutex_);
    Transaction tx(*db_);
    if (!tx.ok()) return unknownError();
    std::string album = aid;
    if (album.empty())
        if (Status s = defaultAlbum(viewer, album)) return s;
    std::string error;
    sqlite3_stmt* find =
        db_->prepareCached("SELECT owner, size, app_default, visible FROM album WHERE aid = ?", error);
    if (!find) return unknownError();
    std::string visible;
    {
        SqliteStatement stmt(find);
        stmt.bind(1, album);
        if (!stmt.step() || stmt.getInt(0) != viewer) return ServiceError{120, "Invalid album id"};
        const std::int64_t capacity = stmt.getInt(2) ? kDefaultAlbumCapacity : kAlbumCapacity;
        if (stmt.getInt(1) >= capacity) return ServiceError{321, "Album is full"};
        visible = stmt.getText(3);
    }
    std::int64_t seq = 0;
    if (Status s = nextId("photo", seq)) return s;
    const std::string pid = std::to_string(viewer) + "_" + std::to_string(seq);
    const std::string base = "http://photos.trelm.example/" + pid;
    const std::string link = "http://www.trelm.example/photo.php?pid=" + pid;
    const std::int64_t time = now();
    sqlite3_stmt* insert = db_->prepareCached(
        "INSERT INTO photo(pid, aid, owner, src_small, src_big, src, link, caption, created, modified, visible) "
        "VALUES (?, ?, ?, ?, ?, ?, ?, ?, ?, ?, ?)",
        error);
    sqlite3_stmt* grow = db_->prepareCached(
        "UPDATE album SET size = size + 1, modified = ?, cover_pid = coalesce(cover_pid, ?) WHERE aid = ?", error);
    if (!insert || !grow) return unknownError();
    {
        SqliteStatement stmt(insert);
        stmt.bind(1, pid);
        stmt.bind(2, album);
        stmt.bind(3, viewer);
        stmt.bind(4, base + "_t.jpg");
        stmt.bind(5, base + "_n.jpg");
        stmt.bind(6, base + "_s.jpg");
        stmt.bind(7, link);
        stmt.bind(8, caption);
        stmt.bind(9, time);
        stmt.bind(10, time);
        stmt.bind(11, visible);
        if (!stmt.run()) return unknownError();
    }
    {
        SqliteStatement stmt(grow);
        stmt.bind(1, time);
        stmt.bind(2, pid);
        stmt.bind(3, album);
        if (!stmt.run()) return unknownError();
    }
    if (!tx.commit()) return unknownError();
    root.add("pid", pid);
    root.add("aid", album);
    root.add("owner", std::to_string(viewer));
    root.add("src", base + "_s.jpg");
    root.add("src_big", base + "_n.jpg");
    root.add("src_small", base + "_t.jpg");
    root.add("link", link);
    root.add("caption", caption);
    root.add("created", std::to_string(time));
    return std::nullopt;
}

Status SqliteStore::usersGetInfo(std::int64_t viewer, const std::string& uids, const std::string& fields,
                                 XmlNode& root) {
    // Checked here, then answered through FQL: ids are plain numbers and field names come from
    // the catalog, so the statement is made only of known words.
    std::string idList;
    for (const std::string& id : splitList(uids)) {
        std::int64_t value = 0;
        if (id.empty() || !parseNumber(id, 0, value)) return invalidParameter();
        if (!idList.empty()) idList += ',';
        idList += std::to_string(value);
    }
    const FqlTable& user = *FqlCatalog::instance().table("user");
    std::string columns = "uid";
    std::set<std::string> seen{"uid"};
    for (const std::string& field : splitList(fields)) {
        const FqlColumn* column = user.column(field);
        if (!column) return invalidParameter();
        if (seen.insert(column->name).second) columns += "," + column->name;
    }
    std::lock_guard<std::mutex> lock(mutex_);
    if (Status s = engine_->run(viewer, now(), "select " + columns + " from user where uid in (" + idList + ")", root))
        return s;
    return seen.count("status") ? showUnsetStatuses(viewer, root) : Status();
}

Status SqliteStore::showUnsetStatuses(std::int64_t viewer, XmlNode& root) {
    // The service showed a status that was never set as an empty message at time 0; only a
    // status the viewer may not see stays nil.
    std::string error;
    sqlite3_stmt* raw = db_->prepareCached(
        "SELECT 1 FROM user u WHERE u.uid = ? AND ((u.hidden & 8) = 0 OR u.uid = ? OR "
        "EXISTS (SELECT 1 FROM friend v WHERE v.uid1 = ? AND v.uid2 = u.uid))",
        error);
    if (!raw) return unknownError();
    for (XmlNode& user : root.children) {
        std::int64_t uid = 0;
        XmlNode* status = nullptr;
        for (XmlNode& field : user.children) {
            if (field.name == "uid" && !parseNumber(field.text, 0, uid)) return unknownError();
            if (field.name == "status" && field.nil) status = &field;
        }
        if (!status) continue;
        SqliteStatement visible(raw);
        visible.bind(1, uid);
        visible.bind(2, viewer);
        visible.bind(3, viewer);
        if (!visible.step()) {
            if (!visible.ok()) return unknownError();
            continue;
        }
        status->nil = false;
        status->add("message");
        status->add("time", "0");
        status->add("status_id", "0");
    }
    return std::nullopt;
}

Status SqliteStore::friendsGet(std::int64_t viewer, const std::string& uid, XmlNode& root) {
    std::int64_t whose = 0;
    if (!parseNumber(uid, viewer, whose) || whose != viewer) return invalidParameter();
    std::lock_guard<std::mutex> lock(mutex_);
    std::string error;
    sqlite3_stmt* raw = db_->prepareCached("SELECT uid2 FROM friend INDEXED BY friend_pair WHERE uid1 = ? ORDER BY uid2",
                                           error);
    if (!raw) return unknownError();
    SqliteStatement row(raw);
    row.bind(1, viewer);
    root.list = true;
    while (row.step()) root.add("uid", row.getText(0));
    return row.ok() ? Status() : unknownError();
}

}  // namespace emu
