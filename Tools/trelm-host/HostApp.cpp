#include "HostApp.h"

#include <unistd.h>

#include <CLI/CLI.hpp>

#include "DemoTour.h"
#include "ErrorText.h"
#include "HostSession.h"
#include "HostShell.h"
#include "ItemCommands.h"
#include "ItemsCommand.h"
#include "PeerCommands.h"
#include "RuntimeConfiguration.h"
#include "StateDirectory.h"
#include "SyncCommand.h"
#include "SyncReport.h"
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

HostApp::HostApp(std::istream& in, std::ostream& out, std::ostream& err)
    : in_(in), out_(out), err_(err) {}

void HostApp::report(uError const& error) {
    err_ << "trelm-host: " << describeError(error, verbose_) << '\n';
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
    app.add_option("--emulator-friends", options.emulatorFriends,
                   "friends of the embedded emulator's demo user (1 to 100000; default 60)")
        ->check(CLI::Range(1LL, 100000LL));
    unsigned retries = options.pacing.attempts - 1;
    app.add_option("--retries", retries,
                   "times a step is tried again when the service throttles or is unavailable (0 to 20)")
        ->default_val(retries)
        ->check(CLI::Range(0u, 20u));
    app.add_option("--retry-time", options.pacing.maxTotalSeconds,
                   "seconds a step may wait out a throttled or unavailable service in all (0 to 3600)")
        ->default_val(options.pacing.maxTotalSeconds)
        ->check(CLI::Range(0.0, 3600.0));
    app.add_flag("--verbose", verbose_, "errors also name the source file and line that made each level");

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

    CLI::App* demo = app.add_subcommand("demo", "sign in, list friends, post a status, upload a photo, fetch a friend again");
    DemoTour::Options tour;
    demo->add_option("--friends", tour.friends, "how many friends to list")
        ->default_val(tour.friends)
        ->check(CLI::NonNegativeNumber);
    demo->add_option("--status", tour.status, "the status to post (default: a greeting with the time)");
    demo->add_option("--photo", tour.photo, "the image to upload (default: a small built-in PNG)");
    ItemCommands items(app, false);
    PeerCommands peerCommands(app);
    CLI::App* shell = app.add_subcommand("shell", "read query, insert and retrieve commands from standard input");
    SyncCommand sync(app);
    ItemsCommand storedItems(app);

    try {
        app.parse(argc, argv);
    } catch (CLI::ParseError const& e) {
        return app.exit(e, out_, err_);
    }
    Printer::parseFormat(format, options.format);
    options.pacing.attempts = retries + 1;
    if (emulatorFlag->count() > 0) options.emulator = emulator;

    if (stateSet->parsed()) return runStateSet(options, tag, key, value);
    if (stateReset->parsed()) return runStateReset(options, tag, keys);
    if (demo->parsed()) {
        return runWithSource(options, [&](SourceClient& client, Printer& printer, HostSession& session) {
            return DemoTour(tour, session.stateDir()).run(client, printer);
        });
    }
    if (items.parsed()) {
        return runWithSource(options, [&](SourceClient& client, Printer& printer, HostSession&) {
            uError e = client.open();
            return e.failed() ? e : items.run(client, printer);
        });
    }
    if (peerCommands.parsed()) {
        return runWithSource(options, [&](SourceClient&, Printer&, HostSession& session) {
            ConnectorClient connector(session);
            PeerPrinter peerPrinter(options.format, out_);
            return peerCommands.run(connector, peerPrinter);
        });
    }
    if (sync.parsed()) {
        return runWithSource(options, [&](SourceClient& client, Printer&, HostSession& session) {
            TRELM_RETURN_IF_ERROR(client.open());
            SyncReport syncReport(options.format, out_, err_, isatty(STDERR_FILENO) == 1);
            return sync.run(client, session, syncReport);
        });
    }
    if (storedItems.parsed()) {
        // From the local store alone: no plug-in, no component, no service.
        std::string folder;
        ItemStore store;
        uError e = StateDirectory::prepare(options.stateDir, folder);
        String const path(StateDirectory::itemStorePath(folder));
        if (e.ok()) e = store.sendConfig(Configuration::Group(store.name(), {{"path", Variant(path)}}));
        if (e.failed()) {
            report(e);
            return kExitSetupFailed;
        }
        SyncReport listing(options.format, out_, err_, false);
        e = storedItems.run(store, listing);
        if (e.failed()) {
            report(e);
            return kExitCommandFailed;
        }
        return kExitOk;
    }
    if (shell->parsed()) {
        return runWithSource(options, [&](SourceClient& client, Printer& printer, HostSession&) {
            TRELM_RETURN_IF_ERROR(client.open());
            int failures = HostShell(in_, out_, err_, verbose_).run(client, printer);
            if (failures == 0) return TRELM_OK();
            return TRELM_ERROR_MSG(kFailure, std::to_string(failures) + " shell command(s) failed");
        });
    }
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

int HostApp::runWithSource(
    HostOptions const& options,
    std::function<uError(SourceClient& client, Printer& printer, HostSession& session)> const& command) {
    Printer printer(options.format, out_);
    HostSession session(options);
    uError e = session.open(printer);
    printer.finish();
    if (e.failed()) {
        report(e);
        return kExitSetupFailed;
    }
    // A component that failed is told now, before the command's own output explains why.
    for (auto const& instance : session.host().instances()) {
        if (instance.error.failed()) report(instance.error);
    }
    bool started = session.allStarted();
    uError result;
    {
        // The client's cursor runs plug-in code: it goes before the components shut down.
        SourceClient client(session, printer);
        result = command(client, printer, session);
        printer.finish();
    }
    if (result.failed()) report(result);
    Vector<uError> errors;
    session.host().shutdownAll(&errors);
    for (uError const& error : errors) report(error);
    if (result.failed()) return kExitCommandFailed;
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
