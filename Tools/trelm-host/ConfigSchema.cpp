#include "ConfigSchema.h"

#include <algorithm>
#include <vector>

namespace trelm {
namespace host {

namespace {

enum class Kind { Text, Flag, Integer, TextList };

struct KeySpec {
    char const* key;
    Kind kind;
    long long min = 0;
    long long max = 0;
};

struct Section {
    char const* name;
    std::vector<KeySpec> keys;
};

std::vector<Section> const& sections() {
    static std::vector<Section> const known = {
        {"http",
         {{"connect_to", Kind::TextList},
          {"ca_file", Kind::Text},
          {"connect_timeout_ms", Kind::Integer, 1, 600000},
          {"timeout_ms", Kind::Integer, 1, 3600000}}},
        {"runtime", {{"path", Kind::Text}}},
        {"@trelm.example:/facebooksource",
         {{"facebook_source_appkey", Kind::Text},
          {"facebook_source_appsecret", Kind::Text},
          {"facebook_source_login", Kind::Text},
          {"facebook_source_password", Kind::Text},
          {"facebook_source_session_id", Kind::Text},
          {"facebook_source_session_secret", Kind::Text},
          {"facebook_source_session_user", Kind::Text},
          {"wipeComponents", Kind::TextList},
          {"wakeupComponents", Kind::TextList},
          {"haveExtendedApi", Kind::Flag}}},
        {"@trelm.example:/facebookconnector",
         {{"facebook_polltime", Kind::Integer, 1, 86400},
          {"facebook_maxtime", Kind::Integer, 1, 7 * 86400},
          {"FacebookAppKey", Kind::Text},
          {"FacebookAppSecret", Kind::Text},
          {"FacebookLogin", Kind::Text},
          {"FacebookPassword", Kind::Text},
          {"FacebookID", Kind::Text}}},
    };
    return known;
}

Section const* find(std::string const& name) {
    for (Section const& s : sections()) {
        if (name == s.name) return &s;
    }
    return nullptr;
}

std::size_t distance(std::string const& a, std::string const& b) {
    std::vector<std::size_t> row(b.size() + 1);
    for (std::size_t j = 0; j <= b.size(); ++j) row[j] = j;
    for (std::size_t i = 1; i <= a.size(); ++i) {
        std::size_t diagonal = row[0];
        row[0] = i;
        for (std::size_t j = 1; j <= b.size(); ++j) {
            std::size_t const above = row[j];
            row[j] = std::min({row[j] + 1, row[j - 1] + 1, diagonal + (a[i - 1] == b[j - 1] ? 0 : 1)});
            diagonal = above;
        }
    }
    return row[b.size()];
}

std::string shown(Variant const& value) {
    String text;
    if (value.type() == Variant::StringList) return "a list";
    if (value.as(text).ok()) return "\"" + text.str() + "\"";
    return "a value of another type";
}

}  // namespace

std::string ConfigSchema::nearest(std::string const& section, std::string const& key) {
    Section const* s = find(section);
    if (s == nullptr) return {};
    std::string best;
    std::size_t bestDistance = 0;
    for (KeySpec const& spec : s->keys) {
        std::size_t const d = distance(key, spec.key);
        if (best.empty() || d < bestDistance) {
            best = spec.key;
            bestDistance = d;
        }
    }
    // Near enough to be a misspelling: a few edits, fewer than a third of the key.
    return bestDistance <= std::max<std::size_t>(2, best.size() / 3) ? best : std::string();
}

uError ConfigSchema::check(std::string const& section, Map<String, Variant> const& values, std::string const& origin,
                           std::string const& where) {
    Section const* s = find(section);
    if (s == nullptr) return TRELM_OK();
    for (auto const& [key, value] : values) {
        std::string const place = origin + ": " + where + "." + key.str();
        KeySpec const* spec = nullptr;
        for (KeySpec const& candidate : s->keys) {
            if (key.str() == candidate.key) spec = &candidate;
        }
        if (spec == nullptr) {
            std::string const near = nearest(section, key.str());
            std::string text = origin + ": " + where + ": unknown key \"" + key.str() + "\"";
            if (!near.empty()) {
                text += "; did you mean \"" + near + "\"?";
            } else {
                text += "; the keys known here are";
                char const* separator = " ";
                for (KeySpec const& known : s->keys) {
                    text += separator + std::string(known.key);
                    separator = ", ";
                }
            }
            return TRELM_ERROR_MSG(kInvalid, text);
        }
        switch (spec->kind) {
            case Kind::Text:
                if (value.type() != Variant::String) {
                    return TRELM_ERROR_MSG(kInvalid, place + " must be a text in quotes, not " + shown(value));
                }
                break;
            case Kind::Flag:
                if (value.type() != Variant::Bool) {
                    return TRELM_ERROR_MSG(kInvalid, place + " must be true or false, not " + shown(value));
                }
                break;
            case Kind::TextList:
                if (value.type() != Variant::StringList) {
                    return TRELM_ERROR_MSG(kInvalid, place + " must be a list of texts, not " + shown(value));
                }
                break;
            case Kind::Integer: {
                long long n = 0;
                bool const integer = value.type() == Variant::Int32 || value.type() == Variant::Int64;
                if (!integer || value.as(n).failed()) {
                    return TRELM_ERROR_MSG(kInvalid, place + " must be a whole number, not " + shown(value));
                }
                if (n < spec->min || n > spec->max) {
                    return TRELM_ERROR_MSG(kInvalid, place + " must be between " + std::to_string(spec->min) +
                                                         " and " + std::to_string(spec->max) + ", not " +
                                                         std::to_string(n));
                }
                break;
            }
        }
    }
    return TRELM_OK();
}

}  // namespace host
}  // namespace trelm
