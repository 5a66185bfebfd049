// Contact cursor throughput, end to end: every friend of the demo user (5,000 of them, 34 pages
// of at most 150) read through the real stack, against the in-process emulator on loopback HTTP.
//   cursor/contacts_walk  one query to a started FacebookSource, then getRow and seek(1) until the
//                         end: ContactCursor pages with keyset statements through FacebookLibrary
//                         (signing, a request from the host's HttpRequestFactory, libcurl with the
//                         factory's shared connection cache, answer parsing, row conversion and
//                         the mapping cache);
//   curl/contacts_replay  the baseline: the very requests of one walk, as the emulator logged
//                         them (same fields, same signatures, same session), posted again with
//                         bare libcurl through one keep-alive easy handle, answers read and
//                         dropped.
// One iteration is one whole walk or replay; the "pages" counter is the number of requests in it.
// The emulator serves both in this process, so its own work counts in both figures. Time is wall
// time. run.sh prints the time per page of each and the ratio of the two.
#include <benchmark/benchmark.h>
#include <curl/curl.h>

#include <cstdio>
#include <cstdlib>
#include <memory>
#include <string>
#include <vector>

#include "ComponentRegistry.h"
#include "Emulator.h"
#include "FacebookSource.h"
#include "HttpRequestFactory.h"
#include "IQueryItems.h"
#include "RuntimeConfiguration.h"
#include "trelm/Configuration.h"

