#include "ItemCommands.h"

#include <iostream>

#include <algorithm>
#include <cstddef>
#include <string>

#include "ItemQuery.h"
#include "ProgressLine.h"
#include "trelm/GUID.h"

namespace trelm {
namespace host {

namespace {

std::string joined(std::vector<std::string> const& words) {
    std::string text;
    for (std::string const& word : words) {
        if (!text.empty()) text += ' ';
        text += word;
    }
    return text;
}

std::string kindList() {
    std::string list;
    for (std::string const& name : ItemQuery::kindNames()) list += (list.empty() ? "" : "|") + name;
    return list;
}

}  // namespace

ItemCommands::ItemCommands(CLI::App& app, bool shell) {
    query_ = app.add_subcommand("query", "list items of the data source");
    query_->add_option("type", type_, "the kind of items: " + kindList())->required()->check(CLI::IsMember(ItemQuery::kindNames()));
    addListingOptions(*query_);

    CLI::App* insert = app.add_subcommand("insert", "publish an item through the data source");
    insert->require_subcommand(1);
    insertStatus_ = insert->add_subcommand("status", "post a status");
    insertStatus_->add_option("text", words_, "the status text (words are joined with blanks)")->required();
    insertPhoto_ = insert->add_subcommand("photo", "upload a photo");
    insertPhoto_->add_option("file", file_, "the image file")->required();
    insertPhoto_->add_option("--caption", caption_, "the photo's caption");
    insertPhoto_->add_option("--album", album_, "the album's service id (default: the application's album)");

    retrieve_ = app.add_subcommand("retrieve", "show a record of a listing again, fetched by its GUID");
    retrieve_->add_option("record", target_, "its GUID, or #N for the N-th record listed")->required();
    CLI::Option* from = retrieve_->add_option("--from", type_, "list items of this kind first: " + kindList())
                            ->check(CLI::IsMember(ItemQuery::kindNames()));
    // Outside the shell no listing came before: the command makes its own.
    if (!shell) from->required();
    addListingOptions(*retrieve_);
    if (shell) quit_ = app.add_subcommand("quit", "leave the shell");
}

void ItemCommands::addListingOptions(CLI::App& command) {
    // A cursor counts rows in 32 bits; a listing of more than a million rows is --all's job.
    CLI::Option* limit = command.add_option("--limit", limit_, "list at most N items (0 to 1000000)")
                             ->default_val(kDefaultLimit)
                             ->check(CLI::Range(0u, 1000000u));
    command.add_option("--skip", skip_, "pass over the first N items (0 to 1000000)")->check(CLI::Range(0u, 1000000u));
    command.add_option("--where", where_, "condition KEY=VALUE (also != < <= > >=; =A,B for a list)")
        ->expected(1)
        ->multi_option_policy(CLI::MultiOptionPolicy::TakeAll);
    command.add_option("--order", order_, "order by KEY, ascending, or KEY:desc");
    command.add_option("--since", since_,
                       "albums, media, photo tags: only those changed at or after TIME (seconds since the "
                       "epoch), fetched in one go");
    command.add_flag("--all", all_, "list every item")->excludes(limit);
}

bool ItemCommands::parsed() const {
    for (CLI::App const* command : {query_, insertStatus_, insertPhoto_, retrieve_, quit_}) {
        if (command != nullptr && command->parsed()) return true;
    }
    return false;
}

bool ItemCommands::quitParsed() const { return quit_ != nullptr && quit_->parsed(); }

uError ItemCommands::run(SourceClient& client, Printer& printer) {
    uError e;
    if (query_->parsed()) {
        e = runQuery(client, printer);
    } else if (insertStatus_->parsed()) {
        e = client.postStatus(String(joined(words_)));
        if (e.ok()) printer.inserted(Metadata::Object::TYPE_STATUS, std::nullopt);
    } else if (insertPhoto_->parsed()) {
        e = runInsertPhoto(client, printer);
    } else if (retrieve_->parsed()) {
        if (!type_.empty()) e = runQuery(client, printer);
        if (e.ok()) e = runRetrieve(client, printer);
    }
    printer.finish();
    return e;
}

uError ItemCommands::runQuery(SourceClient& client, Printer& printer) {
    ItemQuery::Kind const* kind = ItemQuery::findKind(type_);
    if (kind == nullptr) return TRELM_ERROR_MSG(kInvalid, "unknown item type " + type_);
    ItemQuery query(*kind);
    for (std::string const& condition : where_) {
        TRELM_RETURN_IF_ERROR(query.where(condition));
    }
    if (!order_.empty()) TRELM_RETURN_IF_ERROR(query.orderBy(order_));
    query.since = since_;
    TRELM_RETURN_IF_ERROR(query.checkSince());
    query.skip = skip_;
    if (!all_) query.limit = limit_;

    // Records are printed as they arrive; on a terminal a progress line on standard error says
    // how far the listing is (never in JSON output, never when standard error is not a terminal).
    // The total, when the kind can count, is asked for before the walk only for that line.
    ProgressLine progress(printer.format() == Printer::Format::Table && ProgressLine::stderrIsTerminal(), std::cerr);
    SourceClient::Counted counted;
    if (progress.enabled()) {
        counted = [&](unsigned total) {
            std::size_t rows = total > skip_ ? total - skip_ : 0;
            if (!all_) rows = std::min<std::size_t>(rows, limit_);
            progress.setTotal(rows);
        };
    }
    SourceClient::Listing listing;
    uError e = client.query(
        query, listing,
        [&](std::size_t index, SourceClient::Record const& row) {
            progress.clear();
            printer.record(static_cast<unsigned>(index), row);
            printer.flush();
            progress.show(index);
        },
        counted);
    progress.clear();
    if (e.failed()) {
        return TRELM_WRAP_MSG(kFailure, e, client.sourceName() + " cannot list " + type_);
    }
    printer.listed(kind->type, listing.rows.size(), listing.total);
    return TRELM_OK();
}

uError ItemCommands::runInsertPhoto(SourceClient& client, Printer& printer) {
    String id;
    uError e = client.uploadPhoto(file_, String(caption_), String(album_), id);
    if (e.ok()) printer.inserted(Metadata::Object::TYPE_MEDIA, id);
    return e;
}

uError ItemCommands::runRetrieve(SourceClient& client, Printer& printer) {
    GUID guid;
    if (!target_.empty() && target_[0] == '#') {
        unsigned n = 0;
        SourceClient::Record const* record = nullptr;
        if (String(target_.substr(1)).to(n).ok()) record = client.listed(n);
        if (record == nullptr) {
            return TRELM_ERROR_MSG(kNotFound, "the last listing has no record " + target_);
        }
        Variant const* id = record->search("core_object_id");
        if (id == nullptr || id->as(guid).failed()) {
            return TRELM_ERROR_MSG(kNotFound, "record " + target_ + " has no core_object_id");
        }
    } else {
        uError e = GUID::fromString(String(target_), guid);
        if (e.failed()) return TRELM_WRAP_MSG(kInvalid, e, "\"" + target_ + "\" is neither a GUID nor #N");
    }
    SourceClient::Record record;
    uError e = client.retrieve(guid, record);
    if (e.failed()) {
        return TRELM_WRAP_MSG(kFailure, e, client.sourceName() + " has no record " + guid.toString().str());
    }
    printer.retrieved(guid.toString(), record);
    return TRELM_OK();
}

}  // namespace host
}  // namespace trelm
