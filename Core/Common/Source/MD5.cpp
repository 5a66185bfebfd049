#include "trelm/MD5.h"

#include <openssl/evp.h>

#include <cstdio>

namespace trelm {

MD5_CTX::~MD5_CTX() { EVP_MD_CTX_free(evp); }

void MD5Init(MD5_CTX* ctx) {
    if (ctx->evp == nullptr) {
        ctx->evp = EVP_MD_CTX_new();
    }
    EVP_DigestInit_ex(ctx->evp, EVP_md5(), nullptr);
}

void MD5Update(MD5_CTX* ctx, unsigned char const* data, unsigned length) { EVP_DigestUpdate(ctx->evp, data, length); }

void MD5Final(unsigned char digest[16], MD5_CTX* ctx) {
    unsigned int size = 0;
    EVP_DigestFinal_ex(ctx->evp, digest, &size);
    EVP_MD_CTX_free(ctx->evp);
    ctx->evp = nullptr;
}

String md5Hex(String const& text) {
    MD5_CTX ctx;
    MD5Init(&ctx);
    MD5Update(&ctx, reinterpret_cast<unsigned char const*>(text.cStr()), text.size());
    unsigned char digest[16];
    MD5Final(digest, &ctx);
    char hex[33];
    for (int i = 0; i < 16; ++i) std::snprintf(hex + 2 * i, 3, "%02x", digest[i]);
    return String(hex, 32);
}

}  // namespace trelm
