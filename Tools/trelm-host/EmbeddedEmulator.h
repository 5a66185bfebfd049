#pragma once

#include <memory>

#include "trelm/String.h"
#include "trelm/Vector.h"
#include "trelm/uError.h"

namespace emu {
class Emulator;
}

namespace trelm {
namespace host {

// The service emulator running inside the host on ephemeral loopback ports, with the routing
// that sends the service's own host name there. The plug-in keeps addressing the service by its
// real name; only the HTTP factory's connect-to table and trusted CA change.
//
// Lifetime: serves from start() until destruction. Components that may still send requests must
// be stopped first.
// Thread safety: start and the accessors are called from the host's controlling thread; the
// emulator serves on threads of its own.
class EmbeddedEmulator {
public:
    // The host name the plug-in sends its requests to.
    static constexpr char const* kServiceHost = "api.facebook.com";

    EmbeddedEmulator();
    ~EmbeddedEmulator();
    EmbeddedEmulator(EmbeddedEmulator const&) = delete;
    EmbeddedEmulator& operator=(EmbeddedEmulator const&) = delete;

    // False when the host was built without the emulator.
    static bool available();

    // Fills an in-memory data set (the demo account and generated users; the demo user with
    // `demoFriends` friends, the generator's default when 0) and starts the HTTP and HTTPS
    // listeners. kFailure with the emulator's reason when it cannot; kNotSupported when the
    // emulator is not built in.
    uError start(long long demoFriends = 0);

    // REQUIRES: start() succeeded.
    // "api.facebook.com:80:127.0.0.1:<http port>" and the same for 443 and the HTTPS port.
    Vector<String> connectTo() const;
    // The PEM file of the CA that signed the HTTPS listener's certificate.
    String caFile() const;
    int httpPort() const;
    int httpsPort() const;

private:
    std::unique_ptr<emu::Emulator> emulator_;
};

}  // namespace host
}  // namespace trelm
