// The walks of the other cursors, end to end, each next to a replay of its own requests: every
// row of a new cursor read through the real stack against the in-process emulator (CursorHost.h),
// and the very requests of one walk replayed with bare libcurl (CurlReplay.h).
//   cursor/photo_events_walk  photo posts of the stream ("stream.get" windows, names lookups)
//   cursor/messages_walk      the mailbox: threads, then each thread's messages
//   cursor/albums_walk        the demo user's and friends' albums (FQL)
//   cursor/media_walk         the photos of those albums (FQL)
//   cursor/photo_tags_walk    the tags of those photos (FQL)
//   cursor/friend_requests_walk  the pending friend requests (FQL)
// and curl/<kind>_replay for each. The dataset is small enough that all walks record in a few
// seconds: 100 friends among 2,000 users, 3 albums of 10 photos each with 2 tags per photo,
// 10 posts per user, 100 threads of 10 messages, 300 friend requests.
#include "CursorHost.h"

int main(int argc, char** argv) {
    return bench::runCursorBenchmarks(argc, argv, [] {
        emu::GeneratorOptions options;
        options.users = 2000;
        options.demoFriends = 100;
        options.friendsPerUser = 5;
        options.albumsPerUser = 3;
        options.photosPerAlbum = 10;
        options.tagsPerPhoto = 2;
        options.postsPerUser = 10;
        options.postsPerSecond = 1;
        options.threadsPerUser = 100;
        options.messagesPerThread = 10;
        options.friendRequests = 300;
        bench::CursorHost host(options);
        namespace Object = trelm::Metadata::Object;
        std::vector<bench::Walk> walks;
        walks.push_back(host.record("photo_events", bench::kindQuery({Object::TYPE_PHOTO_EVENT})));
        walks.push_back(host.record("messages", bench::kindQuery({Object::TYPE_MESSAGE})));
        walks.push_back(host.record("albums", bench::kindQuery({Object::TYPE_ALBUM})));
        walks.push_back(host.record("media", bench::kindQuery({Object::TYPE_MEDIA})));
        walks.push_back(host.record("photo_tags", bench::kindQuery({Object::TYPE_PHOTO_TAG})));
        walks.push_back(host.record("friend_requests", bench::kindQuery({Object::TYPE_FRIEND_REQUEST})));
        for (bench::Walk const& w : walks) {
            std::fprintf(stderr, "%s: %u rows in %zu requests\n", w.name.c_str(), w.rows, w.bodies.size());
            bench::registerWalk(host, w);
        }
        benchmark::RunSpecifiedBenchmarks();
    });
}
