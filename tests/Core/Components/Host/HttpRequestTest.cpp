#include "trelm/HttpRequest.h"

#include <gtest/gtest.h>

#include "ErrorAssertions.h"

#include <atomic>
#include <filesystem>
#include <fstream>
#include <set>
#include <string>
#include <thread>
#include <vector>

#include "CertificateAuthority.h"
#include "HttpRequestFactory.h"
#include "LoopbackServer.h"
#include "TempDir.h"

namespace trelm {
namespace {

using test::LoopbackServer;
using test::TempDir;

// One POST through `request`: the sendRequest result, and status and body when the exchange
// completed.
struct Posted {
    uError err;
    int status = 0;
    std::string body;
};

Posted post(HttpRequest& request, std::string const& url, Map<String, String> const& fields,
            SmartPtr<InputDataStream> upload = {}) {
    Posted out;
    out.err = request.setup(String(url));
    if (out.err.ok()) out.err = request.setPostData(fields);
    if (out.err.ok() && upload) out.err = request.setUploadData(upload);
    if (out.err.ok()) out.err = request.sendRequest();
    if (out.err.failed()) return out;
    String data;
    EXPECT_OK(request.getResponseCode(out.status));
    EXPECT_OK(request.getResponseData(data));
    out.body = data.str();
    out.err = request.disconnect();
    return out;
}

SmartPtr<HttpRequest> newRequest(HttpRequestFactory& factory) {
    SmartPtr<HttpRequest> r;
    EXPECT_OK(factory.createRequest(r));
    return r;
}

// --- plain HTTP ---------------------------------------------------------------------------

// A 1xx status can't be a final answer; every other status reaches the caller as sent.
TEST(HttpRequestTest, StatusReachesCallerAsSent) {
    LoopbackServer server;
    HttpRequestFactory factory;
    ASSERT_OK(factory.setTimeoutMs(5000));
    for (int sent : {200, 299, 300, 404, 503, 199}) {
        SmartPtr<HttpRequest> r = newRequest(factory);
        auto [e, status, body] = post(*r, server.url("/status/" + std::to_string(sent)), {});
        if (sent >= 200) {
            ASSERT_OK(e) << sent;
            EXPECT_EQ(status, sent);
            EXPECT_EQ(body, "status " + std::to_string(sent));
        } else {
            EXPECT_CODE(e, kFailure);
            int code = 0;
            EXPECT_CODE(r->getResponseCode(code), kInvalid);
        }
    }
}

TEST(HttpRequestTest, FormFieldsArriveIntact) {
    LoopbackServer server;
    Map<String, String> fields{
        {"method", "facebook.users.setStatus"},
        {"status", "Gr\xC3\xBC\xC3\x9F" "e & =+ ? % #1 \xE2\x98\xBA"},
        {"query", "SELECT uid FROM user WHERE name = 'a+b' AND x=\"1&2\""},
        {"empty", ""},
        {"a key&=", "v"},
        {"lines", "one\r\ntwo\n"},
    };
    HttpRequest r;  // default settings, private connections
    ASSERT_OK(post(r, server.url("/echo"), fields).err);
    auto seen = server.requests();
    ASSERT_EQ(seen.size(), 1u);
    EXPECT_EQ(seen[0].contentType, "application/x-www-form-urlencoded");
    std::map<std::string, std::string> want;
    for (auto const& [k, v] : fields) want[k.str()] = v.str();
    EXPECT_EQ(seen[0].params, want);
}

TEST(HttpRequestTest, MultipartUploadArrivesWhole) {
    TempDir dir;
    std::string image;
    for (int round = 0; round < 300; ++round) {
        for (int b = 0; b < 256; ++b) image.push_back(static_cast<char>(b));  // NULs included
    }
    std::string path = dir.file("holiday photo.jpg");
    std::ofstream(path, std::ios::binary) << image;

    auto upload = makeSmart<InputDataStream>();
    std::string uri = "file://" + dir.path() + "/holiday%20photo.jpg";
    ASSERT_OK(upload->setUri(String(uri)));
    EXPECT_EQ(upload->path(), path);

    LoopbackServer server;
    HttpRequestFactory factory;
    SmartPtr<HttpRequest> r = newRequest(factory);
    Map<String, String> fields{{"method", "photos.upload"}, {"caption", "See & say \xE2\x98\xBA"}, {"aid", ""}};
    Posted answer = post(*r, server.url("/echo"), fields, upload);
    ASSERT_OK(answer.err);
    EXPECT_EQ(answer.status, 200);

    auto seen = server.requests();
    ASSERT_EQ(seen.size(), 1u);
    EXPECT_EQ(seen[0].contentType.rfind("multipart/form-data", 0), 0u) << seen[0].contentType;
    auto const& parts = seen[0].parts;
    ASSERT_EQ(parts.size(), 4u);
    EXPECT_EQ(parts.at("method").content, "photos.upload");
    EXPECT_EQ(parts.at("caption").content, "See & say \xE2\x98\xBA");
    EXPECT_EQ(parts.at("aid").content, "");
    EXPECT_EQ(parts.at("file").filename, "holiday photo.jpg");
    EXPECT_EQ(parts.at("file").content.size(), image.size());
    EXPECT_TRUE(parts.at("file").content == image);
}

TEST(HttpRequestTest, UnreadableUploadFailsWithoutSendingAnything) {
    LoopbackServer server;
    auto upload = makeSmart<InputDataStream>();
    ASSERT_OK(upload->setUri("/nonexistent/dir/photo.jpg"));
    HttpRequest r;
    EXPECT_CODE(post(r, server.url("/echo"), {{"a", "b"}}, upload).err, kFailure);
    EXPECT_TRUE(server.requests().empty());
}

TEST(HttpRequestTest, ServerThatNeverAnswersIsCutOffByTimeout) {
    LoopbackServer server;
    HttpRequestFactory factory;
    ASSERT_OK(factory.setTimeoutMs(300));
    SmartPtr<HttpRequest> r = newRequest(factory);
    uError e = post(*r, server.url("/hang"), {}).err;
    EXPECT_CODE(e, kFailure);
    EXPECT_NE(e.message().str().find("timed out"), std::string::npos) << e;
    server.release();
}

// --- connection reuse -------------------------------------------------------------------------

class TlsFixture : public ::testing::Test {
protected:
    static void SetUpTestSuite() {
        dir_ = new TempDir();
        std::string error;
        ok_ = emu::makeTlsFiles(dir_->path(), {"api.facebook.com", "localhost"}, files_, error);
        ASSERT_TRUE(ok_) << error;
        std::filesystem::create_directory(dir_->file("other"));
        ok_ = emu::makeTlsFiles(dir_->file("other"), {"api.facebook.com"}, otherFiles_, error);
        ASSERT_TRUE(ok_) << error;
    }
    static void TearDownTestSuite() {
        delete dir_;
        dir_ = nullptr;
    }
    void SetUp() override { ASSERT_TRUE(ok_); }

