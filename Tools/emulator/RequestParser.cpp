#include "RequestParser.h"

#include <map>
#include <optional>

namespace emu {
namespace {

int hexValue(char c) {
    if (c >= '0' && c <= '9') return c - '0';
    if (c >= 'a' && c <= 'f') return c - 'a' + 10;
    if (c >= 'A' && c <= 'F') return c - 'A' + 10;
    return -1;
}

std::string decode(std::string_view text) {
    std::string out;
    out.reserve(text.size());
    for (std::size_t i = 0; i < text.size(); ++i) {
        char const c = text[i];
        if (c == '+') {
            out += ' ';
        } else if (c == '%' && i + 2 < text.size() && hexValue(text[i + 1]) >= 0 && hexValue(text[i + 2]) >= 0) {
            out += static_cast<char>(hexValue(text[i + 1]) * 16 + hexValue(text[i + 2]));
            i += 2;
        } else {
            out += c;
        }
    }
    return out;
}

char lowerAscii(char c) { return c >= 'A' && c <= 'Z' ? static_cast<char>(c - 'A' + 'a') : c; }

std::string lower(std::string_view text) {
    std::string out(text);
    for (char& c : out) c = lowerAscii(c);
    return out;
}

std::string_view trim(std::string_view text) {
    const std::size_t first = text.find_first_not_of(" \t");
    if (first == std::string_view::npos) return {};
    return text.substr(first, text.find_last_not_of(" \t") - first + 1);
}

// The media type and the parameters of a header value such as
// `form-data; name="a"; filename="b;c.jpg"` (names lower-cased, quoted values unescaped).
struct HeaderValue {
    std::string type;
    std::map<std::string, std::string> params;
};

HeaderValue parseHeaderValue(std::string_view text) {
    HeaderValue out;
    std::size_t at = text.find(';');
    out.type = lower(trim(text.substr(0, at)));
    while (at != std::string_view::npos && at < text.size()) {
        ++at;  // past ';'
        const std::size_t equals = text.find_first_of("=;", at);
        if (equals == std::string_view::npos || text[equals] == ';') {
            at = equals;  // a parameter without a value
            continue;
        }
        const std::string name = lower(trim(text.substr(at, equals - at)));
        std::size_t i = equals + 1;
        while (i < text.size() && (text[i] == ' ' || text[i] == '\t')) ++i;
        std::string value;
        if (i < text.size() && text[i] == '"') {
            for (++i; i < text.size() && text[i] != '"'; ++i) {
                if (text[i] == '\\' && i + 1 < text.size()) ++i;
                value += text[i];
            }
            at = text.find(';', i);
        } else {
            at = text.find(';', i);
            value = std::string(trim(text.substr(i, at == std::string_view::npos ? std::string_view::npos : at - i)));
        }
        if (!name.empty()) out.params.emplace(name, std::move(value));
    }
    return out;
}

// One line of `text` from `at`, without its "\r\n" or "\n"; `at` moves past the line end.
// Returns nothing at the end of the text.
std::optional<std::string_view> nextLine(std::string_view text, std::size_t& at) {
    if (at >= text.size()) return std::nullopt;
    const std::size_t end = text.find('\n', at);
    std::string_view line = text.substr(at, end == std::string_view::npos ? std::string_view::npos : end - at);
    at = end == std::string_view::npos ? text.size() : end + 1;
    if (!line.empty() && line.back() == '\r') line.remove_suffix(1);
    return line;
}

}  // namespace

void RequestParser::addUrlEncoded(std::string_view text, HttpCall& call) {
    std::size_t start = 0;
    while (start <= text.size()) {
        std::size_t end = text.find('&', start);
        if (end == std::string_view::npos) end = text.size();
        const std::string_view pair = text.substr(start, end - start);
        const std::size_t equals = pair.find('=');
        std::string name = decode(pair.substr(0, equals));
        if (!name.empty())
            call.args[std::move(name)] =
                equals == std::string_view::npos ? std::string() : decode(pair.substr(equals + 1));
        start = end + 1;
    }
}

std::string RequestParser::boundaryOf(std::string_view contentType) {
    HeaderValue value = parseHeaderValue(contentType);
    if (value.type != "multipart/form-data") return {};
    auto it = value.params.find("boundary");
    return it == value.params.end() ? std::string() : it->second;
}

bool RequestParser::addBody(std::string_view contentType, std::string_view body, HttpCall& call) {
    const std::string type = parseHeaderValue(contentType).type;
    if (type == "application/x-www-form-urlencoded") {
        addUrlEncoded(body, call);
        return true;
    }
    if (type == "multipart/form-data") {
        const std::string boundary = boundaryOf(contentType);
        return !boundary.empty() && addMultipart(body, boundary, call);
    }
    return true;
}

bool RequestParser::addMultipart(std::string_view body, std::string_view boundary, HttpCall& call) {
    if (boundary.empty()) return false;
    const std::string delimiter = "--" + std::string(boundary);
    // The first delimiter opens a line: at the very start or after a preamble line.
    std::size_t at = 0;
    if (body.compare(0, delimiter.size(), delimiter) != 0) {
        const std::size_t found = body.find("\n" + delimiter);
        if (found == std::string_view::npos) return false;
        at = found + 1;
    }
    HttpCall parsed;
    const std::string nextDelimiter = "\n" + delimiter;
    for (;;) {
        at += delimiter.size();
        if (body.compare(at, 2, "--") == 0) break;  // the closing delimiter
        // The rest of the delimiter line (transport padding) is ignored.
        if (!nextLine(body, at)) return false;

        HeaderValue disposition;
        bool haveDisposition = false;
        for (;;) {
            const std::optional<std::string_view> line = nextLine(body, at);
            if (!line) return false;
            if (line->empty()) break;
            const std::size_t colon = line->find(':');
            if (colon == std::string_view::npos) continue;
            if (lower(trim(line->substr(0, colon))) == "content-disposition") {
                disposition = parseHeaderValue(line->substr(colon + 1));
                haveDisposition = true;
            }
        }
        const std::size_t end = body.find(nextDelimiter, at);
        if (end == std::string_view::npos) return false;
        std::string_view content = body.substr(at, end - at);
        if (!content.empty() && content.back() == '\r') content.remove_suffix(1);
        at = end + 1;

        if (!haveDisposition) continue;
        auto const& params = disposition.params;
        if (params.count("filename") != 0 || params.count("filename*") != 0) {
            if (!parsed.haveFile) {
                parsed.file = std::string(content);
                parsed.haveFile = true;
            }
            continue;
        }
        auto name = params.find("name");
        if (name != params.end() && !name->second.empty()) parsed.args[name->second] = std::string(content);
    }
    for (auto& [name, value] : parsed.args) call.args[name] = std::move(value);
    if (parsed.haveFile && !call.haveFile) {
        call.file = std::move(parsed.file);
        call.haveFile = true;
    }
    return true;
}

}  // namespace emu
