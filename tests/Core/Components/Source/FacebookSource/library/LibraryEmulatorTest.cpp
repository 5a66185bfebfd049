#include <gtest/gtest.h>
#include <stdlib.h>
#include <unistd.h>

#include <filesystem>
#include <fstream>
#include <memory>
#include <mutex>
#include <string>
#include <vector>

#include "ComponentRegistry.h"
#include "ConnectionInfo.h"
#include "Emulator.h"
#include "FacebookLibrary.h"
#include "HttpRequestFactory.h"
#include "RuntimeConfiguration.h"
#include "trelm/Trace.h"

namespace trelm::test {
namespace {

constexpr char const* kTag = "fbsource";
std::string const kDemoUid = std::to_string(emu::DemoAccount::uid);

// The client against the in-process emulator over real HTTP and HTTPS: the host's own
// "HttpRequestFactory" (trusting the emulator's CA, sending api.facebook.com to the emulator's
// ports) and an in-memory "RuntimeConfiguration". Every trace line is kept.
class LibraryEmulatorTest : public ::testing::Test {
protected:
    void SetUp() override {
        emu::Emulator::Options options;
        options.generator.users = 20;
        options.generator.demoFriends = 5;
        options.generator.friendsPerUser = 3;
        options.generator.threadsPerUser = 3;
        options.generator.messagesPerThread = 4;
        options.threads = 4;
        emulator = std::make_unique<emu::Emulator>(options);
        std::string error;
        ASSERT_TRUE(emulator->start(error)) << error;

        factory.setCaFile(emulator->caFile().c_str());
        factory.setConnectTo({String("api.facebook.com:80:127.0.0.1:" + std::to_string(emulator->httpPort())),
                              String("api.facebook.com:443:127.0.0.1:" + std::to_string(emulator->httpsPort()))});
        ASSERT_TRUE(registry.add(HttpRequestFactory::kName, &factory).ok());
        ASSERT_TRUE(registry.add(RuntimeConfiguration::kName, &store).ok());
        registry.activate();

        previousSink = setTraceSink([this](String const& line) {
            std::lock_guard<std::mutex> lock(traceMutex);
            traces.push_back(line.str());
        });

        info = makeSmart<FacebookLibrary::ConnectionInfo>(kTag);
        ASSERT_TRUE(info->setAppConfig(emu::DemoAccount::apiKey, emu::DemoAccount::appSecret).ok());
        ASSERT_TRUE(info->setLoginConfig(emu::DemoAccount::email, password).ok());
        lib = makeSmart<FacebookLibrary>();
        ASSERT_TRUE(lib->setup(info).ok());
    }

    void TearDown() override {
        setTraceSink(previousSink);
        registry.deactivate();
        emulator.reset();
    }

    String stored(char const* key) {
        Map<String, Variant> values;
        values.insert(key, Variant());
        EXPECT_TRUE(store.get(kTag, values).ok());
        return values.search(key)->asString();
    }

    Vector<Map<String, String>> fql(std::string const& query, char const* row) {
        Vector<Map<String, String>> rows;
        unsigned count = 0;
        uError err = lib->runFqlQuery(String(query), row, rows, 0, count);
        EXPECT_TRUE(err.ok()) << err;
        EXPECT_EQ(count, rows.size());
        return rows;
    }