    static inline TempDir* dir_ = nullptr;
    static inline bool ok_ = false;
    static inline emu::TlsFiles files_;       // the server's certificate and its CA
    static inline emu::TlsFiles otherFiles_;  // a CA nobody's server uses
};

class ConnectionReuseTest : public TlsFixture, public ::testing::WithParamInterface<bool> {
protected:
    std::unique_ptr<LoopbackServer> makeServer() {
        if (GetParam()) return std::make_unique<LoopbackServer>(files_.certPath, files_.keyPath);
        return std::make_unique<LoopbackServer>();
    }
};

// Requests of one factory (a new request object each time) share one connection across
// disconnect; requests with private connections connect again, which also shows that remote
// ports do tell connections apart.
TEST_P(ConnectionReuseTest, RequestsOfOneFactoryShareOneConnectionAndPrivateOnesConnectAgain) {
    auto server = makeServer();
    HttpRequestFactory factory;
    factory.setCaFile(String(files_.caCertPath));
    HttpRequest::Settings settings;
    settings.caFile = String(files_.caCertPath);
    for (int i = 0; i < 5; ++i) {
        SmartPtr<HttpRequest> shared = newRequest(factory);
        HttpRequest own(settings, {});
        Posted answer = post(i < 3 ? *shared : own, server->url("/echo"), {{"echo", "x"}});
        ASSERT_OK(answer.err);
        EXPECT_EQ(answer.body, "x");
    }
    auto seen = server->requests();
    ASSERT_EQ(seen.size(), 5u);
    EXPECT_EQ(seen[1].remotePort, seen[0].remotePort);
    EXPECT_EQ(seen[2].remotePort, seen[0].remotePort);
    EXPECT_NE(seen[3].remotePort, seen[0].remotePort);
    EXPECT_NE(seen[4].remotePort, seen[3].remotePort);
}

INSTANTIATE_TEST_SUITE_P(PlainAndTls, ConnectionReuseTest, ::testing::Bool(),
                         [](auto const& info) { return info.param ? "Tls" : "Plain"; });

// --- TLS and connect-to -----------------------------------------------------------------------

class HttpsTest : public TlsFixture {};

TEST_F(HttpsTest, ServiceHostNameIsSentToLoopbackOverPlainAndTls) {
    LoopbackServer plain;
    LoopbackServer tls(files_.certPath, files_.keyPath);
    HttpRequestFactory factory;
    Configuration::Group group(
        "HttpRequestFactory",
        {{"ca_file", Variant(String(files_.caCertPath))},
         {"connect_to", Variant(Vector<String>{
                            String("api.facebook.com:80:127.0.0.1:" + std::to_string(plain.port())),
                            String("api.facebook.com:443:127.0.0.1:" + std::to_string(tls.port()))})}});
    ASSERT_OK(factory.sendConfig(group));

    for (char const* url : {"http://api.facebook.com/echo", "https://api.facebook.com/echo"}) {
        SmartPtr<HttpRequest> r = newRequest(factory);
        Posted answer = post(*r, url, {{"echo", url}});
        ASSERT_OK(answer.err) << url;
        EXPECT_EQ(answer.body, url);
    }
    ASSERT_EQ(plain.requests().size(), 1u);
    ASSERT_EQ(tls.requests().size(), 1u);
    EXPECT_EQ(plain.requests()[0].host, "api.facebook.com");
    EXPECT_EQ(tls.requests()[0].host, "api.facebook.com");
}

TEST_F(HttpsTest, UntrustedOrMisnamedCertificateIsRefused) {
    LoopbackServer tls(files_.certPath, files_.keyPath);
    std::string const port = std::to_string(tls.port());
    struct Case {
        char const* what;
        std::string caFile;
        std::string url;
        std::string connectTo;
    } cases[] = {
        {"certificate of another CA", otherFiles_.caCertPath, "https://api.facebook.com/echo",
         "api.facebook.com:443:127.0.0.1:" + port},
        {"system store", "", "https://api.facebook.com/echo", "api.facebook.com:443:127.0.0.1:" + port},
        {"name not in certificate", files_.caCertPath, "https://other.example/echo",
         "other.example:443:127.0.0.1:" + port},
    };
    for (auto const& c : cases) {
        HttpRequestFactory factory;
        factory.setCaFile(String(c.caFile));
        factory.setConnectTo({String(c.connectTo)});
        SmartPtr<HttpRequest> r = newRequest(factory);
        EXPECT_CODE(post(*r, c.url, {{"password", "secret"}}).err, kFailure) << c.what;
    }
    EXPECT_TRUE(tls.requests().empty());
}

TEST_F(HttpsTest, ManyThreadsRunRequestsOfOneFactoryAtOnce) {
    LoopbackServer tls(files_.certPath, files_.keyPath);
    LoopbackServer plain;
    HttpRequestFactory factory;
    factory.setCaFile(String(files_.caCertPath));
    constexpr int kThreads = 4;
    constexpr int kRequests = 15;
    std::atomic<int> wrong{0};
    std::vector<std::thread> threads;
    for (int t = 0; t < kThreads; ++t) {
        threads.emplace_back([&, t] {
            for (int i = 0; i < kRequests; ++i) {
                LoopbackServer& server = (i % 2 == 0) ? tls : plain;
                std::string tag = std::to_string(t) + "-" + std::to_string(i);
                SmartPtr<HttpRequest> r = newRequest(factory);
                Posted answer = post(*r, server.url("/echo"), {{"echo", String(tag)}});
                if (answer.err.failed() || answer.status != 200 || answer.body != tag) {
                    ++wrong;
                }
            }
        });
    }
    for (auto& th : threads) th.join();
    EXPECT_EQ(wrong.load(), 0);
    EXPECT_EQ(tls.requests().size() + plain.requests().size(), size_t(kThreads * kRequests));
}

}  // namespace
}  // namespace trelm
