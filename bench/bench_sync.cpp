// What storing costs a sync: trelm-host's sync of the demo data set into an empty item store,
// next to the same kinds walked without storing.
//   sync/full_sync     SyncCommand over every kind into an item store emptied before each
//                      iteration (outside the timing): the walks, one SQLite transaction per
//                      window (every row looked up, added with a new host id), the friend
//                      requests' name lookup, the stream's boundary seconds asked again, and the
//                      closing of each pass;
//   walk/every_kind    the baseline: each kind's query started and walked with getRow and seek(1)
//                      to its end, the rows copied out and dropped.
// Both run in one host session (the plug-in loaded as trelm-host loads it, signed in once) against
// the in-process emulator with the generator's default (demo) data set. One iteration is every
// kind once; the walk's "rows" counter is the rows it read. Time is wall time; run.sh prints the ratio.
#include <benchmark/benchmark.h>

#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <memory>
#include <ostream>
#include <sstream>
#include <string>
#include <vector>

#include <CLI/CLI.hpp>

#include "Emulator.h"
#include "HostOptions.h"
#include "HostSession.h"
#include "ItemQuery.h"
#include "Printer.h"
#include "SourceClient.h"
#include "SyncCommand.h"
#include "SyncReport.h"

namespace {

using namespace trelm;
using namespace trelm::host;

[[noreturn]] void fail(char const* what, std::string const& why) {
    std::fprintf(stderr, "%s: %s\n", what, why.c_str());
    std::abort();
}

void check(uError const& err, char const* what) {
    if (err.failed()) fail(what, err.toText());
}

// The emulator, a host session of the demo configuration routed to it, and a signed-in client.
class Host {
public:
    Host() {
        emu::Emulator::Options emulatorOptions;
        emulatorOptions.threads = 4;
        emulator_ = std::make_unique<emu::Emulator>(emulatorOptions);
        std::string error;
        if (!emulator_->start(error)) fail("emulator", error);

        char folder[] = "/tmp/bench-sync-XXXXXX";
        if (mkdtemp(folder) == nullptr) fail("state folder", "mkdtemp failed");
        folder_ = folder;
        HostOptions options;
        options.plugins = {TRELMFACEBOOK_MODULE};
        options.configPath = TRELM_HOST_DEMO_CONFIG;
        options.format = Printer::Format::JsonLines;
        options.stateDir = folder_;
        options.emulator = false;
        options.connectTo = {"api.facebook.com:80:127.0.0.1:" + std::to_string(emulator_->httpPort()),
                             "api.facebook.com:443:127.0.0.1:" + std::to_string(emulator_->httpsPort())};
        options.caFile = emulator_->caFile();
        session_ = std::make_unique<HostSession>(options);
        printer_ = std::make_unique<Printer>(Printer::Format::JsonLines, discard_);
        check(session_->open(*printer_), "session");
        client_ = std::make_unique<SourceClient>(*session_, *printer_);
        check(client_->open(), "sign-in");
    }
    ~Host() {
        client_.reset();
        session_.reset();
        std::error_code ec;
        std::filesystem::remove_all(folder_, ec);
    }

    HostSession& session() { return *session_; }
    SourceClient& client() { return *client_; }
    std::ostream& discard() { return discard_; }

private:
    std::unique_ptr<emu::Emulator> emulator_;
    std::string folder_;
    std::ostringstream discard_;
    std::unique_ptr<HostSession> session_;
    std::unique_ptr<Printer> printer_;
    std::unique_ptr<SourceClient> client_;
};

Host& host() {
    static Host* instance = new Host();  // lives until the process ends
    return *instance;
}

void walkEveryKind(benchmark::State& state) {
    Host& h = host();
    std::size_t rows = 0;
    for (auto _ : state) {
        for (std::string const& name : ItemQuery::kindNames()) {
            ItemQuery query(*ItemQuery::findKind(name));
            SmartPtr<IQueryItems::ICursor> cursor;
            check(h.client().start(query, cursor), "start");
            std::vector<ItemQuery::Record> read;
            check(query.walk(*cursor, read), "walk");
            rows += read.size();
        }
    }
    state.counters["rows"] = benchmark::Counter(static_cast<double>(rows), benchmark::Counter::kAvgIterations);
}
BENCHMARK(walkEveryKind)->Name("walk/every_kind")->UseRealTime()->Unit(benchmark::kMillisecond);

void fullSync(benchmark::State& state) {
    Host& h = host();
    CLI::App app;
    SyncCommand sync(app);
    app.parse("sync", false);
    for (auto _ : state) {
        state.PauseTiming();
        unsigned wiped = 0;
        check(h.session().host().itemStore().wipe(h.client().sourceName(), wiped), "empty the store");
        std::ostringstream out;
        SyncReport report(Printer::Format::JsonLines, out, h.discard(), false);
        state.ResumeTiming();
        check(sync.run(h.client(), h.session(), report), "sync");
    }
}
BENCHMARK(fullSync)->Name("sync/full_sync")->UseRealTime()->Unit(benchmark::kMillisecond);

}  // namespace

BENCHMARK_MAIN();
