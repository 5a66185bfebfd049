// Stream cursor throughput, end to end: the demo user's news stream (1,010 posts of every kind,
// 14 windows of at most 75) read through the real stack, against the in-process emulator on
// loopback HTTP.
//   cursor/stream_walk   one query for status and photo posts to a started FacebookSource, then
//                        getRow and seek(1) until the end: FStreamCursor asks for each window with
//                        "stream.get" below the last post delivered and looks the authors' names
//                        up with one FQL statement per window (signing, the host's
//                        HttpRequestFactory, libcurl, answer parsing, row conversion, the mapping
//                        cache);
//   curl/stream_replay   the baseline: the very requests of one walk, as the emulator logged
//                        them, posted again with bare libcurl through one keep-alive handle.
// One iteration is one whole walk or replay; the "pages" counter is the number of requests in it
// (stream windows and name lookups). The emulator serves both in this process, so its own work
// counts in both figures. Time is wall time. run.sh prints the time per request of each and the
// ratio of the two.
#include <benchmark/benchmark.h>
#include <curl/curl.h>

#include <cstdio>
#include <cstdlib>
#include <memory>
#include <string>
#include <vector>

#include "ComponentRegistry.h"
#include "CurlReplay.h"
#include "Emulator.h"
#include "FacebookSource.h"
#include "HttpRequestFactory.h"
#include "IQueryItems.h"
#include "RuntimeConfiguration.h"
#include "trelm/Configuration.h"

namespace {

using trelm::String;
using trelm::uError;

[[noreturn]] void fail(char const* what, std::string const& why) {
    std::fprintf(stderr, "%s: %s\n", what, why.c_str());
    std::abort();
}

void check(uError const& err, char const* what) {
    if (err.failed()) fail(what, err.toText());
}

// The emulator with a demo user of 100 friends who post 10 times each, every post in a second of
// its own, and a started source signed in with a session of the demo user.
class Host {
public:
    Host() {
        emu::Emulator::Options options;
        options.generator.users = 2000;
        options.generator.demoFriends = 100;
        options.generator.friendsPerUser = 5;
        options.generator.albumsPerUser = 1;
        options.generator.photosPerAlbum = 3;
        options.generator.postsPerUser = 10;
        options.generator.postsPerSecond = 1;
        options.generator.threadsPerUser = 1;
        options.generator.messagesPerThread = 1;
        options.httpsPort = -1;  // the session is configured; no login
        emulator_ = std::make_unique<emu::Emulator>(options);
        std::string error;
        if (!emulator_->start(error)) fail("emulator", error);

        connectTo_ = "api.facebook.com:80:127.0.0.1:" + std::to_string(emulator_->httpPort());
        http_.setConnectTo({String(connectTo_)});
        check(registry_.add(trelm::HttpRequestFactory::kName, &http_), "register factory");
        check(registry_.add(trelm::RuntimeConfiguration::kName, &runtime_), "register store");
        registry_.activate();

        emu::Session session = emulator_->loginDemo();
        trelm::Configuration::Group group("facebook");
        check(group.set("facebook_source_appkey", trelm::Variant(emu::DemoAccount::apiKey)), "configure");
        check(group.set("facebook_source_appsecret", trelm::Variant(emu::DemoAccount::appSecret)), "configure");
        check(group.set("facebook_source_session_user", trelm::Variant(String::from(static_cast<long long>(session.uid)))), "configure");
        check(group.set("facebook_source_session_id", trelm::Variant(String(session.key))), "configure");
        check(group.set("facebook_source_session_secret", trelm::Variant(String(session.secret))), "configure");
        source_ = std::make_unique<trelm::FacebookSource>("facebook");
        check(registry_.add("facebook", source_.get()), "register source");
        check(source_->sendConfig(group), "configure source");
        check(source_->startup(), "start source");

        record();
    }

    ~Host() {
        // Tearing down: each was registered by the constructor, so removal finds it.
        registry_.remove("facebook").ignore();
        registry_.remove(trelm::RuntimeConfiguration::kName).ignore();
        registry_.remove(trelm::HttpRequestFactory::kName).ignore();
        registry_.deactivate();
        source_.reset();
        emulator_->stop();
    }

