#pragma once

#include <memory>

#include "trelm/Export.h"
#include "trelm/InputDataStream.h"
#include "trelm/Map.h"
#include "trelm/SmartPtr.h"
#include "trelm/String.h"
#include "trelm/Vector.h"
#include "trelm/uError.h"

namespace trelm {

// One HTTP POST exchange over a libcurl easy handle:
//   setup(url); setPostData(fields); [setUploadData(file);] sendRequest();
//   getResponseCode(code); getResponseData(body); disconnect();
// Without an upload the fields travel url-encoded (curl's escaping); with one the body is
// multipart/form-data: every field as a part, then the file as the part named "file" with the
// file's base name. TLS peer and host verification are always on. Redirects are not followed.
// Field values are never logged or put into error texts (login forms carry passwords).
//
// Requests made by the "HttpRequestFactory" component share one ConnectionCache, so a
// connection (and TLS session) outlives disconnect() and the next request to the same host
// reuses it. Their libcurl handles are also kept by the cache for the next requests. A request
// made with the default constructor keeps its connections to itself.
//
// Lifetime: a request keeps its ConnectionCache alive. It may be set up and sent again after
// disconnect() or after a completed exchange.
// The operations are virtual so that tests can hand out recording fakes in place of real
// exchanges.
// Thread safety: one request is used by one thread at a time; distinct requests (also of one
// cache) may run on different threads at once.
class TRELM_API HttpRequest {
public:
    // Transfer settings; the factory fills them from its configuration.
    struct Settings {
        long connectTimeoutMs = 10000;  // to establish the connection (TCP and TLS)
        long timeoutMs = 60000;         // the whole exchange
        String caFile;                  // PEM file of trusted CAs; empty: the system store
        // libcurl connect-to entries "HOST:PORT:CONNECT-TO-HOST:CONNECT-TO-PORT": a request for
        // HOST:PORT is sent to the other address while the URL (Host header, TLS name check)
        // stays the same.
        Vector<String> connectTo;
    };

    // The connections, DNS answers and TLS sessions shared by several requests (a libcurl share
    // handle). Thread-safe: it locks each kind of shared data with its own mutex.
    class TRELM_API ConnectionCache {
    public:
        // kResource when libcurl cannot make a share handle.
        static uError create(SmartPtr<ConnectionCache>& out);
        ~ConnectionCache();
        ConnectionCache(ConnectionCache const&) = delete;
        ConnectionCache& operator=(ConnectionCache const&) = delete;

    private:
        friend class HttpRequest;
        struct Impl;
        explicit ConnectionCache(std::unique_ptr<Impl> impl);
        std::unique_ptr<Impl> impl_;
    };

    // Default settings, private connections.
    HttpRequest();
    // `cache` may be empty (private connections).
    HttpRequest(Settings settings, SmartPtr<ConnectionCache> cache);
    virtual ~HttpRequest();
    HttpRequest(HttpRequest const&) = delete;
    HttpRequest& operator=(HttpRequest const&) = delete;

    // Starts a new exchange with `url` (http or https): forgets the fields, the upload and the
    // previous response. kInvalid for an empty url.
    virtual uError setup(String const& url);
    // Marks the exchange as one that publishes (a post, an upload): it is sent on a new
    // connection, never on one kept from an earlier exchange, so that a kept connection found
    // dead cannot make libcurl send it a second time. setup() clears the mark.
    virtual uError setPublishing(bool publishing);
    // Replaces the form fields.
    virtual uError setPostData(Map<String, String> const& fields);
    // Sends `data` as the file part of a multipart body; an empty pointer goes back to a
    // url-encoded body.
    virtual uError setUploadData(SmartPtr<InputDataStream> data);
    // Performs the exchange. kInvalid before setup(); kFailure with libcurl's description when
    // the transfer fails (connection refused, timeout, certificate refused, an answer that is
    // not HTTP, a 1xx status as the final answer, an unreadable upload file).
    virtual uError sendRequest();
    // The HTTP status of the last completed exchange (every status, 3xx and 5xx included).
    // kInvalid when no exchange has completed since setup().
    virtual uError getResponseCode(int& code);
    // The body of the last completed exchange. kInvalid as above.
    virtual uError getResponseData(String& data);
    // Releases the easy handle; with a shared cache the connection stays open for the next
    // request. The last response stays readable.
    virtual uError disconnect();

private:
    struct Impl;
    std::unique_ptr<Impl> impl_;
};

}  // namespace trelm
