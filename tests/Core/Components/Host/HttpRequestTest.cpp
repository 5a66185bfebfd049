// HttpRequest through the host's HttpRequestFactory against the in-process emulator, for what the
// client tests do not provoke: every HTTP status, a server that never answers, certificates that
// must be refused, uploads, and kept connections that die under a request.
#include "trelm/HttpRequest.h"

#include <gtest/gtest.h>
#include <unistd.h>

#include <cstdio>
#include <fstream>
#include <map>
#include <memory>
#include <string>
#include <vector>

#include "Emulator.h"
#include "ErrorAssertions.h"
#include "HttpRequestFactory.h"

namespace trelm {
namespace {

constexpr char const* kUrl = "http://api.facebook.com/restserver.php";

class HttpRequestTest : public ::testing::Test {
protected:
    void SetUp() override {
        emulator = start();
        factory = makeFactory(emulator->caFile());
    }

    static std::unique_ptr<emu::Emulator> start() {
        emu::Emulator::Options options;
        options.generator = {.users = 5, .demoFriends = 2};
        auto made = std::make_unique<emu::Emulator>(options);
        std::string error;
        EXPECT_TRUE(made->start(error)) << error;
        return made;
    }

    // Sends api.facebook.com (and other.example over TLS) to the emulator, trusting `caFile`.
    std::unique_ptr<HttpRequestFactory> makeFactory(std::string const& caFile) {
        auto made = std::make_unique<HttpRequestFactory>();
        made->setCaFile(String(caFile));
        std::string const tls = std::to_string(emulator->httpsPort());
        made->setConnectTo({String("api.facebook.com:80:127.0.0.1:" + std::to_string(emulator->httpPort())),
                            String("api.facebook.com:443:127.0.0.1:" + tls),
                            String("other.example:443:127.0.0.1:" + tls)});
        return made;
    }

    // One POST of `fields` (with "method" = `method`); `status` when the exchange completed.
    uError post(std::string const& method, Map<String, String> fields = {}, bool publishing = false,
                SmartPtr<InputDataStream> upload = {}, std::string const& url = kUrl) {
        SmartPtr<HttpRequest> request;
        TRELM_RETURN_IF_ERROR(factory->createRequest(request));
        TRELM_RETURN_IF_ERROR(request->setup(String(url)));
        TRELM_RETURN_IF_ERROR(request->setPublishing(publishing));
        TRELM_RETURN_IF_ERROR(fields.insert("method", String(method)));
        TRELM_RETURN_IF_ERROR(request->setPostData(fields));
        if (upload) TRELM_RETURN_IF_ERROR(request->setUploadData(upload));
        TRELM_RETURN_IF_ERROR(request->sendRequest());
        TRELM_RETURN_IF_ERROR(request->getResponseCode(status));
        String body;
        TRELM_RETURN_IF_ERROR(request->getResponseData(body));
        if (body.empty()) return TRELM_ERROR_MSG(kFailure, "empty body");
        return request->disconnect();
    }

