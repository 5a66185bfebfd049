#pragma once

#include "trelm/InputDataStream.h"
#include "trelm/Map.h"
#include "trelm/SmartPtr.h"
#include "trelm/String.h"
#include "trelm/uError.h"

namespace trelm {

// The request format and transport that every client of the Facebook REST service in this module
// shares (the data source's FacebookLibrary and the connector's FaceBook): the base fields, the
// MD5 signature, one form POST through the host's "HttpRequestFactory", and the reading of the
// service's "error_response" documents into this system's codes. What differs between the
// clients (where the credentials, the session and the call counter live) stays with them.
//
//   Map<String, String> args;
//   ServiceTransport::makeBaseArgs("facebook.friends.get", args);
//   ... insert "api_key", "session_key", "call_id" ...
//   args.insert("sig", ServiceTransport::signature(args, secret));
//   String answer;
//   uError e = ServiceTransport::post(ServiceTransport::kServiceUrl, args, {}, answer);
//   if (e.ok()) e = ServiceTransport::errorOf(answer, false);
//
// Codes: kFailure (no request from the factory, a transport failure, an HTTP status outside
// 200-299, an error document without a numeric code), kServiceUnavailable (service code 2),
// kRequestLimit (4), kNotSignedIn (102, 400, 401; and 100 for a login), kServiceError (any other).
//
// Secrets: field values (a login's password, the signed text) never reach an error text.
// Thread safety: stateless; every function may run on any thread. post() reaches
// "HttpRequestFactory" through the active component registry.
class ServiceTransport {
public:
    // Where requests go: ordinary calls over plain HTTP, the login over HTTPS. The clients never
    // change these; a host that wants them served elsewhere routes them in its HTTP factory.
    static constexpr char const* kServiceUrl = "http://api.facebook.com/restserver.php";
    static constexpr char const* kLoginUrl = "https://api.facebook.com/restserver.php";

    ServiceTransport() = delete;

    // Inserts "method" and "v" = "1.0".
    static uError makeBaseArgs(String const& method, Map<String, String>& args);

    // The MD5, as 32 lowercase hex digits, of every "key=value" of `args` in the map's (byte-wise
    // key) order, run together, followed by `secret`.
    static String signature(Map<String, String> const& args, String const& secret);

    // True for a call that publishes something (a status, a post, a photo: "users.setStatus",
    // "stream.publish", "photos.upload", with or without the "facebook." prefix) and for any call
    // with an uploaded file (`withUpload`).
    static bool isPublishing(Map<String, String> const& args, bool withUpload);

    // One HTTP exchange: a request from "HttpRequestFactory", `args` as form fields, `data` (when
    // not empty) as the uploaded file of a multipart body. On success `response` receives the
    // body; on failure it is left as it was. A publishing call (isPublishing) is sent on a new
    // connection, so that it is never sent twice without the caller knowing.
    static uError post(String const& url, Map<String, String> const& args, SmartPtr<InputDataStream> data,
                       String& response);

    // Success when `response` is not an "error_response" document; otherwise the failure its
    // "error_code" stands for (resolveErrorCode), with the service's code and text as its message
    // ("service error 104: Incorrect signature"; none for kFailure). For the answer of a login
    // (`login`), code 100 (the service's answer to a wrong e-mail or password) is kNotSignedIn.
    static uError errorOf(String const& response, bool login);

    // The service's error code (decimal text, surrounding white space allowed) to this system's
    // code: 2 kServiceUnavailable, 4 kRequestLimit, 102/400/401 kNotSignedIn, any other number
    // kServiceError, not a number kFailure. Always a failure.
    static uError resolveErrorCode(String const& serviceCode);
};

}  // namespace trelm
