#include "Pacing.h"

#include <algorithm>
#include <chrono>
#include <cstdio>
#include <optional>
#include <random>
#include <thread>

#include "ErrorText.h"

namespace trelm {
namespace host {

bool Pacing::transient(uError const& error) {
    for (uError const* level = &error; level != nullptr; level = level->cause()) {
        if (level->code() == kRequestLimit || level->code() == kServiceUnavailable) return true;
    }
    return false;
}

uError Pacing::run(char const* what, std::function<uError()> const& step, std::ostream& log,
                   std::function<void(double)> const& sleep) const {
    // Seeded only when a step has to wait: every cursor step runs through here, and seeding from
    // std::random_device costs more than a whole step.
    std::optional<std::mt19937> random;
    double waited = 0;
    double wait = firstWaitSeconds;
    for (unsigned attempt = 1;; ++attempt) {
        uError const result = step();
        if (!result.failed() || !transient(result) || attempt >= attempts) return result;
        if (!random) random.emplace(std::random_device{}());
        double const jittered = wait * std::uniform_real_distribution<double>(0.5, 1.0)(*random);
        if (waited + jittered > maxTotalSeconds) return result;
        unsigned code = kServiceUnavailable;
        for (uError const* level = &result; level != nullptr; level = level->cause()) {
            if (level->code() == kRequestLimit || level->code() == kServiceUnavailable) code = level->code();
        }
        char seconds[32];
        std::snprintf(seconds, sizeof seconds, "%.1f", jittered);
        log << "trelm-host: " << what << ": " << codeMeaning(code) << "; trying again in " << seconds
            << " s (attempt " << attempt + 1 << " of " << attempts << ")\n";
        log.flush();
        if (sleep) {
            sleep(jittered);
        } else {
            std::this_thread::sleep_for(std::chrono::duration<double>(jittered));
        }
        waited += jittered;
        wait = std::min(wait * 2, maxWaitSeconds);
    }
}

}  // namespace host
}  // namespace trelm
