// The request signature of the REST service.
#pragma once

#include <map>
#include <string>

namespace emu {

// A request's arguments by name. std::map orders keys by byte value, the order the signature uses.
using Arguments = std::map<std::string, std::string>;

// Computes and checks request signatures. Stateless; thread safe.
class Signature {
public:
    // MD5 (lower-case hex) of every "key=value" except "sig", in key order, concatenated without
    // separators, followed by `secret`. Values are the decoded texts the client sent.
    static std::string compute(const Arguments& args, const std::string& secret);

    // True when args["sig"] equals compute(args, secret) exactly (an upper-case hex digest fails,
    // as it did on the service).
    static bool matches(const Arguments& args, const std::string& secret);

    // Lower-case hex MD5 of `data`.
    static std::string md5Hex(const std::string& data);
};

}  // namespace emu
