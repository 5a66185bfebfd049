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
#include <malloc.h>

#include <fstream>
#include <string>

#include "CursorHost.h"

namespace {

using trelm::String;
using trelm::uError;
using trelm::Variant;
using Record = trelm::Map<String, Variant>;

constexpr int kThreads = 1000;
constexpr int kMessagesPerThread = 50;

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

bench::CursorHost* host = nullptr;

void BM_MessageCursorMemory(benchmark::State& state) {
    long long messages = 0, recordBytes = 0, peak = 0;
    for (auto _ : state) {
        if (!resetPeak()) {
            state.SkipWithError("the peak resident size cannot be reset (/proc/self/clear_refs)");
            break;
        }
        long long const before = statusBytes("VmRSS:");
        trelm::SmartPtr<trelm::IQueryItems::ICursor> cursor;
        uError err = host->open(bench::kindQuery({trelm::Metadata::Object::TYPE_MESSAGE}), cursor);
        if (err.failed()) {
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
    return bench::runCursorBenchmarks(argc, argv, [] {
        // The demo user's big mailbox; little else.
        emu::GeneratorOptions options;
        options.users = 2000;
        options.demoFriends = 60;
        options.friendsPerUser = 5;
        options.albumsPerUser = 0;
        options.postsPerUser = 0;
        options.friendRequests = 0;
        options.threadsPerUser = kThreads;
        options.messagesPerThread = kMessagesPerThread;
        bench::CursorHost made(options);
        host = &made;
        benchmark::RunSpecifiedBenchmarks();
        host = nullptr;
    });
}
