// Reads a request's arguments and its file from the query string and the body, the way the
// service's front end did.
#pragma once

#include <string>
#include <string_view>

#include "Server.h"

namespace emu {

// Arguments are merged in order: query string, then body; a later pair wins for a repeated name.
// Texts are kept as the client's bytes (binary and invalid UTF-8 included): the signature is
// computed over them.
//
// Stateless; every member may be called from any thread.
class RequestParser {
public:
    // Adds the pairs of `text` ("a=1&b=x%20y+z") to `call.args`. '+' is a blank, "%XX" a byte;
    // a '%' not followed by two hex digits stays as it is. A pair without '=' has an empty value;
    // a pair with an empty name is skipped.
    static void addUrlEncoded(std::string_view text, HttpCall& call);

    // Adds a body of `contentType`: url-encoded pairs for "application/x-www-form-urlencoded",
    // the parts of "multipart/form-data"; any other type adds nothing. Returns false, adding
    // nothing, for a multipart body that is not what its type announces (no boundary, no
    // opening or closing delimiter): the front end then saw no arguments in the body at all.
    static bool addBody(std::string_view contentType, std::string_view body, HttpCall& call);

    // The parts of a multipart body. A part whose Content-Disposition has a "filename" parameter
    // is a file, whatever its "name" (or none): the first one becomes `call.file`, the others are
    // dropped, and none is an argument. Any other part with a "name" is an argument; a part with
    // neither is dropped.
    static bool addMultipart(std::string_view body, std::string_view boundary, HttpCall& call);

    // The "boundary" parameter of a "multipart/form-data" content type, quoted or not; empty when
    // the type is another one or has none.
    static std::string boundaryOf(std::string_view contentType);
};

}  // namespace emu
