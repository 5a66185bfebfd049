#pragma once

#include <string>

#include "trelm/uError.h"

namespace trelm {
namespace host {

// What a user reads of an error: one line per level of the chain, outermost first, each with the
// level's own text, the code's meaning in words and the code itself, e.g.
//   the sign-in of facebook failed: the operation failed [0x80000001]
//     caused by: service error 100: Invalid parameter: not signed in or the session expired;
//     check facebook_source_login and facebook_source_password in the configuration file [0x8000001c]
// With `verbose`, each line also names the source file and line that made it. No trailing newline.
std::string describeError(uError const& error, bool verbose);

// The meaning of a code in words ("the service is unavailable"); a generic text for codes the
// system does not define.
char const* codeMeaning(unsigned code);

// What the user can do about a code, or "" when there is nothing general to say.
char const* codeRemedy(unsigned code);

}  // namespace host
}  // namespace trelm
