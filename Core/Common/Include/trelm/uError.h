#pragma once

#include <cstddef>
#include <iosfwd>
#include <memory>
#include <string>

#include "trelm/Export.h"

namespace trelm {

class String;

// Result codes. A code with the high bit set is a failure; kNoData (1) is not a failure: it
// means "no row", "skip this row" or "nothing more".
enum ErrorCode : unsigned {
    kSuccess = 0,
    kNoData = 1,
    kFailure = 0x80000001,
    kNotSupported = 0x80000002,
    kNotSet = 0x80000003,
    kInvalid = 0x80000004,
    kNotFound = 0x80000006,
    kResource = 0x80000008,
    kInnerStep = 0x80000009,
    kOutOfMemory = 0x80000010,
    kOutOfWindow = 0x80000011,
    kDataOpNotSupported = 0x8000001b,
    kNotSignedIn = 0x8000001c,
    kServiceError = 0x8000001d,
    kRequestLimit = 0x8000001e,
    kServiceUnavailable = 0x8000001f,
};

// The result of every framework and plug-in operation: a code, an optional message, the source
// location that made it and an optional cause (the error that led to this one).
//
// Build values with the macros at the end of this file (TRELM_OK, TRELM_ERROR, TRELM_WRAP,
// TRELM_ERROR_MSG) so that the location is stamped automatically.
//
// Lifetime: `file` must have static storage duration (a string literal or the macros' stamped
// path); it is kept as a pointer. The message is copied. The cause is shared between copies, so
// copying an uError is cheap.
// Thread safety: an uError is an immutable value; distinct threads may copy and read it freely.
class [[nodiscard, TRELM_API_ATTR]] uError {
public:
    // Success without a location.
    uError() noexcept = default;
    // Success made at file:line.
    uError(char const* file, int line) noexcept;
    // A result with `code` (normally a failure). `message` may be null or empty.
    uError(unsigned code, char const* message, char const* file, int line);
    // A result with `code` caused by `cause`.
    uError(unsigned code, uError const& cause, char const* message, char const* file, int line);
    // The same two with a message held in a String.
    uError(unsigned code, String const& message, char const* file, int line);
    uError(unsigned code, uError const& cause, String const& message, char const* file, int line);

    unsigned code() const noexcept { return code_; }
    // True when the high bit of the code is set.
    bool failed() const noexcept { return (code_ & 0x80000000u) != 0; }
    bool ok() const noexcept { return !failed(); }
    // Drops this result on purpose. Every call says beside it why nothing is to be done.
    void ignore() const noexcept {}

    String message() const;
    // Project-relative path without extension, e.g. "Core/Common/Source/Variant"; "" if unknown.
    char const* file() const noexcept { return file_ ? file_ : ""; }
    int line() const noexcept { return line_; }
    // The error this one wraps, or null.
    uError const* cause() const noexcept { return cause_.get(); }

    // Appends one line per level of the chain, outermost first, separated by '\n':
    //   "0x80000001 at Core/Libraries/trelmfacebook/loader:46"
    //   "  caused by 0x80000010 at Core/Common/Include/trelm/Map:70: message"
    // The message is appended after ": " when not empty. No trailing newline.
    void format(String & out) const;
    // format() into a fresh std::string.
    std::string toText() const;

private:
    unsigned code_ = kSuccess;
    int line_ = 0;
    char const* file_ = nullptr;
    std::string message_;
    std::shared_ptr<uError const> cause_;
};

// Prints toText(); lets test frameworks show the whole chain.
TRELM_API std::ostream& operator<<(std::ostream& os, uError const& e);

namespace detail {

#ifndef TRELM_SOURCE_ROOT
#define TRELM_SOURCE_ROOT ""
#endif

// The location text stamped into uError values: __FILE__ with the project's source root and the
// file extension removed, built at compile time into static storage.
template <std::size_t N>
struct SourcePath {
    char text[N] = {};

    consteval explicit SourcePath(char const (&file)[N]) {
        constexpr char const* root = TRELM_SOURCE_ROOT;
        std::size_t rootLen = 0;
        while (root[rootLen] != '\0') ++rootLen;
        std::size_t begin = 0;
        if (rootLen > 0 && rootLen < N - 1) {
            bool match = true;
            for (std::size_t i = 0; i < rootLen; ++i) {
                if (file[i] != root[i]) {
                    match = false;
                    break;
                }
            }
            if (match) {
                begin = rootLen;
                if (root[rootLen - 1] != '/' && file[begin] == '/') ++begin;
            }
        }
        // A build that compiles with relative paths (ccache's base_dir, for one) names files
        // "../../Core/..." from the build folder: the leading "./" and "../" steps are dropped.
        while (true) {
            if (begin + 3 <= N - 1 && file[begin] == '.' && file[begin + 1] == '.' && file[begin + 2] == '/') {
                begin += 3;
            } else if (begin + 2 <= N - 1 && file[begin] == '.' && file[begin + 1] == '/') {
                begin += 2;
            } else {
                break;
            }
        }
        std::size_t end = N - 1;
        for (std::size_t i = N - 1; i > begin; --i) {
            if (file[i - 1] == '/') break;
            if (file[i - 1] == '.') {
                end = i - 1;
                break;
            }
        }
        std::size_t out = 0;
        for (std::size_t i = begin; i < end; ++i) text[out++] = file[i];
        text[out] = '\0';
    }
};

}  // namespace detail
}  // namespace trelm

// The stamped location of the current source file (static storage).
#define TRELM_SOURCE_FILE                                                                   \
    ([]() noexcept -> char const* {                                                         \
        static constexpr ::trelm::detail::SourcePath<sizeof(__FILE__)> trelmPath(__FILE__); \
        return trelmPath.text;                                                              \
    }())

#define TRELM_OK() ::trelm::uError(TRELM_SOURCE_FILE, __LINE__)
#define TRELM_ERROR(code) ::trelm::uError((code), "", TRELM_SOURCE_FILE, __LINE__)
#define TRELM_ERROR_MSG(code, msg) ::trelm::uError((code), (msg), TRELM_SOURCE_FILE, __LINE__)
#define TRELM_WRAP(code, cause) ::trelm::uError((code), (cause), "", TRELM_SOURCE_FILE, __LINE__)
#define TRELM_WRAP_MSG(code, cause, msg) ::trelm::uError((code), (cause), (msg), TRELM_SOURCE_FILE, __LINE__)

// Evaluates an uError expression once and returns it, unchanged (cause and location kept), from
// the enclosing function when it failed. A success, kNoData included, falls through.
#define TRELM_RETURN_IF_ERROR(...)                                    \
    do {                                                              \
        ::trelm::uError trelmReturnIfError_ = (__VA_ARGS__);          \
        if (trelmReturnIfError_.failed()) return trelmReturnIfError_; \
    } while (0)

#include "trelm/String.h"
