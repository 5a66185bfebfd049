// Memory of an inbox message cursor: the demo user's mailbox of 50,000 messages in 1,000 threads,
// read whole by one query to a started FacebookSource against the in-process emulator.
//   memory/message_cursor  one iteration opens a message cursor (which reads every thread and
//                          message at start and keeps every record), walks it with getRow and
//                          seek(1), and releases it.
// Counters:
//   messages       records the cursor held
//   record_bytes   the bytes of the records' keys and values: per field the key's length plus
//                  the value's (a text's length, 4 for a 32-bit integer, 16 for a GUID, 1 for a
//                  boolean)
//   peak_rss       the process's peak resident memory while the cursor lived, less its resident
//                  memory just before the query (the peak is reset first), in bytes
//   rss_ratio      peak_rss / record_bytes
// The emulator's data is generated before the measurement; its answers and the HTTP exchanges
// during the start count in peak_rss like the cursor's own records and mapping-cache entries.
#include <benchmark/benchmark.h>
#include <malloc.h>

#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <memory>
#include <string>

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
using trelm::Variant;
using Record = trelm::Map<String, Variant>;

constexpr int kThreads = 1000;
constexpr int kMessagesPerThread = 50;

[[noreturn]] void fail(char const* what, std::string const& why) {
    std::fprintf(stderr, "%s: %s\n", what, why.c_str());
    std::abort();
}

void check(uError const& err, char const* what) {
    if (err.failed()) fail(what, err.toText());
}

// A "VmRSS:"-style line of /proc/self/status, in bytes; 0 when it can't be read.
long long statusBytes(std::string const& field) {
    std::ifstream status("/proc/self/status");
    std::string line;
    while (std::getline(status, line)) {
        if (line.compare(0, field.size(), field) == 0) return std::atoll(line.c_str() + field.size()) * 1024;
    }
    return 0;
}

// Returns freed heap to the system and makes the peak start from the current resident size.
bool resetPeak() {
    malloc_trim(0);
    std::ofstream clear("/proc/self/clear_refs");
    clear << "5";
    clear.flush();
    return static_cast<bool>(clear);
}

long long valueBytes(Variant const& value) {
    switch (value.type()) {
        case Variant::Empty: return 0;
        case Variant::Bool: return 1;
        case Variant::Int32:
        case Variant::UInt32: return 4;
        case Variant::Int64: return 8;
        case Variant::Guid: return 16;
        case Variant::String: return value.asString().size();
        case Variant::IntList: {
            trelm::Vector<int> list;
            value.as(list).ignore();  // the type was just checked
            return 4LL * list.size();
        }
        case Variant::StringList: {
            trelm::Vector<String> list;
            value.as(list).ignore();  // the type was just checked
            long long n = 0;
            for (String const& s : list) n += s.size();
            return n;
        }
    }
    return 0;
}

