#include "Printer.h"

#include <algorithm>
#include <cstddef>
#include <cstdio>

#include "JsonText.h"
#include "TerminalText.h"

namespace trelm {
namespace host {

void writeTable(std::ostream& out, std::vector<std::vector<std::string>> const& rows) {
    std::vector<std::vector<std::string>> cells;
    std::vector<std::size_t> width;
    for (auto const& row : rows) {
        std::vector<std::string>& shown = cells.emplace_back();
        for (std::string const& cell : row) shown.push_back(terminalText(cell));
        width.resize(std::max(width.size(), shown.size()), 0);
        for (std::size_t c = 0; c < shown.size(); ++c) width[c] = std::max(width[c], shown[c].size());
    }
    for (auto const& row : cells) {
        std::string line;
        for (std::size_t c = 0; c < row.size(); ++c) {
            line += row[c];
            if (c + 1 < row.size()) line += std::string(width[c] - row[c].size() + 2, ' ');
        }
        out << line << '\n';
    }
}

namespace {

using json = Json;

std::string joined(Vector<String> const& list, char const* separator, char const* none) {
    if (list.empty()) return none;
    std::string text;
    for (String const& s : list) {
        if (!text.empty()) text += separator;
        text += s.str();
    }
    return text;
}

// One "key  value" line per field, the values in one column.
void writeFields(std::ostream& out, Map<String, Variant> const& fields) {
    std::size_t width = 0;
    for (auto const& [key, value] : fields) {
        (void)value;
        width = std::max<std::size_t>(width, key.size());
    }
    for (auto const& [key, value] : fields) {
        out << "  " << terminalText(key.view()) << std::string(width - key.size() + 2, ' ')
            << terminalText(value.toString().view()) << '\n';
    }
}

std::string hex(unsigned code) {
    char text[16];
    std::snprintf(text, sizeof text, "0x%08x", code);
    return text;
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
        writeJsonLine(out_, {{"type", "plugin"}, {"path", plugin.path}, {"components", toJson(plugin.ids)}});
        return;
    }
    out_ << "plug-in   " << plugin.path << '\n';
    for (String const& id : plugin.ids) out_ << "  offers  " << id << '\n';
}

void Printer::endpoint(bool emulator, Vector<String> const& connectTo, String const& caFile) {
    if (format_ == Format::JsonLines) {
        writeJsonLine(out_, {{"type", "endpoint"},
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
    writeJsonLine(out_, {{"type", "component"},
                     {"name", instance.name.str()},
                     {"id", instance.id.str()},
                     {"state", stateOf(instance)},
                     {"restored", toJson(instance.restored)},
                     {"error", error}});
}

void Printer::state(String const& tag, char const* action, Vector<String> const& keys) {
    if (format_ == Format::JsonLines) {
        writeJsonLine(out_, {{"type", "state"}, {"tag", tag.str()}, {"action", action}, {"keys", toJson(keys)}});
        return;
    }
    out_ << action << "  " << tag << "  " << joined(keys, ", ", "-") << '\n';
}

void Printer::login(String const& tag, unsigned code, String const& userId, bool stored) {
    char const* session = stored ? "stored" : "new";
    if (format_ == Format::JsonLines) {
        writeJsonLine(out_, {{"type", "login"},
                         {"tag", tag.str()},
                         {"code", hex(code)},
                         {"user", userId.str()},
                         {"session", session}});
        return;
    }
    out_ << "login     " << tag << "  ";
    if ((code & 0x80000000u) != 0) {
        out_ << "failed with " << hex(code) << '\n';
    } else {
        out_ << "signed in as " << userId << " (" << session << " session)\n";
    }
}

void Printer::step(int number, std::string const& action) {
    if (format_ == Format::JsonLines) {
        writeJsonLine(out_, {{"type", "step"}, {"step", number}, {"action", action}});
        return;
    }
    out_ << "step " << number << "    " << action << '\n';
}

void Printer::record(unsigned index, Map<String, Variant> const& fields) {
    if (format_ == Format::JsonLines) {
        writeJsonLine(out_, {{"type", "record"}, {"index", index}, {"fields", toJson(fields)}});
        return;
    }
    out_ << '#' << index << '\n';
    writeFields(out_, fields);
}

void Printer::listed(int objectType, std::size_t rows, std::optional<unsigned> total) {
    if (format_ == Format::JsonLines) {
        json count = nullptr;
        if (total) count = *total;
        writeJsonLine(out_, {{"type", "listed"}, {"object_type", objectType}, {"rows", rows}, {"total", count}});
        return;
    }
    out_ << "listed    " << rows << (rows == 1 ? " record" : " records");
    if (total) out_ << " (" << *total << " in all)";
    out_ << '\n';
}

void Printer::inserted(int objectType, std::optional<String> const& serviceId) {
    if (format_ == Format::JsonLines) {
        json id = nullptr;
        if (serviceId) id = serviceId->str();
        writeJsonLine(out_, {{"type", "inserted"}, {"object_type", objectType}, {"core_service_id", id}});
        return;
    }
    out_ << "inserted  object type " << objectType;
    if (serviceId) out_ << ", core_service_id " << *serviceId;
    out_ << '\n';
}

void Printer::retrieved(String const& guid, Map<String, Variant> const& fields) {
    if (format_ == Format::JsonLines) {
        writeJsonLine(out_, {{"type", "retrieved"}, {"guid", guid.str()}, {"fields", toJson(fields)}});
        return;
    }
    out_ << "retrieved " << guid << '\n';
    writeFields(out_, fields);
}

void Printer::check(std::string const& what, bool ok) {
    if (format_ == Format::JsonLines) {
        writeJsonLine(out_, {{"type", "check"}, {"what", what}, {"ok", ok}});
        return;
    }
    out_ << "check     " << what << ": " << (ok ? "yes" : "NO") << '\n';
}

void Printer::finish() {
    if (format_ == Format::Table && !pending_.empty()) {
        std::vector<std::vector<std::string>> rows{{"NAME", "ID", "STATE", "RESTORED"}};
        for (auto const& instance : pending_) {
            rows.push_back({instance.name.str(), instance.id.str(), stateOf(instance),
                            joined(instance.restored, ",", "-")});
        }
        writeTable(out_, rows);
    }
    pending_.clear();
    out_.flush();
}

}  // namespace host
}  // namespace trelm
