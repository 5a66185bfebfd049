// trelm-emulator: the emulated REST service as a stand-alone program.
#include <signal.h>

#include <cstdio>
#include <fstream>
#include <iostream>
#include <memory>
#include <mutex>
#include <string>
#include <vector>

#include <CLI/CLI.hpp>
#include <nlohmann/json.hpp>

#include "Emulator.h"

namespace {

nlohmann::json toJson(const emu::LoggedRequest& r) {
    nlohmann::json j;
    j["method"] = r.method;
    j["args"] = r.args;
    if (!r.fql.empty()) j["fql"] = r.fql;
    j["https"] = r.https;
    if (r.hadFile) j["file_bytes"] = r.fileSize;
    if (r.errorCode != 0) j["error_code"] = r.errorCode;
    if (!r.internalError.empty()) j["internal_error"] = r.internalError;
    j["http_status"] = r.httpStatus;
    if (!r.fault.empty()) j["fault"] = r.fault;
    return j;
}

}  // namespace

int main(int argc, char** argv) {
    emu::Emulator::Options options;
    options.httpPort = 8080;
    options.httpsPort = 8443;
    std::vector<std::string> faultTexts;
    std::string logPath;
    emu::GeneratorOptions& g = options.generator;

    CLI::App app{"Local emulator of the REST service: HTTP and HTTPS at /restserver.php, answering from SQLite."};
    app.add_option("--bind", options.bindAddress, "Address to listen on")->capture_default_str();
    app.add_option("--http-port", options.httpPort, "Plain HTTP port (0 = any free port, -1 = off)")
        ->capture_default_str();
    app.add_option("--https-port", options.httpsPort, "HTTPS port (0 = any free port, -1 = off)")
        ->capture_default_str();
    app.add_option("--data", options.databasePath,
                   "SQLite file with the service's data (generated when empty; \":memory:\" = not kept)")
        ->capture_default_str();
    app.add_option("--tls-dir", options.tlsDirectory,
                   "Directory for the generated CA and server certificate (default: a private temporary one)");
    app.add_option("--session-lifetime", options.sessionLifetimeSeconds, "Seconds a login's session lasts (0 = forever)")
        ->capture_default_str();
    app.add_flag("--strict-call-id", options.strictCallId, "Answer 103 to a call_id not greater than the session's last");
    app.add_option("--fault", faultTexts,
                   "Inject a fault: \"method:key=value,...\" (method \"*\" = all). Keys: error, every, probability, "
                   "seed, http_status, delay_ms, drop, truncate, malformed, expire_after, rate, burst");
    app.add_option("--log", logPath, "Write each request as a JSON line to this file (\"-\" = standard output)");
    app.add_option("--threads", options.threads, "Worker threads per listener")->capture_default_str();

    auto* data = app.add_option_group("dataset", "Sizes of a generated dataset");
    data->add_option("--seed", g.seed, "Generator seed")->capture_default_str();
    data->add_option("--users", g.users, "Users")->capture_default_str();
    data->add_option("--demo-friends", g.demoFriends, "Friends of the demo user")->capture_default_str();
    data->add_option("--friends-per-user", g.friendsPerUser, "Friends of other users")->capture_default_str();
    data->add_option("--albums-per-user", g.albumsPerUser, "Albums per user")->capture_default_str();
    data->add_option("--photos-per-album", g.photosPerAlbum, "Photos per album")->capture_default_str();
    data->add_option("--tags-per-photo", g.tagsPerPhoto, "Tags per photo")->capture_default_str();
    data->add_option("--posts-per-user", g.postsPerUser, "Stream posts per user")->capture_default_str();
    data->add_option("--photos-per-second", g.photosPerSecond, "Photos sharing a creation second, 1 to 5")
        ->capture_default_str();
    data->add_option("--posts-per-second", g.postsPerSecond, "Stream posts sharing a second, 1 to 6")
        ->capture_default_str();
    data->add_option("--threads-per-user", g.threadsPerUser, "Inbox threads of the demo user")->capture_default_str();
    data->add_option("--messages-per-thread", g.messagesPerThread, "Messages per thread")->capture_default_str();
    data->add_option("--friend-requests", g.friendRequests, "Pending friend requests to the demo user")
        ->capture_default_str();

    CLI11_PARSE(app, argc, argv);

    std::vector<std::pair<std::string, emu::FaultRule>> faults;
    for (const std::string& text : faultTexts) {
        std::string method, error;
        emu::FaultRule rule;
        if (!emu::Faults::parse(text, method, rule, error)) {
            std::cerr << "trelm-emulator: " << error << "\n";
            return 2;
        }
        faults.emplace_back(method, rule);
    }

    std::unique_ptr<std::ofstream> logFile;
    std::ostream* logStream = nullptr;
    if (logPath == "-") {
        logStream = &std::cout;
    } else if (!logPath.empty()) {
        logFile = std::make_unique<std::ofstream>(logPath, std::ios::app);
        if (!*logFile) {
            std::cerr << "trelm-emulator: cannot open " << logPath << "\n";
            return 2;
        }
        logStream = logFile.get();
    }
    // The in-memory log only serves in-process tests; the program keeps none unless asked to print.
    options.log = logStream != nullptr;
    options.logCapacity = 1;

    // Every thread started from here on inherits this mask, so the signals reach sigwait below and
    // no worker is interrupted by them.
    sigset_t stopSignals;
    sigemptyset(&stopSignals);
    sigaddset(&stopSignals, SIGINT);
    sigaddset(&stopSignals, SIGTERM);
    pthread_sigmask(SIG_BLOCK, &stopSignals, nullptr);

    emu::Emulator emulator(options);
    std::string error;
    if (!emulator.start(error)) {
        std::cerr << "trelm-emulator: " << error << "\n";
        return 1;
    }
    for (const auto& [method, rule] : faults) emulator.faults().set(method, rule);
    if (logStream != nullptr) {
        emulator.log().setListener([logStream](const emu::LoggedRequest& r) {
            // Arguments are the bytes a client sent; invalid UTF-8 in them is shown as U+FFFD.
            *logStream << toJson(r).dump(-1, ' ', false, nlohmann::json::error_handler_t::replace) << std::endl;
        });
    }

    std::cout << "trelm-emulator is running (Ctrl-C to stop)\n";
    if (emulator.httpPort() >= 0) std::cout << "  http:    " << emulator.httpUrl() << "\n";
    if (emulator.httpsPort() >= 0) {
        std::cout << "  https:   " << emulator.httpsUrl() << "  (certificate for api.facebook.com, localhost, 127.0.0.1)\n";
        std::cout << "  CA file: " << emulator.caFile() << "\n";
    }
    std::cout << "  data:    " << options.databasePath << "\n"
              << "  demo account: e-mail " << emu::DemoAccount::email << ", password " << emu::DemoAccount::password
              << "\n"
              << "  application:  api key " << emu::DemoAccount::apiKey << ", secret " << emu::DemoAccount::appSecret
              << "\n";
    for (const std::string& text : faultTexts) std::cout << "  fault:   " << text << "\n";
    std::cout << std::flush;

    int signal = 0;
    sigwait(&stopSignals, &signal);
    std::cout << "trelm-emulator: stopping\n" << std::flush;
    emulator.stop();
    return 0;
}
