// The emulator's request reading: the input's first line is the Content-Type, the second the query
// string, the rest the body. Whatever the bytes, reading must not fail, and the error document that
// echoes the arguments must be well-formed in XML and in JSON.
#include <cstddef>
#include <cstdint>
#include <string_view>

#include "Protocol.h"
#include "RequestParser.h"
#include "WellFormed.h"

extern "C" int LLVMFuzzerTestOneInput(std::uint8_t const* data, std::size_t size) {
    std::string_view input(reinterpret_cast<char const*>(data), size);
    auto line = [&input] {
        const std::size_t end = input.find('\n');
        const std::string_view first = input.substr(0, end);
        input.remove_prefix(end == std::string_view::npos ? input.size() : end + 1);
        return first;
    };
    const std::string_view contentType = line();
    const std::string_view query = line();

    emu::HttpCall call;
    emu::RequestParser::addUrlEncoded(query, call);
    bool const read = emu::RequestParser::addBody(contentType, input, call);
    if (!call.haveFile && !call.file.empty()) __builtin_trap();  // a file only comes with its flag
    (void)read;
    const emu::ServiceError error{104, "Incorrect signature"};
    fuzz::requireXml(emu::Protocol::errorDocument(error, call.args, emu::Protocol::Format::Xml));
    fuzz::requireJson(emu::Protocol::errorDocument(error, call.args, emu::Protocol::Format::Json));
    return 0;
}
