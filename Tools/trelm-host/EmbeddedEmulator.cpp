#include "EmbeddedEmulator.h"

#include <algorithm>
#include <cstdint>
#include <string>

#ifdef TRELM_HOST_WITH_EMULATOR
#include "Emulator.h"
#else
// Never instantiated; complete only so that the unique_ptr member can be destroyed.
namespace emu {
class Emulator {};
}  // namespace emu
#endif

namespace trelm {
namespace host {

#ifdef TRELM_HOST_WITH_EMULATOR

EmbeddedEmulator::EmbeddedEmulator() = default;

EmbeddedEmulator::~EmbeddedEmulator() {
    if (emulator_) emulator_->stop();
}

bool EmbeddedEmulator::available() { return true; }

uError EmbeddedEmulator::start(long long demoFriends) {
    emu::Emulator::Options options;
    if (demoFriends > 0) {
        options.generator.demoFriends = demoFriends;
        // Room for the friends and for the other users that content and requests come from.
        options.generator.users = std::max<std::int64_t>(options.generator.users, demoFriends * 2 + 100);
    }
    options.bindAddress = "127.0.0.1";
    options.httpPort = 0;
    options.httpsPort = 0;
    // One person drives the host; a few workers per listener are plenty.
    options.threads = 4;
    auto emulator = std::make_unique<emu::Emulator>(options);
    std::string error;
    if (!emulator->start(error)) {
        return TRELM_ERROR_MSG(kFailure, "cannot start the service emulator: " + error);
    }
    emulator_ = std::move(emulator);
    return TRELM_OK();
}

Vector<String> EmbeddedEmulator::connectTo() const {
    std::string loopback = ":127.0.0.1:";
    return Vector<String>{
        String(std::string(kServiceHost) + ":80" + loopback + std::to_string(httpPort())),
        String(std::string(kServiceHost) + ":443" + loopback + std::to_string(httpsPort())),
    };
}

String EmbeddedEmulator::caFile() const { return String(emulator_->caFile()); }
int EmbeddedEmulator::httpPort() const { return emulator_->httpPort(); }
int EmbeddedEmulator::httpsPort() const { return emulator_->httpsPort(); }

#else  // built without the emulator

EmbeddedEmulator::EmbeddedEmulator() = default;
EmbeddedEmulator::~EmbeddedEmulator() = default;
bool EmbeddedEmulator::available() { return false; }
uError EmbeddedEmulator::start(long long /*demoFriends*/) {
    return TRELM_ERROR_MSG(kNotSupported, "this trelm-host was built without the service emulator");
}
Vector<String> EmbeddedEmulator::connectTo() const { return {}; }
String EmbeddedEmulator::caFile() const { return String(); }
int EmbeddedEmulator::httpPort() const { return -1; }
int EmbeddedEmulator::httpsPort() const { return -1; }

#endif

}  // namespace host
}  // namespace trelm
