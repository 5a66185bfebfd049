// trelm-host run as a user runs it against an in-process emulator the test starts itself
// (--no-emulator, --connect-to both ports, --ca-file), so that what the host did shows in the
// emulator's request log and data. Only for tests that link the emulator.
#pragma once

#include <memory>
#include <optional>
#include <string>
#include <vector>

#include <gtest/gtest.h>
#include <nlohmann/json.hpp>

#include "Emulator.h"
#include "EmulatorRows.h"
#include "ProgramRunner.h"
#include "trelm/FStreamParseObj.h"

class EmulatedHost {
public:
    // Starts an emulator with `options`, or with none until restart().
    explicit EmulatedHost(std::optional<emu::Emulator::Options> options = emu::Emulator::Options{}) {
        if (options) restart(std::move(*options));
    }

    // A fresh emulator with `options` (four workers unless they say otherwise).
    void restart(emu::Emulator::Options options) {
        if (options.threads == emu::Emulator::Options{}.threads) options.threads = 4;
        emulator = std::make_unique<emu::Emulator>(std::move(options));
        std::string error;
        EXPECT_TRUE(emulator->start(error)) << error;
    }

    void useConfig(std::string const& text) { config = runner.writeFile("config.json", text); }
    std::string stateDir() const { return runner.folder() + "/state"; }

    // The host's arguments for `command` against this emulator, in this scratch folder.
    std::vector<std::string> arguments(std::vector<std::string> const& command) const {
        std::string const http = "api.facebook.com:80:127.0.0.1:" + std::to_string(emulator->httpPort());
        std::string const https = "api.facebook.com:443:127.0.0.1:" + std::to_string(emulator->httpsPort());
        std::vector<std::string> args{"--state-dir",  stateDir(), "--no-emulator",     "--connect-to",     http,
                                      "--connect-to", https,      "--ca-file",         emulator->caFile(), "--config",
                                      config,         "--plugin", TRELMFACEBOOK_MODULE};
        args.insert(args.end(), command.begin(), command.end());
        return args;
    }

    // Runs the host with `command`; no password may show in what it prints.
    ProgramRunner::Result run(std::vector<std::string> const& command, std::string const& format = "json",
                              std::string const& input = {}, int signal = 0, int afterMs = 0) {
        std::vector<std::string> args{"--format", format};
        for (std::string& arg : arguments(command)) args.push_back(std::move(arg));
        ProgramRunner::Result result = runner.run(TRELM_HOST_PROGRAM, args, input, signal, afterMs);
        for (std::string const& text : {result.out, result.err}) {
            EXPECT_EQ(text.find(emu::DemoAccount::password), std::string::npos) << text;
        }
        return result;
    }

    // The fields of the records a run that must succeed printed.
    std::vector<nlohmann::json> records(std::vector<std::string> const& command) {
        ProgramRunner::Result const result = run(command);
        EXPECT_EQ(result.exitCode, 0) << result.err;
        std::vector<nlohmann::json> fields;
        for (nlohmann::json& record : linesOfType(result, "record")) fields.push_back(record["fields"]);
        return fields;
    }

    // What the service holds, read as the demo user.
    std::vector<emu::test::Row> fql(std::string const& query) {
        return emu::test::fqlRows(emulator->store(), emu::DemoAccount::uid, query);
    }
    std::string nameOf(std::string const& uid) { return fql("select name from user where uid = " + uid).at(0)["name"]; }
    std::vector<emu::LoggedRequest> requests(std::string const& method) { return emulator->log().entriesFor(method); }

    // The status posts of `uid`'s stream from `endTime` down (0: the newest), newest first, each
    // parsed as the source parses the service's answer.
    std::vector<trelm::Map<trelm::String, trelm::String>> statusPosts(std::int64_t uid = emu::DemoAccount::uid,
                                                                      int endTime = 0) {
        emu::XmlNode root("stream_get_response");
        EXPECT_FALSE(
            emulator->store().streamGet(uid, std::to_string(uid), "0", std::to_string(endTime), "100000", root));
        trelm::Vector<trelm::Map<trelm::String, trelm::String>> rows;
        unsigned total = 0;
        EXPECT_TRUE(trelm::FStreamParseObj().parse(emu::renderDocument(root), rows, total).ok());
        std::vector<trelm::Map<trelm::String, trelm::String>> statuses;
        for (auto const& row : rows) {
            if (row.contains("is_status")) statuses.push_back(row);
        }
        return statuses;
    }

    ProgramRunner runner;
    std::unique_ptr<emu::Emulator> emulator;
    std::string config = TRELM_DEMO_CONFIG;
};
