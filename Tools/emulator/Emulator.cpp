#include "Emulator.h"

#include <cstdlib>
#include <filesystem>
#include <system_error>

namespace emu {

Emulator::Emulator(Options options)
    : options_(std::move(options)), log_(options_.logCapacity), sessions_(options_.clock) {
    log_.setEnabled(options_.log);
}

Emulator::~Emulator() {
    stop();
    if (!ownTlsDirectory_.empty()) {
        std::error_code ignored;
        std::filesystem::remove_all(ownTlsDirectory_, ignored);
    }
}

bool Emulator::prepareTls(std::string& error) {
    if (!tls_.certPath.empty()) return true;
    std::string dir = options_.tlsDirectory;
    if (dir.empty()) {
        const char* tmp = std::getenv("TMPDIR");
        std::string pattern = std::string(tmp != nullptr && *tmp != '\0' ? tmp : "/tmp") + "/trelm-emulator-XXXXXX";
        if (mkdtemp(pattern.data()) == nullptr) {
            error = "cannot make a directory for the TLS files under " + pattern;
            return false;
        }
        dir = ownTlsDirectory_ = pattern;
    } else {
        std::error_code ec;
        std::filesystem::create_directories(dir, ec);
        if (ec) {
            error = "cannot make the TLS directory " + dir + ": " + ec.message();
            return false;
        }
    }
    return makeTlsFiles(dir, {"api.facebook.com", "localhost"}, tls_, error);
}

bool Emulator::start(std::string& error) {
    if (server_) return true;
    if (!store_) {
        if (options_.store) {
            store_ = options_.store;
        } else {
            std::unique_ptr<Store> opened = Store::open(options_.databasePath, error);
            if (!opened) return false;
            if (Status s = opened->generate(options_.generator)) {
                error = "cannot fill " + options_.databasePath + ": " + s->message;
                return false;
            }
            store_ = std::move(opened);
        }
        protocol_ = std::make_unique<Protocol>(*store_, sessions_, faults_, log_,
                                               Protocol::Options{options_.sessionLifetimeSeconds, options_.strictCallId});
    }
    if (options_.httpsPort >= 0 && !prepareTls(error)) return false;

    Server::Options so;
    so.bindAddress = options_.bindAddress;
    so.httpPort = options_.httpPort;
    so.httpsPort = options_.httpsPort;
    so.certPath = tls_.certPath;
    so.keyPath = tls_.keyPath;
    so.threads = options_.threads;
    so.keepAliveSeconds = options_.keepAliveSeconds;
    Protocol* protocol = protocol_.get();
    auto server = std::make_unique<Server>(so, [protocol](const HttpCall& call) { return protocol->handle(call); });
    if (!server->start(error)) return false;
    server_ = std::move(server);
    return true;
}

void Emulator::stop() {
    if (server_) server_->stop();
    server_.reset();
}

namespace {
// A wildcard bind address is reached through loopback.
std::string hostFor(const std::string& bindAddress) {
    return bindAddress == "0.0.0.0" ? std::string("127.0.0.1") : bindAddress;
}
}  // namespace

std::string Emulator::httpUrl() const {
    return "http://" + hostFor(options_.bindAddress) + ":" + std::to_string(httpPort()) + "/restserver.php";
}

std::string Emulator::httpsUrl() const {
    return "https://" + hostFor(options_.bindAddress) + ":" + std::to_string(httpsPort()) + "/restserver.php";
}

Session Emulator::loginDemo() { return sessions_.create(DemoAccount::uid, options_.sessionLifetimeSeconds); }

}  // namespace emu
