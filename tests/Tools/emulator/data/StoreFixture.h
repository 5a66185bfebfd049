// Shared helpers for the data-layer tests: a generated store in a temporary file, a second
// plain SQLite connection to the same file for computing expectations independently, and
// readers for answer trees.
#pragma once

#include <cstdint>
#include <map>
#include <memory>
#include <string>
#include <vector>

#include <sqlite3.h>

#include "SqliteStore.h"
#include "Store.h"
#include "XmlNode.h"

namespace emu::test {

using Row = std::map<std::string, std::string>;

// A store generated from `options` into a fresh file, plus a read connection to that file.
class GeneratedStore {
public:
    explicit GeneratedStore(const GeneratorOptions& options);
    ~GeneratedStore();

    SqliteStore& store() { return *store_; }
    // Runs plain SQL on the second connection; every column as text ("" for NULL).
    std::vector<std::vector<std::string>> sql(const std::string& text, const std::vector<std::int64_t>& ints = {});
    std::int64_t sqlInt(const std::string& text, const std::vector<std::int64_t>& ints = {});
    void execute(const std::string& text);
    // A digest of every table's rows, for "nothing changed" and determinism checks.
    std::string dump();

    // Runs an FQL statement as the demo user and fails the test on an error.
    std::vector<Row> fql(const std::string& query, std::int64_t viewer = DemoAccount::uid);

private:
    std::string path_;
    std::unique_ptr<SqliteStore> store_;
    sqlite3* raw_ = nullptr;
};

// The options most tests share: small enough to be quick, large enough for several pages.
GeneratorOptions testOptions();

// Rows of a list answer: element name to text; nested elements as "parent.child"; a nil element
// as "<nil>".
std::vector<Row> rowsOf(const XmlNode& root);
// The element names of one row, in order.
std::vector<std::string> childNames(const XmlNode& row);
const XmlNode* child(const XmlNode& node, const std::string& name);

// The client's text sort key of a user id.
inline std::string textKey(std::int64_t uid) { return std::to_string(uid) + " "; }

}  // namespace emu::test