    std::string password = emu::DemoAccount::password;
    ComponentRegistry registry;
    HttpRequestFactory factory;
    RuntimeConfiguration store;
    std::unique_ptr<emu::Emulator> emulator;
    SmartPtr<FacebookLibrary::ConnectionInfo> info;
    SmartPtr<FacebookLibrary> lib;
    TraceSink previousSink;
    std::mutex traceMutex;  // guards traces
    std::vector<std::string> traces;
};

TEST_F(LibraryEmulatorTest, DemoAccountSignsInOverHttpsAndTheSessionIsStored) {
    ASSERT_TRUE(lib->connect().ok());
    String user;
    ASSERT_TRUE(lib->getUserId(user).ok());
    EXPECT_EQ(user, kDemoUid);
    EXPECT_EQ(stored("facebook_source_session_user"), kDemoUid);
    EXPECT_EQ(stored("facebook_source_lastuser"), kDemoUid);
    String session;
    ASSERT_TRUE(info->getSessionId(session).ok());
    EXPECT_EQ(stored("facebook_source_session_id"), session);

    auto logins = emulator->log().entriesFor("auth.login");
    ASSERT_EQ(logins.size(), 1u);
    EXPECT_TRUE(logins[0].https);
    EXPECT_EQ(logins[0].errorCode, 0);
}

TEST_F(LibraryEmulatorTest, EveryCallReturnsTheEmulatorsData) {
    ASSERT_TRUE(lib->connect().ok());

    auto me = fql("SELECT uid, name FROM user WHERE uid = " + kDemoUid, "user");
    ASSERT_EQ(me.size(), 1u);
    EXPECT_EQ(*me[0].search("uid"), kDemoUid);
    EXPECT_FALSE(me[0].search("name")->empty());
    EXPECT_EQ(fql("SELECT uid2 FROM friend WHERE uid1 = " + kDemoUid, "friend").size(), 5u);

    Vector<Map<String, String>> posts;
    unsigned count = 0;
    ASSERT_TRUE(lib->runFStreamQuery(kDemoUid.c_str(), 0, 0, 50, posts, count).ok());
    EXPECT_GT(count, 0u);
    EXPECT_EQ(posts.size(), count);
    for (auto const& post : posts) EXPECT_TRUE(post.contains("created_time"));

    Vector<FacebookLibrary::ThreadObj> threads;
    ASSERT_TRUE(lib->getInboxThreads(0, 20, threads).ok());
    ASSERT_EQ(threads.size(), 3u);
    for (auto const& thread : threads) {
        EXPECT_FALSE(thread.threadId.empty());
        EXPECT_GT(thread.lastUpdate, 0);
    }
    EXPECT_GE(threads[0].lastUpdate, threads[2].lastUpdate);  // newest first

    Vector<FacebookLibrary::MessageObj> messages;
    ASSERT_TRUE(lib->getThreadMessages(threads[0].threadId, "ctx", 0, 50, messages).ok());
    ASSERT_EQ(messages.size(), 4u);
    for (auto const& message : messages) {
        EXPECT_EQ(message.threadId, threads[0].threadId);
        EXPECT_EQ(message.context, "ctx");
        EXPECT_FALSE(message.messageId.empty());
        EXPECT_GT(message.timeSent, 0);
        EXPECT_TRUE(message.hasAttachment);  // a non-zero time sent gives the flag
    }

    // Successive calls of one session carry growing call ids, as the service expects.
    auto sent = emulator->log().entries();
    ASSERT_GE(sent.size(), 6u);
    EXPECT_EQ(sent[1].args.at("call_id"), "1");
    EXPECT_EQ(sent.back().args.at("call_id"), std::to_string(sent.size() - 1));
}

TEST_F(LibraryEmulatorTest, PostedStatusIsSeenByTheService) {
    ASSERT_TRUE(lib->connect().ok());
    ASSERT_TRUE(lib->setStatus("testing the client", false).ok());
    auto me = fql("SELECT status FROM user WHERE uid = " + kDemoUid, "user");
    ASSERT_EQ(me.size(), 1u);
    EXPECT_EQ(*me[0].search("status.message"), "testing the client");

    auto calls = emulator->log().entriesFor("users.setStatus");
    ASSERT_EQ(calls.size(), 1u);
    EXPECT_EQ(calls[0].args.at("status_includes_verb"), "0");
}

TEST_F(LibraryEmulatorTest, UploadedPhotoIsSeenByTheService) {
    char dir[] = "/tmp/trelm-library-test-XXXXXX";
    ASSERT_NE(mkdtemp(dir), nullptr);
    std::string const path = std::string(dir) + "/photo.jpg";
    std::ofstream(path, std::ios::binary) << std::string("\xff\xd8\xff\xe0 not really a picture \xff\xd9", 26);
    auto photo = makeSmart<InputDataStream>();
    ASSERT_TRUE(photo->setUri(path.c_str()).ok());

    ASSERT_TRUE(lib->connect().ok());
    String pid;
    uError err = lib->sendPhoto(photo, "", "a caption", pid);
    std::filesystem::remove_all(dir);
    ASSERT_TRUE(err.ok()) << err;
    ASSERT_FALSE(pid.empty());

    auto rows = fql("SELECT pid, caption, owner FROM photo WHERE pid = '" + pid.str() + "'", "photo");
    ASSERT_EQ(rows.size(), 1u);
    EXPECT_EQ(*rows[0].search("caption"), "a caption");
    EXPECT_EQ(*rows[0].search("owner"), kDemoUid);
    auto uploads = emulator->log().entriesFor("photos.upload");
    ASSERT_EQ(uploads.size(), 1u);
    EXPECT_TRUE(uploads[0].hadFile);
    EXPECT_EQ(uploads[0].fileSize, 26u);
    EXPECT_EQ(uploads[0].args.count("aid"), 0u);
}

TEST_F(LibraryEmulatorTest, WrongPasswordIsNotSignedIn) {
    ASSERT_TRUE(info->setLoginConfig(emu::DemoAccount::email, "not the password").ok());
    EXPECT_EQ(lib->connect().code(), kNotSignedIn);
    EXPECT_FALSE(info->hasSession());
    EXPECT_EQ(stored("facebook_source_lastuser"), "");
}

// The service ends the session; the client drops it, keeps the user, and signs in again.
TEST_F(LibraryEmulatorTest, ExpiredSessionIsDroppedAndASecondLoginRecovers) {
    emu::FaultRule rule;
    rule.expireAfter = 2;
    emulator->faults().set("fql.query", rule);
    ASSERT_TRUE(lib->connect().ok());

    std::string const query = "SELECT uid FROM user WHERE uid = " + kDemoUid;
    fql(query, "user");
    fql(query, "user");
    Vector<Map<String, String>> rows;
    unsigned count = 0;
    EXPECT_EQ(lib->runFqlQuery(String(query), "user", rows, 0, count).code(), kNotSignedIn);
    EXPECT_FALSE(info->hasSession());
    String user;
    ASSERT_TRUE(lib->getUserId(user).ok());
    EXPECT_EQ(user, kDemoUid);
    EXPECT_EQ(stored("facebook_source_session_id"), "");
    EXPECT_EQ(stored("facebook_source_lastuser"), kDemoUid);

    emulator->faults().clearAll();
    ASSERT_TRUE(lib->connect().ok());
    EXPECT_EQ(fql(query, "user").size(), 1u);
}

TEST_F(LibraryEmulatorTest, ThrottledCallAnswersRequestLimitAndKeepsTheSession) {
    ASSERT_TRUE(lib->connect().ok());
    emu::FaultRule rule;
    rule.rate = 0.001;  // one call now, the next in about a quarter of an hour
    rule.burst = 1;
    emulator->faults().set("users.setStatus", rule);
    ASSERT_TRUE(lib->setStatus("first", false).ok());
    EXPECT_EQ(lib->setStatus("second", false).code(), kRequestLimit);
    EXPECT_TRUE(info->hasSession());
}

// The password goes out once, in the HTTPS login; the session secret never goes out; neither
// appears in a trace line or an error text, even when the client has failures to report.
TEST_F(LibraryEmulatorTest, SecretsStayInTheLoginRequestAndOutOfTraces) {
    // Another user signed in last, and a wipe component is missing: both get reported.
    Set<Configuration::Value> last{Configuration::Value("facebook_source_lastuser", Variant("7"))};
    ASSERT_TRUE(store.store(kTag, last).ok());
    ASSERT_TRUE(info->setWipeComponents({"NoSuchComponent"}).ok());
    emu::FaultRule rule;
    rule.expireAfter = 1;
    emulator->faults().set("users.setStatus", rule);

    std::vector<std::string> errors;
    auto keep = [&](uError const& err) { errors.push_back(err.toText()); };
    keep(lib->connect());
    std::vector<std::string> secrets;
    String secret;
    ASSERT_TRUE(info->getSessionSecret(secret).ok());
    secrets.push_back(secret.str());
    keep(lib->setStatus("one", false));
    keep(lib->setStatus("two", false));
    ASSERT_TRUE(info->setLoginConfig(emu::DemoAccount::email, "wrong-password").ok());
    keep(lib->connect());
    ASSERT_TRUE(info->setLoginConfig(emu::DemoAccount::email, password).ok());
    keep(lib->connect());
    ASSERT_TRUE(info->getSessionSecret(secret).ok());
    secrets.push_back(secret.str());
    ASSERT_NE(secrets[0], secrets[1]);

    std::lock_guard<std::mutex> lock(traceMutex);
    EXPECT_FALSE(traces.empty());  // the missing wipe component was reported
    for (auto const* lines : {&traces, &errors}) {
        for (std::string const& line : *lines) {
            EXPECT_EQ(line.find(password), std::string::npos) << line;
            EXPECT_EQ(line.find("wrong-password"), std::string::npos) << line;
            for (std::string const& s : secrets) EXPECT_EQ(line.find(s), std::string::npos) << line;
        }
    }
    for (auto const& request : emulator->log().entries()) {
        for (auto const& [key, value] : request.args) {
            for (std::string const& s : secrets) EXPECT_NE(value, s) << key;
            if (key == "password") {
                EXPECT_TRUE(request.https);
                EXPECT_EQ(value, "***");
            }
        }
        EXPECT_EQ(request.args.count("password") == 1, request.method == "facebook.auth.login") << request.method;
    }
}

}  // namespace
}  // namespace trelm::test
