// Paging through the demo user's friends as the client does, over a million users:
//   engine/...   the FQL statement through the engine, answer rendered as XML;
//   sqlite/...   the best hand-written SQLite query for the same rows (index-range join);
//   sqlite_xml/... the hand-written query with its rows put into the same answer document, which
//                isolates what the engine itself adds (parsing, checking, translating);
//   literal/...  the statement translated word for word, for reference (sorts every friend);
//   http/...     the same statement through the whole emulator over loopback HTTP (keep-alive
//                client, requests signed with a demo session).
// Answers are written as the emulator writes them: rows straight from the step loop into the text.
// One iteration is one page of 150 rows (the walk starts again after the last page) or one
// counting statement. Compare engine/ with sqlite/ for the cost of the engine.
#include <benchmark/benchmark.h>
#include <sqlite3.h>

#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <ctime>
#include <memory>
#include <string>
#include <vector>

#include "SqliteStore.h"
#include "XmlAnswerWriter.h"

#if __has_include("Emulator.h")
#include <httplib.h>

#include "Emulator.h"
#include "Signature.h"
#define BENCH_HTTP 1
#endif

namespace {

// A named in-memory database, so that the hand-written queries read the very same data.
const char* const kDatabase = "file:bench_fql_paging?mode=memory&cache=shared";
const std::string kMe = std::to_string(emu::DemoAccount::uid);
const std::string kContacts =
    "select uid,name,pic_big from user where uid in (select uid2 from friend where uid1='" + kMe + "')";
const std::string kCount = "select '' from user where uid in (select uid2 from friend where uid1='" + kMe + "')";

std::int64_t envOr(const char* name, std::int64_t fallback) {
    const char* v = std::getenv(name);
    return v ? std::atoll(v) : fallback;
}

struct Dataset {
    std::shared_ptr<emu::SqliteStore> store;
    sqlite3* db = nullptr;
};

Dataset& dataset() {
    static Dataset d = [] {
        Dataset made;
        std::string error;
        made.store = emu::SqliteStore::openDatabase(kDatabase, error);
        if (!made.store) {
            std::fprintf(stderr, "open: %s\n", error.c_str());
            std::abort();
        }
        emu::GeneratorOptions options;
        options.users = envOr("BENCH_USERS", 1000000);
        options.demoFriends = envOr("BENCH_FRIENDS", 5000);
        const auto start = std::chrono::steady_clock::now();
        const std::clock_t cpuStart = std::clock();
        if (emu::Status s = made.store->generate(options)) {
            std::fprintf(stderr, "generate: %s\n", s->message.c_str());
            std::abort();
        }
        const double seconds = std::chrono::duration<double>(std::chrono::steady_clock::now() - start).count();
        const double cpu = static_cast<double>(std::clock() - cpuStart) / CLOCKS_PER_SEC;
        std::fprintf(stderr, "generated %lld users, %lld friends of the demo user in %.2f s (%.2f s CPU)\n",
                     static_cast<long long>(options.users), static_cast<long long>(options.demoFriends), seconds, cpu);
        if (sqlite3_open_v2(kDatabase, &made.db, SQLITE_OPEN_READWRITE | SQLITE_OPEN_URI, nullptr) != SQLITE_OK)
            std::abort();
        return made;
    }();
    return d;
}

std::string pageStatement(const std::string& last) {
    if (last.empty()) return kContacts + " order by concat(uid,' ') asc limit 150";
    return kContacts + " and (concat(uid,' ') > '" + last + " ') order by concat(uid,' ') asc limit 150";
}

// The last uid of a page, read from the answer text.
std::string lastUid(const std::string& answer) {
    const std::size_t at = answer.rfind("<uid>");
    if (at == std::string::npos) return {};
    return answer.substr(at + 5, answer.find('<', at + 5) - at - 5);
}

std::size_t countRows(const std::string& answer) {
    std::size_t rows = 0;
    for (std::size_t at = answer.find("<user>"); at != std::string::npos; at = answer.find("<user>", at + 1)) ++rows;
    return rows;
}

// An FQL answer through the engine, as the emulator renders it.
bool engineAnswer(const std::string& query, std::string& doc) {
    emu::XmlAnswerWriter writer;
    writer.open("fql_query_response", true);
    const emu::Status failed = dataset().store->fqlQuery(emu::DemoAccount::uid, query, writer);
    writer.close();
    doc = writer.take();
    return !failed;
}

void BM_EngineContactPage(benchmark::State& state) {
    dataset();  // generated before the clock starts
    std::string last, doc;
    std::size_t rows = 0, pages = 0;
    for (auto _ : state) {
        if (!engineAnswer(pageStatement(last), doc)) state.SkipWithError("fql failed");
        benchmark::DoNotOptimize(doc.data());
        const std::size_t n = countRows(doc);
        rows += n;
        ++pages;
        last = n == 150 ? lastUid(doc) : std::string();
    }
    state.counters["rows/page"] = static_cast<double>(rows) / static_cast<double>(pages);
}
BENCHMARK(BM_EngineContactPage)->Name("engine/contact_page")->Unit(benchmark::kMicrosecond);

// Steps one prepared statement to the end, reading every column as text.
std::size_t drain(sqlite3_stmt* stmt, std::string* lastFirstColumn) {
    std::size_t rows = 0;
    while (sqlite3_step(stmt) == SQLITE_ROW) {
        for (int c = 0; c < sqlite3_column_count(stmt); ++c) {
            const unsigned char* t = sqlite3_column_text(stmt, c);
            std::string value(t ? reinterpret_cast<const char*>(t) : "");
            benchmark::DoNotOptimize(value.data());
            if (c == 0 && lastFirstColumn) *lastFirstColumn = std::move(value);
        }
        ++rows;
    }
    sqlite3_reset(stmt);
    return rows;
}

void sqlitePage(benchmark::State& state, const char* sql, bool keyIsText) {
    Dataset& d = dataset();
    sqlite3_stmt* stmt = nullptr;
    if (sqlite3_prepare_v2(d.db, sql, -1, &stmt, nullptr) != SQLITE_OK) {
        state.SkipWithError(sqlite3_errmsg(d.db));
        return;
    }
    std::string last;
    for (auto _ : state) {
        sqlite3_bind_int64(stmt, 1, emu::DemoAccount::uid);
        const std::string key = keyIsText ? last + (last.empty() ? "" : " ") : last;
        sqlite3_bind_text(stmt, 2, key.c_str(), -1, SQLITE_TRANSIENT);
        std::string lastUid;
        const std::size_t rows = drain(stmt, &lastUid);
        last = rows == 150 ? lastUid : std::string();
    }
    sqlite3_finalize(stmt);
}

void BM_SqliteContactPage(benchmark::State& state) {
    sqlitePage(state,
               "SELECT u.uid, u.name, 'http://pics.trelm.example/n/' || u.uid || '.jpg' FROM friend f "
               "JOIN user u ON u.uid = f.uid2 WHERE f.uid1 = ? AND f.key2 > ? ORDER BY f.key2 LIMIT 150",
               true);
}
BENCHMARK(BM_SqliteContactPage)->Name("sqlite/contact_page")->Unit(benchmark::kMicrosecond);

// Steps a statement into an answer shaped as the engine shapes it, written the way it writes.
std::size_t renderRows(sqlite3_stmt* stmt, const std::vector<const char*>& names, std::string* lastFirstColumn) {
    emu::XmlAnswerWriter writer;
    writer.open("fql_query_response", true);
    std::size_t rows = 0;
    while (sqlite3_step(stmt) == SQLITE_ROW) {
        writer.open("user", false);
        for (int c = 0; c < static_cast<int>(names.size()); ++c) {
            const unsigned char* t = sqlite3_column_text(stmt, c);
            const std::string_view text(t ? reinterpret_cast<const char*>(t) : "",
                                        static_cast<std::size_t>(sqlite3_column_bytes(stmt, c)));
            writer.leaf(names[c], text);
            if (c == 0 && lastFirstColumn) *lastFirstColumn = text;
        }
        writer.close();
        ++rows;
    }
    sqlite3_reset(stmt);
    writer.close();
    const std::string doc = writer.take();
    benchmark::DoNotOptimize(doc.data());
    return rows;
}

void BM_SqliteXmlContactPage(benchmark::State& state) {
    Dataset& d = dataset();
    sqlite3_stmt* stmt = nullptr;
    if (sqlite3_prepare_v2(d.db,
                           "SELECT u.uid, u.name, 'http://pics.trelm.example/n/' || u.uid || '.jpg' FROM friend f "
                           "JOIN user u ON u.uid = f.uid2 WHERE f.uid1 = ? AND f.key2 > ? ORDER BY f.key2 LIMIT 150",
                           -1, &stmt, nullptr) != SQLITE_OK) {
        state.SkipWithError(sqlite3_errmsg(d.db));
        return;
    }
    std::string last;
    for (auto _ : state) {
        sqlite3_bind_int64(stmt, 1, emu::DemoAccount::uid);
        const std::string key = last.empty() ? "" : last + " ";
        sqlite3_bind_text(stmt, 2, key.c_str(), -1, SQLITE_TRANSIENT);
        std::string lastUid;
        const std::size_t rows = renderRows(stmt, {"uid", "name", "pic_big"}, &lastUid);
        last = rows == 150 ? lastUid : std::string();
    }
    sqlite3_finalize(stmt);
}
BENCHMARK(BM_SqliteXmlContactPage)->Name("sqlite_xml/contact_page")->Unit(benchmark::kMicrosecond);

void BM_LiteralContactPage(benchmark::State& state) {
    sqlitePage(state,
               "SELECT uid, name, 'http://pics.trelm.example/n/' || uid || '.jpg' FROM user WHERE uid IN "
               "(SELECT uid2 FROM friend WHERE uid1 = ?) AND (uid || ' ') > ? ORDER BY (uid || ' ') LIMIT 150",
               true);
}
BENCHMARK(BM_LiteralContactPage)->Name("literal/contact_page")->Unit(benchmark::kMicrosecond);

void BM_EngineCount(benchmark::State& state) {
    dataset();
    std::string doc;
    for (auto _ : state) {
        if (!engineAnswer(kCount, doc)) state.SkipWithError("fql failed");
        benchmark::DoNotOptimize(doc.data());
    }
}
BENCHMARK(BM_EngineCount)->Name("engine/count")->Unit(benchmark::kMicrosecond);

void BM_SqliteCount(benchmark::State& state) {
    Dataset& d = dataset();
    sqlite3_stmt* stmt = nullptr;
    if (sqlite3_prepare_v2(d.db, "SELECT '' FROM friend WHERE uid1 = ?", -1, &stmt, nullptr) != SQLITE_OK) {
        state.SkipWithError(sqlite3_errmsg(d.db));
        return;
    }
    for (auto _ : state) {
        sqlite3_bind_int64(stmt, 1, emu::DemoAccount::uid);
        benchmark::DoNotOptimize(drain(stmt, nullptr));
    }
    sqlite3_finalize(stmt);
}
BENCHMARK(BM_SqliteCount)->Name("sqlite/count")->Unit(benchmark::kMicrosecond);

void BM_SqliteXmlCount(benchmark::State& state) {
    Dataset& d = dataset();
    sqlite3_stmt* stmt = nullptr;
    if (sqlite3_prepare_v2(d.db, "SELECT '' FROM friend WHERE uid1 = ?", -1, &stmt, nullptr) != SQLITE_OK) {
        state.SkipWithError(sqlite3_errmsg(d.db));
        return;
    }
    for (auto _ : state) {
        sqlite3_bind_int64(stmt, 1, emu::DemoAccount::uid);
        benchmark::DoNotOptimize(renderRows(stmt, {"anon"}, nullptr));
    }
    sqlite3_finalize(stmt);
}
BENCHMARK(BM_SqliteXmlCount)->Name("sqlite_xml/count")->Unit(benchmark::kMicrosecond);

#ifdef BENCH_HTTP

// The emulator on loopback, serving the same store, and one keep-alive client signed with a
// demo session.
struct HttpClient {
    std::unique_ptr<emu::Emulator> emulator;
    std::unique_ptr<httplib::Client> client;
    emu::Session session;
    std::int64_t callId = 0;

