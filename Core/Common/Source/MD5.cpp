#include "trelm/MD5.h"

#include <openssl/evp.h>

namespace trelm {

namespace {

// The MD5 implementation, looked up in OpenSSL's providers once for the process: with
// EVP_md5() every EVP_DigestInit_ex looks it up again. Falls back to EVP_md5() when the fetch
// fails (the digest then works as before, only slower). Kept for the life of the process.
EVP_MD const* md5Digest() {
    static EVP_MD const* const digest = [] {
        EVP_MD const* fetched = EVP_MD_fetch(nullptr, "MD5", nullptr);
        return fetched != nullptr ? fetched : EVP_md5();
    }();
    return digest;
}

}  // namespace

MD5_CTX::~MD5_CTX() { EVP_MD_CTX_free(evp); }

void MD5Init(MD5_CTX* ctx) {
    if (ctx->evp == nullptr) {
        ctx->evp = EVP_MD_CTX_new();
    }
    EVP_DigestInit_ex(ctx->evp, md5Digest(), nullptr);
}

void MD5Update(MD5_CTX* ctx, unsigned char const* data, unsigned length) { EVP_DigestUpdate(ctx->evp, data, length); }

void MD5Final(unsigned char digest[16], MD5_CTX* ctx) {
    unsigned int size = 0;
    EVP_DigestFinal_ex(ctx->evp, digest, &size);
}

String MD5FinalHex(MD5_CTX* ctx) {
    unsigned char digest[16];
    MD5Final(digest, ctx);
    static constexpr char kHex[] = "0123456789abcdef";
    char hex[32];
    for (int i = 0; i < 16; ++i) {
        hex[2 * i] = kHex[digest[i] >> 4];
        hex[2 * i + 1] = kHex[digest[i] & 0x0f];
    }
    return String(hex, 32);
}

String md5Hex(String const& text) {
    // The call's own context: a thread-local one would be freed after OpenSSL's clean-up at exit.
    MD5_CTX ctx;
    MD5Init(&ctx);
    MD5Update(&ctx, reinterpret_cast<unsigned char const*>(text.cStr()), text.size());
    return MD5FinalHex(&ctx);
}

}  // namespace trelm
