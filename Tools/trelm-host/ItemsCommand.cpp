#include "ItemsCommand.h"

#include <nlohmann/json.hpp>

#include "ItemQuery.h"
#include "trelm/Vector.h"

namespace trelm {
namespace host {

namespace {

using json = nlohmann::json;
using Constraint = IQueryItems::Constraint;

// -1, 0 or 1 as `stored` compares with the condition's `text`; nullopt when they cannot be
// compared (a number field and a text that is not a number).
std::optional<int> compare(json const& stored, std::string const& text) {
    auto sign = [](auto a, auto b) { return a < b ? -1 : (b < a ? 1 : 0); };
    if (stored.is_boolean()) {
        if (text != "true" && text != "false" && text != "1" && text != "0") return std::nullopt;
        return sign(stored.get<bool>(), text == "true" || text == "1");
    }
    if (stored.is_number()) {
        long long value = 0;
        if (String(text).to(value).failed()) return std::nullopt;
        return sign(stored.get<long long>(), value);
    }
    if (stored.is_string()) return sign(stored.get<std::string>(), text);
    return std::nullopt;
}

}  // namespace

ItemsCommand::ItemsCommand(CLI::App& app) {
    command_ = app.add_subcommand("items", "list the items sync stored, from the local store only");
    command_->add_option("type", type_, "the kind of items")->required()->check(CLI::IsMember(ItemQuery::kindNames()));
    command_->add_option("--where", where_, "condition KEY=VALUE (also != < <= > >=; =A,B for a list)")
        ->expected(1)
        ->multi_option_policy(CLI::MultiOptionPolicy::TakeAll);
    command_->add_option("--account", account_, "only the items of this user id (default: every account stored)");
    command_->add_flag("--removed", removed_, "also the items a complete sync found removed");
}

bool ItemsCommand::matches(std::string const& fields, Constraint const& condition) {
    json const object = json::parse(fields, nullptr, false);
    if (!object.is_object()) return false;
    auto found = object.find(condition.key.name().str());
    if (found == object.end() || found->is_null()) return false;
    Vector<String> texts;
    if (condition.function == Constraint::InList) {
        if (condition.value.as(texts).failed()) return false;
    } else if (texts.pushBack(condition.value.toString()).failed()) {
        return false;
    }
    for (String const& text : texts) {
        std::optional<int> const order = compare(*found, text.str());
        if (!order) continue;
        switch (condition.function) {
            case Constraint::Equal:
            case Constraint::InList:
                if (*order == 0) return true;
                break;
            case Constraint::NotEqual: return *order != 0;
            case Constraint::LessThan: return *order < 0;
            case Constraint::LessOrEqual: return *order <= 0;
            case Constraint::GreaterThan: return *order > 0;
            case Constraint::GreaterOrEqual: return *order >= 0;
            default: return false;
        }
    }
    return false;
}

uError ItemsCommand::run(ItemStore& store, SyncReport& report) {
    ItemQuery::Kind const* kind = ItemQuery::findKind(type_);
    if (kind == nullptr) return TRELM_ERROR_MSG(kInvalid, "unknown item type " + type_);
    // The conditions are read as query reads them; the kind's own constraint comes first.
    ItemQuery query(*kind);
    for (std::string const& condition : where_) TRELM_RETURN_IF_ERROR(query.where(condition));
    IQueryItems::StartQueryMessage msg;
    TRELM_RETURN_IF_ERROR(query.fill(msg));

    if (!store.exists()) report.nothingStored(store.path().str());
    std::vector<ItemStore::Item> items;
    TRELM_RETURN_IF_ERROR(store.list(String(account_), kind->type, removed_, items));
    std::size_t listed = 0;
    for (ItemStore::Item const& item : items) {
        bool keep = true;
        for (unsigned i = 1; keep && i < msg.constraints.size(); ++i) keep = matches(item.fields, msg.constraints[i]);
        if (keep) report.item(++listed, item);
    }
    report.items(kind->type, listed);
    return TRELM_OK();
}

}  // namespace host
}  // namespace trelm
