// Contact cursor throughput, end to end: every friend of the demo user (5,000 of them, 34 pages
// of at most 150) read through the real stack, against the in-process emulator on loopback HTTP
// (20,000 users).
//   cursor/contacts_walk  one query to a started FacebookSource, then getRow and seek(1) until the
//                         end: ContactCursor pages with keyset statements through FacebookLibrary
//                         (signing, a request from the host's HttpRequestFactory, libcurl with the
//                         factory's shared connection cache, answer parsing, row conversion and
//                         the mapping cache);
//   curl/contacts_replay  the baseline: the very requests of one walk replayed with bare libcurl
//                         through one keep-alive easy handle (CursorHost.h, CurlReplay.h).
// The emulator serves both in this process, so its own work counts in both figures. run.sh
// prints the wall time and the benchmark thread's CPU time per page of each and their ratios.
#include "CursorHost.h"

int main(int argc, char** argv) {
    return bench::runCursorBenchmarks(argc, argv, [] {
        emu::GeneratorOptions options;
        options.users = 20000;
        options.demoFriends = 5000;
        options.friendsPerUser = 5;
        options.albumsPerUser = 1;
        options.photosPerAlbum = 1;
        options.postsPerUser = 1;
        options.threadsPerUser = 1;
        options.messagesPerThread = 1;
        bench::CursorHost host(options);
        bench::Walk const contacts =
            host.record("contacts", bench::kindQuery({trelm::Metadata::Object::TYPE_CONTACT}), 5000);
        if (contacts.rows != 5000) bench::fail("contacts", std::to_string(contacts.rows) + " rows");
        bench::registerWalk(host, contacts);
        benchmark::RunSpecifiedBenchmarks();
    });
}
