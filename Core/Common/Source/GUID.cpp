#include "trelm/GUID.h"

#include <pthread.h>
#include <uuid/uuid.h>

#include <atomic>
#include <cstdint>
#include <cstring>
#include <mutex>
#include <ostream>

namespace trelm {

namespace {

// Each libuuid draw costs a few microseconds (it re-stirs its fallback generator on every call),
// which made it the largest single cost of converting a page of new contacts. So a thread draws
// one value from libuuid as a seed and derives a block of identifiers from it: seed XOR a mix of
// a per-thread counter, with the low 32 bits of the counter kept unmixed in the last four bytes
// so that the identifiers of one block can never collide. Across blocks, threads and processes
// they are as unlikely to collide as independent random values.
//
// A forked child inherits the forking thread's block; the fork handler makes every thread of
// the child draw a fresh seed before its next identifier, so parent and child never share one.
constexpr unsigned kBlockSize = 256;

std::atomic<unsigned> forkGeneration{0};

void onForkChild() { forkGeneration.fetch_add(1, std::memory_order_relaxed); }

struct SeedBlock {
    std::uint64_t seed[2] = {0, 0};
    std::uint64_t counter = 0;
    unsigned left = 0;  // identifiers still to derive from this seed
    unsigned generation = 0;
};

// A bijection of 64-bit values (the splitmix64 finaliser) that spreads every input bit.
std::uint64_t mix(std::uint64_t z) {
    z = (z ^ (z >> 30)) * 0xbf58476d1ce4e5b9ull;
    z = (z ^ (z >> 27)) * 0x94d049bb133111ebull;
    return z ^ (z >> 31);
}

}  // namespace

GUID GUID::generate() {
    static std::once_flag registered;
    std::call_once(registered, [] { pthread_atfork(nullptr, nullptr, &onForkChild); });
    thread_local SeedBlock block;

    unsigned const generation = forkGeneration.load(std::memory_order_relaxed);
    if (block.left == 0 || block.generation != generation) {
        unsigned char raw[16];
        uuid_generate_random(raw);
        std::memcpy(block.seed, raw, sizeof raw);
        block.left = kBlockSize;
        block.generation = generation;
    }
    --block.left;
    std::uint64_t const c = block.counter++;
    std::uint64_t const words[2] = {
        block.seed[0] ^ mix(c),
        block.seed[1] ^ (mix(c ^ 0x9e3779b97f4a7c15ull) & ~std::uint64_t(0xffffffff)),
    };
    Bytes bytes;
    std::memcpy(bytes.data(), words, sizeof words);
    // The last four bytes: seed XOR the counter's low 32 bits, byte order fixed.
    std::uint32_t const low = static_cast<std::uint32_t>(c);
    for (int i = 0; i < 4; ++i) bytes[12 + i] ^= static_cast<unsigned char>(low >> (8 * i));
    bytes[6] = static_cast<unsigned char>((bytes[6] & 0x0f) | 0x40);  // version 4
    bytes[8] = static_cast<unsigned char>((bytes[8] & 0x3f) | 0x80);  // RFC 4122 variant
    return GUID(bytes);
}

uError GUID::fromString(String const& text, GUID& out) {
    // uuid_parse alone would also accept other lengths on some versions; check the shape first.
    if (text.size() != 36) return TRELM_ERROR(kInvalid);
    for (unsigned i = 0; i < 36; ++i) {
        char c = text[i];
        bool dash = i == 8 || i == 13 || i == 18 || i == 23;
        bool hex = (c >= '0' && c <= '9') || (c >= 'a' && c <= 'f') || (c >= 'A' && c <= 'F');
        if (dash ? c != '-' : !hex) return TRELM_ERROR(kInvalid);
    }
    Bytes bytes;
    if (uuid_parse(text.cStr(), bytes.data()) != 0) return TRELM_ERROR(kInvalid);
    out = GUID(bytes);
    return TRELM_OK();
}

String GUID::toString() const {
    char text[37];
    uuid_unparse_lower(bytes_.data(), text);
    return String(text);
}

bool GUID::isNull() const noexcept {
    for (unsigned char b : bytes_) {
        if (b != 0) return false;
    }
    return true;
}

std::ostream& operator<<(std::ostream& os, GUID const& g) { return os << g.toString().str(); }

}  // namespace trelm
