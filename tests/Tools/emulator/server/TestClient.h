// A libcurl client for the emulator tests: form, multipart and GET requests, TLS verified against
// a given CA with every check on, and the service's signature computed on the test's side.
#pragma once

#include <curl/curl.h>

#include <map>
#include <string>

namespace emu::test {

using Fields = std::map<std::string, std::string>;

struct Reply {
    CURLcode code = CURLE_OK;
    long status = 0;
    std::string body;
    std::string contentType;
    long newConnections = 0;  // connections the transfer had to open (0 = reused)
    long localPort = 0;

    // The "error_code" of an error document; 0 when the body is not one.
    int errorCode() const;
};

// One easy handle, so consecutive requests reuse its connection. Not thread safe: one per thread.
class TestClient {
public:
    TestClient();
    ~TestClient();
    TestClient(const TestClient&) = delete;
    TestClient& operator=(const TestClient&) = delete;

    void trust(const std::string& caFile) { caFile_ = caFile; }
    // A libcurl connect-to rule, "host:port:connect-host:connect-port".
    void connectTo(const std::string& rule) { connectTo_ = rule; }

    Reply postForm(const std::string& url, const Fields& fields);
    // `body` as it is, under `contentType` (none given: a url-encoded form).
    Reply postRaw(const std::string& url, const std::string& contentType, const std::string& body);
    Reply postMultipart(const std::string& url, const Fields& fields, const std::string* file);
    Reply get(const std::string& url, const Fields& fields);

    // "a=1&b=2", each side url-encoded.
    std::string encode(const Fields& fields);

private:
    Reply perform(const std::string& url);

    CURL* curl_;
    std::string caFile_;
    std::string connectTo_;
};

// `fields` plus "sig": MD5 of the sorted key=value pairs and `secret`.
Fields sign(Fields fields, const std::string& secret);

}  // namespace emu::test
