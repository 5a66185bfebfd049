#include "Faults.h"

#include <algorithm>
#include <charconv>
#include <cmath>

namespace emu {
namespace {

int burstOf(const FaultRule& r) {
    if (r.burst > 0) return r.burst;
    return std::max(1, static_cast<int>(std::ceil(r.rate)));
}

template <typename T>
bool parseNumber(const std::string& text, T& out) {
    const char* end = text.data() + text.size();
    auto [ptr, ec] = std::from_chars(text.data(), end, out);
    return !text.empty() && ec == std::errc() && ptr == end;
}

}  // namespace

Faults::Faults(Clock clock)
    : clock_(clock ? std::move(clock) : Clock([] { return std::chrono::steady_clock::now(); })) {}

void Faults::set(const std::string& method, const FaultRule& rule) {
    Active a;
    a.rule = rule;
    a.random.seed(rule.seed);
    a.tokens = burstOf(rule);
    a.refilled = clock_();
    std::lock_guard lock(mutex_);
    rules_[method] = std::move(a);
}

void Faults::clear(const std::string& method) {
    std::lock_guard lock(mutex_);
    rules_.erase(method);
}

void Faults::clearAll() {
    std::lock_guard lock(mutex_);
    rules_.clear();
}

void Faults::apply(Active& a, FaultDecision& d, std::chrono::steady_clock::time_point now) {
    const FaultRule& r = a.rule;
    ++a.calls;

    if (r.rate > 0) {
        const double elapsed = std::chrono::duration<double>(now - a.refilled).count();
        a.tokens = std::min<double>(burstOf(r), a.tokens + elapsed * r.rate);
        a.refilled = now;
        if (a.tokens >= 1) {
            a.tokens -= 1;
        } else {
            d.rateLimited = true;
        }
    }
    if (r.expireAfter > 0 && (d.expireAfter == 0 || r.expireAfter < d.expireAfter)) d.expireAfter = r.expireAfter;

    bool hit = true;
    if (r.every > 0) {
        hit = a.calls % static_cast<std::uint64_t>(r.every) == 0;
    } else if (r.probability > 0) {
        hit = std::uniform_real_distribution<double>(0.0, 1.0)(a.random) < r.probability;
    }
    if (!hit) return;
    d.delayMs = std::max(d.delayMs, r.delayMs);
    d.drop = d.drop || r.drop;
    if (d.httpStatus == 0) d.httpStatus = r.httpStatus;
    if (d.errorCode == 0) d.errorCode = r.errorCode;
    d.truncate = d.truncate || r.truncate;
    d.malformed = d.malformed || r.malformed;
}

FaultDecision Faults::decide(const std::string& method) {
    FaultDecision d;
    const auto now = clock_();
    std::lock_guard lock(mutex_);
    if (rules_.empty()) return d;
    if (!method.empty() && method != "*") {
        auto own = rules_.find(method);
        if (own != rules_.end()) apply(own->second, d, now);
    }
    auto all = rules_.find("*");
    if (all != rules_.end()) apply(all->second, d, now);
    return d;
}

bool Faults::parse(const std::string& text, std::string& method, FaultRule& rule, std::string& error) {
    const auto colon = text.find(':');
    if (colon == std::string::npos || colon == 0) {
        error = "a fault reads \"method:key=value,...\" (method \"*\" for all): " + text;
        return false;
    }
    method = text.substr(0, colon);
    if (method.rfind("facebook.", 0) == 0) method.erase(0, 9);
    rule = FaultRule{};

    std::string rest = text.substr(colon + 1);
    std::size_t start = 0;
    while (start <= rest.size()) {
        std::size_t comma = rest.find(',', start);
        if (comma == std::string::npos) comma = rest.size();
        const std::string item = rest.substr(start, comma - start);
        start = comma + 1;
        if (item.empty()) continue;

        const auto eq = item.find('=');
        const std::string key = item.substr(0, eq);
        const std::string value = eq == std::string::npos ? std::string() : item.substr(eq + 1);
        const bool flag = eq == std::string::npos || value == "1" || value == "true";
        bool ok = true;
        if (key == "every") ok = parseNumber(value, rule.every) && rule.every > 0;
        else if (key == "probability" || key == "p")
            ok = parseNumber(value, rule.probability) && rule.probability > 0 && rule.probability <= 1;
        else if (key == "seed") ok = parseNumber(value, rule.seed);
        else if (key == "delay_ms") ok = parseNumber(value, rule.delayMs) && rule.delayMs >= 0;
        else if (key == "drop") rule.drop = flag;
        else if (key == "http_status" || key == "status")
            ok = parseNumber(value, rule.httpStatus) && rule.httpStatus >= 100 && rule.httpStatus <= 599;
        else if (key == "error") ok = parseNumber(value, rule.errorCode) && rule.errorCode > 0;
        else if (key == "truncate") rule.truncate = flag;
        else if (key == "malformed") rule.malformed = flag;
        else if (key == "expire_after") ok = parseNumber(value, rule.expireAfter) && rule.expireAfter > 0;
        else if (key == "rate") ok = parseNumber(value, rule.rate) && rule.rate > 0;
        else if (key == "burst") ok = parseNumber(value, rule.burst) && rule.burst > 0;
        else {
            error = "unknown fault key \"" + key + "\" in " + text;
            return false;
        }
        if (!ok) {
            error = "bad value for \"" + key + "\" in " + text;
            return false;
        }
        if (comma == rest.size()) break;
    }
    return true;
}

}  // namespace emu