    // Reads the whole stream through a new cursor for status and photo posts; the rows read.
    uError walk(unsigned& rows) {
        using trelm::IQueryItems::Column;
        using trelm::IQueryItems::Constraint;
        using trelm::Metadata::Key;
        trelm::Vector<Column> ordering{{Key("core_object_time", trelm::TRELM_TYPES::INT32), false},
                                       {Key("core_event_service", trelm::TRELM_TYPES::STRING), false},
                                       {Key("core_event_serviceid", trelm::TRELM_TYPES::STRING), false}};
        trelm::Vector<Constraint> constraints{Constraint{Key("core_object_type", trelm::TRELM_TYPES::INT32),
                                                         trelm::Variant(trelm::Vector<int>{4, 5}),
                                                         Constraint::InList}};
        trelm::IQueryItems::StartQueryMessage msg(ordering, constraints);
        TRELM_RETURN_IF_ERROR(source_->onMessage(msg));
        trelm::SmartPtr<trelm::IQueryItems::ICursor> cursor = msg.cursor;
        if (!cursor) return TRELM_ERROR(trelm::kFailure);
        TRELM_RETURN_IF_ERROR(cursor->jumpBeginning());
        rows = 0;
        for (int moved = 1; moved != 0;) {
            trelm::SmartPtr<trelm::Map<String, trelm::Variant>> row;
            uError got = cursor->getRow(row);
            TRELM_RETURN_IF_ERROR(got);
            if (got.code() == trelm::kNoData) break;
            benchmark::DoNotOptimize(row.get());
            ++rows;
            moved = 0;
            TRELM_RETURN_IF_ERROR(cursor->seek(1, moved));
        }
        return TRELM_OK();
    }

    std::vector<std::string> const& bodies() const { return bodies_; }
    std::string const& connectTo() const { return connectTo_; }
    unsigned rows() const { return rows_; }

private:
    // One walk with the request log on, to learn what a walk sends and how many rows it gives;
    // the log is off afterwards so that it costs nothing in the measured runs.
    void record() {
        emulator_->log().clear();
        check(walk(rows_), "recording walk");
        std::vector<emu::LoggedRequest> const requests = emulator_->log().entries();
        emulator_->log().setEnabled(false);
        if (!bench::formBodies(requests, bodies_)) fail("recording walk", "a request failed");
        if (rows_ < 700) fail("recording walk", std::to_string(rows_) + " rows");
    }

    std::unique_ptr<emu::Emulator> emulator_;
    std::string connectTo_;
    // Declared before the components: destroyed after them.
    trelm::ComponentRegistry registry_;
    trelm::HttpRequestFactory http_;
    trelm::RuntimeConfiguration runtime_;
    std::unique_ptr<trelm::FacebookSource> source_;
    std::vector<std::string> bodies_;
    unsigned rows_ = 0;
};

Host* host = nullptr;

void BM_StreamWalk(benchmark::State& state) {
    unsigned rows = 0;
    for (auto _ : state) {
        if (uError err = host->walk(rows); err.failed() || rows != host->rows()) {
            state.SkipWithError(err.failed() ? err.toText().c_str() : "a walk missed posts");
            break;
        }
    }
    state.counters["pages"] = static_cast<double>(host->bodies().size());
    state.SetItemsProcessed(static_cast<int64_t>(state.iterations()) * host->rows());
}
BENCHMARK(BM_StreamWalk)->Name("cursor/stream_walk")->UseRealTime()->Unit(benchmark::kMillisecond);

void BM_StreamReplay(benchmark::State& state) {
    bench::Replayer replayer(host->connectTo());
    for (auto _ : state) {
        for (std::string const& body : host->bodies()) {
            if (!replayer.post(body)) {
                state.SkipWithError("a replayed request failed");
                return;
            }
        }
    }
    state.counters["pages"] = static_cast<double>(host->bodies().size());
    state.SetItemsProcessed(static_cast<int64_t>(state.iterations()) * host->rows());
}
BENCHMARK(BM_StreamReplay)->Name("curl/stream_replay")->UseRealTime()->Unit(benchmark::kMillisecond);

}  // namespace

int main(int argc, char** argv) {
    benchmark::Initialize(&argc, argv);
    if (benchmark::ReportUnrecognizedArguments(argc, argv)) return 1;
    curl_global_init(CURL_GLOBAL_DEFAULT);
    host = new Host;
    benchmark::RunSpecifiedBenchmarks();
    benchmark::Shutdown();
    delete host;
    curl_global_cleanup();
    return 0;
}