    std::unique_ptr<emu::Emulator> emulator;
    std::unique_ptr<HttpRequestFactory> factory;
    int status = 0;
};

// A 1xx status can't be a final answer; every other status reaches the caller as sent.
TEST_F(HttpRequestTest, StatusReachesCallerAsSent) {
    for (int sent : {299, 300, 404, 503, 199}) {
        std::string const method = "status" + std::to_string(sent);
        emulator->faults().set(method, emu::FaultRule{.httpStatus = sent});
        status = 0;
        EXPECT_CODE(post(method), sent >= 200 ? kSuccess : kFailure) << sent;
        EXPECT_EQ(status, sent >= 200 ? sent : 0);
    }
}

// Url-encoded, and as the parts of a multipart body beside a file with every byte value.
TEST_F(HttpRequestTest, FieldsAndUploadArriveIntact) {
    Map<String, String> const fields{
        {"status", "Gr\xC3\xBC\xC3\x9F\x65 & =+ ? % #1 \xE2\x98\xBA"},
        {"query", "SELECT uid FROM user WHERE name = 'a+b' AND x=\"1&2\""},
        {"empty", ""},
        {"a key&=", "v"},
        {"lines", "one\r\ntwo\n"},
    };
    std::string const base = ::testing::TempDir() + "trelm-http-" + std::to_string(::getpid());  // one per run
    std::string const path = base + " photo.jpg";
    std::string image;
    for (int b = 0; b < 256 * 300; ++b) image.push_back(static_cast<char>(b));  // NULs included
    std::ofstream(path, std::ios::binary) << image;
    auto upload = makeSmart<InputDataStream>();
    ASSERT_OK(upload->setUri(String("file://" + base + "%20photo.jpg")));
    ASSERT_EQ(upload->path(), path);

    ASSERT_OK(post("form", fields));
    ASSERT_OK(post("photos.upload", fields, false, upload));
    std::remove(path.c_str());
    auto const seen = emulator->log().entries();
    ASSERT_EQ(seen.size(), 2u);
    for (auto const& request : seen) {
        SCOPED_TRACE(request.method);
        std::map<std::string, std::string> want{{"method", request.method}};
        for (auto const& [k, v] : fields) want[k.str()] = v.str();
        EXPECT_EQ(request.args, want);
        EXPECT_EQ(request.fileSize, request.hadFile ? image.size() : 0u);
    }
    EXPECT_TRUE(seen[1].hadFile);
}

TEST_F(HttpRequestTest, UnreadableUploadFailsWithoutSendingAnything) {
    auto upload = makeSmart<InputDataStream>();
    ASSERT_OK(upload->setUri("/nonexistent/dir/photo.jpg"));
    EXPECT_CODE(post("photos.upload", {}, false, upload), kFailure);
    EXPECT_EQ(emulator->log().total(), 0u);
}

TEST_F(HttpRequestTest, ServerThatNeverAnswersIsCutOffByTimeout) {
    ASSERT_OK(factory->setTimeoutMs(300));
    emulator->faults().set("hang", emu::FaultRule{.delayMs = 1500});
    uError e = post("hang");
    EXPECT_CODE(e, kFailure);
    EXPECT_NE(e.message().str().find("timed out"), std::string::npos) << e;
}

TEST_F(HttpRequestTest, UntrustedOrMisnamedCertificateIsRefused) {
    std::unique_ptr<emu::Emulator> other = start();  // its CA signed nothing of this emulator
    struct Case {
        char const* what;
        std::string caFile;
        char const* url;
        unsigned code;
    } const cases[] = {
        {"trusted", emulator->caFile(), "https://api.facebook.com/restserver.php", kSuccess},
        {"certificate of another CA", other->caFile(), "https://api.facebook.com/restserver.php", kFailure},
        {"system store", "", "https://api.facebook.com/restserver.php", kFailure},
        {"name not in certificate", emulator->caFile(), "https://other.example/restserver.php", kFailure},
    };
    for (auto const& c : cases) {
        factory = makeFactory(c.caFile);
        EXPECT_CODE(post("m", {{"password", "secret"}}, false, {}, c.url), c.code) << c.what;
    }
    EXPECT_EQ(emulator->log().total(), 1u);
}

// libcurl sends a request again on a new connection when the kept connection it went out on dies
// before any answer. The emulator drops the connection of the last request of each sequence, so
// that request reaches it more than once when it went out on a kept connection, once on a new
// one. A publishing request must never go out on a kept connection; the requests after it may.
TEST_F(HttpRequestTest, OnlyPublishingRequestsAvoidKeptConnections) {
    struct Case {
        std::vector<bool> publishing;  // one request each, in order; the last one is dropped
        bool resent;
    } const cases[] = {
        {{false, false}, true},
        {{false, true}, false},
        {{true, false}, true},  // the handle that carried a publishing request reuses connections again
        {{true, false, true, false}, true},
        {{false, true, true}, false},
    };
    int n = 0;
    for (Case const& c : cases) {
        SCOPED_TRACE(::testing::PrintToString(c.publishing));
        factory = makeFactory(emulator->caFile());
        std::string const dies = "dies" + std::to_string(n++);
        emulator->faults().set(dies, emu::FaultRule{.drop = true});
        for (std::size_t i = 0; i + 1 < c.publishing.size(); ++i) ASSERT_OK(post("m", {}, c.publishing[i]));
        EXPECT_CODE(post(dies, {}, c.publishing.back()), kFailure);
        EXPECT_EQ(emulator->log().entriesFor(dies).size() > 1, c.resent);
    }
}

}  // namespace
}  // namespace trelm
