#include "SyncReport.h"

#include <algorithm>

#include "JsonText.h"

namespace trelm {
namespace host {

using json = Json;

SyncReport::SyncReport(Printer::Format format, std::ostream& out, std::ostream& progress, bool terminal)
    : format_(format), out_(out), progress_(progress), showProgress_(terminal && format == Printer::Format::Table) {}

void SyncReport::wiped(String const& tag, unsigned items) {
    if (format_ == Printer::Format::JsonLines) {
        writeJsonLine(out_, {{"type", "wiped"}, {"tag", tag.str()}, {"items", items}});
    } else {
        out_ << "wiped     " << items << " items of " << tag << " (another person signed in)\n";
    }
    out_.flush();
}

void SyncReport::begin(std::string const& kind, int type, ItemStore::Pass const& pass, bool restart) {
    kind_ = kind;
    line_.emplace(showProgress_, progress_);
    if (format_ == Printer::Format::JsonLines) {
        json from = nullptr;
        if (!pass.resume.empty()) from = pass.resume;
        writeJsonLine(out_, {{"type", "sync"},
                         {"kind", kind},
                         {"object_type", type},
                         {"pass", pass.id},
                         {"continued", pass.continued},
                         {"from", from},
                         {"rows_before", pass.rows},
                         {"restart", pass.continued && restart}});
    } else if (pass.continued) {
        out_ << "continue  " << kind << ": an earlier sync stopped after " << pass.rows << " rows; ";
        if (restart) {
            out_ << "this kind cannot continue where it stopped, so it is read again from the start\n";
        } else if (pass.resume.empty()) {
            out_ << "it continues from the first row\n";
        } else {
            out_ << "it continues from " << pass.resume << " without reading the committed windows again\n";
        }
    }
    out_.flush();
}

void SyncReport::progress(std::size_t rows, std::size_t read, std::optional<unsigned> total) {
    if (!line_) return;
    if (total) line_->setTotal(*total);
    line_->setEarlier(rows - read);
    line_->show(rows, kind_.c_str());
}

void SyncReport::endProgress() {
    if (line_) line_->clear();
}

void SyncReport::summary(KindSummary const& summary) {
    endProgress();
    if (format_ == Printer::Format::Table) {
        summaries_.push_back(summary);
        return;
    }
    json error = nullptr;
    if (!summary.error.empty()) error = summary.error;
    writeJsonLine(out_, {{"type", "synced"},
                     {"kind", summary.kind},
                     {"object_type", summary.type},
                     {"pass", summary.pass},
                     {"complete", summary.complete},
                     {"rows", summary.rows},
                     {"added", summary.counts.added},
                     {"changed", summary.counts.changed},
                     {"unchanged", summary.counts.unchanged},
                     {"removed", summary.counts.removed},
                     {"boundary_seconds", summary.boundarySeconds},
                     {"recovered", summary.recovered},
                     {"requests", summary.requests},
                     {"error", error}});
    out_.flush();
}

void SyncReport::finish() {
    endProgress();
    if (format_ == Printer::Format::Table && !summaries_.empty()) {
        std::vector<std::vector<std::string>> rows{
            {"KIND", "ROWS", "ADDED", "CHANGED", "UNCHANGED", "REMOVED", "REQUESTS", "PASS"}};
        for (KindSummary const& s : summaries_) {
            std::string state = std::to_string(s.pass) + (s.complete ? " complete" : " stopped, continues next time");
            if (s.recovered > 0) state += ", " + std::to_string(s.recovered) + " posts of boundary seconds recovered";
            rows.push_back({s.kind, std::to_string(s.rows), std::to_string(s.counts.added),
                            std::to_string(s.counts.changed), std::to_string(s.counts.unchanged),
                            std::to_string(s.counts.removed), std::to_string(s.requests), state});
        }
        writeTable(out_, rows);
    }
    summaries_.clear();
    out_.flush();
}

void SyncReport::item(std::size_t index, ItemStore::Item const& item) {
    json fields = json::parse(item.fields, nullptr, false);
    if (format_ == Printer::Format::JsonLines) {
        writeJsonLine(out_, {{"type", "item"},
                         {"index", index},
                         {"host_id", item.hostId.str()},
                         {"account", item.account.str()},
                         {"object_type", item.type},
                         {"service_id", item.serviceId.str()},
                         {"first_seen", item.firstSeen},
                         {"last_seen", item.lastSeen},
                         {"deleted", item.deleted},
                         {"fields", fields}});
        return;
    }
    out_ << '#' << index << "  " << item.hostId << (item.deleted ? "  (removed)" : "") << '\n';
    std::vector<std::pair<std::string, std::string>> lines{
        {"service_id", item.serviceId.str()},
        {"account", item.account.str()},
        {"first_seen", utcText(item.firstSeen)},
        {"last_seen", utcText(item.lastSeen)},
    };
    if (fields.is_object()) {
        for (auto const& [key, value] : fields.items()) {
            lines.emplace_back(key, value.is_string() ? value.get<std::string>() : value.dump());
        }
    }
    std::size_t width = 0;
    for (auto const& line : lines) width = std::max(width, line.first.size());
    for (auto const& [key, value] : lines) out_ << "  " << key << std::string(width - key.size() + 2, ' ') << value << '\n';
}

void SyncReport::items(int type, std::size_t count) {
    if (format_ == Printer::Format::JsonLines) {
        writeJsonLine(out_, {{"type", "items"}, {"object_type", type}, {"count", count}});
    } else {
        out_ << "stored    " << count << (count == 1 ? " item" : " items") << '\n';
    }
    out_.flush();
}

void SyncReport::nothingStored(std::string const& path) {
    progress_ << "trelm-host: nothing synced yet (no " << path << "); run trelm-host sync first\n";
}

}  // namespace host
}  // namespace trelm
