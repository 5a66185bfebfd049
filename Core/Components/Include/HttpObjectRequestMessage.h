#pragma once

#include "IMessage.h"
#include "trelm/Export.h"
#include "trelm/HttpRequest.h"
#include "trelm/SmartPtr.h"

namespace trelm {
namespace IHttpRequestFactory {

// Asks the host's "HttpRequestFactory" for a new HttpRequest. On success the receiver has put
// the request into `request`; the caller owns it from then on (shared with nobody).
class TRELM_API HttpObjectRequestMessage : public IMessage {
public:
    static constexpr char const* kType = "IHttpRequestFactory::HttpObjectRequestMessage";

    HttpObjectRequestMessage() : IMessage(kType) {}
    ~HttpObjectRequestMessage() override;

    // Filled by the receiver.
    SmartPtr<HttpRequest> request;
};

}  // namespace IHttpRequestFactory
}  // namespace trelm
