// What every end-to-end cursor benchmark shares: the in-process emulator with a dataset of the
// benchmark's choosing, a host around it (an active registry with the real "HttpRequestFactory",
// sending the service's host name to the emulator's port, and an in-memory
// "RuntimeConfiguration"), and a started source signed in with a session of the demo user.
//
//   bench::CursorHost host(generatorOptions);
//   bench::Walk walk = host.record("stream", bench::kindQuery(TYPE_STATUS, TYPE_PHOTO_EVENT));
//   bench::registerWalk(host, walk);    // "cursor/stream_walk" and "curl/stream_replay"
//
// A walk reads every row of a new cursor as a host does (jumpBeginning, then getRow and seek(1)
// until the end). Its baseline replays the very requests of one walk, as the emulator logged
// them (same fields, signatures and session), with bare libcurl (CurlReplay.h). One iteration
// is one whole walk or replay; the "pages" counter is the number of requests in it, so run.sh
// can print the time per request of each and the ratio of the two.
//
// Not thread-safe: one host per program, used by the benchmark thread.
#pragma once

#include <benchmark/benchmark.h>

#include <cstdio>
#include <cstdlib>
#include <initializer_list>
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

namespace bench {

[[noreturn]] inline void fail(char const* what, std::string const& why) {
    std::fprintf(stderr, "%s: %s\n", what, why.c_str());
    std::abort();
}

inline void check(trelm::uError const& err, char const* what) {
    if (err.failed()) fail(what, err.toText());
}

// The columns and constraints of a query.
struct Query {
    trelm::Vector<trelm::IQueryItems::Column> ordering;
    trelm::Vector<trelm::IQueryItems::Constraint> constraints;
};

// Items of the given kinds ("core_object_type" equal to the one kind, or in the list), with the
// ordering the kind's cursor needs (newest first for events and messages, by service id for
// friend requests), as trelm-host asks for them.
inline Query kindQuery(std::initializer_list<int> kinds) {
    using trelm::IQueryItems::Column;
    using trelm::IQueryItems::Constraint;
    using trelm::Metadata::Key;
    namespace Object = trelm::Metadata::Object;
    Query q;
    Key const service("core_event_service", trelm::TRELM_TYPES::STRING);
    Key const serviceId("core_event_serviceid", trelm::TRELM_TYPES::STRING);
    int const first = *kinds.begin();
    if (first == Object::TYPE_STATUS || first == Object::TYPE_PHOTO_EVENT || first == Object::TYPE_MESSAGE) {
        q.ordering = {{Key("core_object_time", trelm::TRELM_TYPES::INT32), false}, {service, false}, {serviceId, false}};
    } else if (first == Object::TYPE_FRIEND_REQUEST) {
        q.ordering = {{service, true}, {serviceId, true}};
    }
    Key const type("core_object_type", trelm::TRELM_TYPES::INT32);
    if (kinds.size() == 1) {
        q.constraints = {Constraint{type, trelm::Variant(first), Constraint::Equal}};
    } else {
        q.constraints = {Constraint{type, trelm::Variant(trelm::Vector<int>(kinds)), Constraint::InList}};
    }
    return q;
}

// A recorded walk: what it asks, how many rows it gives and the form bodies of its requests.
struct Walk {
    std::string name;  // "contacts", "stream", ...
    Query query;
    unsigned rows = 0;
    std::vector<std::string> bodies;
};

class CursorHost {
public:
    explicit CursorHost(emu::GeneratorOptions const& generator) {
        emu::Emulator::Options options;
        options.generator = generator;
        options.httpsPort = -1;  // the session is configured; no login
        emulator_ = std::make_unique<emu::Emulator>(options);
        std::string error;
        if (!emulator_->start(error)) fail("emulator", error);
        // Logged only while a walk is recorded: the log costs time and memory.
        emulator_->log().setEnabled(false);

        connectTo_ = "api.facebook.com:80:127.0.0.1:" + std::to_string(emulator_->httpPort());
        http_.setConnectTo({trelm::String(connectTo_)});
        check(registry_.add(trelm::HttpRequestFactory::kName, &http_), "register factory");
        check(registry_.add(trelm::RuntimeConfiguration::kName, &runtime_), "register store");
        registry_.activate();

        emu::Session session = emulator_->loginDemo();
        trelm::Configuration::Group group("facebook");
        using trelm::String;
        using trelm::Variant;
        check(group.set("facebook_source_appkey", Variant(emu::DemoAccount::apiKey)), "configure");
        check(group.set("facebook_source_appsecret", Variant(emu::DemoAccount::appSecret)), "configure");
        check(group.set("facebook_source_session_user", Variant(String::from(static_cast<long long>(session.uid)))),
              "configure");
        check(group.set("facebook_source_session_id", Variant(String(session.key))), "configure");
        check(group.set("facebook_source_session_secret", Variant(String(session.secret))), "configure");
        source_ = std::make_unique<trelm::FacebookSource>("facebook");
        check(registry_.add("facebook", source_.get()), "register source");
        check(source_->sendConfig(group), "configure source");
        check(source_->startup(), "start source");
    }

