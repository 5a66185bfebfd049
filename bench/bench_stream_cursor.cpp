// Stream cursor throughput, end to end: the demo user's news stream (1,010 posts of every kind,
// each in a second of its own; 100 friends who post 10 times each) read through the real stack,
// against the in-process emulator on loopback HTTP.
//   cursor/stream_walk   one query for status and photo posts to a started FacebookSource, then
//                        getRow and seek(1) until the end: FStreamCursor asks for each window with
//                        "stream.get" below the last post delivered and looks the authors' names
//                        up with one FQL statement per window (signing, the host's
//                        HttpRequestFactory, libcurl, answer parsing, row conversion, the mapping
//                        cache);
//   curl/stream_replay   the baseline: the very requests of one walk replayed with bare libcurl
//                        (CursorHost.h, CurlReplay.h).
// The "pages" counter counts stream windows and name lookups. run.sh prints the time per
// request of each and the ratio of the two.
#include "CursorHost.h"

int main(int argc, char** argv) {
    return bench::runCursorBenchmarks(argc, argv, [] {
        emu::GeneratorOptions options;
        options.users = 2000;
        options.demoFriends = 100;
        options.friendsPerUser = 5;
        options.albumsPerUser = 1;
        options.photosPerAlbum = 3;
        options.postsPerUser = 10;
        options.postsPerSecond = 1;
        options.threadsPerUser = 1;
        options.messagesPerThread = 1;
        bench::CursorHost host(options);
        namespace Object = trelm::Metadata::Object;
        bench::Walk const stream =
            host.record("stream", bench::kindQuery({Object::TYPE_STATUS, Object::TYPE_PHOTO_EVENT}), 700);
        bench::registerWalk(host, stream);
        benchmark::RunSpecifiedBenchmarks();
    });
}
