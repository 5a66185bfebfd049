#pragma once

#include <string>
#include <vector>

#include <CLI/CLI.hpp>

#include "IQueryItems.h"
#include "ItemStore.h"
#include "SyncReport.h"
#include "trelm/uError.h"

namespace trelm {
namespace host {

// `trelm-host items KIND [--where KEY=VALUE ...] [--account UID] [--removed]`: lists what `sync`
// stored, from the item store alone (no plug-in, no service), each item with its host id.
// Conditions are written as for `query` (= != < <= > >=, "KEY=A,B" for a list) and compared with
// each stored field by that field's kind (numbers as numbers, texts as texts); an item without
// the field does not match. Removed items are listed only with --removed.
//
// Lifetime: `app` must outlive the object. Thread safety: used by the host's controlling thread.
class ItemsCommand {
public:
    explicit ItemsCommand(CLI::App& app);
    ItemsCommand(ItemsCommand const&) = delete;
    ItemsCommand& operator=(ItemsCommand const&) = delete;

    bool parsed() const { return command_->parsed(); }

    // Lists from `store`. kInvalid for a malformed condition; the store's failure as it is.
    // REQUIRES: parsed().
    uError run(ItemStore& store, SyncReport& report);

    // Whether the stored JSON object `fields` satisfies `condition`.
    static bool matches(std::string const& fields, IQueryItems::Constraint const& condition);

private:
    CLI::App* command_ = nullptr;
    std::string type_;
    std::vector<std::string> where_;
    std::string account_;
    bool removed_ = false;
};

}  // namespace host
}  // namespace trelm
