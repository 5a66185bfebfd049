#include "HostApp.h"

#include <CLI/CLI.hpp>

#include "HostSession.h"
#include "RuntimeConfiguration.h"
#include "StateDirectory.h"
#include "trelm/Configuration.h"
#include "trelm/Set.h"

namespace trelm {
namespace host {

namespace {

// Opens the runtime store of the state folder for a state command.
uError openStore(HostOptions const& options, RuntimeConfiguration& store) {
    std::string folder;
    uError e = StateDirectory::prepare(options.stateDir, folder);
    if (e.ok()) e = store.open(String(StateDirectory::runtimeStorePath(folder)));
    return e;
}

}  // namespace

HostApp::HostApp(std::ostream& out, std::ostream& err) : out_(out), err_(err) {}

void HostApp::report(uError const& error) {
    err_ << "trelm-host: " << error.toText() << '\n';
}

int HostApp::run(int argc, char const* const* argv) {
    CLI::App app{"Loads trelm plug-ins, then configures and starts their components."};
    app.require_subcommand(0, 1);
    app.fallthrough();

    HostOptions options;
    std::string format = "table";
    bool emulator = true;
    app.add_option("--plugin", options.plugins,
                   "plug-in module to load (repeatable; default: " +
                       PluginLoader::defaultPluginPath() + ")")
        ->expected(1)
        ->multi_option_policy(CLI::MultiOptionPolicy::TakeAll);
    app.add_option("--config", options.configPath, "JSON file with the components and settings");
    app.add_option("--format", format, "output: table or json (JSON lines)")
        ->check(CLI::IsMember({"table", "json"}));
    app.add_option("--state-dir", options.stateDir,
                   "folder of the runtime-configuration store (default: ~/.trelm-host)");
    CLI::Option* emulatorFlag = app.add_flag(
        "--emulator,!--no-emulator", emulator,
        "run the service emulator in-process (default: on unless an endpoint is configured)");
    app.add_option("--connect-to", options.connectTo,
                   "route HOST:PORT:TO-HOST:TO-PORT (repeatable; replaces the configured routes)")
        ->expected(1)
        ->multi_option_policy(CLI::MultiOptionPolicy::TakeAll);
    app.add_option("--ca-file", options.caFile, "PEM file of the CAs to trust");

    CLI::App* state = app.add_subcommand("state", "change values of the runtime-configuration store");
    state->require_subcommand(1);
    std::string tag, key, value;
    std::vector<std::string> keys;
    CLI::App* stateSet = state->add_subcommand("set", "keep VALUE under KEY for component TAG");
    stateSet->add_option("tag", tag, "component name")->required();
    stateSet->add_option("key", key, "key")->required();
    stateSet->add_option("value", value, "value")->required();
    CLI::App* stateReset = state->add_subcommand("reset", "forget KEYs of component TAG");
    stateReset->add_option("tag", tag, "component name")->required();
    stateReset->add_option("keys", keys, "keys")->required();

    try {
        app.parse(argc, argv);
    } catch (CLI::ParseError const& e) {
        return app.exit(e, out_, err_);
    }
    Printer::parseFormat(format, options.format);
    if (emulatorFlag->count() > 0) options.emulator = emulator;

    if (stateSet->parsed()) return runStateSet(options, tag, key, value);
    if (stateReset->parsed()) return runStateReset(options, tag, keys);
    return runStart(options);
}

int HostApp::runStart(HostOptions const& options) {
    Printer printer(options.format, out_);
    HostSession session(options);
    uError e = session.open(printer);
    printer.finish();
    if (e.failed()) {
        report(e);
        return kExitSetupFailed;
    }
    bool started = session.allStarted();
    Vector<uError> errors;
    session.host().shutdownAll(&errors);
    for (uError const& error : errors) report(error);
    for (auto const& instance : session.host().instances()) {
        if (instance.error.failed()) report(instance.error);
    }
    return started ? kExitOk : kExitComponentFailed;
}

int HostApp::runStateSet(HostOptions const& options, std::string const& tag,
                         std::string const& key, std::string const& value) {
    RuntimeConfiguration store;
    uError e = openStore(options, store);
    Set<Configuration::Value> values;
    if (e.ok()) e = values.insert(Configuration::Value(String(key), Variant(String(value))));
    if (e.ok()) e = store.store(String(tag), values);
    if (e.failed()) {
        report(e);
        return kExitSetupFailed;
    }
    Printer printer(options.format, out_);
    printer.state(String(tag), "set", Vector<String>{String(key)});
    printer.finish();
    return kExitOk;
}

int HostApp::runStateReset(HostOptions const& options, std::string const& tag,
                           std::vector<std::string> const& keys) {
    RuntimeConfiguration store;
    uError e = openStore(options, store);
    Set<String> names;
    Vector<String> listed;
    for (std::string const& k : keys) {
        if (e.ok()) e = names.insert(String(k));
        if (e.ok()) e = listed.pushBack(String(k));
    }
    if (e.ok()) e = store.reset(String(tag), names);
    if (e.failed()) {
        report(e);
        return kExitSetupFailed;
    }
    Printer printer(options.format, out_);
    printer.state(String(tag), "reset", listed);
    printer.finish();
    return kExitOk;
}

}  // namespace host
}  // namespace trelm
