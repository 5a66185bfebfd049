#include "trelm/HttpRequest.h"

#include <curl/curl.h>
#include <unistd.h>

#include <array>
#include <cstring>
#include <mutex>
#include <new>
#include <string>
#include <vector>

namespace trelm {

namespace {

// curl_global_init is not thread-safe; every entry that may make the first handle goes here.
uError initCurlOnce() {
    static std::once_flag once;
    static CURLcode result = CURLE_OK;
    std::call_once(once, [] { result = curl_global_init(CURL_GLOBAL_DEFAULT); });
    if (result != CURLE_OK) {
        return TRELM_ERROR_MSG(kResource, String("libcurl initialisation failed: ") + curl_easy_strerror(result));
    }
    return TRELM_OK();
}

size_t appendBody(char* data, size_t size, size_t n, void* user) {
    try {
        static_cast<std::string*>(user)->append(data, size * n);
    } catch (...) {
        return 0;  // makes curl fail the transfer with a write error
    }
    return size * n;
}

// Appends `text` url-encoded as curl_easy_escape does: letters, digits and "-._~" as they are,
// every other byte as %XX with upper-case digits. Done here to spare two allocations per field.
void appendEscaped(std::string& out, std::string const& text) {
    static constexpr char kHex[] = "0123456789ABCDEF";
    for (char ch : text) {
        auto const c = static_cast<unsigned char>(ch);
        bool const plain = (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || (c >= '0' && c <= '9') || c == '-' ||
                           c == '.' || c == '_' || c == '~';
        if (plain) {
            out += ch;
        } else {
            out += '%';
            out += kHex[c >> 4];
            out += kHex[c & 0x0f];
        }
    }
}

}  // namespace

// ---------------------------------------------------------------------------------------------

struct HttpRequest::ConnectionCache::Impl {
    // Constant after construction.
    CURLSH* share = nullptr;
    // One mutex per kind of shared data (connections, DNS, TLS sessions, the share's own
    // state), indexed by curl_lock_data; each guards that kind inside the share handle.
    std::array<std::mutex, CURL_LOCK_DATA_LAST> locks;

    // Easy handles of finished exchanges, reset and detached from the share, kept for the next
    // requests: making a handle per request costs a large allocation and its set-up.
    static constexpr std::size_t kMaxIdle = 8;
    std::mutex idleMutex;  // guards idle
    std::vector<CURL*> idle;

    // A handle from the pool, or a new one; null when libcurl cannot make one.
    CURL* takeHandle() {
        {
            std::lock_guard<std::mutex> lock(idleMutex);
            if (!idle.empty()) {
                CURL* easy = idle.back();
                idle.pop_back();
                return easy;
            }
        }
        return curl_easy_init();
    }

    // Takes `easy` back after its exchange: its connection is already in the share's cache.
    void giveHandle(CURL* easy) {
        curl_easy_setopt(easy, CURLOPT_SHARE, nullptr);
        curl_easy_reset(easy);
        {
            std::lock_guard<std::mutex> lock(idleMutex);
            if (idle.size() < kMaxIdle) {
                try {
                    idle.push_back(easy);
                    return;
                } catch (std::bad_alloc const&) {
                    // fall through: the handle is simply released
                }
            }
        }
        curl_easy_cleanup(easy);
    }

    static void lock(CURL*, curl_lock_data data, curl_lock_access, void* user) {
        static_cast<Impl*>(user)->locks[static_cast<std::size_t>(data)].lock();
    }
    static void unlock(CURL*, curl_lock_data data, void* user) {
        static_cast<Impl*>(user)->locks[static_cast<std::size_t>(data)].unlock();
    }

    ~Impl() {
        // No request is left (each keeps the cache alive), so nothing else touches the pool.
        for (CURL* easy : idle) curl_easy_cleanup(easy);
        if (share != nullptr) curl_share_cleanup(share);
    }
};

uError HttpRequest::ConnectionCache::create(SmartPtr<ConnectionCache>& out) {
    TRELM_RETURN_IF_ERROR(initCurlOnce());
    auto impl = std::make_unique<Impl>();
    impl->share = curl_share_init();
    if (impl->share == nullptr) return TRELM_ERROR_MSG(kResource, "cannot create a libcurl share handle");
    CURLSHcode rc = curl_share_setopt(impl->share, CURLSHOPT_LOCKFUNC, &Impl::lock);
    if (rc == CURLSHE_OK) rc = curl_share_setopt(impl->share, CURLSHOPT_UNLOCKFUNC, &Impl::unlock);
    if (rc == CURLSHE_OK) rc = curl_share_setopt(impl->share, CURLSHOPT_USERDATA, impl.get());
    for (curl_lock_data kind : {CURL_LOCK_DATA_CONNECT, CURL_LOCK_DATA_DNS, CURL_LOCK_DATA_SSL_SESSION}) {
        if (rc == CURLSHE_OK) rc = curl_share_setopt(impl->share, CURLSHOPT_SHARE, kind);
    }
    if (rc != CURLSHE_OK) {
        return TRELM_ERROR_MSG(kResource, String("cannot set up a libcurl share handle: ") + curl_share_strerror(rc));
    }
    out = SmartPtr<ConnectionCache>(new ConnectionCache(std::move(impl)));
    return TRELM_OK();
}

HttpRequest::ConnectionCache::ConnectionCache(std::unique_ptr<Impl> impl) : impl_(std::move(impl)) {}

HttpRequest::ConnectionCache::~ConnectionCache() = default;

// ---------------------------------------------------------------------------------------------

struct HttpRequest::Impl {
    // Constant after construction.
    Settings settings;
    SmartPtr<ConnectionCache> cache;  // outlives `easy`: declared first, destroyed last

