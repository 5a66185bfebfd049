#include "trelm/Trace.h"

#include "trelm/uError.h"

#include <cstdio>
#include <cstdlib>
#include <mutex>
#include <utility>

namespace trelm {
namespace {

// Guards sink().
std::mutex& sinkMutex() {
    static std::mutex mutex;
    return mutex;
}

TraceSink& sink() {
    static TraceSink installed;
    return installed;
}

void defaultSink(String const& line) {
    // getenv is read once: later setenv calls from other threads would race with it.
    static bool const enabled = std::getenv("TRELM_TRACE") != nullptr;
    if (!enabled) return;
    std::fprintf(stderr, "trelm: %s\n", line.cStr());
}

}  // namespace

void trace(String const& line) {
    TraceSink current;
    {
        std::lock_guard<std::mutex> lock(sinkMutex());
        current = sink();
    }
    if (current) {
        current(line);
    } else {
        defaultSink(line);
    }
}

void traceError(char const* who, char const* what, uError const& err) {
    String text;
    err.format(text);
    String const lead = String(who) + ": ";
    unsigned begin = 0;
    bool first = true;
    while (begin <= text.size()) {
        unsigned end = text.find('\n', begin);
        if (end == String::npos) end = text.size();
        String line = first ? lead + what + ": " : lead;
        line += text.substr(begin, end - begin);
        trace(line);
        first = false;
        begin = end + 1;
    }
}

TraceSink setTraceSink(TraceSink replacement) {
    std::lock_guard<std::mutex> lock(sinkMutex());
    return std::exchange(sink(), std::move(replacement));
}

}  // namespace trelm
