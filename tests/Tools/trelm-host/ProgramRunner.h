#pragma once

#include <string>
#include <vector>

#include <nlohmann/json.hpp>

// Runs a program as a user would, in a scratch folder of its own that is removed afterwards.
// HOME points into the scratch folder, so nothing touches the real home.
class ProgramRunner {
public:
    struct Result {
        int exitCode = -1;       // -1 when the program did not exit normally
        bool signalled = false;  // whether it was still running when the signal was due, and got it
        std::string out;
        std::string err;
        std::vector<std::string> outLines() const;
    };

    ProgramRunner();
    ~ProgramRunner();
    ProgramRunner(ProgramRunner const&) = delete;
    ProgramRunner& operator=(ProgramRunner const&) = delete;

    std::string const& folder() const { return folder_; }
    // Writes `text` to a file in the scratch folder and returns its path.
    std::string writeFile(std::string const& name, std::string const& text) const;

    // Runs `program` with `args`, `input` as its standard input, and waits for it to end.
    // With `signal` > 0, the program is sent that signal `afterMs` milliseconds after it started
    // (if it is still running then).
    Result run(std::string const& program, std::vector<std::string> const& args, std::string const& input = {},
               int signal = 0, int afterMs = 0) const;

private:
    std::string folder_;
};

// The lines of a run with "--format json" whose "type" is `type`, parsed, in output order.
std::vector<nlohmann::json> linesOfType(ProgramRunner::Result const& result, std::string const& type);
