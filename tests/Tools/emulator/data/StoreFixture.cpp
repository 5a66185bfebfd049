#include "StoreFixture.h"

#include <atomic>
#include <cstdio>
#include <filesystem>
#include <functional>

#include <gtest/gtest.h>
#include <unistd.h>

namespace emu::test {

namespace {

void flattenInto(const XmlNode& node, const std::string& prefix, Row& row) {
    const std::string name = prefix.empty() ? node.name : prefix + "." + node.name;
    if (node.nil) {
        row[name] = "<nil>";
        return;
    }
    if (node.children.empty()) {
        row[name] = node.text;
        return;
    }
    for (const XmlNode& c : node.children) flattenInto(c, name, row);
}

}  // namespace

GeneratorOptions testOptions() {
    return GeneratorOptions{.seed = 7, .users = 3000, .demoFriends = 420, .friendsPerUser = 4, .albumsPerUser = 2,
                            .photosPerAlbum = 4, .tagsPerPhoto = 2, .postsPerUser = 3, .threadsPerUser = 25,
                            .messagesPerThread = 6, .friendRequests = 7};
}

GeneratedStore::GeneratedStore(const GeneratorOptions& options) {
    static std::atomic<int> counter{0};
    path_ = (std::filesystem::temp_directory_path() /
             ("emu-data-" + std::to_string(getpid()) + "-" + std::to_string(counter++) + ".db"))
                .string();
    std::filesystem::remove(path_);
    std::string error;
    store_ = SqliteStore::openDatabase(path_, error);
    if (!store_) ADD_FAILURE() << "open: " << error;
    if (store_) {
        if (Status s = store_->generate(options)) ADD_FAILURE() << "generate: " << s->code << " " << s->message;
    }
    if (sqlite3_open_v2(path_.c_str(), &raw_, SQLITE_OPEN_READWRITE, nullptr) != SQLITE_OK)
        ADD_FAILURE() << "second connection";
    sqlite3_busy_timeout(raw_, 5000);
}

GeneratedStore::~GeneratedStore() {
    sqlite3_close(raw_);
    store_.reset();
    std::filesystem::remove(path_);
}

std::vector<std::vector<std::string>> GeneratedStore::sql(const std::string& text,
                                                          const std::vector<std::int64_t>& ints) {
    std::vector<std::vector<std::string>> rows;
    sqlite3_stmt* stmt = nullptr;
    if (sqlite3_prepare_v2(raw_, text.c_str(), -1, &stmt, nullptr) != SQLITE_OK) {
        ADD_FAILURE() << "prepare: " << sqlite3_errmsg(raw_) << " in " << text;
        return rows;
    }
    for (std::size_t i = 0; i < ints.size(); ++i) sqlite3_bind_int64(stmt, static_cast<int>(i + 1), ints[i]);
    int rc;
    while ((rc = sqlite3_step(stmt)) == SQLITE_ROW) {
        std::vector<std::string> row;
        for (int c = 0; c < sqlite3_column_count(stmt); ++c) {
            const unsigned char* t = sqlite3_column_text(stmt, c);
            row.emplace_back(t ? reinterpret_cast<const char*>(t) : "");
        }
        rows.push_back(std::move(row));
    }
    if (rc != SQLITE_DONE) ADD_FAILURE() << "step: " << sqlite3_errmsg(raw_);
    sqlite3_finalize(stmt);
    return rows;
}

std::int64_t GeneratedStore::sqlInt(const std::string& text, const std::vector<std::int64_t>& ints) {
    auto rows = sql(text, ints);
    if (rows.empty() || rows[0].empty()) return -1;
    return std::stoll(rows[0][0]);
}

void GeneratedStore::execute(const std::string& text) {
    char* message = nullptr;
    if (sqlite3_exec(raw_, text.c_str(), nullptr, nullptr, &message) != SQLITE_OK)
        ADD_FAILURE() << "exec: " << (message ? message : "") << " in " << text;
    sqlite3_free(message);
}

std::string GeneratedStore::dump() {
    std::string out;
    for (const auto& table : sql("SELECT name FROM sqlite_schema WHERE type = 'table' AND name NOT LIKE 'sqlite_%' "
                                 "ORDER BY name")) {
        std::size_t digest = 0;
        std::size_t count = 0;
        for (const auto& row : sql("SELECT * FROM \"" + table[0] + "\" ORDER BY 1, 2")) {
            for (const auto& v : row) digest = digest * 1000003u ^ std::hash<std::string>{}(v);
            ++count;
        }
        out += table[0] + ":" + std::to_string(count) + ":" + std::to_string(digest) + "\n";
    }
    return out;
}

std::vector<Row> GeneratedStore::fql(const std::string& query, std::int64_t viewer) {
    XmlNode root("fql_query_response");
    if (Status s = store_->fqlQuery(viewer, query, root)) {
        ADD_FAILURE() << "fql " << s->code << " " << s->message << " for " << query;
        return {};
    }
    return rowsOf(root);
}

std::vector<Row> rowsOf(const XmlNode& root) {
    std::vector<Row> rows;
    for (const XmlNode& r : root.children) {
        Row row;
        for (const XmlNode& c : r.children) flattenInto(c, "", row);
        rows.push_back(std::move(row));
    }
    return rows;
}

std::vector<std::string> childNames(const XmlNode& row) {
    std::vector<std::string> names;
    for (const XmlNode& c : row.children) names.push_back(c.name);
    return names;
}

const XmlNode* child(const XmlNode& node, const std::string& name) {
    for (const XmlNode& c : node.children)
        if (c.name == name) return &c;
    return nullptr;
}

}  // namespace emu::test
