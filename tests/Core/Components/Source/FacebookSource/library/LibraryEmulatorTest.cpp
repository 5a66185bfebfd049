#include <gtest/gtest.h>

#include "ErrorAssertions.h"

#include <memory>
#include <mutex>

#include "ComponentRegistry.h"
#include "ConnectionInfo.h"
#include "Emulator.h"
#include "HttpRequestFactory.h"
#include "RuntimeConfiguration.h"
#include "trelm/Trace.h"

namespace trelm::test {
namespace {

constexpr char const* kTag = "fbsource";
std::string const kDemoUid = std::to_string(emu::DemoAccount::uid);

// The client against the in-process emulator over real HTTP and HTTPS, through the host's own
// "HttpRequestFactory" (trusting the emulator's CA, sending api.facebook.com to its ports) and an
// in-memory "RuntimeConfiguration". Every trace line is kept.
class LibraryEmulatorTest : public ::testing::Test {
protected:
    void SetUp() override {
        emu::Emulator::Options options;
        options.generator.users = 20;
        options.generator.demoFriends = 5;
        options.generator.friendsPerUser = 3;
        options.generator.threadsPerUser = 3;
        options.threads = 4;
        emulator = std::make_unique<emu::Emulator>(options);
        std::string error;
        ASSERT_TRUE(emulator->start(error)) << error;
        factory.setCaFile(emulator->caFile());
        factory.setConnectTo({"api.facebook.com:80:127.0.0.1:" + std::to_string(emulator->httpPort()),
                              "api.facebook.com:443:127.0.0.1:" + std::to_string(emulator->httpsPort())});
        ASSERT_OK(registry.add(HttpRequestFactory::kName, &factory));
        ASSERT_OK(registry.add(RuntimeConfiguration::kName, &store));
        registry.activate();
        previousSink = setTraceSink([this](String const& line) {
            std::lock_guard<std::mutex> lock(traceMutex);
            traces.push_back(line.str());
        });
        ASSERT_OK(info->setAppConfig(emu::DemoAccount::apiKey, emu::DemoAccount::appSecret));
        ASSERT_OK(info->setLoginConfig(emu::DemoAccount::email, emu::DemoAccount::password));
        ASSERT_OK(lib->setup(info));
    }

    void TearDown() override { setTraceSink(previousSink); }

    String stored(char const* key) {
        Map<String, Variant> values{{key, Variant()}};
        EXPECT_OK(store.get(kTag, values));
        return values.search(key)->asString();
    }

    Vector<Map<String, String>> fql(std::string const& query, char const* row, unsigned code = kSuccess) {
        Vector<Map<String, String>> rows;
        unsigned count = 0;
        EXPECT_CODE(lib->runFqlQuery(String(query), row, rows, 0, count), code) << query;
        return rows;
    }

    ComponentRegistry registry;
    HttpRequestFactory factory;
    RuntimeConfiguration store;
    std::unique_ptr<emu::Emulator> emulator;
    SmartPtr<FacebookLibrary::ConnectionInfo> info = makeSmart<FacebookLibrary::ConnectionInfo>(kTag);
    SmartPtr<FacebookLibrary> lib = makeSmart<FacebookLibrary>();
    TraceSink previousSink;
    std::mutex traceMutex;  // guards traces
    std::vector<std::string> traces;
};

TEST_F(LibraryEmulatorTest, DemoAccountSignsInOverHttpsAndTheSessionIsStored) {
    ASSERT_OK(lib->connect());
    String user, session;
    ASSERT_OK(lib->getUserId(user));
    ASSERT_OK(info->getSessionId(session));
    EXPECT_EQ(user, kDemoUid);
    EXPECT_EQ(stored("facebook_source_session_id"), session);
    EXPECT_EQ(stored("facebook_source_lastuser"), kDemoUid);
    auto logins = emulator->log().entriesFor("auth.login");
    ASSERT_EQ(logins.size(), 1u);
    EXPECT_TRUE(logins[0].https);
}

TEST_F(LibraryEmulatorTest, EveryCallReturnsTheEmulatorsData) {
    ASSERT_OK(lib->connect());
    auto me = fql("SELECT uid, name FROM user WHERE uid = " + kDemoUid, "user");
    ASSERT_EQ(me.size(), 1u);
    EXPECT_EQ(*me[0].search("uid"), kDemoUid);
    EXPECT_EQ(fql("SELECT uid2 FROM friend WHERE uid1 = " + kDemoUid, "friend").size(), 5u);
    fql("SELECT uid FROM user WHERE about_me = 'x'", "user", kServiceError);  // not indexable

    Vector<Map<String, String>> posts;
    unsigned count = 0;
    ASSERT_OK(lib->runFStreamQuery(kDemoUid.c_str(), 0, 0, 50, posts, count));
    EXPECT_GT(count, 0u);
    EXPECT_EQ(posts.size(), count);

    Vector<FacebookLibrary::ThreadObj> threads;
    ASSERT_OK(lib->getInboxThreads(0, 20, threads));
    ASSERT_EQ(threads.size(), 3u);
    EXPECT_GE(threads[0].lastUpdate, threads[2].lastUpdate);  // newest first
    EXPECT_GT(threads[2].lastUpdate, 0);

    Vector<FacebookLibrary::MessageObj> messages;
    ASSERT_OK(lib->getThreadMessages(threads[0].threadId, "ctx", 0, 50, messages));
    ASSERT_FALSE(messages.empty());
    for (auto const& message : messages) {
        EXPECT_EQ(message.threadId + "|" + message.context, threads[0].threadId + "|ctx");
        EXPECT_FALSE(message.messageId.empty());
        EXPECT_TRUE(message.hasAttachment);  // a non-zero time sent gives the flag
    }
}

// The password goes out only in the HTTPS login; the session secret never goes out; neither
// appears in a trace line or an error text, even while the client has failures to report.
TEST_F(LibraryEmulatorTest, SecretsStayInTheLoginRequestAndOutOfTraces) {
    ASSERT_OK(store.store(kTag, {Configuration::Value("facebook_source_lastuser", Variant("7"))}));
    ASSERT_OK(info->setWipeComponents({"NoSuchComponent"}));
    emu::FaultRule rule;
    rule.expireAfter = 1;
    emulator->faults().set("users.setStatus", rule);

    std::vector<std::string> texts;  // the traces, then every error
    std::vector<std::string> secrets{emu::DemoAccount::password, "wrong-password"};
    auto note = [&](uError const& err) {
        texts.push_back(err.toText());
        String secret;
        if (info->getSessionSecret(secret).ok()) secrets.push_back(secret.str());
    };
    note(lib->connect());
    note(lib->setStatus("one", false));
    note(lib->setStatus("two", false));
    ASSERT_OK(info->setLoginConfig(emu::DemoAccount::email, "wrong-password"));
    note(lib->connect());
    ASSERT_OK(info->setLoginConfig(emu::DemoAccount::email, emu::DemoAccount::password));
    note(lib->connect());
    {
        std::lock_guard<std::mutex> lock(traceMutex);
        ASSERT_FALSE(traces.empty());  // the missing wipe component was reported
        texts.insert(texts.end(), traces.begin(), traces.end());
    }
    for (std::string const& text : texts) {
        for (std::string const& secret : secrets) EXPECT_EQ(text.find(secret), std::string::npos) << text;
    }
    for (auto const& request : emulator->log().entries()) {
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
