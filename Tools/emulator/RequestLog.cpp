#include "RequestLog.h"

namespace emu {

RequestLog::RequestLog(std::size_t capacity) : capacity_(capacity == 0 ? 1 : capacity) {}

void RequestLog::setEnabled(bool enabled) { enabled_ = enabled; }

bool RequestLog::enabled() const { return enabled_; }

void RequestLog::add(LoggedRequest entry) {
    if (!enabled_) return;
    std::lock_guard lock(mutex_);
    ++total_;
    if (listener_) listener_(entry);
    if (entries_.size() == capacity_) entries_.pop_front();
    entries_.push_back(std::move(entry));
}

void RequestLog::setListener(Listener listener) {
    std::lock_guard lock(mutex_);
    listener_ = std::move(listener);
}

std::vector<LoggedRequest> RequestLog::entries() const {
    std::lock_guard lock(mutex_);
    return {entries_.begin(), entries_.end()};
}

std::vector<LoggedRequest> RequestLog::entriesFor(const std::string& method) const {
    std::vector<LoggedRequest> out;
    std::lock_guard lock(mutex_);
    for (const LoggedRequest& e : entries_) {
        std::string_view m = e.method;
        if (m.substr(0, 9) == "facebook.") m.remove_prefix(9);
        if (m == method) out.push_back(e);
    }
    return out;
}

std::uint64_t RequestLog::total() const {
    std::lock_guard lock(mutex_);
    return total_;
}

void RequestLog::clear() {
    std::lock_guard lock(mutex_);
    entries_.clear();
    total_ = 0;
}

}  // namespace emu
