#include "DataGenerator.h"

#include <algorithm>
#include <optional>
#include <unordered_set>

#include "Schema.h"
#include "SqliteDatabase.h"
#include "SqliteStatement.h"

namespace emu {

namespace {

const char* const kFirstNames[] = {"Anna",  "Ben",   "Carla", "David", "Emma",  "Felix", "Greta", "Hugo",
                                   "Ida",   "Jonas", "Klara", "Lukas", "Mia",   "Noah",  "Olivia", "Paul",
                                   "Rosa",  "Simon", "Tina",  "Umar",  "Vera",  "Will",  "Xenia", "Yusuf",
                                   "Zoe",   "Aaron", "Bella", "Chris", "Dora",  "Emil",  "Fiona", "Gabe"};
const char* const kLastNames[] = {"Adler",  "Berger", "Conte",   "Dietz",  "Eriksen", "Fischer", "Garcia", "Hansen",
                                  "Ivanov", "Jensen", "Keller",  "Larsen", "Moreau",  "Novak",   "Olsen",  "Peters",
                                  "Quinn",  "Rossi",  "Schmidt", "Tanaka", "Ueda",    "Vogel",   "Weber",  "Young"};
const char* const kCities[][4] = {{"Springfield", "Illinois", "United States", "62701"},
                                  {"Portland", "Oregon", "United States", "97201"},
                                  {"Hamburg", "Hamburg", "Germany", "20095"},
                                  {"Lyon", "Rhone", "France", "69001"},
                                  {"Osaka", "Osaka", "Japan", "530-0001"},
                                  {"Toronto", "Ontario", "Canada", "M5H 2N2"}};
const char* const kLocales[] = {"en_US", "en_GB", "de_DE", "fr_FR", "ja_JP"};
const char* const kMonths[] = {"January", "February", "March",     "April",   "May",      "June",
                               "July",    "August",   "September", "October", "November", "December"};
const char* const kStatuses[] = {"is reading",     "is at the beach", "is cooking dinner", "is on a train",
                                 "is listening to music", "is writing code", "is out for a run", "is sleepy"};

constexpr std::int64_t kContentStrangers = 20;

// Binds the arguments of one row in order and runs the statement.
void bindOne(SqliteStatement& s, int i, std::int64_t v) { s.bind(i, v); }
void bindOne(SqliteStatement& s, int i, int v) { s.bind(i, static_cast<std::int64_t>(v)); }
void bindOne(SqliteStatement& s, int i, double v) { s.bind(i, SqlValue::ofReal(v)); }
void bindOne(SqliteStatement& s, int i, const std::string& v) { s.bind(i, v); }
// Literal texts outlive the statement's use, so SQLite need not copy them.
void bindOne(SqliteStatement& s, int i, const char* v) { s.bindStatic(i, v); }
void bindOne(SqliteStatement& s, int i, std::nullopt_t) { s.bindNull(i); }
void bindOne(SqliteStatement& s, int i, const std::optional<std::string>& v) {
    if (v) s.bind(i, *v);
    else s.bindNull(i);
}
void bindOne(SqliteStatement& s, int i, const std::optional<std::int64_t>& v) {
    if (v) s.bind(i, *v);
    else s.bindNull(i);
}

template <typename... Args>
bool insertRow(SqliteDatabase& db, sqlite3_stmt* raw, std::string& error, const Args&... args) {
    SqliteStatement s(raw);
    int i = 0;
    (bindOne(s, ++i, args), ...);
    if (!s.run()) {
        error = db.lastError();
        return false;
    }
    return true;
}

std::string idText(std::int64_t owner, std::int64_t seq) { return std::to_string(owner) + "_" + std::to_string(seq); }

}  // namespace

Status DataGenerator::run() {
    const GeneratorOptions& o = options_;
    if (o.users < 1 || o.demoFriends < 0 || o.friendsPerUser < 0 || o.albumsPerUser < 0 || o.photosPerAlbum < 0 ||
        o.tagsPerPhoto < 0 || o.postsPerUser < 0 || o.threadsPerUser < 0 || o.messagesPerThread < 0 ||
        o.friendRequests < 0 || o.users > 20000000 || o.photosPerSecond < 1 || o.photosPerSecond > 5 ||
        o.postsPerSecond < 1 || o.postsPerSecond > 6)
        return ServiceError{100, "Invalid parameter"};
    std::string error;
    if (!db_.exec("BEGIN", error)) return ServiceError{1, error};
    if (!writeAll(error)) {
        std::string ignored;
        db_.exec("ROLLBACK", ignored);
        return ServiceError{1, error};
    }
    if (!db_.exec("COMMIT", error)) return ServiceError{1, error};
    return std::nullopt;
}

bool DataGenerator::writeAll(std::string& error) {
    return Schema::dropSecondaryIndexes(db_, error) && makeUsers(error) && makeFriends(error) && makeAlbums(error) &&
           makePosts(error) && makeRequests(error) && makeThreads(error) && writeSequences(error) &&
           Schema::createSecondaryIndexes(db_, error) && db_.exec("PRAGMA analysis_limit = 1000; ANALYZE", error);
}

bool DataGenerator::makeUsers(std::string& error) {
    const std::int64_t count = options_.users;
    uids_.reserve(static_cast<std::size_t>(count));
    std::unordered_set<std::int64_t> used;
    used.reserve(static_cast<std::size_t>(count) * 2);
    uids_.push_back(DemoAccount::uid);
    used.insert(DemoAccount::uid);
    static const std::int64_t kLow[] = {100000, 1000000, 10000000, 100000000, 1000000000};
    while (static_cast<std::int64_t>(uids_.size()) < count) {
        const std::int64_t low = kLow[below(5)];
        const std::int64_t uid = low + static_cast<std::int64_t>(below(static_cast<std::uint64_t>(low * 9)));
        if (used.insert(uid).second) uids_.push_back(uid);
    }

    // The demo user's friends are a random sample of everyone else; a few other users get
    // content too, so that what the viewer may not see can be tested.
    isFriend_.assign(uids_.size(), 0);
    // Every fourth friend has never set a status, so that both kinds of friend are always there.
    std::vector<char> noStatus(uids_.size(), 0);
    const std::int64_t others = count - 1;
    const std::int64_t friends = std::min(options_.demoFriends, others);
    std::vector<std::int64_t> order(static_cast<std::size_t>(others));
    for (std::int64_t i = 0; i < others; ++i) order[static_cast<std::size_t>(i)] = i + 1;
    for (std::int64_t i = 0; i < friends; ++i) {
        const std::int64_t j = i + static_cast<std::int64_t>(below(static_cast<std::uint64_t>(others - i)));
        std::swap(order[static_cast<std::size_t>(i)], order[static_cast<std::size_t>(j)]);
        isFriend_[static_cast<std::size_t>(order[static_cast<std::size_t>(i)])] = 1;
        if (i % 4 == 3) noStatus[static_cast<std::size_t>(order[static_cast<std::size_t>(i)])] = 1;
        demoFriends_.push_back(uids_[static_cast<std::size_t>(order[static_cast<std::size_t>(i)])]);
    }
    demoFriendSet_.insert(demoFriends_.begin(), demoFriends_.end());
    contentUsers_.push_back(DemoAccount::uid);
    contentUsers_.insert(contentUsers_.end(), demoFriends_.begin(), demoFriends_.end());
    std::vector<char> isContent(uids_.size(), 0);
    isContent[0] = 1;
    for (std::size_t i = 1; i < uids_.size(); ++i) isContent[i] = isFriend_[i];
    std::int64_t strangers = 0;
    // Requests come from the first non-friends in generation order; content strangers follow.
    std::int64_t skipped = 0;
    for (std::size_t i = 1; i < uids_.size() && strangers < kContentStrangers; ++i) {
        if (isFriend_[i]) continue;
        if (skipped++ < options_.friendRequests) continue;
        isContent[i] = 1;
        contentUsers_.push_back(uids_[i]);
        ++strangers;
    }

    std::vector<std::size_t> byUid(uids_.size());
    for (std::size_t i = 0; i < byUid.size(); ++i) byUid[i] = i;
    std::sort(byUid.begin(), byUid.end(), [&](std::size_t a, std::size_t b) { return uids_[a] < uids_[b]; });

    // Profile values are drawn per user in generation order, so the result does not depend on
    // the order of insertion.
    struct Profile {
        std::uint32_t first, last, locale, city, month, day, year, status;
        std::int64_t statusTime;
        int hidden;
    };
    std::vector<Profile> profiles(uids_.size());
    for (std::size_t i = 0; i < uids_.size(); ++i) {
        Profile& p = profiles[i];
        p.first = static_cast<std::uint32_t>(below(std::size(kFirstNames)));
        p.last = static_cast<std::uint32_t>(below(std::size(kLastNames)));
        p.locale = static_cast<std::uint32_t>(below(std::size(kLocales)));
        if (isContent[i]) {
            p.city = static_cast<std::uint32_t>(below(std::size(kCities)));
            p.month = static_cast<std::uint32_t>(below(12));
            p.day = static_cast<std::uint32_t>(1 + below(28));
            p.year = static_cast<std::uint32_t>(1960 + below(40));
            p.status = static_cast<std::uint32_t>(below(std::size(kStatuses)));
            p.statusTime = randomTime();
            p.hidden = i == 0 ? 0 : static_cast<int>(below(16));
        }
    }

    sqlite3_stmt* insert = db_.prepareCached(
        "INSERT INTO user(uid, name, first_name, last_name, birthday, sex, city, state, country, zip, "
        "status_message, status_time, status_id, locale, about_me, hidden) "
        "VALUES (?, ?, ?, ?, ?, ?, ?, ?, ?, ?, ?, ?, ?, ?, ?, ?)",
        error);
    // Most users have a name and little else.
    sqlite3_stmt* plain = db_.prepareCached(
        "INSERT INTO user(uid, name, first_name, last_name, sex, locale) VALUES (?, ?, ?, ?, ?, ?)", error);
    if (!insert || !plain) return false;
    std::unordered_map<std::int64_t, std::int64_t> statusIds;
    for (std::size_t i = 0; i < uids_.size(); ++i)
        if (isContent[i] && !noStatus[i]) statusIds[uids_[i]] = ++statusSeq_;
    for (std::size_t index : byUid) {
        const std::int64_t uid = uids_[index];
        const Profile& p = profiles[index];
        const char* first = index == 0 ? "Demo" : kFirstNames[p.first];
        const char* last = index == 0 ? "User" : kLastNames[p.last];
        std::string name = first;
        name += ' ';
        name += last;
        const char* sex = p.first % 2 ? "male" : "female";
        if (!isContent[index]) {
            if (!insertRow(db_, plain, error, uid, name, first, last, sex, kLocales[p.locale])) return false;
            continue;
        }
        names_[uid] = name;
        const auto& city = kCities[p.city];
        const std::string birthday =
            std::string(kMonths[p.month]) + " " + std::to_string(p.day) + ", " + std::to_string(p.year);
        const std::string about = std::string("Hello, I am ") + first + " from " + city[0] + ".";
        std::optional<std::string> statusText;
        std::optional<std::int64_t> statusTime, statusId;
        if (!noStatus[index]) {
            statusText = kStatuses[p.status];
            statusTime = p.statusTime;
            statusId = statusIds[uid];
        }
        if (!insertRow(db_, insert, error, uid, name, first, last, birthday, sex, city[0], city[1], city[2], city[3],
                       statusText, statusTime, statusId, kLocales[p.locale], about, p.hidden))
            return false;
    }

    sqlite3_stmt* app = db_.prepareCached("INSERT INTO application(api_key, secret, name, app_id) VALUES (?, ?, ?, ?)",
                                          error);
    sqlite3_stmt* account = db_.prepareCached("INSERT INTO account(email, password, uid) VALUES (?, ?, ?)", error);
    return app && account &&
           insertRow(db_, app, error, DemoAccount::apiKey, DemoAccount::appSecret, "Trelm Demo", 1) &&
           insertRow(db_, account, error, DemoAccount::email, DemoAccount::password, DemoAccount::uid) &&
           (uids_.size() < 2 ||
            insertRow(db_, account, error, SecondAccount::email, SecondAccount::password, uids_[1]));
}

bool DataGenerator::makeFriends(std::string& error) {
    struct Edge {
        std::int64_t uid1;
        std::string key2;  // the client's text key of uid2
        std::int64_t uid2;
    };
    std::vector<std::pair<std::int64_t, std::int64_t>> pairs;
    for (std::int64_t f : demoFriends_) pairs.emplace_back(DemoAccount::uid, f);
    // Each content user other than the demo user links to half its share of random users;
    // links arriving from others make up the rest. The demo user keeps exactly its own friends.
    const std::size_t n = uids_.size();
    const std::int64_t perUser = options_.friendsPerUser / 2;
    if (n > 2) {
        for (std::size_t u = 1; u < contentUsers_.size(); ++u) {
            for (std::int64_t k = 0; k < perUser; ++k) {
                const std::int64_t other = uids_[1 + static_cast<std::size_t>(below(n - 1))];
                if (other != contentUsers_[u]) pairs.emplace_back(contentUsers_[u], other);
            }
        }
    }
    std::vector<Edge> edges;
    edges.reserve(pairs.size() * 2);
    for (const auto& [a, b] : pairs) {
        edges.push_back(Edge{a, std::to_string(b) + " ", b});
        edges.push_back(Edge{b, std::to_string(a) + " ", a});
    }
    // Rows go in in key order, which keeps the inserts appending.
    std::sort(edges.begin(), edges.end(), [](const Edge& a, const Edge& b) {
        return a.uid1 != b.uid1 ? a.uid1 < b.uid1 : a.key2 < b.key2;
    });
    edges.erase(std::unique(edges.begin(), edges.end(),
                            [](const Edge& a, const Edge& b) { return a.uid1 == b.uid1 && a.uid2 == b.uid2; }),
                edges.end());
    sqlite3_stmt* insert = db_.prepareCached("INSERT INTO friend(uid1, key2, uid2) VALUES (?, ?, ?)", error);
    if (!insert) return false;
    for (const Edge& e : edges)
        if (!insertRow(db_, insert, error, e.uid1, e.key2, e.uid2)) return false;
    return true;
}

std::int64_t DataGenerator::friendOf(std::int64_t uid) {
    // Content users are the demo user, its friends and strangers; the demo user is a friend
    // of each of its friends, so a friend's counterpart is the demo user.
    if (uid == DemoAccount::uid)
        return demoFriends_.empty() ? uid : demoFriends_[below(demoFriends_.size())];
    return demoFriendSet_.count(uid) ? DemoAccount::uid : uid;
}

bool DataGenerator::makeAlbums(std::string& error) {
    sqlite3_stmt* album = db_.prepareCached(
        "INSERT INTO album(aid, owner, cover_pid, name, created, modified, description, location, link, size, "
        "visible, type) VALUES (?, ?, ?, ?, ?, ?, ?, ?, ?, ?, ?, ?)",
        error);
    sqlite3_stmt* photo = db_.prepareCached(
        "INSERT INTO photo(pid, aid, owner, src_small, src_big, src, link, caption, created, modified, visible) "
        "VALUES (?, ?, ?, ?, ?, ?, ?, ?, ?, ?, ?)",
        error);
    sqlite3_stmt* tag = db_.prepareCached(
        "INSERT OR IGNORE INTO photo_tag(pid, subject, text, xcoord, ycoord, created) VALUES (?, ?, ?, ?, ?, ?)", error);
    if (!album || !photo || !tag) return false;
    static const char* const kAudience[] = {"everyone", "friends", "everyone", "friends", "custom"};
    std::int64_t lastPhotoTime = randomTime();
    for (std::size_t u = 0; u < contentUsers_.size(); ++u) {
        const std::int64_t owner = contentUsers_[u];
        for (std::int64_t a = 0; a < options_.albumsPerUser; ++a) {
            const std::string aid = idText(owner, ++albumSeq_);
            const std::string name = a == 0 ? "Profile Pictures" : "Album " + std::to_string(a);
            const char* type = a == 0 ? "profile" : (a % 5 == 3 ? "mobile" : "normal");
            const char* visible = kAudience[(u + static_cast<std::size_t>(a)) % std::size(kAudience)];
            const std::int64_t created = randomTime();
            std::int64_t modified = created;
            std::string cover;
            for (std::int64_t p = 0; p < options_.photosPerAlbum; ++p) {
                const std::string pid = idText(owner, ++photoSeq_);
                // The last photosPerSecond - 1 photos of every five share their creation second
                // with the photo made before them.
                const std::int64_t time = (photoSeq_ - 1) % 5 >= 6 - options_.photosPerSecond ? lastPhotoTime : randomTime();
                lastPhotoTime = time;
                modified = std::max(modified, time);
                if (cover.empty()) cover = pid;
                const std::string base = "http://photos.trelm.example/" + pid;
                const std::string caption = name + ", photo " + std::to_string(p + 1);
                if (!insertRow(db_, photo, error, pid, aid, owner, base + "_t.jpg", base + "_n.jpg", base + "_s.jpg",
                               "http://www.trelm.example/photo.php?pid=" + pid, caption, time, time, visible))
                    return false;
                photos_[owner].push_back(Photo{pid, aid, owner, time, caption});
                for (std::int64_t t = 0; t < options_.tagsPerPhoto; ++t) {
                    const std::int64_t subject = t == 0 ? owner : friendOf(owner);
                    const auto known = names_.find(subject);
                    const std::string text = known != names_.end() ? known->second : std::to_string(subject);
                    if (!insertRow(db_, tag, error, pid, subject, text, static_cast<double>(below(1001)) / 10.0,
                                   static_cast<double>(below(1001)) / 10.0, time + 60))
                        return false;
                }
            }
            if (!insertRow(db_, album, error, aid, owner, cover.empty() ? std::optional<std::string>() : cover, name,
                           created, modified, "Photos of " + name, "Springfield",
                           "http://www.trelm.example/album.php?aid=" + aid, options_.photosPerAlbum, visible, type))
                return false;
        }
    }
    return true;
}

bool DataGenerator::makePosts(std::string& error) {
    sqlite3_stmt* post = db_.prepareCached(
        "INSERT INTO stream(post_id, source_id, actor_id, target_id, filter_key, type, app_id, attribution, message, "
        "att_name, att_href, att_caption, att_description, created_time, updated_time) "
        "VALUES (?, ?, ?, ?, 'nf', ?, ?, ?, ?, ?, ?, ?, ?, ?, ?)",
        error);
    sqlite3_stmt* media = db_.prepareCached(
        "INSERT INTO stream_media(post_id, idx, href, alt, type, src, photo_aid, photo_pid, photo_owner, width, "
        "height) VALUES (?, ?, ?, ?, ?, ?, ?, ?, ?, ?, ?)",
        error);
    if (!post || !media) return false;
    static const int kKinds[] = {46, 247, 80, 56};
    std::int64_t lastTime = randomTime();
    for (std::size_t u = 0; u < contentUsers_.size(); ++u) {
        const std::int64_t owner = contentUsers_[u];
        const std::int64_t count = u == 0 ? std::max<std::int64_t>(options_.postsPerUser, 4) : options_.postsPerUser;
        for (std::int64_t k = 0; k < count; ++k) {
            int kind = kKinds[(u + static_cast<std::size_t>(k)) % 4];
            const auto& own = photos_[owner];
            if (kind == 247 && own.empty()) kind = 46;
            const std::string postId = idText(owner, ++storySeq_);
            // The last postsPerSecond - 1 posts of every six share their second with the post
            // made before them.
            const std::int64_t time = (storySeq_ - 1) % 6 >= 7 - options_.postsPerSecond ? lastTime : randomTime();
            lastTime = time;
            std::int64_t actor = owner;
            std::optional<std::string> message, name, href, caption, description;
            std::optional<std::string> target;
            switch (kind) {
                case 46: message = std::string(kStatuses[below(std::size(kStatuses))]); break;
                case 247: {
                    message = std::string("New photos");
                    const Photo& first = own[below(own.size())];
                    name = "Photos of " + std::to_string(owner);
                    href = "http://www.trelm.example/album.php?aid=" + first.aid;
                    const std::size_t shown = 1 + below(std::min<std::size_t>(3, own.size()));
                    for (std::size_t m = 0; m < shown; ++m) {
                        const Photo& p = own[(static_cast<std::size_t>(&first - own.data()) + m) % own.size()];
                        const std::string base = "http://photos.trelm.example/" + p.pid;
                        if (!insertRow(db_, media, error, postId, static_cast<std::int64_t>(m),
                                       "http://www.trelm.example/photo.php?pid=" + p.pid, p.caption, "photo",
                                       base + "_s.jpg", p.aid, p.pid, p.owner, 604, 453))
                            return false;
                    }
                    break;
                }
                case 80: {
                    const std::string story = "http://news.trelm.example/story" + std::to_string(storySeq_);
                    message = std::string("Worth reading");
                    name = "Story " + std::to_string(storySeq_);
                    href = story;
                    caption = std::string("news.trelm.example");
                    description = "What happened in story " + std::to_string(storySeq_);
                    if (!insertRow(db_, media, error, postId, static_cast<std::int64_t>(0), story, *name, "link",
                                   "http://news.trelm.example/thumb" + std::to_string(storySeq_) + ".jpg", std::nullopt,
                                   std::nullopt, std::nullopt, std::nullopt, std::nullopt))
                        return false;
                    break;
                }
                default:
                    actor = friendOf(owner);
                    target = std::to_string(owner);
                    message = "Hi from " + std::to_string(actor);
                    break;
            }
            SqliteStatement s(post);
            s.bind(1, postId);
            s.bind(2, owner);
            s.bind(3, actor);
            if (target) s.bind(4, static_cast<std::int64_t>(owner));
            else s.bindNull(4);
            s.bind(5, static_cast<std::int64_t>(kind));
            s.bind(6, static_cast<std::int64_t>(0));
            s.bindNull(7);
            auto opt = [&](int i, const std::optional<std::string>& v) {
                if (v) s.bind(i, *v);
                else s.bindNull(i);
            };
            opt(8, message);
            opt(9, name);
            opt(10, href);
            opt(11, caption);
            opt(12, description);
            s.bind(13, time);
            s.bind(14, time);
            if (!s.run()) {
                error = db_.lastError();
                return false;
            }
        }
    }
    return true;
}

bool DataGenerator::makeRequests(std::string& error) {
    sqlite3_stmt* insert = db_.prepareCached(
        "INSERT INTO friend_request(uid_to, from_key, uid_from, time, message, unread) VALUES (?, ?, ?, ?, ?, ?)",
        error);
    if (!insert) return false;
    std::int64_t made = 0;
    for (std::size_t i = 1; i < uids_.size() && made < options_.friendRequests; ++i) {
        if (isFriend_[i]) continue;
        ++made;
        if (!insertRow(db_, insert, error, DemoAccount::uid, std::to_string(uids_[i]) + " ", uids_[i], randomTime(),
                       "Let's be friends", static_cast<std::int64_t>(below(2))))
            return false;
    }
    return true;
}

bool DataGenerator::makeThreads(std::string& error) {
    sqlite3_stmt* thread = db_.prepareCached(
        "INSERT INTO thread(thread_id, owner, folder_id, subject, recipients, updated_time, message_count, snippet, "
        "snippet_author, unread) VALUES (?, ?, 0, ?, ?, ?, ?, ?, ?, ?)",
        error);
    sqlite3_stmt* message = db_.prepareCached(
        "INSERT INTO message(message_id, thread_id, seq, author_id, body, created_time, att_name, att_href) "
        "VALUES (?, ?, ?, ?, ?, ?, ?, ?)",
        error);
    if (!thread || !message) return false;
    // The demo user's mailbox, and smaller ones for a few friends that it must never see.
    std::vector<std::pair<std::int64_t, std::int64_t>> mailboxes{{DemoAccount::uid, options_.threadsPerUser}};
    for (std::size_t i = 0; i < demoFriends_.size() && i < 3; ++i)
        mailboxes.emplace_back(demoFriends_[i], std::max<std::int64_t>(1, options_.threadsPerUser / 2));
    for (const auto& [owner, threads] : mailboxes) {
        for (std::int64_t t = 0; t < threads; ++t) {
            const std::int64_t tid = 1000 + ++threadSeq_;
            const std::int64_t other = friendOf(owner);
            std::int64_t time = randomTime();
            std::string body;
            std::int64_t author = owner;
            for (std::int64_t m = 0; m < options_.messagesPerThread; ++m) {
                // Every fifth message shares its second with the one before it.
                if (m > 0 && below(5) != 0) time += 1 + static_cast<std::int64_t>(below(3600));
                author = m % 2 == 0 ? other : owner;
                body = "Message " + std::to_string(m + 1) + " of thread " + std::to_string(tid);
                std::optional<std::string> attName, attHref;
                if (m % 4 == 3) {
                    attName = std::string("A link");
                    attHref = "http://news.trelm.example/shared" + std::to_string(tid) + "_" + std::to_string(m);
                }
                if (!insertRow(db_, message, error, std::to_string(tid) + "_" + std::to_string(m + 1), tid, m + 1, author,
                               body, time, attName, attHref))
                    return false;
            }
            const std::string recipients = std::to_string(owner) + "," + std::to_string(other);
            if (!insertRow(db_, thread, error, tid, owner, "Subject " + std::to_string(tid), recipients, time,
                           options_.messagesPerThread, body, author, static_cast<std::int64_t>(below(2))))
                return false;
        }
    }
    return true;
}

bool DataGenerator::writeSequences(std::string& error) {
    sqlite3_stmt* insert = db_.prepareCached("INSERT OR REPLACE INTO sequence(name, value) VALUES (?, ?)", error);
    return insert && insertRow(db_, insert, error, "album", albumSeq_) &&
           insertRow(db_, insert, error, "photo", photoSeq_) && insertRow(db_, insert, error, "story", storySeq_) &&
           insertRow(db_, insert, error, "status", statusSeq_) && insertRow(db_, insert, error, "thread", threadSeq_);
}

}  // namespace emu
