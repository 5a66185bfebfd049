#include "HttpObjectRequestMessage.h"

namespace trelm {
namespace IHttpRequestFactory {

// Defined here so that the class's vtable and typeinfo live in libtrelm only.
HttpObjectRequestMessage::~HttpObjectRequestMessage() = default;

}  // namespace IHttpRequestFactory
}  // namespace trelm
