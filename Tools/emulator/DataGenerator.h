// Fills an empty emulator database with a deterministic social graph and its content.
#pragma once

#include <cstdint>
#include <random>
#include <string>
#include <unordered_map>
#include <unordered_set>
#include <vector>

#include "Store.h"

namespace emu {

class SqliteDatabase;

// What is generated from GeneratorOptions (the same seed and sizes give the same rows):
// - `users` users with ids of 6 to 10 digits (so that their text order differs from their
//   numeric order), the demo user among them, with the demo account and application;
// - `demoFriends` friends of the demo user, and about `friendsPerUser` friends for each of the
//   content users below (the rest are friends of those only, which keeps a million users
//   fast); each friendship is stored in both directions;
// - content for the demo user, its friends and a few other users ("content users"): albums
//   with photos and tags, stream posts of every kind (46 status, 247 photo, 80 link, 56 wall;
//   the demo user gets at least one of each), runs of `postsPerSecond` posts and of
//   `photosPerSecond` photos sharing a creation second; the others have a name and a short
//   profile only;
// - `friendRequests` pending requests to the demo user from non-friends;
// - `threadsPerUser` inbox threads for the demo user with `messagesPerThread` messages each,
//   and fewer for a few friends.
// Generated times lie in the half year after kBaseTime; anything created later through the
// store uses the clock and so is newer.
// One generator per run; it uses the database only inside run().
class DataGenerator {
public:
    static constexpr std::int64_t kBaseTime = 1262304000;  // 2010-01-01 00:00:00 UTC
    static constexpr std::int64_t kTimeSpan = 180 * 86400;

    DataGenerator(SqliteDatabase& db, const GeneratorOptions& options) : db_(db), options_(options), rng_(options.seed) {}

    // REQUIRES: the database is empty and the caller holds its lock. Everything is written in
    // one transaction, with the secondary indexes built once at the end.
    Status run();

private:
    struct Photo {
        std::string pid;
        std::string aid;
        std::int64_t owner;
        std::int64_t created;
        std::string caption;
    };

    std::uint64_t below(std::uint64_t n) { return n ? rng_() % n : 0; }
    std::int64_t randomTime() { return kBaseTime + static_cast<std::int64_t>(below(kTimeSpan)); }

    bool writeAll(std::string& error);
    bool makeUsers(std::string& error);
    bool makeFriends(std::string& error);
    bool makeAlbums(std::string& error);
    bool makePosts(std::string& error);
    bool makeRequests(std::string& error);
    bool makeThreads(std::string& error);
    bool writeSequences(std::string& error);

    std::int64_t friendOf(std::int64_t uid);

    SqliteDatabase& db_;
    const GeneratorOptions options_;
    std::mt19937_64 rng_;

    std::vector<std::int64_t> uids_;          // generation order; [0] is the demo user
    std::vector<char> isFriend_;              // by generation index: a friend of the demo user
    std::vector<std::int64_t> contentUsers_;  // demo, its friends, a few others
    std::vector<std::int64_t> demoFriends_;
    std::unordered_set<std::int64_t> demoFriendSet_;
    std::unordered_map<std::int64_t, std::string> names_;          // content users only
    std::unordered_map<std::int64_t, std::vector<Photo>> photos_;  // by owner
    std::int64_t albumSeq_ = 0, photoSeq_ = 0, storySeq_ = 0, statusSeq_ = 0, threadSeq_ = 0;
};

}  // namespace emu
