#include "SessionTable.h"

#include <chrono>
#include <stdexcept>

#include <openssl/rand.h>

namespace emu {
namespace {

std::string randomHex(std::size_t bytes) {
    std::string raw(bytes, '\0');
    if (RAND_bytes(reinterpret_cast<unsigned char*>(raw.data()), static_cast<int>(bytes)) != 1)
        throw std::runtime_error("no random bytes for a session");
    static constexpr char hex[] = "0123456789abcdef";
    std::string out;
    out.reserve(bytes * 2);
    for (char c : raw) {
        auto b = static_cast<unsigned char>(c);
        out += hex[b >> 4];
        out += hex[b & 0x0f];
    }
    return out;
}

std::int64_t systemNow() {
    return std::chrono::duration_cast<std::chrono::seconds>(std::chrono::system_clock::now().time_since_epoch())
        .count();
}

}  // namespace

SessionTable::SessionTable(Clock clock) : clock_(clock ? std::move(clock) : Clock(&systemNow)) {}

Session SessionTable::create(std::int64_t uid, std::int64_t lifetimeSeconds) {
    Session s;
    // The user id in the key mirrors the service's keys and makes logs easier to read.
    s.key = randomHex(16) + "-" + std::to_string(uid);
    s.secret = randomHex(16);
    s.uid = uid;
    s.expires = lifetimeSeconds > 0 ? clock_() + lifetimeSeconds : 0;
    std::lock_guard lock(mutex_);
    entries_[s.key] = Entry{s, 0, std::nullopt};
    return s;
}

SessionTable::Lookup SessionTable::use(const std::string& key) {
    const std::int64_t now = clock_();
    std::lock_guard lock(mutex_);
    auto it = entries_.find(key);
    if (it == entries_.end()) return {Check::Unknown, {}, 0};
    if (it->second.session.expires != 0 && now >= it->second.session.expires) {
        entries_.erase(it);
        return {Check::Expired, {}, 0};
    }
    ++it->second.calls;
    return {Check::Valid, it->second.session, it->second.calls};
}

bool SessionTable::acceptCallId(const std::string& key, const std::string& callId) {
    const std::size_t point = callId.find('.');
    std::string whole = callId.substr(0, point);
    std::string fraction = point == std::string::npos ? std::string() : callId.substr(point + 1);
    if (whole.empty() && fraction.empty()) return false;
    for (const std::string* part : {&whole, &fraction})
        for (char c : *part)
            if (c < '0' || c > '9') return false;
    whole.erase(0, whole.find_first_not_of('0') == std::string::npos ? whole.size() : whole.find_first_not_of('0'));
    fraction.erase(fraction.find_last_not_of('0') + 1);
    // Without leading zeros a longer integer part is the greater number; equal lengths compare
    // digit by digit, and so do fractions without trailing zeros.
    auto greater = [](const std::pair<std::string, std::string>& a, const std::pair<std::string, std::string>& b) {
        if (a.first.size() != b.first.size()) return a.first.size() > b.first.size();
        if (a.first != b.first) return a.first > b.first;
        return a.second > b.second;
    };
    std::pair<std::string, std::string> value{std::move(whole), std::move(fraction)};
    std::lock_guard lock(mutex_);
    auto it = entries_.find(key);
    if (it == entries_.end()) return false;
    if (it->second.lastCallId && !greater(value, *it->second.lastCallId)) return false;
    it->second.lastCallId = std::move(value);
    return true;
}

void SessionTable::remove(const std::string& key) {
    std::lock_guard lock(mutex_);
    entries_.erase(key);
}

std::size_t SessionTable::size() const {
    std::lock_guard lock(mutex_);
    return entries_.size();
}

}  // namespace emu