    ~CursorHost() {
        // Tearing down: each was registered by the constructor, so removal finds it.
        registry_.remove("facebook").ignore();
        registry_.remove(trelm::RuntimeConfiguration::kName).ignore();
        registry_.remove(trelm::HttpRequestFactory::kName).ignore();
        registry_.deactivate();
        source_.reset();
        emulator_->stop();
    }

    CursorHost(CursorHost const&) = delete;
    CursorHost& operator=(CursorHost const&) = delete;

    // A new cursor for `query`.
    trelm::uError open(Query const& query, trelm::SmartPtr<trelm::IQueryItems::ICursor>& cursor) {
        trelm::IQueryItems::StartQueryMessage msg(query.ordering, query.constraints);
        TRELM_RETURN_IF_ERROR(source_->onMessage(msg));
        if (!msg.cursor) return TRELM_ERROR(trelm::kFailure);
        cursor = msg.cursor;
        return TRELM_OK();
    }

    // Reads every row of a new cursor for `query`; `rows` receives the number read.
    trelm::uError walk(Query const& query, unsigned& rows) {
        trelm::SmartPtr<trelm::IQueryItems::ICursor> cursor;
        TRELM_RETURN_IF_ERROR(open(query, cursor));
        TRELM_RETURN_IF_ERROR(cursor->jumpBeginning());
        rows = 0;
        for (int moved = 1; moved > 0;) {
            trelm::SmartPtr<trelm::Map<trelm::String, trelm::Variant>> row;
            trelm::uError got = cursor->getRow(row);
            TRELM_RETURN_IF_ERROR(got);
            if (got.code() == trelm::kNoData || !row) break;
            benchmark::DoNotOptimize(row.get());
            ++rows;
            moved = 0;
            TRELM_RETURN_IF_ERROR(cursor->seek(1, moved));
        }
        return TRELM_OK();
    }

    // One walk with the request log on, to learn what a walk sends and how many rows it gives;
    // the log is off afterwards so that it costs nothing in the measured runs. Aborts when the
    // walk fails, a request of it was refused or it gives fewer than `minRows` rows.
    Walk record(std::string name, Query query, unsigned minRows = 1) {
        Walk w{std::move(name), std::move(query), 0, {}};
        emulator_->log().setEnabled(true);
        emulator_->log().clear();
        check(walk(w.query, w.rows), ("recording the " + w.name + " walk").c_str());
        std::vector<emu::LoggedRequest> const requests = emulator_->log().entries();
        emulator_->log().setEnabled(false);
        if (!formBodies(requests, w.bodies)) fail(w.name.c_str(), "a request of the recorded walk failed");
        if (w.rows < minRows) fail(w.name.c_str(), std::to_string(w.rows) + " rows");
        return w;
    }

    std::string const& connectTo() const { return connectTo_; }

private:
    std::unique_ptr<emu::Emulator> emulator_;
    std::string connectTo_;
    // Declared before the components: destroyed after them.
    trelm::ComponentRegistry registry_;
    trelm::HttpRequestFactory http_;
    trelm::RuntimeConfiguration runtime_;
    std::unique_ptr<trelm::FacebookSource> source_;
};

// Registers "cursor/<name>_walk" (the walk through the whole client stack) and
// "curl/<name>_replay" (its requests with bare libcurl). `host` and `walk` must outlive the run.
inline void registerWalk(CursorHost& host, Walk const& walk) {
    CursorHost* h = &host;
    Walk const* w = &walk;
    benchmark::RegisterBenchmark(("cursor/" + w->name + "_walk").c_str(),
                                 [h, w](benchmark::State& state) {
                                     unsigned rows = 0;
                                     for (auto _ : state) {
                                         trelm::uError err = h->walk(w->query, rows);
                                         if (err.failed() || rows != w->rows) {
                                             state.SkipWithError(err.failed() ? err.toText().c_str()
                                                                              : "a walk gave another number of rows");
                                             break;
                                         }
                                     }
                                     state.counters["pages"] = static_cast<double>(w->bodies.size());
                                     state.SetItemsProcessed(static_cast<int64_t>(state.iterations()) * w->rows);
                                 })
        ->UseRealTime()
        ->Unit(benchmark::kMillisecond);
    benchmark::RegisterBenchmark(("curl/" + w->name + "_replay").c_str(),
                                 [h, w](benchmark::State& state) {
                                     Replayer replayer(h->connectTo());
                                     for (auto _ : state) {
                                         for (std::string const& body : w->bodies) {
                                             if (!replayer.post(body)) {
                                                 state.SkipWithError("a replayed request failed");
                                                 return;
                                             }
                                         }
                                     }
                                     state.counters["pages"] = static_cast<double>(w->bodies.size());
                                     state.SetItemsProcessed(static_cast<int64_t>(state.iterations()) * w->rows);
                                 })
        ->UseRealTime()
        ->Unit(benchmark::kMillisecond);
}

// The main() of a cursor benchmark program: libcurl initialised around `body`, which makes the
// host, records and registers its walks, and runs the benchmarks.
template <class Body>
int runCursorBenchmarks(int argc, char** argv, Body body) {
    benchmark::Initialize(&argc, argv);
    if (benchmark::ReportUnrecognizedArguments(argc, argv)) return 1;
    curl_global_init(CURL_GLOBAL_DEFAULT);
    body();
    benchmark::Shutdown();
    curl_global_cleanup();
    return 0;
}

}  // namespace bench
