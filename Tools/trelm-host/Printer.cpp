#include "Printer.h"

#include <algorithm>
#include <cstddef>

#include <nlohmann/json.hpp>

namespace trelm {
namespace host {

namespace {

using json = nlohmann::ordered_json;

json toJson(Vector<String> const& list) {
    json array = json::array();
    for (String const& s : list) array.push_back(s.str());
    return array;
}

std::string joined(Vector<String> const& list, char const* separator, char const* none) {
    if (list.empty()) return none;
    std::string text;
    for (String const& s : list) {
        if (!text.empty()) text += separator;
        text += s.str();
    }
    return text;
}

// Texts from plug-ins are byte strings; replacing invalid UTF-8 keeps every line valid JSON.
void writeLine(std::ostream& out, json const& object) {
    out << object.dump(-1, ' ', false, json::error_handler_t::replace) << '\n';
}

std::string stateOf(ComponentHost::Instance const& instance) {
    if (instance.component == nullptr) return "not created";
    return Printer::stateName(instance.component->state());
}

}  // namespace

Printer::Printer(Format format, std::ostream& out) : format_(format), out_(out) {}

bool Printer::parseFormat(std::string const& text, Format& out) {
    if (text == "table") {
        out = Format::Table;
    } else if (text == "json") {
        out = Format::JsonLines;
    } else {
        return false;
    }
    return true;
}

char const* Printer::stateName(Component::State state) {
    switch (state) {
        case Component::State::Created: return "created";
        case Component::State::Configured: return "configured";
        case Component::State::Started: return "started";
        case Component::State::Stopped: return "stopped";
        case Component::State::ShutDown: return "shut down";
    }
    return "unknown";
}

void Printer::plugin(PluginLoader::Plugin const& plugin) {
    if (format_ == Format::JsonLines) {
        writeLine(out_, {{"type", "plugin"}, {"path", plugin.path}, {"components", toJson(plugin.ids)}});
        return;
    }
    out_ << "plug-in   " << plugin.path << '\n';
    for (String const& id : plugin.ids) out_ << "  offers  " << id << '\n';
}

void Printer::endpoint(bool emulator, Vector<String> const& connectTo, String const& caFile) {
    if (format_ == Format::JsonLines) {
        writeLine(out_, {{"type", "endpoint"},
                         {"emulator", emulator},
                         {"connect_to", toJson(connectTo)},
                         {"ca_file", caFile.str()}});
        return;
    }
    out_ << "endpoint  " << (emulator ? "embedded emulator" : "as configured") << '\n';
    out_ << "  route   " << joined(connectTo, ", ", "(direct)") << '\n';
    if (!caFile.empty()) out_ << "  CA      " << caFile << '\n';
}

void Printer::component(ComponentHost::Instance const& instance) {
    if (format_ == Format::Table) {
        pending_.push_back(instance);
        return;
    }
    json error = nullptr;
    if (instance.error.failed()) error = instance.error.toText();
    writeLine(out_, {{"type", "component"},
                     {"name", instance.name.str()},
                     {"id", instance.id.str()},
                     {"state", stateOf(instance)},
                     {"restored", toJson(instance.restored)},
                     {"error", error}});
}

void Printer::state(String const& tag, char const* action, Vector<String> const& keys) {
    if (format_ == Format::JsonLines) {
        writeLine(out_, {{"type", "state"}, {"tag", tag.str()}, {"action", action}, {"keys", toJson(keys)}});
        return;
    }
    out_ << action << "  " << tag << "  " << joined(keys, ", ", "-") << '\n';
}

void Printer::finish() {
    if (format_ == Format::Table && !pending_.empty()) {
        std::vector<std::vector<std::string>> rows{{"NAME", "ID", "STATE", "RESTORED"}};
        for (auto const& instance : pending_) {
            rows.push_back({instance.name.str(), instance.id.str(), stateOf(instance),
                            joined(instance.restored, ",", "-")});
        }
        std::vector<std::size_t> width(rows.front().size(), 0);
        for (auto const& row : rows) {
            for (std::size_t c = 0; c < row.size(); ++c) width[c] = std::max(width[c], row[c].size());
        }
        for (auto const& row : rows) {
            std::string line;
            for (std::size_t c = 0; c < row.size(); ++c) {
                line += row[c];
                if (c + 1 < row.size()) line += std::string(width[c] - row[c].size() + 2, ' ');
            }
            out_ << line << '\n';
        }
    }
    pending_.clear();
    out_.flush();
}

}  // namespace host
}  // namespace trelm