namespace {

using trelm::String;
using trelm::uError;

constexpr unsigned kFriends = 5000;

[[noreturn]] void fail(char const* what, std::string const& why) {
    std::fprintf(stderr, "%s: %s\n", what, why.c_str());
    std::abort();
}

void check(uError const& err, char const* what) {
    if (err.failed()) fail(what, err.toText());
}

// The emulator with a demo user of 5,000 friends among 20,000 users, and a host around it: an
// active registry with the real "HttpRequestFactory" (sending the service's host name to the
// emulator's port) and an in-memory "RuntimeConfiguration", and a started source signed in with a
// session of the demo user.
class Host {
public:
    Host() {
        emu::Emulator::Options options;
        options.generator.users = 20000;
        options.generator.demoFriends = kFriends;
        options.generator.friendsPerUser = 5;
        options.generator.albumsPerUser = 1;
        options.generator.photosPerAlbum = 1;
        options.generator.postsPerUser = 1;
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

    // Reads every friend through a new contact cursor; the number of rows read.
    uError walk(unsigned& rows) {
        using trelm::IQueryItems::Constraint;
        trelm::Vector<Constraint> constraints{
            Constraint{trelm::Metadata::Key("core_object_type", trelm::TRELM_TYPES::INT32), trelm::Variant(2),
                       Constraint::Equal}};
        trelm::IQueryItems::StartQueryMessage msg(trelm::Vector<trelm::IQueryItems::Column>(), constraints);
        TRELM_RETURN_IF_ERROR(source_->onMessage(msg));
        trelm::SmartPtr<trelm::IQueryItems::ICursor> cursor = msg.cursor;
        if (!cursor) return TRELM_ERROR(trelm::kFailure);
        rows = 0;
        for (int moved = 1; moved != 0;) {
            trelm::SmartPtr<trelm::Map<String, trelm::Variant>> row;
            TRELM_RETURN_IF_ERROR(cursor->getRow(row));
            benchmark::DoNotOptimize(row.get());
            ++rows;
            TRELM_RETURN_IF_ERROR(cursor->seek(1, moved));
        }
        return TRELM_OK();
    }

    // The url-encoded bodies of the requests of one walk, in order.
    std::vector<std::string> const& bodies() const { return bodies_; }
    std::string const& connectTo() const { return connectTo_; }

private:
    // One walk with the request log on, to learn what a walk sends; the log is off afterwards so
    // that it costs nothing in the measured runs.
    void record() {
        emulator_->log().clear();
        unsigned rows = 0;
        check(walk(rows), "recording walk");
        if (rows != kFriends) fail("recording walk", std::to_string(rows) + " rows");
        std::vector<emu::LoggedRequest> const requests = emulator_->log().entries();
        emulator_->log().setEnabled(false);

        CURL* easy = curl_easy_init();
        for (emu::LoggedRequest const& r : requests) {
            if (r.errorCode != 0 || r.httpStatus != 200) fail("recording walk", "a request failed: " + r.method);
            std::string body;
            for (auto const& [key, value] : r.args) {
                char* k = curl_easy_escape(easy, key.data(), static_cast<int>(key.size()));
                char* v = curl_easy_escape(easy, value.data(), static_cast<int>(value.size()));
                if (!body.empty()) body += '&';
                body += k;
                body += '=';
                body += v;
                curl_free(k);
                curl_free(v);
            }
            bodies_.push_back(std::move(body));
        }
        curl_easy_cleanup(easy);
    }

    std::unique_ptr<emu::Emulator> emulator_;
    std::string connectTo_;
    // Declared before the components: destroyed after them.
    trelm::ComponentRegistry registry_;
    trelm::HttpRequestFactory http_;
    trelm::RuntimeConfiguration runtime_;
    std::unique_ptr<trelm::FacebookSource> source_;
    std::vector<std::string> bodies_;
};

Host* host = nullptr;

void BM_CursorWalk(benchmark::State& state) {
    unsigned rows = 0;
    for (auto _ : state) {
        if (uError err = host->walk(rows); err.failed() || rows != kFriends) {
            state.SkipWithError(err.failed() ? err.toText().c_str() : "a walk missed friends");
            break;
        }
    }
    state.counters["pages"] = static_cast<double>(host->bodies().size());
    state.SetItemsProcessed(static_cast<int64_t>(state.iterations()) * kFriends);
}
BENCHMARK(BM_CursorWalk)->Name("cursor/contacts_walk")->UseRealTime()->Unit(benchmark::kMillisecond);

size_t appendAnswer(char* data, size_t size, size_t count, void* answer) {
    static_cast<std::string*>(answer)->append(data, size * count);
    return size * count;
}

// Bare libcurl: one easy handle for every request, so the connection stays open.
class Replayer {
public:
    explicit Replayer(std::string const& connectTo) : easy_(curl_easy_init()) {
        connectTo_ = curl_slist_append(nullptr, connectTo.c_str());
        headers_ = curl_slist_append(nullptr, "Expect:");
        curl_easy_setopt(easy_, CURLOPT_URL, "http://api.facebook.com/restserver.php");
        curl_easy_setopt(easy_, CURLOPT_CONNECT_TO, connectTo_);
        curl_easy_setopt(easy_, CURLOPT_HTTPHEADER, headers_);
        curl_easy_setopt(easy_, CURLOPT_NOSIGNAL, 1L);
        curl_easy_setopt(easy_, CURLOPT_POST, 1L);
        curl_easy_setopt(easy_, CURLOPT_WRITEFUNCTION, &appendAnswer);
        curl_easy_setopt(easy_, CURLOPT_WRITEDATA, &answer_);
    }
    ~Replayer() {
        curl_easy_cleanup(easy_);
        curl_slist_free_all(connectTo_);
        curl_slist_free_all(headers_);
    }

    // Posts `body`; false unless the answer is a 200 that is not an error document.
    bool post(std::string const& body) {
        answer_.clear();
        curl_easy_setopt(easy_, CURLOPT_POSTFIELDSIZE_LARGE, static_cast<curl_off_t>(body.size()));
        curl_easy_setopt(easy_, CURLOPT_POSTFIELDS, body.c_str());
        if (curl_easy_perform(easy_) != CURLE_OK) return false;
        long status = 0;
        curl_easy_getinfo(easy_, CURLINFO_RESPONSE_CODE, &status);
        return status == 200 && answer_.find("<error_response") == std::string::npos;
    }

private:
    CURL* easy_;
    curl_slist* connectTo_ = nullptr;
    curl_slist* headers_ = nullptr;
    std::string answer_;
};

void BM_CurlReplay(benchmark::State& state) {
    Replayer replayer(host->connectTo());
    for (auto _ : state) {
        for (std::string const& body : host->bodies()) {
            if (!replayer.post(body)) {
                state.SkipWithError("a replayed request failed");
                return;
            }
        }
    }
    state.counters["pages"] = static_cast<double>(host->bodies().size());
    state.SetItemsProcessed(static_cast<int64_t>(state.iterations()) * kFriends);
}
BENCHMARK(BM_CurlReplay)->Name("curl/contacts_replay")->UseRealTime()->Unit(benchmark::kMillisecond);

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
