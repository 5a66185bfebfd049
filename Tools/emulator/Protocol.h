// The REST protocol of the emulated service: validation, sessions, faults, dispatch to the store,
// and the answer documents.
#pragma once

#include <cstdint>
#include <string>

#include "Faults.h"
#include "RequestLog.h"
#include "Server.h"
#include "SessionTable.h"
#include "Signature.h"
#include "Store.h"
#include "XmlNode.h"

namespace emu {

// Answers one request the way the service did. Checks run in the service's order: "api_key" (101),
// the request limit (4), "method" present (3), the session when one is needed or presented (102),
// the signature (104), then, ours, a growing "call_id" when strict (103), the method known (3),
// an injected error, auth.login over HTTPS only (8), and the method's own parameters (100).
//
// Ownership: the store, the session table, the faults and the log are borrowed and must outlive
// the protocol. Thread safety: handle may run on many threads at once; the protocol has no state
// of its own beyond its options, and each borrowed part locks for itself.
class Protocol {
public:
    struct Options {
        std::int64_t sessionLifetimeSeconds = 24 * 3600;  // a login's session; 0 = never expires
        bool strictCallId = false;
    };

    Protocol(Store& store, SessionTable& sessions, Faults& faults, RequestLog& log, Options options);

    // The server's handler: answers `call`, applying the faults decided for it, and logs it.
    HttpReply handle(const HttpCall& call);

    // The answer's format: "format" = "JSON" (any case) asks for JSON; anything else is XML.
    enum class Format { Xml, Json };
    static Format formatOf(const Arguments& args);
    static const char* contentType(Format format);

    // The service's text for an error code ("An unknown error occurred" for a code it had no text for).
    static std::string errorText(int code);

    // An "error_response" document listing every argument of the request (a password as "***");
    // in JSON an object {"error_code": n, "error_msg": "...", "request_args": [{"key", "value"}...]}.
    static std::string errorDocument(const ServiceError& error, const Arguments& args, Format format = Format::Xml);

    // The root element of a method's answer: "fql.query" gives "fql_query_response".
    static std::string responseRoot(const std::string& method);

private:
    // The answer document (as a tree, or already rendered), or the error to answer with.
    struct Outcome {
        XmlNode root;
        Status error;
        std::string body;
        bool rendered = false;  // body holds the answer; root is unused
    };

    Outcome process(const HttpCall& call, const std::string& method, const FaultDecision& faults, Format format);
    Outcome login(const HttpCall& call);
    Outcome runMethod(const std::string& method, std::int64_t viewer, const HttpCall& call, Format format);

    Store& store_;
    SessionTable& sessions_;
    Faults& faults_;
    RequestLog& log_;
    const Options options_;  // constant after construction
};

}  // namespace emu
