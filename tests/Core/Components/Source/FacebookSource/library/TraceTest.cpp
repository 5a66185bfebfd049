#include <gtest/gtest.h>

#include <mutex>
#include <vector>

#include "trelm/Trace.h"

namespace trelm::test {
namespace {

TEST(TraceTest, InstalledSinkReceivesLinesUntilReplaced) {
    std::vector<String> lines;
    TraceSink previous = setTraceSink([&](String const& line) { lines.push_back(line); });
    trace("one");
    TraceSink mine = setTraceSink(previous);
    trace("two");  // back to the default
    EXPECT_EQ(lines, (std::vector<String>{"one"}));
    EXPECT_TRUE(static_cast<bool>(mine));
}

// A sink that traces must not deadlock the trace.
TEST(TraceTest, SinkMayTraceItself) {
    std::vector<String> lines;
    TraceSink previous = setTraceSink([&](String const& line) {
        lines.push_back(line);
        if (line == "outer") trace("inner");
    });
    trace("outer");
    setTraceSink(previous);
    EXPECT_EQ(lines, (std::vector<String>{"outer", "inner"}));
}

}  // namespace
}  // namespace trelm::test
