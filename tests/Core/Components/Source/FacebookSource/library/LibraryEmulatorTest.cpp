#include <gtest/gtest.h>

#include <mutex>

#include "EmulatorHost.h"
#include "ErrorAssertions.h"
#include "trelm/Trace.h"

namespace trelm::test {
namespace {

// The client against the in-process emulator over real HTTP and HTTPS. Every trace line is kept.
class LibraryEmulatorTest : public ::testing::Test {
protected:
    void SetUp() override {
        std::string error;
        ASSERT_TRUE(host.start(error)) << error;
        previousSink = setTraceSink([this](String const& line) {
            std::lock_guard<std::mutex> lock(traceMutex);
            traces.push_back(line.str());
        });
        ASSERT_OK(info->setAppConfig(emu::DemoAccount::apiKey, emu::DemoAccount::appSecret));
        ASSERT_OK(info->setLoginConfig(emu::DemoAccount::email, emu::DemoAccount::password));
        ASSERT_OK(lib->setup(info));
    }

    void TearDown() override { setTraceSink(previousSink); }

    EmulatorHost host{{.users = 20, .demoFriends = 5, .friendsPerUser = 3}};
    SmartPtr<FacebookLibrary::ConnectionInfo> info = makeSmart<FacebookLibrary::ConnectionInfo>("fbsource");
    SmartPtr<FacebookLibrary> lib = makeSmart<FacebookLibrary>();
    TraceSink previousSink;
    std::mutex traceMutex;  // guards traces
    std::vector<std::string> traces;
};

// The password goes out only in the HTTPS login; the session secret never goes out; neither
// appears in a trace line or an error text, even while the client has failures to report. (A
// refused password in the host's output: RefusedCommandTest.ExitsNonZeroAndSaysWhy/WrongPassword.)
TEST_F(LibraryEmulatorTest, SecretsStayInTheLoginRequestAndOutOfTraces) {
    ASSERT_OK(host.runtime().store("fbsource", {Configuration::Value("facebook_source_lastuser", Variant("7"))}));
    ASSERT_OK(info->setWipeComponents({"NoSuchComponent"}));
    host.emulator().faults().set("users.setStatus", emu::FaultRule{.expireAfter = 1});

    std::vector<std::string> texts;  // the traces, then every error
    std::vector<std::string> secrets{emu::DemoAccount::password};
    auto note = [&](uError const& err) {
        texts.push_back(err.toText());
        String secret;
        if (info->getSessionSecret(secret).ok()) secrets.push_back(secret.str());
    };
    note(lib->connect());
    note(lib->setStatus("one", false));
    note(lib->setStatus("two", false));
    note(lib->connect());
    {
        std::lock_guard<std::mutex> lock(traceMutex);
        ASSERT_FALSE(traces.empty());  // the missing wipe component was reported
        texts.insert(texts.end(), traces.begin(), traces.end());
    }
    for (std::string const& text : texts) {
        for (std::string const& secret : secrets) EXPECT_EQ(text.find(secret), std::string::npos) << text;
    }
    for (auto const& request : host.emulator().log().entries()) {
        bool const login = request.method == "facebook.auth.login";
        EXPECT_EQ(request.args.count("password"), login ? 1u : 0u) << request.method;
        if (login) {
            EXPECT_TRUE(request.https);
            EXPECT_EQ(request.args.at("password"), "***");  // how the emulator logs a password
        }
        for (auto const& [key, value] : request.args) {
            for (std::string const& secret : secrets) EXPECT_NE(value, secret) << key;
        }
    }
}

}  // namespace
}  // namespace trelm::test
