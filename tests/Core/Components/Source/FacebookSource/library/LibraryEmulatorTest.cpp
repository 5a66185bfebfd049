#include <gtest/gtest.h>

#include <mutex>

#include "EmulatorHost.h"
#include "ErrorAssertions.h"
#include "trelm/Trace.h"

namespace trelm::test {
namespace {

// The client against the in-process emulator over real HTTP and HTTPS. The password goes out only
// in the HTTPS login; the session secret never goes out; neither appears in a trace line or an
// error text, even while the client has failures to report. (A refused password in the host's
// output: RefusedCommandTest.ExitsNonZeroAndSaysWhy/WrongPassword.)
TEST(LibraryEmulatorTest, SecretsStayInTheLoginRequestAndOutOfTraces) {
    EmulatorHost host{{.users = 20, .demoFriends = 5, .friendsPerUser = 3}};
    std::string error;
    ASSERT_TRUE(host.start(error)) << error;
    auto info = makeSmart<FacebookLibrary::ConnectionInfo>("fbsource");
    ASSERT_OK(info->setAppConfig(emu::DemoAccount::apiKey, emu::DemoAccount::appSecret));
    ASSERT_OK(info->setLoginConfig(emu::DemoAccount::email, emu::DemoAccount::password));
    ASSERT_OK(info->setWipeComponents({"NoSuchComponent"}));
    auto lib = makeSmart<FacebookLibrary>();
    ASSERT_OK(lib->setup(info));
    ASSERT_OK(host.runtime().store("fbsource", {Configuration::Value("facebook_source_lastuser", Variant("7"))}));
    host.emulator().faults().set("users.setStatus", emu::FaultRule{.expireAfter = 1});

    std::mutex mutex;                // guards texts
    std::vector<std::string> texts;  // every trace line and error text
    TraceSink const previousSink = setTraceSink([&](String const& line) {
        std::lock_guard<std::mutex> lock(mutex);
        texts.push_back(line.str());
    });
    std::vector<std::string> secrets{emu::DemoAccount::password};
    // Sign in (the missing wipe component is traced), post twice (the second finds the session
    // expired) and sign in again.
    for (int step = 0; step < 4; ++step) {
        uError const err = step % 3 == 0 ? lib->connect() : lib->setStatus("status", false);
        std::lock_guard<std::mutex> lock(mutex);
        texts.push_back(err.toText());
        String secret;
        if (info->getSessionSecret(secret).ok()) secrets.push_back(secret.str());
    }
    setTraceSink(previousSink);

    EXPECT_GT(texts.size(), 4u) << "the missing wipe component was traced";
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
