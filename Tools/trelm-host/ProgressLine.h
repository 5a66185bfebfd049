#pragma once

#include <chrono>
#include <cstddef>
#include <optional>
#include <ostream>

namespace trelm {
namespace host {

// A one-line report of long work that rewrites itself in place on a terminal: "1200 of 5000
// rows, 830 rows/s" (or "1200 rows, ..." while the total is unknown). A disabled line writes
// nothing, so callers need not test for a terminal themselves. Not thread-safe: one thread
// drives a line.
class ProgressLine {
public:
    // `enabled`: whether anything is written (the caller decides: a terminal, not JSON output).
    ProgressLine(bool enabled, std::ostream& out);
    ~ProgressLine();
    ProgressLine(ProgressLine const&) = delete;
    ProgressLine& operator=(ProgressLine const&) = delete;

    // True when standard error is a terminal: the usual condition for `enabled`.
    static bool stderrIsTerminal();

    bool enabled() const { return enabled_; }
    // The number of rows the work will end with, once known.
    void setTotal(std::size_t total) { total_ = total; }
    // Rows done before this line started (by an earlier run): shown, but not in the rate.
    void setEarlier(std::size_t rows) { earlier_ = rows; }
    // Shows `rows` done; redraws a few times a second at most. `label` (optional) leads the line.
    void show(std::size_t rows, char const* label = nullptr);
    // Removes the line, so that other output starts at the beginning of an empty line.
    void clear();

private:
    bool const enabled_;
    std::ostream& out_;
    std::chrono::steady_clock::time_point const start_;
    std::chrono::steady_clock::time_point last_;
    std::optional<std::size_t> total_;
    std::size_t earlier_ = 0;
    bool shown_ = false;
};

}  // namespace host
}  // namespace trelm
