// trelm-host run as a user runs it: the built program, the built plug-in, a configuration file
// and a state folder in a scratch folder.
#include <sys/stat.h>
#include <unistd.h>

#include <cstdlib>

#include <algorithm>
#include <filesystem>
#include <fstream>
#include <string>
#include <utility>
#include <vector>

#include <gtest/gtest.h>

#include "ProgramRunner.h"

namespace {

class HostProgramTest : public ::testing::Test {
protected:
    // Runs the host with JSON-lines output and, unless `args` give others, the scratch folder's
    // state folder, the demo configuration and the built plug-in.
    ProgramRunner::Result host(std::vector<std::string> args) {
        for (auto const& [option, value] : {std::pair<std::string, std::string>{"--state-dir", stateDir()},
                                            {"--config", TRELM_DEMO_CONFIG},
                                            {"--plugin", TRELMFACEBOOK_MODULE},
                                            {"--format", "json"}}) {
            if (std::find(args.begin(), args.end(), option) == args.end()) args.insert(args.begin(), {option, value});
        }
        return runner_.run(TRELM_HOST_PROGRAM, args);
    }
    std::string stateDir() const { return runner_.folder() + "/state"; }

    ProgramRunner runner_;
};

TEST_F(HostProgramTest, ComponentIdThatNoPluginOffersFailsTheRunButNotTheOthers) {
    std::string config = runner_.writeFile("config.json", R"({"components": [
        {"name": "ghost", "id": "@trelm.example:/nothing"},
        {"name": "presence", "id": "@trelm.example:/facebookconnector",
         "config": {"facebook_polltime": 300, "facebook_maxtime": 3600}}]})");
    auto result = host({"--no-emulator", "--config", config});
    EXPECT_EQ(result.exitCode, 2);
    auto components = linesOfType(result, "component");
    ASSERT_EQ(components.size(), 2u) << result.out;
    EXPECT_EQ(components[0]["state"], "not created");
    EXPECT_NE(components[0]["error"].get<std::string>().find("@trelm.example:/nothing"), std::string::npos);
    EXPECT_EQ(components[1]["state"], "started");
}

}  // namespace

// A path the host cannot use (state folder or its database, configuration file, CA file,
// plug-in) or a malformed configuration is named, with why and what to do, before any component
// starts.
TEST_F(HostProgramTest, UnusablePathOrPluginIsNamedWithTheReasonAndARemedy) {
    std::string const file = runner_.writeFile("plain-file", "x");
    std::string const big = runner_.writeFile("big.json", "{\"pad\": \"" + std::string(1 << 20, 'x') + "\"}");
    std::string const config = runner_.writeFile("config.json", R"({"components": [
        {"name": "facebook", "id": "@trelm.example:/facebooksource", "config": {"facebook_polltime": 1.5}}]})");
    std::string const damaged = runner_.folder() + "/damaged";
    std::filesystem::create_directories(damaged);
    std::ofstream(damaged + "/runtime-configuration.db", std::ios::binary) << std::string(4096, '\x5a');
    std::string const locked = runner_.folder() + "/locked";
    ASSERT_EQ(::mkdir(locked.c_str(), 0700), 0);
    // Root passes every permission test: only the immutable flag keeps it out, where the file
    // system has one.
    bool const immutable = std::system(("chattr +i '" + locked + "' 2>/dev/null").c_str()) == 0;
    bool const lockable = immutable || (::geteuid() != 0 && ::chmod(locked.c_str(), 0500) == 0);
    struct Case {
        std::vector<std::string> args;
        std::string words;
        std::vector<std::string> more = {};
    };
    std::vector<Case> cases{
        {{"--plugin", "/nonexistent/libmissing.so"},
         "/nonexistent/libmissing.so",
         {"0x80000006", "cannot load plug-in"}},
        {{"--plugin", NO_ENTRY_PLUGIN}, NO_ENTRY_PLUGIN, {"0x80000006", "has no entry point getComponents"}},
        {{"--plugin", FAILING_PLUGIN},
         FAILING_PLUGIN,
         {"0x80000001", "getComponents of plug-in", "caused by: this is not supported [0x80000002]"}},
        {{"--state-dir", file}, "state folder " + file + " is not a folder; choose another with --state-dir"},
        {{"--state-dir", file + "/state"}, "cannot create state folder " + file + "/state: Not a directory"},
        {{"--state-dir", damaged},
         "the state database " + damaged + "/runtime-configuration.db cannot be used; if it is damaged, move it away"},
        {{"--config", "/nonexistent/config.json"}, "cannot read configuration file /nonexistent/config.json"},
        {{"--config", big}, "configuration file " + big + " is larger than 1 MiB"},
        {{"--config", "/dev/zero"}, "configuration file /dev/zero is not a regular file"},
        {{"--config", runner_.folder()}, "configuration file " + runner_.folder() + " is a folder"},
        {{"--config", config}, "components[0].config.facebook_polltime"},
        {{"--ca-file", "/dev/zero"}, "CA file /dev/zero is not a regular file; give a PEM file"},
        {{"--ca-file", file}, "CA file " + file + " holds no PEM certificate"},
    };
    if (lockable) cases.push_back({{"--state-dir", locked}, "state folder " + locked + " cannot be written ("});
    for (Case const& c : cases) {
        auto result = host({c.args[0], c.args[1], "query", "contacts"});
        EXPECT_EQ(result.exitCode, 1) << c.words;
        EXPECT_NE(result.err.find(c.words), std::string::npos) << result.err;
        for (std::string const& words : c.more) EXPECT_NE(result.err.find(words), std::string::npos) << result.err;
        EXPECT_TRUE(linesOfType(result, "component").empty()) << c.words << "\n" << result.out;
    }
    if (immutable) {
        EXPECT_EQ(std::system(("chattr -i '" + locked + "'").c_str()), 0);
    }
}
