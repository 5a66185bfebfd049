// Signing one service call, as the client does for every request:
//   sign/addAuth        the authentication fields added to the call and the signature made, under
//                       the client mutex, as before every request;
//   md5/bare            the baseline: md5Hex of the very text the client hashes, built once.
// The call is a contact page statement of 200 characters with a session, so it carries "api_key",
// "call_id", "method", "query", "session_key" and "v". run.sh prints the sign/ figure as a ratio
// to md5/bare.
#include <benchmark/benchmark.h>

#include <cstdio>
#include <cstdlib>

#include "ConnectionInfo.h"
#include "FacebookLibrary.h"
#include "trelm/MD5.h"

namespace {

using trelm::FacebookLibrary;
using trelm::Map;
using trelm::String;

// A keyset page statement of the contact cursor, padded with blanks to 200 characters (the
// service ignores them), the size of a typical call.
String pageQuery() {
    std::string query =
        "select uid,name,pic_big from user where uid in (select uid2 from friend where uid1='100000001') "
        "and (concat(uid,' ') > '100004711 ') order by concat(uid,' ') asc limit 150";
    query.resize(200, ' ');
    return String(query);
}

void check(trelm::uError const& err, char const* what) {
    if (err.failed()) {
        std::fprintf(stderr, "%s: %s\n", what, err.toText().c_str());
        std::abort();
    }
}

// A client signed in with a session held in memory only, so no message leaves it.
struct Signer {
    trelm::SmartPtr<FacebookLibrary> library = trelm::makeSmart<FacebookLibrary>();
    Map<String, String> call;  // method, v and query: what addAuth receives
    Map<String, String> signedCall;  // the same with the authentication fields, without "sig"
    String text;  // what the client hashes for signedCall

    Signer() {
        auto info = trelm::makeSmart<FacebookLibrary::ConnectionInfo>("bench");
        check(info->setAppConfig("4f6b1e0c9a7d4c2e8b3a5d6f7e8c9b0a", "c3d2e1f0a9b8c7d6e5f4a3b2c1d0e9f8"), "app");
        check(info->setSessionConfig("2.AbCdEfGhIjKlMnOpQrStUv__.3600.1262304000-100000001",
                                     "9e8d7c6b5a4f3e2d1c0b9a8f7e6d5c4b", "100000001", false, false),
              "session");
        check(library->setup(info), "setup");
        check(library->makeBaseArgs("facebook.fql.query", call), "base");
        check(call.insert("query", pageQuery()), "query");

        signedCall = call;
        check(library->addAuth(signedCall, true), "addAuth");
        String sig = *signedCall.search("sig");
        check(signedCall.remove("sig"), "remove sig");
        for (auto const& [key, value] : signedCall) text += key + "=" + value;
        text += "9e8d7c6b5a4f3e2d1c0b9a8f7e6d5c4b";
        // The baseline must hash exactly what the client hashes.
        if (trelm::md5Hex(text) != sig) {
            std::fprintf(stderr, "the baseline text differs from the signed text\n");
            std::abort();
        }
    }
};

Signer& signer() {
    static Signer s;
    return s;
}

void BM_AddAuth(benchmark::State& state) {
    Signer& s = signer();
    Map<String, String> args = s.call;
    for (auto _ : state) {
        // addAuth replaces the fields it adds; only a previous "sig" would join the signed text.
        args.remove("sig").ignore();  // absent on the first round
        if (s.library->addAuth(args, true).failed()) state.SkipWithError("addAuth failed");
        benchmark::DoNotOptimize(args.search("sig"));
    }
    state.SetBytesProcessed(static_cast<int64_t>(state.iterations()) * s.text.size());
}
BENCHMARK(BM_AddAuth)->Name("sign/addAuth");

void BM_BareMd5(benchmark::State& state) {
    Signer& s = signer();
    for (auto _ : state) {
        String sig = trelm::md5Hex(s.text);
        benchmark::DoNotOptimize(sig.cStr());
    }
    state.SetBytesProcessed(static_cast<int64_t>(state.iterations()) * s.text.size());
}
BENCHMARK(BM_BareMd5)->Name("md5/bare");

}  // namespace

BENCHMARK_MAIN();
