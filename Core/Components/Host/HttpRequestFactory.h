#pragma once

#include <atomic>
#include <cstdint>
#include <mutex>

#include "Component.h"
#include "trelm/Configuration.h"
#include "trelm/Export.h"
#include "trelm/HttpRequest.h"
#include "trelm/SmartPtr.h"
#include "trelm/String.h"
#include "trelm/Vector.h"
#include "trelm/uError.h"

namespace trelm {

// The host's built-in component "HttpRequestFactory": answers
// "IHttpRequestFactory::HttpObjectRequestMessage" with a new HttpRequest. Every request it makes
// shares one connection cache (connections, DNS answers, TLS sessions), so consecutive requests to
// one host reuse a connection even though each request is disconnected after its exchange.
//
// Configuration group keys (sendConfig); an absent key keeps its default:
//   "connect_timeout_ms"  integer > 0, default 10000: time to establish a connection (TCP + TLS)
//   "timeout_ms"          integer > 0, default 60000: time for a whole exchange
//   "ca_file"             string, default "" (the system's trusted CAs): PEM file of trusted CAs
//   "connect_to"          list of strings "HOST:PORT:CONNECT-TO-HOST:CONNECT-TO-PORT", default
//                         none: sends requests for HOST:PORT to another address while keeping the
//                         URL's host for the Host header and the certificate name check (used to
//                         send the service's own host names to a local endpoint)
// A value of the wrong kind fails sendConfig with kInvalid and changes nothing. TLS verification
// of peer and host is always on; there is no setting to turn it off.
//
// Settings apply to requests made afterwards; requests already handed out keep theirs.
// Lifetime: requests keep the connection cache alive, so they may outlive the factory.
// Thread safety: every operation may be called from any thread; requests may be made and run on
// several threads at once.
class TRELM_API HttpRequestFactory : public Component {
public:
    static constexpr char const* kName = "HttpRequestFactory";

    explicit HttpRequestFactory(String name = kName, String componentId = kName);
    ~HttpRequestFactory() override;

    // A new request with the current settings and the shared cache. kResource when libcurl
    // cannot make its share handle.
    uError createRequest(SmartPtr<HttpRequest>& out);

    // The same settings as the configuration keys, for hosts and tests. kInvalid for a timeout
    // that is not positive.
    uError setConnectTimeoutMs(long ms);
    uError setTimeoutMs(long ms);
    void setCaFile(String const& path);
    void setConnectTo(Vector<String> const& entries);
    HttpRequest::Settings settings() const;
    // How many requests createRequest has handed out since construction: a host that watches it
    // around a cursor step knows whether the step went to the service.
    std::uint64_t requestsMade() const noexcept { return requestsMade_.load(); }

protected:
    uError sendConfigImpl(Configuration::Group const& group) override;
    uError handleMessage(IMessage& msg) override;

private:
    // Guards settings_ and cache_.
    mutable std::mutex mutex_;
    HttpRequest::Settings settings_;
    SmartPtr<HttpRequest::ConnectionCache> cache_;  // made by the first request
    std::atomic<std::uint64_t> requestsMade_{0};    // atomic, not guarded
};

}  // namespace trelm
