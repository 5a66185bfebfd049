// Shared helpers for the data-layer tests: a generated store in a temporary file, a second
// plain SQLite connection to the same file for computing expectations independently, and
// readers for answer trees.
#pragma once

#include <cstdint>
#include <memory>
#include <string>
#include <vector>

#include <sqlite3.h>

#include "EmulatorRows.h"
#include "SqliteStore.h"
#include "XmlNode.h"

namespace emu::test {

// A store generated from `options` into a fresh file, plus a read connection to that file.
class GeneratedStore {
public:
    explicit GeneratedStore(GeneratorOptions const& options);
    ~GeneratedStore();

    SqliteStore& store() { return *store_; }
    // Runs plain SQL on the second connection; every column as text ("" for NULL).
    std::vector<std::vector<std::string>> sql(std::string const& text, std::vector<std::int64_t> const& ints = {});
    std::int64_t sqlInt(std::string const& text, std::vector<std::int64_t> const& ints = {});
    // A digest of every table's rows, for "nothing changed" and determinism checks.
    std::string dump();

    // Runs an FQL statement as `viewer` and fails the test on an error.
    std::vector<Row> fql(std::string const& query, std::int64_t viewer = DemoAccount::uid) {
        return fqlRows(*store_, viewer, query);
    }

private:
    std::string path_;
    std::unique_ptr<SqliteStore> store_;
    sqlite3* raw_ = nullptr;
};

// The options most tests share: small enough to be quick, large enough for several pages.
GeneratorOptions testOptions();

// The element names of one row, in order.
std::vector<std::string> childNames(XmlNode const& row);
XmlNode const* child(XmlNode const& node, std::string const& name);

}  // namespace emu::test
