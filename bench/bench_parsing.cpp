// Reading the service's answers, as the client does after every call:
//   parse/fql_users_150     FqlParseObj over a contact page: 150 "user" rows of uid, name, pic_big;
//   parse/stream_posts_75   FStreamParseObj over a stream answer of 75 posts of every kind, with
//                           its profiles and albums;
//   expat/...               the baseline for each: one bare expat pass over the same bytes with
//                           callbacks that do nothing (parser made and freed per document, as the
//                           client's parser does).
// The documents are the emulator's own answers, rendered as it sends them. run.sh prints each
// parse/ figure as a ratio to its expat/ twin.
#include <benchmark/benchmark.h>
#include <expat.h>

#include <cstdio>
#include <cstdlib>
#include <memory>
#include <string>

#include "SqliteStore.h"
#include "XmlNode.h"
#include "trelm/FStreamParseObj.h"
#include "trelm/FqlParseObj.h"

namespace {

using trelm::Map;
using trelm::String;
using trelm::Vector;

struct Documents {
    std::string users;   // fql_query_response with 150 rows
    std::string stream;  // stream_get_response with 75 posts
};

[[noreturn]] void fail(char const* what, std::string const& why) {
    std::fprintf(stderr, "%s: %s\n", what, why.c_str());
    std::abort();
}

Documents const& documents() {
    static Documents const docs = [] {
        std::string error;
        std::unique_ptr<emu::SqliteStore> store = emu::SqliteStore::openDatabase(":memory:", error);
        if (!store) fail("open", error);
        emu::GeneratorOptions options;
        options.users = 1000;
        options.demoFriends = 300;
        options.postsPerUser = 3;
        if (emu::Status s = store->generate(options)) fail("generate", s->message);

        Documents made;
        std::string const me = std::to_string(emu::DemoAccount::uid);
        emu::XmlNode users("fql_query_response");
        if (emu::Status s = store->fqlQuery(emu::DemoAccount::uid,
                                            "select uid,name,pic_big from user where uid in (select uid2 from "
                                            "friend where uid1='" + me + "') order by concat(uid,' ') asc limit 150",
                                            users))
            fail("fql", s->message);
        if (users.children.size() != 150) fail("fql", "not 150 rows");
        made.users = emu::renderDocument(users);

        emu::XmlNode stream("stream_get_response");
        if (emu::Status s = store->streamGet(emu::DemoAccount::uid, me, "", "", "75", stream))
            fail("stream", s->message);
        made.stream = emu::renderDocument(stream);
        return made;
    }();
    return docs;
}

void BM_FqlUsers(benchmark::State& state) {
    std::string const& doc = documents().users;
    String const xml(doc);
    unsigned count = 0;
    for (auto _ : state) {
        trelm::FqlParseObj parser("fql_query_response", "user", 0);
        Vector<Map<String, String>> rows;
        if (parser.parse(xml, rows, count).failed()) state.SkipWithError("parse failed");
        benchmark::DoNotOptimize(rows.size());
    }
    if (count != 150) state.SkipWithError("not 150 rows");
    state.SetBytesProcessed(static_cast<int64_t>(state.iterations()) * doc.size());
    state.SetItemsProcessed(static_cast<int64_t>(state.iterations()) * count);
}
BENCHMARK(BM_FqlUsers)->Name("parse/fql_users_150");

void BM_StreamPosts(benchmark::State& state) {
    std::string const& doc = documents().stream;
    String const xml(doc);
    unsigned count = 0;
    for (auto _ : state) {
        trelm::FStreamParseObj parser;
        Vector<Map<String, String>> rows;
        if (parser.parse(xml, rows, count).failed()) state.SkipWithError("parse failed");
        benchmark::DoNotOptimize(rows.size());
    }
    if (count != 75) state.SkipWithError("not 75 posts");
    state.SetBytesProcessed(static_cast<int64_t>(state.iterations()) * doc.size());
    state.SetItemsProcessed(static_cast<int64_t>(state.iterations()) * count);
}
BENCHMARK(BM_StreamPosts)->Name("parse/stream_posts_75");

void XMLCALL noStart(void*, XML_Char const*, XML_Char const**) {}
void XMLCALL noEnd(void*, XML_Char const*) {}
void XMLCALL noChars(void*, XML_Char const*, int) {}

void bareExpat(benchmark::State& state, std::string const& doc) {
    for (auto _ : state) {
        XML_Parser parser = XML_ParserCreate(nullptr);
        XML_SetElementHandler(parser, noStart, noEnd);
        XML_SetCharacterDataHandler(parser, noChars);
        if (XML_Parse(parser, doc.data(), static_cast<int>(doc.size()), XML_TRUE) != XML_STATUS_OK)
            state.SkipWithError("expat failed");
        XML_ParserFree(parser);
    }
    state.SetBytesProcessed(static_cast<int64_t>(state.iterations()) * doc.size());
}

void BM_ExpatUsers(benchmark::State& state) { bareExpat(state, documents().users); }
BENCHMARK(BM_ExpatUsers)->Name("expat/fql_users_150");

void BM_ExpatStream(benchmark::State& state) { bareExpat(state, documents().stream); }
BENCHMARK(BM_ExpatStream)->Name("expat/stream_posts_75");

}  // namespace

BENCHMARK_MAIN();