    HttpClient() {
        emu::Emulator::Options options;
        options.store = dataset().store;
        options.httpsPort = -1;
        options.log = false;
        emulator = std::make_unique<emu::Emulator>(options);
        std::string error;
        if (!emulator->start(error)) {
            std::fprintf(stderr, "emulator: %s\n", error.c_str());
            std::abort();
        }
        session = emulator->loginDemo();
        client = std::make_unique<httplib::Client>("127.0.0.1", emulator->httpPort());
        client->set_keep_alive(true);
        client->set_tcp_nodelay(true);
    }
    ~HttpClient() {
        client.reset();
        emulator->stop();
    }

    bool fql(const std::string& query, std::string& answer) {
        emu::Arguments args{{"method", "facebook.fql.query"}, {"v", "1.0"},
                            {"api_key", emu::DemoAccount::apiKey}, {"session_key", session.key},
                            {"call_id", std::to_string(++callId)}, {"query", query}};
        args["sig"] = emu::Signature::compute(args, session.secret);
        httplib::Params form(args.begin(), args.end());
        auto result = client->Post("/restserver.php", form);
        if (!result || result->status != 200) return false;
        answer = std::move(result->body);
        return answer.find("<error_response") == std::string::npos;
    }
};

HttpClient& httpClient() {
    static HttpClient client;
    return client;
}

void BM_HttpContactPage(benchmark::State& state) {
    HttpClient& client = httpClient();
    std::string last, answer;
    for (auto _ : state) {
        if (!client.fql(pageStatement(last), answer)) state.SkipWithError("request failed");
        last = countRows(answer) == 150 ? lastUid(answer) : std::string();
    }
}
// The work happens on the server's threads: CPU time of this thread would undercount it and
// stretch the run. The CPU column is the whole process's (client, server and their system calls):
// on a loaded machine the wall time mostly measures waiting for a core.
BENCHMARK(BM_HttpContactPage)->Name("http/contact_page")->Unit(benchmark::kMicrosecond)->MeasureProcessCPUTime()->UseRealTime();

void BM_HttpCount(benchmark::State& state) {
    HttpClient& client = httpClient();
    std::string answer;
    for (auto _ : state)
        if (!client.fql(kCount, answer)) state.SkipWithError("request failed");
}
BENCHMARK(BM_HttpCount)->Name("http/count")->Unit(benchmark::kMicrosecond)->MeasureProcessCPUTime()->UseRealTime();

#endif

}  // namespace

BENCHMARK_MAIN();
