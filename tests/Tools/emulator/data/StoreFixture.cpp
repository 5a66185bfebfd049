#include "StoreFixture.h"

#include <atomic>
#include <cstdio>
#include <filesystem>
#include <functional>

#include <gtest/gtest.h>
#include <unistd.h>

namespace emu::test {

GeneratorOptions testOptions() {
    return GeneratorOptions{.seed = 7,
                            .users = 3000,
                            .demoFriends = 420,
                            .friendsPerUser = 4,
                            .albumsPerUser = 2,
                            .photosPerAlbum = 4,
                            .tagsPerPhoto = 2,
                            .postsPerUser = 3,
                            .threadsPerUser = 25,
                            .messagesPerThread = 6,
                            .friendRequests = 7};
}

GeneratedStore::GeneratedStore(GeneratorOptions const& options) {
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

std::vector<std::vector<std::string>> GeneratedStore::sql(std::string const& text,
                                                          std::vector<std::int64_t> const& ints) {
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
            unsigned char const* t = sqlite3_column_text(stmt, c);
            row.emplace_back(t ? reinterpret_cast<char const*>(t) : "");
        }
        rows.push_back(std::move(row));
    }
    if (rc != SQLITE_DONE) ADD_FAILURE() << "step: " << sqlite3_errmsg(raw_);
    sqlite3_finalize(stmt);
    return rows;
}

std::int64_t GeneratedStore::sqlInt(std::string const& text, std::vector<std::int64_t> const& ints) {
    auto rows = sql(text, ints);
    if (rows.empty() || rows[0].empty()) return -1;
    return std::stoll(rows[0][0]);
}

std::string GeneratedStore::dump() {
    std::string out;
    for (auto const& table : sql("SELECT name FROM sqlite_schema WHERE type = 'table' AND name NOT LIKE 'sqlite_%' "
                                 "ORDER BY name")) {
        std::size_t digest = 0;
        std::size_t count = 0;
        for (auto const& row : sql("SELECT * FROM \"" + table[0] + "\" ORDER BY 1, 2")) {
            for (auto const& v : row) digest = digest * 1000003u ^ std::hash<std::string>{}(v);
            ++count;
        }
        out += table[0] + ":" + std::to_string(count) + ":" + std::to_string(digest) + "\n";
    }
    return out;
}

std::vector<std::string> childNames(XmlNode const& row) {
    std::vector<std::string> names;
    for (XmlNode const& c : row.children) names.push_back(c.name);
    return names;
}

XmlNode const* child(XmlNode const& node, std::string const& name) {
    for (XmlNode const& c : node.children)
        if (c.name == name) return &c;
    return nullptr;
}

}  // namespace emu::test
