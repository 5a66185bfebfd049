#include "trelm/InputDataStream.h"

#include <curl/curl.h>

#include <memory>

namespace trelm {

namespace {

struct UrlDeleter {
    void operator()(CURLU* u) const { curl_url_cleanup(u); }
};
struct CurlTextDeleter {
    void operator()(char* p) const { curl_free(p); }
};

}  // namespace

InputDataStream::InputDataStream() = default;

InputDataStream::~InputDataStream() = default;

uError InputDataStream::setUri(String const& uri) {
    if (uri.empty()) return TRELM_ERROR_MSG(kInvalid, "empty upload URI");
    std::string const& text = uri.str();
    std::size_t scheme = text.find("://");
    if (scheme == std::string::npos) {
        uri_ = uri;
        path_ = uri;
        return TRELM_OK();
    }
    if (text.compare(0, scheme, "file") != 0) {
        return TRELM_ERROR_MSG(kInvalid, "upload URI is not a local file: " + uri);
    }
    // curl's URL parser decodes the path and tells the host apart.
    std::unique_ptr<CURLU, UrlDeleter> url(curl_url());
    if (!url) return TRELM_ERROR(kOutOfMemory);
    if (curl_url_set(url.get(), CURLUPART_URL, uri.cStr(), CURLU_ALLOW_SPACE) != CURLUE_OK) {
        return TRELM_ERROR_MSG(kInvalid, "malformed file URI: " + uri);
    }
    char* host = nullptr;
    if (curl_url_get(url.get(), CURLUPART_HOST, &host, 0) == CURLUE_OK) {
        std::unique_ptr<char, CurlTextDeleter> hold(host);
        std::string h(host);
        if (!h.empty() && h != "localhost") {
            return TRELM_ERROR_MSG(kInvalid, "file URI names a remote host: " + uri);
        }
    }
    char* decoded = nullptr;
    if (curl_url_get(url.get(), CURLUPART_PATH, &decoded, CURLU_URLDECODE) != CURLUE_OK) {
        return TRELM_ERROR_MSG(kInvalid, "malformed file URI: " + uri);
    }
    std::unique_ptr<char, CurlTextDeleter> hold(decoded);
    uri_ = uri;
    path_ = String(decoded);
    return TRELM_OK();
}

}  // namespace trelm
