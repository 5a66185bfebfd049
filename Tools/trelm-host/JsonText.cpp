#include "JsonText.h"

#include <ctime>

namespace trelm {
namespace host {

std::string jsonText(Json const& object) { return object.dump(-1, ' ', false, Json::error_handler_t::replace); }

void writeJsonLine(std::ostream& out, Json const& object) { out << jsonText(object) << '\n'; }

Json toJson(Vector<String> const& list) {
    Json array = Json::array();
    for (String const& s : list) array.push_back(s.str());
    return array;
}

Json toJson(Variant const& value) {
    switch (value.type()) {
        case Variant::Empty: return nullptr;
        case Variant::Bool: {
            bool b = false;
            value.as(b).ignore();  // the type was just checked
            return b;
        }
        case Variant::Int32:
        case Variant::Int64: return value.asInt64();
        case Variant::UInt32: return value.asUInt32();
        case Variant::IntList: {
            Vector<int> list;
            value.as(list).ignore();  // the type was just checked
            Json array = Json::array();
            for (int n : list) array.push_back(n);
            return array;
        }
        case Variant::StringList: {
            Vector<String> list;
            value.as(list).ignore();  // the type was just checked
            return toJson(list);
        }
        case Variant::String:
        case Variant::Guid: break;
    }
    return value.asString().str();
}

Json toJson(Map<String, Variant> const& fields) {
    Json object = Json::object();
    for (auto const& [key, value] : fields) object[key.str()] = toJson(value);
    return object;
}

std::string utcText(std::int64_t seconds) {
    std::time_t const time = static_cast<std::time_t>(seconds);
    std::tm parts{};
    if (gmtime_r(&time, &parts) == nullptr) return std::to_string(seconds);
    char text[32];
    std::strftime(text, sizeof text, "%Y-%m-%d %H:%M:%S", &parts);
    return text;
}

}  // namespace host
}  // namespace trelm
