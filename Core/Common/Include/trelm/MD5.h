#pragma once

#include <openssl/types.h>

#include "trelm/Export.h"
#include "trelm/String.h"

namespace trelm {

// An MD5 computation in progress (RFC 1321, computed by OpenSSL's EVP interface).
// Owns its EVP context: the first MD5Init allocates it, the destructor releases it; a context
// may be started again with MD5Init after MD5Final, reusing its allocation.
// Not copyable. Not thread-safe: one context per thread.
struct TRELM_API MD5_CTX {
    MD5_CTX() = default;
    ~MD5_CTX();
    MD5_CTX(MD5_CTX const&) = delete;
    MD5_CTX& operator=(MD5_CTX const&) = delete;

    EVP_MD_CTX* evp = nullptr;
};

// Starts a new digest in ctx (dropping one in progress).
TRELM_API void MD5Init(MD5_CTX* ctx);
// Adds `length` bytes. REQUIRES: MD5Init was called.
TRELM_API void MD5Update(MD5_CTX* ctx, unsigned char const* data, unsigned length);
// Writes the 16-byte digest and ends the computation. REQUIRES: MD5Init was called.
TRELM_API void MD5Final(unsigned char digest[16], MD5_CTX* ctx);
// As MD5Final, the digest as 32 lowercase hexadecimal digits.
TRELM_API String MD5FinalHex(MD5_CTX* ctx);

// The MD5 of the bytes of text as 32 lowercase hexadecimal digits.
TRELM_API String md5Hex(String const& text);

}  // namespace trelm
