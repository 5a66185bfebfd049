#include "HostSession.h"

#include <utility>

#include "StateDirectory.h"

#include <filesystem>
#include <fstream>
#include <string>

namespace trelm {
namespace host {

HostSession::HostSession(HostOptions options) : options_(std::move(options)) {}

HostSession::~HostSession() = default;

uError HostSession::open(Printer& printer) {
    uError e = StateDirectory::prepare(options_.stateDir, stateDir_);
    if (e.failed()) return e;
    if (!options_.configPath.empty()) {
        TRELM_RETURN_IF_ERROR(HostConfig::load(options_.configPath, config_));
    }

    std::vector<std::string> paths = options_.plugins;
    if (paths.empty()) paths.push_back(PluginLoader::defaultPluginPath());
    for (std::string const& path : paths) {
        TRELM_RETURN_IF_ERROR(plugins_.load(path));
        printer.plugin(plugins_.plugins().back());
    }

    Map<String, Variant> http = config_.http();
    TRELM_RETURN_IF_ERROR(prepareEndpoint(printer, http));

    e = host_.startBuiltins(http, config_.runtime(),
                            String(StateDirectory::runtimeStorePath(stateDir_)));
    if (e.ok()) e = host_.startItemStore(String(StateDirectory::itemStorePath(stateDir_)));
    if (e.ok()) e = host_.attach(loginListener_);
    if (e.failed()) return e;

    for (HostConfig::ComponentEntry const& entry : config_.components()) {
        printer.component(host_.addComponent(entry, plugins_.table()));
    }
    return TRELM_OK();
}

uError HostSession::prepareEndpoint(Printer& printer, Map<String, Variant>& http) {
    bool useEmulator =
        options_.emulator.value_or(!config_.namesEndpoint() && options_.connectTo.empty());
    uError e;
    if (useEmulator) {
        e = emulator_.start(options_.emulatorFriends);
        if (e.ok()) e = http.insert("connect_to", Variant(emulator_.connectTo()));
        if (e.ok()) e = http.insert("ca_file", Variant(emulator_.caFile()));
        if (e.failed()) return e;
    }
    if (!options_.connectTo.empty()) {
        Vector<String> routes;
        for (std::string const& route : options_.connectTo) {
            TRELM_RETURN_IF_ERROR(routes.pushBack(String(route)));
        }
        TRELM_RETURN_IF_ERROR(http.insert("connect_to", Variant(routes)));
    }
    if (!options_.caFile.empty()) {
        TRELM_RETURN_IF_ERROR(http.insert("ca_file", Variant(String(options_.caFile))));
    }

    Vector<String> routes;
    if (Variant const* value = http.search("connect_to")) (void)value->as(routes);
    String caFile;
    if (Variant const* value = http.search("ca_file")) (void)value->as(caFile);
    printer.endpoint(useEmulator, routes, caFile);
    if (!caFile.empty()) TRELM_RETURN_IF_ERROR(checkCaFile(caFile.str()));
    return TRELM_OK();
}

uError HostSession::checkCaFile(std::string const& path) {
    // HTTPS would fail on every request with a bad CA file, and the sign-in reports only that it
    // failed: the file is looked at once, here, so the user reads what is wrong with it.
    std::string const remedy = "; give a PEM file of the CAs to trust with --ca-file or http.ca_file";
    std::error_code ec;
    std::filesystem::file_status const status = std::filesystem::status(path, ec);
    if (!std::filesystem::exists(status)) {
        return TRELM_ERROR_MSG(kInvalid, "CA file " + path + " does not exist" + remedy);
    }
    if (!std::filesystem::is_regular_file(status)) {
        return TRELM_ERROR_MSG(kInvalid, "CA file " + path + " is not a regular file" + remedy);
    }
    std::ifstream in(path, std::ios::binary);
    std::string head(64 * 1024, '\0');
    in.read(head.data(), static_cast<std::streamsize>(head.size()));
    if (in.bad() || (!in && in.gcount() == 0)) {
        return TRELM_ERROR_MSG(kInvalid, "CA file " + path + " cannot be read" + remedy);
    }
    head.resize(static_cast<std::size_t>(in.gcount()));
    if (head.find("-----BEGIN CERTIFICATE-----") == std::string::npos) {
        return TRELM_ERROR_MSG(kInvalid, "CA file " + path + " holds no PEM certificate" + remedy);
    }
    return TRELM_OK();
}

HostConfig::ComponentEntry const* HostSession::entry(String const& name) const {
    for (HostConfig::ComponentEntry const& candidate : config_.components()) {
        if (candidate.name == name) return &candidate;
    }
    return nullptr;
}

bool HostSession::allStarted() const {
    for (auto const& instance : host_.instances()) {
        if (instance.component == nullptr || instance.component->state() != Component::State::Started) {
            return false;
        }
    }
    return true;
}

}  // namespace host
}  // namespace trelm
