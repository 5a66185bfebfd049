// The emulated service in one object: data store, sessions, faults, request log and the HTTP and
// HTTPS listeners. Tests, benchmarks and trelm-host embed it; trelm-emulator runs it as a program.
#pragma once

#include <cstddef>
#include <cstdint>
#include <memory>
#include <string>

#include "CertificateAuthority.h"
#include "Faults.h"
#include "Protocol.h"
#include "RequestLog.h"
#include "Server.h"
#include "SessionTable.h"
#include "Store.h"

namespace emu {

// Lifetime: construct, start, use, stop (or destroy). A stopped emulator may be started again; it
// keeps its store, sessions, faults and log, and its TLS files, and may get new ephemeral ports.
//
// Thread safety: start, stop and loginDemo are called from one controlling thread. The parts
// handed out (store, faults, log, sessions) are thread safe and may be used from any thread while
// the emulator serves; their references stay valid until the emulator is destroyed.
class Emulator {
public:
    struct Options {
        std::string databasePath = ":memory:";  // a file keeps its data between runs
        GeneratorOptions generator;             // used to fill an empty database
        std::string bindAddress = "127.0.0.1";
        int httpPort = 0;                       // 0 = ephemeral, -1 = off
        int httpsPort = 0;                      // 0 = ephemeral, -1 = off
        std::int64_t sessionLifetimeSeconds = 24 * 3600;  // 0 = sessions never expire
        bool strictCallId = false;
        std::string tlsDirectory;               // empty = a fresh private directory, removed with the emulator
        bool log = true;
        std::size_t logCapacity = 10000;
        int threads = 16;                       // workers per listener
        int keepAliveSeconds = 5;
        // Tests: a store to serve instead of opening databasePath (nothing is generated into it),
        // and a clock for session expiry.
        std::shared_ptr<Store> store;
        SessionTable::Clock clock;
    };

    explicit Emulator(Options options);
    ~Emulator();
    Emulator(const Emulator&) = delete;
    Emulator& operator=(const Emulator&) = delete;

    // Opens and fills the store (first start only), makes the TLS files when HTTPS is on and starts
    // listening. Returns false and sets `error` on failure; nothing listens then.
    bool start(std::string& error);
    void stop();

    int httpPort() const { return server_ ? server_->httpPort() : -1; }
    int httpsPort() const { return server_ ? server_->httpsPort() : -1; }
    // "http://127.0.0.1:<port>/restserver.php" and the HTTPS twin (with the bind address).
    std::string httpUrl() const;
    std::string httpsUrl() const;
    // The CA certificate to trust for the HTTPS listener; empty until HTTPS has started once.
    std::string caFile() const { return tls_.caCertPath; }

    // REQUIRES: start has succeeded once.
    Store& store() { return *store_; }
    Faults& faults() { return faults_; }
    RequestLog& log() { return log_; }
    SessionTable& sessions() { return sessions_; }

    // A session of the demo account, made as a login would make it, without the HTTPS exchange.
    Session loginDemo();

private:
    bool prepareTls(std::string& error);

    const Options options_;  // constant after construction

    // Thread-safe parts, alive as long as the emulator.
    Faults faults_;
    RequestLog log_;
    SessionTable sessions_;

    // Owned by the controlling thread; set up by the first start.
    std::shared_ptr<Store> store_;
    std::unique_ptr<Protocol> protocol_;
    std::unique_ptr<Server> server_;
    TlsFiles tls_;
    std::string ownTlsDirectory_;  // removed at destruction when we made it
};

}  // namespace emu
