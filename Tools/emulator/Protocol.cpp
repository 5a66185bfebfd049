#include "Protocol.h"

#include <chrono>
#include <cstring>
#include <exception>
#include <iostream>
#include <thread>

#include "JsonAnswerWriter.h"
#include "Utf8Text.h"
#include "XmlAnswerWriter.h"

namespace emu {
namespace {

constexpr const char* kPrefix = "facebook.";
constexpr const char* kHidden = "***";

std::string arg(const HttpCall& call, const char* name) {
    auto it = call.args.find(name);
    return it == call.args.end() ? std::string() : it->second;
}

bool has(const HttpCall& call, const char* name) { return call.args.count(name) != 0; }

ServiceError serviceError(int code) { return ServiceError{code, Protocol::errorText(code)}; }

// A method's arguments with the secret one hidden, for error documents and the log.
Arguments visibleArgs(const Arguments& args) {
    Arguments out = args;
    auto it = out.find("password");
    if (it != out.end()) it->second = kHidden;
    return out;
}

// A document that starts like the real answer and then breaks: the parser reads some elements
// before it meets the fault, as it would on a garbled transfer.
std::string malform(const std::string& body) {
    return body.substr(0, body.size() * 2 / 3) + "<</ broken&;>\n";
}

// The answer in `format`, written by `fn` into the writer it is given.
template <typename Fn>
std::string render(Protocol::Format format, std::size_t sizeHint, Fn&& fn) {
    if (format == Protocol::Format::Json) {
        JsonAnswerWriter writer(sizeHint);
        fn(static_cast<AnswerWriter&>(writer));
        return writer.take();
    }
    XmlAnswerWriter writer(sizeHint);
    fn(static_cast<AnswerWriter&>(writer));
    return writer.take();
}

// Whether `bytes` start like an image of a format the service took: JPEG, PNG, GIF, BMP, TIFF,
// PSD, JPEG 2000 or IFF.
bool looksLikeImage(const std::string& bytes) {
    auto startsWith = [&](const char* magic, std::size_t length) {
        return bytes.size() >= length && std::memcmp(bytes.data(), magic, length) == 0;
    };
    return startsWith("\xFF\xD8\xFF", 3) || startsWith("\x89PNG\r\n\x1A\n", 8) || startsWith("GIF87a", 6) ||
           startsWith("GIF89a", 6) || (startsWith("BM", 2) && bytes.size() >= 26) || startsWith("II*\0", 4) ||
           startsWith("MM\0*", 4) || startsWith("8BPS", 4) || startsWith("\0\0\0\x0CjP  ", 8) ||
           (startsWith("FORM", 4) && bytes.size() >= 12 &&
            (bytes.compare(8, 4, "ILBM") == 0 || bytes.compare(8, 4, "PBM ") == 0));
}

using Runner = Status (*)(Store&, std::int64_t viewer, const HttpCall&, XmlNode& root);
// A method that writes its rows straight into the answer text, inside the open root.
using Streamer = Status (*)(Store&, std::int64_t viewer, const HttpCall&, AnswerWriter& root);

struct MethodEntry {
    const char* name;
    bool listRoot;
    const char* required;  // a parameter without which the call is invalid (100), or null
    Runner run;
    Streamer stream = nullptr;  // used instead of run when set
};

// Session methods. auth.login, the one application method, is answered by the protocol itself.
const MethodEntry kMethods[] = {
    {"fql.query", true, "query", nullptr,
     [](Store& s, std::int64_t v, const HttpCall& c, AnswerWriter& w) { return s.fqlQuery(v, arg(c, "query"), w); }},
    {"stream.get", false, nullptr,
     [](Store& s, std::int64_t v, const HttpCall& c, XmlNode& r) {
         return s.streamGet(v, arg(c, "viewer_id"), arg(c, "start_time"), arg(c, "end_time"), arg(c, "limit"), r);
     }},
    {"mailbox.getInbox", false, nullptr,
     [](Store& s, std::int64_t v, const HttpCall& c, XmlNode& r) {
         return s.getInbox(v, arg(c, "start"), arg(c, "limit"), r);
     }},
    {"mailbox.getThreadMessages", false, "tid",
     [](Store& s, std::int64_t v, const HttpCall& c, XmlNode& r) {
         return s.getThreadMessages(v, arg(c, "tid"), arg(c, "start"), arg(c, "limit"), r);
     }},
    {"users.setStatus", false, nullptr,
     [](Store& s, std::int64_t v, const HttpCall& c, XmlNode& r) {
         return s.setStatus(v, arg(c, "status"), arg(c, "status_includes_verb"), arg(c, "clear"), r);
     }},
    {"photos.upload", false, nullptr,
     [](Store& s, std::int64_t v, const HttpCall& c, XmlNode& r) -> Status {
         if (c.haveFile && !c.file.empty() && !looksLikeImage(c.file)) return serviceError(324);
         return s.uploadPhoto(v, arg(c, "aid"), arg(c, "caption"), c.file, c.haveFile, r);
     }},
    {"users.getInfo", true, "uids",
     [](Store& s, std::int64_t v, const HttpCall& c, XmlNode& r) {
         return s.usersGetInfo(v, arg(c, "uids"), arg(c, "fields"), r);
     }},
    {"friends.get", true, nullptr,
     [](Store& s, std::int64_t v, const HttpCall& c, XmlNode& r) { return s.friendsGet(v, arg(c, "uid"), r); }},
};

const MethodEntry* findMethod(const std::string& name) {
    for (const MethodEntry& m : kMethods)
        if (name == m.name) return &m;
    return nullptr;
}

}  // namespace

Protocol::Protocol(Store& store, SessionTable& sessions, Faults& faults, RequestLog& log, Options options)
    : store_(store), sessions_(sessions), faults_(faults), log_(log), options_(options) {}

std::string Protocol::errorText(int code) {
    switch (code) {
        case 1: return "An unknown error occurred";
        case 2: return "Service temporarily unavailable";
        case 3: return "Unknown method";
        case 4: return "Application request limit reached";
        case 8: return "This method must be called over HTTPS";
        case 100: return "Invalid parameter";
        case 101: return "Invalid API key";
        case 102: return "Session key invalid or no longer valid";
        case 103: return "Call_id must be greater than previous";
        case 104: return "Incorrect signature";
        case 120: return "Invalid album id";
        case 121: return "Invalid photo id";
        case 321: return "Album is full";
        case 324: return "Missing or invalid image file";
        default: return "An unknown error occurred";
    }
}

std::string Protocol::responseRoot(const std::string& method) {
    std::string root = method.rfind(kPrefix, 0) == 0 ? method.substr(9) : method;
    for (char& c : root)
        if (c == '.') c = '_';
    return root + "_response";
}

Protocol::Format Protocol::formatOf(const Arguments& args) {
    auto it = args.find("format");
    if (it == args.end() || it->second.size() != 4) return Format::Xml;
    std::string lower = it->second;
    for (char& c : lower) c = static_cast<char>(c >= 'A' && c <= 'Z' ? c - 'A' + 'a' : c);
    return lower == "json" ? Format::Json : Format::Xml;
}

const char* Protocol::contentType(Format format) {
    return format == Format::Json ? "application/json; charset=utf-8" : "text/xml; charset=utf-8";
}

std::string Protocol::errorDocument(const ServiceError& error, const Arguments& args, Format format) {
    const Arguments shown = visibleArgs(args);
    std::size_t size = 256;
    for (const auto& [key, value] : shown) size += key.size() + value.size() + 40;
    return render(format, size, [&](AnswerWriter& w) {
        w.open("error_response", false);
        w.number("error_code", error.code);
        w.leaf("error_msg", error.message);
        w.open("request_args", true);
        for (const auto& [key, value] : shown) {
            w.open("arg", false);
            w.leaf("key", key);
            w.leaf("value", value);
            w.close();
        }
        w.close();
        w.close();
    });
}

HttpReply Protocol::handle(const HttpCall& call) {
    const std::string sent = arg(call, "method");
    const std::string method = sent.rfind(kPrefix, 0) == 0 ? sent.substr(9) : sent;
    const FaultDecision faults = faults_.decide(method);
    const Format format = formatOf(call.args);

    LoggedRequest entry;
    const bool logging = log_.enabled();
    if (logging) {
        entry.method = sent;
        entry.args = visibleArgs(call.args);
        if (method == "fql.query") entry.fql = arg(call, "query");
        entry.https = call.https;
        entry.hadFile = call.haveFile;
        entry.fileSize = call.file.size();
    }
    auto finish = [&](HttpReply reply, int errorCode, const char* fault) {
        if (logging) {
            entry.errorCode = errorCode;
            entry.httpStatus = reply.delivery == HttpReply::Delivery::Dropped ? 0 : reply.status;
            entry.fault = fault;
            log_.add(std::move(entry));
        }
        return reply;
    };

    if (faults.delayMs > 0) std::this_thread::sleep_for(std::chrono::milliseconds(faults.delayMs));
    if (faults.drop) return finish(HttpReply{0, {}, {}, HttpReply::Delivery::Dropped}, 0, "drop");
    if (faults.httpStatus != 0)
        return finish(HttpReply{faults.httpStatus, "The service is not answering right now.\n", "text/plain",
                                HttpReply::Delivery::Whole},
                      0, "http_status");

    Outcome outcome;
    try {
        outcome = process(call, method, faults, format);
    } catch (const std::exception& e) {
        // An emulator fault, not a service error: said on stderr and in the request log, so that
        // nobody takes the code-1 answer below for the service's behaviour.
        std::cerr << "trelm-emulator: internal error in \"" << method << "\": " << e.what() << "\n";
        if (logging) entry.internalError = e.what();
        outcome.error = serviceError(1);
    }
    HttpReply reply;
    reply.contentType = contentType(format);
    int errorCode = 0;
    if (outcome.error) {
        errorCode = outcome.error->code;
        if (outcome.error->message.empty()) outcome.error->message = errorText(errorCode);
        reply.body = errorDocument(*outcome.error, call.args, format);
    } else if (outcome.rendered) {
        reply.body = std::move(outcome.body);
    } else {
        reply.body = render(format, 1024, [&](AnswerWriter& w) { w.write(outcome.root); });
    }
    if (faults.truncate) {
        reply.delivery = HttpReply::Delivery::Truncated;
        return finish(std::move(reply), errorCode, "truncate");
    }
    if (faults.malformed) {
        reply.body = malform(reply.body);
        return finish(std::move(reply), errorCode, "malformed");
    }
    return finish(std::move(reply), errorCode, "");
}

Protocol::Outcome Protocol::process(const HttpCall& call, const std::string& method, const FaultDecision& faults,
                                    Format format) {
    auto fail = [](int code) {
        Outcome out;
        out.error = serviceError(code);
        return out;
    };

    const auto appSecret = has(call, "api_key") ? store_.appSecret(arg(call, "api_key")) : std::nullopt;
    if (!appSecret) return fail(101);
    if (faults.rateLimited) return fail(4);
    if (method.empty()) return fail(3);

    const bool isLogin = method == "auth.login";
    const MethodEntry* entry = findMethod(method);
    const std::string sessionKey = arg(call, "session_key");
    if (entry != nullptr && sessionKey.empty()) return fail(102);

    // A call that presents a session is checked against it whatever the method, so that its
    // signature can be checked with the session's secret.
    std::optional<Session> session;
    if (!sessionKey.empty()) {
        SessionTable::Lookup lookup = sessions_.use(sessionKey);
        if (lookup.check != SessionTable::Check::Valid) return fail(102);
        if (faults.expireAfter > 0 && lookup.calls > faults.expireAfter) {
            sessions_.remove(sessionKey);
            return fail(102);
        }
        session = lookup.session;
    }

    if (!Signature::matches(call.args, session ? session->secret : *appSecret)) return fail(104);
    if (session && options_.strictCallId && !sessions_.acceptCallId(sessionKey, arg(call, "call_id")))
        return fail(103);
    if (entry == nullptr && !isLogin) return fail(3);
    if (faults.errorCode != 0) return fail(faults.errorCode);

    if (isLogin) {
        if (!call.https) return fail(8);
        return login(call);
    }
    if (entry->required != nullptr && arg(call, entry->required).empty()) return fail(100);
    // The method sees its texts as the service kept them: valid UTF-8 that XML can carry. The
    // signature above was checked over the bytes as sent.
    bool clean = true;
    for (const auto& [name, value] : call.args) clean = clean && Utf8Text::isClean(value);
    if (clean) return runMethod(method, session->uid, call, format);
    HttpCall cleaned;
    cleaned.file = call.file;
    cleaned.haveFile = call.haveFile;
    cleaned.https = call.https;
    for (const auto& [name, value] : call.args) cleaned.args.emplace(name, Utf8Text::clean(value));
    return runMethod(method, session->uid, cleaned, format);
}

Protocol::Outcome Protocol::login(const HttpCall& call) {
    Outcome out;
    const std::string email = arg(call, "email");
    const std::string password = arg(call, "password");
    if (email.empty() || password.empty()) {
        out.error = serviceError(100);
        return out;
    }
    const auto uid = store_.checkLogin(email, password);
    if (!uid) {
        out.error = serviceError(100);
        return out;
    }
    const Session s = sessions_.create(*uid, options_.sessionLifetimeSeconds);
    out.root.name = "auth_login_response";
    out.root.add("session_key", s.key);
    out.root.add("uid", std::to_string(s.uid));
    out.root.add("secret", s.secret);
    out.root.add("expires", std::to_string(s.expires));
    return out;
}

Protocol::Outcome Protocol::runMethod(const std::string& method, std::int64_t viewer, const HttpCall& call,
                                      Format format) {
    const MethodEntry* entry = findMethod(method);
    Outcome out;
    if (entry->stream != nullptr) {
        out.body = render(format, 16 * 1024, [&](AnswerWriter& w) {
            w.open(responseRoot(method), entry->listRoot);
            out.error = entry->stream(store_, viewer, call, w);
            w.close();
        });
        out.rendered = !out.error;
        return out;
    }
    out.root.name = responseRoot(method);
    out.root.list = entry->listRoot;
    out.error = entry->run(store_, viewer, call, out.root);
    return out;
}

}  // namespace emu
