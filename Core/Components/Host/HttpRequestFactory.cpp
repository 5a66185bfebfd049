#include "HttpRequestFactory.h"

#include "HttpObjectRequestMessage.h"

namespace trelm {

namespace {

// Reads an optional positive integer setting.
uError readPositive(Configuration::Group const& group, char const* key, long& out) {
    Variant v = group.get(String(key));
    if (v.empty()) return TRELM_OK();
    int value = 0;
    uError e = v.as(value);
    if (e.failed()) return TRELM_WRAP_MSG(kInvalid, e, String("configuration key ") + key + " is not an integer");
    if (value <= 0) return TRELM_ERROR_MSG(kInvalid, String("configuration key ") + key + " must be positive");
    out = value;
    return TRELM_OK();
}

}  // namespace

HttpRequestFactory::HttpRequestFactory(String name, String componentId)
    : Component(std::move(name), std::move(componentId)) {}

HttpRequestFactory::~HttpRequestFactory() = default;

uError HttpRequestFactory::createRequest(SmartPtr<HttpRequest>& out) {
    HttpRequest::Settings settings;
    SmartPtr<HttpRequest::ConnectionCache> cache;
    {
        std::lock_guard<std::mutex> lock(mutex_);
        if (!cache_) {
            TRELM_RETURN_IF_ERROR(HttpRequest::ConnectionCache::create(cache_));
        }
        settings = settings_;
        cache = cache_;
    }
    out = makeSmart<HttpRequest>(std::move(settings), std::move(cache));
    requestsMade_.fetch_add(1);
    return TRELM_OK();
}

uError HttpRequestFactory::setConnectTimeoutMs(long ms) {
    if (ms <= 0) return TRELM_ERROR_MSG(kInvalid, "connect timeout must be positive");
    std::lock_guard<std::mutex> lock(mutex_);
    settings_.connectTimeoutMs = ms;
    return TRELM_OK();
}

uError HttpRequestFactory::setTimeoutMs(long ms) {
    if (ms <= 0) return TRELM_ERROR_MSG(kInvalid, "timeout must be positive");
    std::lock_guard<std::mutex> lock(mutex_);
    settings_.timeoutMs = ms;
    return TRELM_OK();
}

void HttpRequestFactory::setCaFile(String const& path) {
    std::lock_guard<std::mutex> lock(mutex_);
    settings_.caFile = path;
}

void HttpRequestFactory::setConnectTo(Vector<String> const& entries) {
    std::lock_guard<std::mutex> lock(mutex_);
    settings_.connectTo = entries;
}

HttpRequest::Settings HttpRequestFactory::settings() const {
    std::lock_guard<std::mutex> lock(mutex_);
    return settings_;
}

uError HttpRequestFactory::sendConfigImpl(Configuration::Group const& group) {
    // Built aside and swapped in whole, so a bad value changes nothing.
    std::lock_guard<std::mutex> lock(mutex_);
    HttpRequest::Settings next = settings_;
    TRELM_RETURN_IF_ERROR(readPositive(group, "connect_timeout_ms", next.connectTimeoutMs));
    uError e = readPositive(group, "timeout_ms", next.timeoutMs);
    if (e.failed()) return e;
    Variant ca = group.get(String("ca_file"));
    if (!ca.empty()) {
        e = ca.as(next.caFile);
        if (e.failed()) return TRELM_WRAP_MSG(kInvalid, e, "configuration key ca_file is not a string");
    }
    e = group.get(String("connect_to"), next.connectTo, next.connectTo);
    if (e.failed()) return TRELM_WRAP_MSG(kInvalid, e, "configuration key connect_to is not a list of strings");

    settings_ = std::move(next);
    return TRELM_OK();
}

uError HttpRequestFactory::handleMessage(IMessage& msg) {
    if (msg.type() != IHttpRequestFactory::HttpObjectRequestMessage::kType) return TRELM_OK();
    auto* request = dynamic_cast<IHttpRequestFactory::HttpObjectRequestMessage*>(&msg);
    if (request == nullptr) return TRELM_ERROR_MSG(kInvalid, "message of type " + msg.type() + " has another class");
    return createRequest(request->request);
}

}  // namespace trelm