    // The exchange being prepared or last performed.
    CURL* easy = nullptr;
    curl_mime* mime = nullptr;
    curl_slist* connectTo = nullptr;
    curl_slist* headers = nullptr;
    String url;
    Map<String, String> fields;
    SmartPtr<InputDataStream> upload;
    std::string body;  // the url-encoded fields; curl reads it during the transfer
    std::string response;
    long status = 0;
    bool completed = false;
    bool publishing = false;
    char errorText[CURL_ERROR_SIZE] = {};

    // Frees what one transfer needed; the easy handle goes back last (to the cache's pool, or
    // released when the request has no cache) so that its connection returns to the cache.
    void releaseHandle() {
        if (easy != nullptr) {
            if (cache) {
                cache->impl_->giveHandle(easy);
            } else {
                curl_easy_cleanup(easy);
            }
            easy = nullptr;
        }
        if (mime != nullptr) {
            curl_mime_free(mime);
            mime = nullptr;
        }
        if (connectTo != nullptr) {
            curl_slist_free_all(connectTo);
            connectTo = nullptr;
        }
        if (headers != nullptr) {
            curl_slist_free_all(headers);
            headers = nullptr;
        }
    }

    ~Impl() { releaseHandle(); }

    uError configure();
    uError encodeFields();
    uError buildMultipart();
};

uError HttpRequest::Impl::encodeFields() {
    try {
        body.clear();
        for (auto const& [key, value] : fields) {
            if (!body.empty()) body += '&';
            appendEscaped(body, key.str());
            body += '=';
            appendEscaped(body, value.str());
        }
    } catch (std::bad_alloc const&) {
        return TRELM_ERROR(kOutOfMemory);
    }
    curl_easy_setopt(easy, CURLOPT_POSTFIELDSIZE_LARGE, static_cast<curl_off_t>(body.size()));
    curl_easy_setopt(easy, CURLOPT_POSTFIELDS, body.c_str());
    return TRELM_OK();
}

uError HttpRequest::Impl::buildMultipart() {
    String const& path = upload->path();
    if (path.empty()) return TRELM_ERROR_MSG(kInvalid, "upload stream names no file");
    // curl would only notice an unreadable file in the middle of the transfer.
    if (::access(path.cStr(), R_OK) != 0) {
        return TRELM_ERROR_MSG(kFailure, "cannot read upload file " + path + ": " + std::strerror(errno));
    }
    mime = curl_mime_init(easy);
    if (mime == nullptr) return TRELM_ERROR(kOutOfMemory);
    for (auto const& [key, value] : fields) {
        curl_mimepart* part = curl_mime_addpart(mime);
        if (part == nullptr || curl_mime_name(part, key.cStr()) != CURLE_OK ||
            curl_mime_data(part, value.cStr(), value.size()) != CURLE_OK) {
            return TRELM_ERROR(kOutOfMemory);
        }
    }
    curl_mimepart* part = curl_mime_addpart(mime);
    if (part == nullptr || curl_mime_name(part, "file") != CURLE_OK) return TRELM_ERROR(kOutOfMemory);
    // Sets the part's file name to the base name of the path.
    CURLcode rc = curl_mime_filedata(part, path.cStr());
    if (rc != CURLE_OK) {
        return TRELM_ERROR_MSG(kFailure, "cannot attach upload file " + path + ": " + curl_easy_strerror(rc));
    }
    curl_mime_type(part, "application/octet-stream");
    curl_easy_setopt(easy, CURLOPT_MIMEPOST, mime);
    return TRELM_OK();
}

uError HttpRequest::Impl::configure() {
    errorText[0] = '\0';
    curl_easy_setopt(easy, CURLOPT_ERRORBUFFER, errorText);
    curl_easy_setopt(easy, CURLOPT_URL, url.cStr());
    curl_easy_setopt(easy, CURLOPT_PROTOCOLS_STR, "http,https");
    // Timeouts must not raise signals in a multi-threaded host.
    curl_easy_setopt(easy, CURLOPT_NOSIGNAL, 1L);
    curl_easy_setopt(easy, CURLOPT_CONNECTTIMEOUT_MS, settings.connectTimeoutMs);
    curl_easy_setopt(easy, CURLOPT_TIMEOUT_MS, settings.timeoutMs);
    curl_easy_setopt(easy, CURLOPT_SSL_VERIFYPEER, 1L);
    curl_easy_setopt(easy, CURLOPT_SSL_VERIFYHOST, 2L);
    if (!settings.caFile.empty()) curl_easy_setopt(easy, CURLOPT_CAINFO, settings.caFile.cStr());
    curl_easy_setopt(easy, CURLOPT_FOLLOWLOCATION, 0L);
    curl_easy_setopt(easy, CURLOPT_POST, 1L);
    curl_easy_setopt(easy, CURLOPT_WRITEFUNCTION, &appendBody);
    curl_easy_setopt(easy, CURLOPT_WRITEDATA, &response);
    if (cache) curl_easy_setopt(easy, CURLOPT_SHARE, cache->impl_->share);
    if (publishing) {
        // libcurl re-sends a request whose reused connection turns out dead; a publishing call
        // must not go out twice, so it never goes on a reused connection.
        curl_easy_setopt(easy, CURLOPT_FRESH_CONNECT, 1L);
    }

    for (String const& entry : settings.connectTo) {
        curl_slist* next = curl_slist_append(connectTo, entry.cStr());
        if (next == nullptr) return TRELM_ERROR(kOutOfMemory);
        connectTo = next;
    }
    if (connectTo != nullptr) curl_easy_setopt(easy, CURLOPT_CONNECT_TO, connectTo);

    // Without this curl holds back large bodies for a second waiting for "100 Continue".
    headers = curl_slist_append(nullptr, "Expect:");
    if (headers == nullptr) return TRELM_ERROR(kOutOfMemory);
    curl_easy_setopt(easy, CURLOPT_HTTPHEADER, headers);

    return upload ? buildMultipart() : encodeFields();
}

// ---------------------------------------------------------------------------------------------

HttpRequest::HttpRequest() : HttpRequest(Settings(), SmartPtr<ConnectionCache>()) {}

HttpRequest::HttpRequest(Settings settings, SmartPtr<ConnectionCache> cache) : impl_(std::make_unique<Impl>()) {
    impl_->settings = std::move(settings);
    impl_->cache = std::move(cache);
}

HttpRequest::~HttpRequest() = default;

uError HttpRequest::setup(String const& url) {
    if (url.empty()) return TRELM_ERROR_MSG(kInvalid, "empty URL");
    impl_->url = url;
    impl_->fields.clear();
    impl_->upload.reset();
    impl_->response.clear();
    impl_->status = 0;
    impl_->completed = false;
    impl_->publishing = false;
    return TRELM_OK();
}

uError HttpRequest::setPublishing(bool publishing) {
    impl_->publishing = publishing;
    return TRELM_OK();
}

uError HttpRequest::setPostData(Map<String, String> const& fields) {
    try {
        impl_->fields = fields;
    } catch (std::bad_alloc const&) {
        return TRELM_ERROR(kOutOfMemory);
    }
    return TRELM_OK();
}

uError HttpRequest::setUploadData(SmartPtr<InputDataStream> data) {
    impl_->upload = std::move(data);
    return TRELM_OK();
}

uError HttpRequest::sendRequest() {
    Impl& d = *impl_;
    if (d.url.empty()) return TRELM_ERROR_MSG(kInvalid, "request not set up");
    TRELM_RETURN_IF_ERROR(initCurlOnce());

    d.releaseHandle();
    d.response.clear();
    d.status = 0;
    d.completed = false;
    d.easy = d.cache ? d.cache->impl_->takeHandle() : curl_easy_init();
    if (d.easy == nullptr) return TRELM_ERROR_MSG(kResource, "cannot create a libcurl handle");
    TRELM_RETURN_IF_ERROR(d.configure());

    CURLcode rc = curl_easy_perform(d.easy);
    if (rc != CURLE_OK) {
        String text = "HTTP request failed: ";
        text += d.errorText[0] != '\0' ? d.errorText : curl_easy_strerror(rc);
        d.response.clear();
        return TRELM_ERROR_MSG(kFailure, text);
    }
    curl_easy_getinfo(d.easy, CURLINFO_RESPONSE_CODE, &d.status);
    d.completed = true;
    return TRELM_OK();
}

uError HttpRequest::getResponseCode(int& code) {
    if (!impl_->completed) return TRELM_ERROR_MSG(kInvalid, "no completed HTTP exchange");
    code = static_cast<int>(impl_->status);
    return TRELM_OK();
}

uError HttpRequest::getResponseData(String& data) {
    if (!impl_->completed) return TRELM_ERROR_MSG(kInvalid, "no completed HTTP exchange");
    data = String(impl_->response);
    return TRELM_OK();
}

uError HttpRequest::disconnect() {
    impl_->releaseHandle();
    return TRELM_OK();
}

}  // namespace trelm