// The emulator with the demo user's big mailbox, and a host around it: an active registry with
// the real "HttpRequestFactory" and an in-memory "RuntimeConfiguration", and a started source
// signed in with a session of the demo user.
class Host {
public:
    Host() {
        emu::Emulator::Options options;
        options.generator.users = 2000;
        options.generator.demoFriends = 60;
        options.generator.friendsPerUser = 5;
        options.generator.albumsPerUser = 0;
        options.generator.postsPerUser = 0;
        options.generator.friendRequests = 0;
        options.generator.threadsPerUser = kThreads;
        options.generator.messagesPerThread = kMessagesPerThread;
        options.httpsPort = -1;  // the session is configured; no login
        emulator_ = std::make_unique<emu::Emulator>(options);
        std::string error;
        if (!emulator_->start(error)) fail("emulator", error);
        emulator_->log().setEnabled(false);

        http_.setConnectTo({String("api.facebook.com:80:127.0.0.1:" + std::to_string(emulator_->httpPort()))});
        check(registry_.add(trelm::HttpRequestFactory::kName, &http_), "register factory");
        check(registry_.add(trelm::RuntimeConfiguration::kName, &runtime_), "register store");
        registry_.activate();

        emu::Session session = emulator_->loginDemo();
        trelm::Configuration::Group group("facebook");
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

    ~Host() {
        // Tearing down: each was registered by the constructor, so removal finds it.
        registry_.remove("facebook").ignore();
        registry_.remove(trelm::RuntimeConfiguration::kName).ignore();
        registry_.remove(trelm::HttpRequestFactory::kName).ignore();
        registry_.deactivate();
        source_.reset();
        emulator_->stop();
    }

    // Opens a message cursor over the whole mailbox.
    uError open(trelm::SmartPtr<trelm::IQueryItems::ICursor>& cursor) {
        using trelm::IQueryItems::Column;
        using trelm::IQueryItems::Constraint;
        using trelm::Metadata::Key;
        trelm::Vector<Column> ordering{{Key("core_object_time", trelm::TRELM_TYPES::INT32), false},
                                       {Key("core_event_service", trelm::TRELM_TYPES::STRING), false},
                                       {Key("core_event_serviceid", trelm::TRELM_TYPES::STRING), false}};
        trelm::Vector<Constraint> constraints{
            Constraint{Key("core_object_type", trelm::TRELM_TYPES::INT32), Variant(10), Constraint::Equal}};
        trelm::IQueryItems::StartQueryMessage msg(ordering, constraints);
        TRELM_RETURN_IF_ERROR(source_->onMessage(msg));
        if (!msg.cursor) return TRELM_ERROR(trelm::kFailure);
        cursor = msg.cursor;
        return TRELM_OK();
    }

private:
    std::unique_ptr<emu::Emulator> emulator_;
    // Declared before the components: destroyed after them.
    trelm::ComponentRegistry registry_;
    trelm::HttpRequestFactory http_;
    trelm::RuntimeConfiguration runtime_;
    std::unique_ptr<trelm::FacebookSource> source_;
};

Host* host = nullptr;

void BM_MessageCursorMemory(benchmark::State& state) {
    long long messages = 0, recordBytes = 0, peak = 0;
    for (auto _ : state) {
        if (!resetPeak()) {
            state.SkipWithError("the peak resident size cannot be reset (/proc/self/clear_refs)");
            break;
        }
        long long const before = statusBytes("VmRSS:");
        trelm::SmartPtr<trelm::IQueryItems::ICursor> cursor;
        if (uError err = host->open(cursor); err.failed()) {
            state.SkipWithError(err.toText().c_str());
            break;
        }
        messages = 0;
        recordBytes = 0;
        for (int moved = 1; moved != 0;) {
            trelm::SmartPtr<Record> row;
            if (cursor->getRow(row).code() != trelm::kSuccess) break;
            ++messages;
            for (auto const& [key, value] : *row) recordBytes += key.size() + valueBytes(value);
            if (cursor->seek(1, moved).failed()) break;
        }
        peak = statusBytes("VmHWM:") - before;
        cursor.reset();
    }
    if (messages != kThreads * kMessagesPerThread) {
        state.SkipWithError(("the cursor held " + std::to_string(messages) + " messages").c_str());
        return;
    }
    state.counters["messages"] = static_cast<double>(messages);
    state.counters["record_bytes"] = static_cast<double>(recordBytes);
    state.counters["peak_rss"] = static_cast<double>(peak);
    state.counters["rss_ratio"] = static_cast<double>(peak) / static_cast<double>(recordBytes);
}
BENCHMARK(BM_MessageCursorMemory)
    ->Name("memory/message_cursor")
    ->Iterations(1)
    ->UseRealTime()
    ->Unit(benchmark::kMillisecond);

}  // namespace

int main(int argc, char** argv) {
    benchmark::Initialize(&argc, argv);
    if (benchmark::ReportUnrecognizedArguments(argc, argv)) return 1;
    host = new Host();
    benchmark::RunSpecifiedBenchmarks();
    delete host;
    benchmark::Shutdown();
    return 0;
}
