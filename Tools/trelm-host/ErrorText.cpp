#include "ErrorText.h"

#include <cstdio>

#include "trelm/String.h"
#include "TerminalText.h"

namespace trelm {
namespace host {

char const* codeMeaning(unsigned code) {
    switch (code) {
        case kSuccess: return "success";
        case kNoData: return "no data";
        case kFailure: return "the operation failed";
        case kNotSupported: return "this is not supported";
        case kNotSet: return "a required setting is missing";
        case kInvalid: return "an argument or setting is not valid";
        case kNotFound: return "not found";
        case kResource: return "a system resource could not be had";
        case kInnerStep: return "an inner step failed";
        case kOutOfMemory: return "out of memory";
        case kOutOfWindow: return "outside the current window of rows";
        case kDataOpNotSupported: return "the data source does not offer this operation";
        case kNotSignedIn: return "not signed in or the session expired";
        case kServiceError: return "the service refused the request";
        case kRequestLimit: return "the service's request limit was reached";
        case kServiceUnavailable: return "the service is unavailable";
        default: return (code & 0x80000000u) != 0 ? "an unknown failure" : "an unknown result";
    }
}

char const* codeRemedy(unsigned code) {
    switch (code) {
        case kNotSet: return "add it to the configuration file";
        case kNotSignedIn:
            return "check facebook_source_login and facebook_source_password in the configuration file";
        case kServiceError: return "the service's own code and text, where it gave them, say why";
        case kRequestLimit: return "wait a while and try again";
        case kServiceUnavailable: return "try again later";
        case kOutOfMemory: return "free memory and try again";
        default: return "";
    }
}

std::string describeError(uError const& error, bool verbose) {
    std::string out;
    int depth = 0;
    for (uError const* level = &error; level != nullptr; level = level->cause(), ++depth) {
        if (depth > 0) out += "\n  caused by: ";
        std::string const message = level->message().str();
        if (!message.empty()) out += terminalText(message) + ": ";
        out += codeMeaning(level->code());
        // The remedy belongs to the innermost level that has one: that is where the cause is.
        char const* remedy = codeRemedy(level->code());
        bool deeperRemedy = false;
        for (uError const* inner = level->cause(); inner != nullptr; inner = inner->cause()) {
            deeperRemedy = deeperRemedy || *codeRemedy(inner->code()) != '\0';
        }
        if (*remedy != '\0' && !deeperRemedy) out += std::string("; ") + remedy;
        char code[16];
        std::snprintf(code, sizeof code, "0x%08x", level->code());
        out += std::string(" [") + code + "]";
        if (verbose && *level->file() != '\0') out += std::string(" at ") + level->file() + ":" + std::to_string(level->line());
    }
    return out;
}

}  // namespace host
}  // namespace trelm
