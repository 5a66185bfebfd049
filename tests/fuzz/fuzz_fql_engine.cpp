// The emulator's FQL engine over a small generated dataset: any statement is parsed, checked,
// translated and run, or refused with an error; the answer, or the error document naming the
// statement, must be well-formed in XML and in JSON.
#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <memory>
#include <string>

#include "JsonAnswerWriter.h"
#include "Protocol.h"
#include "SqliteStore.h"
#include "WellFormed.h"
#include "XmlAnswerWriter.h"

namespace {

emu::SqliteStore& store() {
    static std::unique_ptr<emu::SqliteStore> made = [] {
        std::string error;
        auto s = emu::SqliteStore::openDatabase(":memory:", error);
        emu::GeneratorOptions o;
        o.users = 30;
        o.demoFriends = 8;
        o.friendsPerUser = 3;
        if (!s || s->generate(o)) std::abort();
        s->setClock([] { return std::int64_t{1700000000}; });
        return s;
    }();
    return *made;
}

template <typename Writer>
std::string answer(std::string const& query, emu::Protocol::Format format) {
    Writer w;
    w.open("fql_query_response", true);
    const emu::Status s = store().fqlQuery(emu::DemoAccount::uid, query, w);
    w.close();
    if (s) return emu::Protocol::errorDocument(*s, {{"query", query}}, format);
    return w.take();
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(std::uint8_t const* data, std::size_t size) {
    if (size > 4096) return 0;  // statements of the client are a few hundred bytes
    const std::string query(reinterpret_cast<char const*>(data), size);
    fuzz::requireXml(answer<emu::XmlAnswerWriter>(query, emu::Protocol::Format::Xml));
    fuzz::requireJson(answer<emu::JsonAnswerWriter>(query, emu::Protocol::Format::Json));
    return 0;
}
