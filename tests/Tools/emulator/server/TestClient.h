// A libcurl client for the emulator tests: form, multipart and GET requests, TLS verified against
// a given CA with every check on, and the service's signature computed on the test's side.
#pragma once

#include <curl/curl.h>

#include <map>
#include <string>
#include <vector>

namespace emu::test {

using Fields = std::map<std::string, std::string>;

// A file part of a multipart body: its Content-Disposition parameters and its content.
struct FilePart {
    std::string disposition;
    std::string content;
};

struct Reply {
    CURLcode code = CURLE_OK;
    long status = 0;
    std::string body;
    std::string contentType;
    long newConnections = 0;  // connections the transfer had to open (0 = reused)

    // The "error_code" of an error document; 0 when the body is not one.
    int errorCode() const;
};

// One easy handle, so consecutive requests reuse its connection. Not thread safe: one per thread.
class TestClient {
public:
    TestClient();
    ~TestClient();
    TestClient(TestClient const&) = delete;
    TestClient& operator=(TestClient const&) = delete;

    void trust(std::string const& caFile) { caFile_ = caFile; }
    // A libcurl connect-to rule, "host:port:connect-host:connect-port".
    void connectTo(std::string const& rule) { connectTo_ = rule; }

    Reply postForm(std::string const& url, Fields const& fields);
    // `body` as it is, under `contentType` (none given: a url-encoded form).
    Reply postRaw(std::string const& url, std::string const& contentType, std::string const& body);
    // A multipart body built by hand, as the era's clients built it (see multipart()).
    Reply postMultipart(std::string const& url, Fields const& fields, std::vector<FilePart> const& files);
    Reply get(std::string const& url, Fields const& fields);

    // "a=1&b=2", each side url-encoded.
    std::string encode(Fields const& fields);

private:
    Reply perform(std::string const& url);

    CURL* curl_;
    std::string caFile_;
    std::string connectTo_;
};

inline constexpr char const* kBoundary = "AaB03x-era";
// `fields`, then `files` as application/octet-stream, as a multipart/form-data body with kBoundary.
std::string multipart(Fields const& fields, std::vector<FilePart> const& files);

// `fields` plus "sig": MD5 of the sorted key=value pairs and `secret`.
Fields sign(Fields fields, std::string const& secret);

}  // namespace emu::test
