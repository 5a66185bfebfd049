#include "Signature.h"

#include <memory>
#include <stdexcept>

#include <openssl/evp.h>

namespace emu {

std::string Signature::md5Hex(const std::string& data) {
    unsigned char digest[EVP_MAX_MD_SIZE];
    unsigned int length = 0;
    if (EVP_Digest(data.data(), data.size(), digest, &length, EVP_md5(), nullptr) != 1)
        throw std::runtime_error("MD5 is not available");
    static constexpr char hex[] = "0123456789abcdef";
    std::string out;
    out.reserve(length * 2);
    for (unsigned int i = 0; i < length; ++i) {
        out += hex[digest[i] >> 4];
        out += hex[digest[i] & 0x0f];
    }
    return out;
}

std::string Signature::compute(const Arguments& args, const std::string& secret) {
    std::string text;
    for (const auto& [key, value] : args) {
        if (key == "sig") continue;
        text += key;
        text += '=';
        text += value;
    }
    text += secret;
    return md5Hex(text);
}

bool Signature::matches(const Arguments& args, const std::string& secret) {
    auto it = args.find("sig");
    return it != args.end() && it->second == compute(args, secret);
}

}  // namespace emu
