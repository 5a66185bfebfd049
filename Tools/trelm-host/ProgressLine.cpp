#include "ProgressLine.h"

#include <unistd.h>

#include <cstdio>

namespace trelm {
namespace host {

ProgressLine::ProgressLine(bool enabled, std::ostream& out)
    : enabled_(enabled), out_(out), start_(std::chrono::steady_clock::now()) {}

ProgressLine::~ProgressLine() { clear(); }

bool ProgressLine::stderrIsTerminal() { return isatty(STDERR_FILENO) == 1; }

void ProgressLine::show(std::size_t rows, char const* label) {
    if (!enabled_) return;
    auto const now = std::chrono::steady_clock::now();
    if (now - last_ < std::chrono::milliseconds(200)) return;  // a few redraws a second at most
    double const seconds = std::chrono::duration<double>(now - start_).count();
    std::size_t const doneNow = rows > earlier_ ? rows - earlier_ : 0;
    double const rate = seconds > 0 ? static_cast<double>(doneNow) / seconds : 0.0;
    char line[160];
    char const* lead = label == nullptr ? "" : label;
    char const* gap = label == nullptr ? "" : ": ";
    if (total_) {
        std::snprintf(line, sizeof line, "\r%s%s%zu of %zu rows, %.0f rows/s ", lead, gap, rows, *total_, rate);
    } else {
        std::snprintf(line, sizeof line, "\r%s%s%zu rows, %.0f rows/s ", lead, gap, rows, rate);
    }
    out_ << line << std::flush;
    shown_ = true;
    last_ = now;
}

void ProgressLine::clear() {
    if (!shown_) return;
    out_ << "\r\033[K" << std::flush;
    shown_ = false;
}

}  // namespace host
}  // namespace trelm
