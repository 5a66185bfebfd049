#include "HostShell.h"

#include "ErrorText.h"

#include <unistd.h>

#include <string>

#include <CLI/CLI.hpp>

#include "ItemCommands.h"
#include "TerminalText.h"

namespace trelm {
namespace host {

namespace {

// A word of a line that is not a command, as it can be printed: its first 40 bytes.
std::string shown(std::string const& word) {
    constexpr std::size_t kMost = 40;
    if (word.size() <= kMost) return terminalText(word);
    return terminalText(std::string_view(word).substr(0, kMost)) + "...";
}

}  // namespace

HostShell::HostShell(std::istream& in, std::ostream& out, std::ostream& err, bool verbose)
    : in_(in), out_(out), err_(err), verbose_(verbose) {}

int HostShell::run(SourceClient& client, Printer& printer) {
    bool const prompt = isatty(STDIN_FILENO) == 1 && &in_ == &std::cin;
    int failures = 0;
    std::string line;
    while (true) {
        if (prompt) out_ << "trelm> " << std::flush;
        if (!std::getline(in_, line)) break;
        std::size_t first = line.find_first_not_of(" \t\r");
        if (first == std::string::npos || line[first] == '#') continue;

        // Each line gets fresh definitions: CLI11 keeps what it parsed in the app.
        CLI::App app{"trelm-host shell"};
        app.require_subcommand(1);
        ItemCommands commands(app, true);
        std::string word = line.substr(first, line.find_first_of(" \t\r", first) - first);
        auto known = app.get_subcommands([&](CLI::App* command) { return command->check_name(word); });
        if (known.empty()) {
            err_ << "trelm-host: unknown command \"" << shown(word) << "\" (query, insert, retrieve, quit)\n";
            ++failures;
            continue;
        }
        try {
            app.parse(line, false);
        } catch (CLI::ParseError const& e) {
            int code = app.exit(e, out_, err_);
            if (code != 0) ++failures;
            continue;
        }
        if (commands.quitParsed()) break;
        uError e = commands.run(client, printer);
        if (e.failed()) {
            err_ << "trelm-host: " << describeError(e, verbose_) << '\n';
            ++failures;
        }
    }
    return failures;
}

}  // namespace host
}  // namespace trelm
