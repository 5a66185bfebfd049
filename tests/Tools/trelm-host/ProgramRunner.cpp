#include "ProgramRunner.h"

#include <fcntl.h>
#include <signal.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <sstream>
#include <stdexcept>

namespace {

std::string readAll(std::string const& path) {
    std::ifstream in(path, std::ios::binary);
    std::ostringstream text;
    text << in.rdbuf();
    return text.str();
}

}  // namespace

std::vector<std::string> ProgramRunner::Result::outLines() const {
    std::vector<std::string> lines;
    std::istringstream in(out);
    for (std::string line; std::getline(in, line);) lines.push_back(line);
    return lines;
}

ProgramRunner::ProgramRunner() {
    std::string pattern = (std::filesystem::temp_directory_path() / "trelm-host-test-XXXXXX").string();
    if (mkdtemp(pattern.data()) == nullptr) throw std::runtime_error("mkdtemp failed");
    folder_ = pattern;
}

ProgramRunner::~ProgramRunner() {
    std::error_code ec;
    std::filesystem::remove_all(folder_, ec);
}

std::string ProgramRunner::writeFile(std::string const& name, std::string const& text) const {
    std::string path = folder_ + "/" + name;
    std::ofstream(path, std::ios::binary) << text;
    return path;
}

ProgramRunner::Result ProgramRunner::run(std::string const& program, std::vector<std::string> const& args,
                                         std::string const& input, int signal, int afterMs) const {
    // A program never waits for a terminal: its input is a file, empty unless given.
    std::string inPath = writeFile("stdin", input);
    std::string outPath = folder_ + "/stdout";
    std::string errPath = folder_ + "/stderr";
    std::string home = folder_ + "/home";
    std::filesystem::create_directories(home);

    std::vector<char*> argv;
    argv.push_back(const_cast<char*>(program.c_str()));
    for (std::string const& arg : args) argv.push_back(const_cast<char*>(arg.c_str()));
    argv.push_back(nullptr);
    // The environment is built before fork: the child only redirects and execs.
    std::vector<std::string> environment;
    for (char** e = environ; *e != nullptr; ++e) {
        if (std::string(*e).rfind("HOME=", 0) != 0) environment.emplace_back(*e);
    }
    environment.push_back("HOME=" + home);
    std::vector<char*> envp;
    for (std::string& entry : environment) envp.push_back(entry.data());
    envp.push_back(nullptr);

    pid_t pid = fork();
    if (pid == 0) {
        int in = open(inPath.c_str(), O_RDONLY);
        int out = open(outPath.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0600);
        int err = open(errPath.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0600);
        if (in < 0 || out < 0 || err < 0 || dup2(in, 0) < 0 || dup2(out, 1) < 0 || dup2(err, 2) < 0) {
            _exit(126);
        }
        execve(program.c_str(), argv.data(), envp.data());
        _exit(127);
    }
    Result result;
    int status = 0;
    bool reaped = false;
    // Polls, so that a program that ends early is not waited for in full.
    for (int waited = 0; pid > 0 && signal > 0 && !reaped; waited += 10) {
        if (waitpid(pid, &status, WNOHANG) == pid) {
            reaped = true;
        } else if (waited >= afterMs) {
            kill(pid, signal);
            result.signalled = true;
            break;
        } else {
            usleep(10000);
        }
    }
    if (pid > 0 && !reaped) reaped = waitpid(pid, &status, 0) == pid;
    if (reaped && WIFEXITED(status)) result.exitCode = WEXITSTATUS(status);
    result.out = readAll(outPath);
    result.err = readAll(errPath);
    return result;
}

std::vector<nlohmann::json> linesOfType(ProgramRunner::Result const& result, std::string const& type) {
    std::vector<nlohmann::json> lines;
    for (std::string const& line : result.outLines()) {
        nlohmann::json object = nlohmann::json::parse(line);
        if (object.at("type") == type) lines.push_back(object);
    }
    return lines;
}
