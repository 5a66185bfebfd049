#include "ServiceTransport.h"

#include <string_view>
#include <utility>

#include "HttpObjectRequestMessage.h"
#include "trelm/HashParseObj.h"
#include "trelm/HttpRequest.h"
#include "trelm/MD5.h"

namespace trelm {
namespace {

constexpr char const* kHttpFactory = "HttpRequestFactory";

// The service writes numbers as bare text, but a pretty-printed document may surround them with
// white space; anything else is not a number.
String trimmed(String const& text) {
    unsigned begin = 0;
    unsigned end = text.size();
    auto space = [](char c) { return c == ' ' || c == '\t' || c == '\n' || c == '\r'; };
    while (begin < end && space(text[begin])) ++begin;
    while (end > begin && space(text[end - 1])) --end;
    return text.substr(begin, end - begin);
}

// The service's own account of a refusal, kept as the message of the translated error so that a
// user reads why ("service error 104: Incorrect signature"); callers branch on the code alone.
String serviceErrorText(Map<String, String> const& fields) {
    String const* code = fields.search("error_code");
    String const* message = fields.search("error_msg");
    String text = "service error " + trimmed(code != nullptr ? *code : String());
    if (message != nullptr && !message->empty()) text += ": " + *message;
    return text;
}

}  // namespace

uError ServiceTransport::makeBaseArgs(String const& method, Map<String, String>& args) {
    TRELM_RETURN_IF_ERROR(args.insert("method", method));
    TRELM_RETURN_IF_ERROR(args.insert("v", "1.0"));
    return TRELM_OK();
}

String ServiceTransport::signature(Map<String, String> const& args, String const& secret) {
    // The pieces go into the digest one by one: the same bytes as the text run together, without
    // building it. The context is the call's own: a thread-local one in the plug-in would outlive
    // the unloaded plug-in's code and OpenSSL's clean-up at exit.
    MD5_CTX ctx;
    auto add = [&ctx](String const& piece) {
        MD5Update(&ctx, reinterpret_cast<unsigned char const*>(piece.cStr()), piece.size());
    };
    static unsigned char const equals = '=';
    MD5Init(&ctx);
    for (auto const& [key, value] : args) {
        add(key);
        MD5Update(&ctx, &equals, 1);
        add(value);
    }
    add(secret);
    return MD5FinalHex(&ctx);
}

bool ServiceTransport::isPublishing(Map<String, String> const& args, bool withUpload) {
    if (withUpload) return true;
    String const* method = args.search("method");
    if (method == nullptr) return false;
    std::string_view name = method->view();
    constexpr std::string_view prefix = "facebook.";
    if (name.substr(0, prefix.size()) == prefix) name.remove_prefix(prefix.size());
    return name == "users.setStatus" || name == "stream.publish" || name == "photos.upload";
}

uError ServiceTransport::post(String const& url, Map<String, String> const& args, SmartPtr<InputDataStream> data,
                              String& response) {
    IHttpRequestFactory::HttpObjectRequestMessage msg;
    if (uError err = msg.send(kHttpFactory); err.failed()) return TRELM_WRAP(kFailure, err);
    SmartPtr<HttpRequest> request = msg.request;
    if (!request) return TRELM_ERROR(kFailure);

    TRELM_RETURN_IF_ERROR(request->setup(url));
    if (isPublishing(args, static_cast<bool>(data))) TRELM_RETURN_IF_ERROR(request->setPublishing(true));
    TRELM_RETURN_IF_ERROR(request->setPostData(args));
    if (data) TRELM_RETURN_IF_ERROR(request->setUploadData(data));
    TRELM_RETURN_IF_ERROR(request->sendRequest());
    int status = 0;
    TRELM_RETURN_IF_ERROR(request->getResponseCode(status));
    if (status < 200 || status > 299) {
        // The call has failed already; releasing the connection is best effort.
        request->disconnect().ignore();
        return TRELM_ERROR_MSG(kFailure, "HTTP status " + String::from(status));
    }
    String body;
    TRELM_RETURN_IF_ERROR(request->getResponseData(body));
    // The answer is complete: a connection that cannot be handed back only costs a reconnect.
    request->disconnect().ignore();
    response = std::move(body);
    return TRELM_OK();
}

uError ServiceTransport::errorOf(String const& response, bool login) {
    Map<String, String> fields;
    if (HashParseObj("error_response").parse(response, fields).failed()) return TRELM_OK();
    String const* code = fields.search("error_code");
    String const text = code ? *code : String();
    int number = 0;
    // The service answers a wrong e-mail or password with "invalid parameter": a failed sign-in.
    unsigned result = login && trimmed(text).to(number).ok() && number == 100 ? unsigned(kNotSignedIn)
                                                                              : resolveErrorCode(text).code();
    // A document without a numeric code says nothing a user could act on.
    if (result == kFailure) return TRELM_ERROR(kFailure);
    return TRELM_ERROR_MSG(result, serviceErrorText(fields));
}

uError ServiceTransport::resolveErrorCode(String const& serviceCode) {
    int code = 0;
    if (trimmed(serviceCode).to(code).failed()) return TRELM_ERROR(kFailure);
    switch (code) {
        case 2:
            return TRELM_ERROR(kServiceUnavailable);
        case 4:
            return TRELM_ERROR(kRequestLimit);
        case 102:
        case 400:
        case 401:
            return TRELM_ERROR(kNotSignedIn);
        default:
            return TRELM_ERROR(kServiceError);
    }
}

}  // namespace trelm
