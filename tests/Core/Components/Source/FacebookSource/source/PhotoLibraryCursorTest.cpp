// The album, media and photo-tag cursors against the in-process emulator: one suite over the three
// kinds, each in its orderings and both senses, checked against what a client of its own reads
// from the service in one statement.
#include <gtest/gtest.h>

#include <algorithm>
#include <cstdint>
#include <map>
#include <ostream>
#include <set>
#include <string>
#include <vector>

#include "AlbumCursor.h"
#include "EmulatorHost.h"
#include "ErrorAssertions.h"
#include "IQueryItems.h"
#include "MediaCursor.h"
#include "PhotoTagCursor.h"
#include "trelm/GUID.h"

namespace trelm::test {
namespace {

using Constraint = IQueryItems::Constraint;
using Cursor = SmartPtr<IQueryItems::ICursor>;
using Row = std::map<std::string, std::string>;

constexpr int kAlbums = 1200;       // of the demo user
constexpr int kPhotosPerAlbum = 2;  // so 2400 photos of the demo user, and as many tags naming it
constexpr int kWindow = 150;
constexpr char const* kSourceName = "facebook";
std::string const kDemoUid = std::to_string(emu::DemoAccount::uid);

// One kind as the test reads it from the service, and one of its orderings.
struct KindCase {
    char const* name;
    int type;
    PhotoLibraryCursor::Kind const* kind;
    std::string reference;                  // the kind's default rows, read by a client of its own
    std::string table;
    std::vector<std::string> identity;      // row fields that identify a row, in order
    std::vector<std::string> identityKeys;  // the record keys they land in
    std::vector<std::string> orderFields;   // row fields whose blank-joined text is the order
    char const* orderKey;                   // the ordering column asked for; null: the default
    bool ascending;
    std::string sinceField;                 // the row field the since mode compares
};

void PrintTo(KindCase const& c, std::ostream* os) { *os << c.name; }

std::vector<KindCase> kindCases() {
    std::string const albums = "select aid,created,modified from album where owner = " + kDemoUid;
    std::string const media = "select pid,created from photo where owner = " + kDemoUid;
    std::string const tags = "select pid,subject,created from photo_tag where subject = " + kDemoUid;
    KindCase const album{"AlbumsNewestFirst", 11, &AlbumCursor::kKind, albums, "album", {"aid"}, {"core_service_id"},
                         {"created", "aid"}, nullptr, false, "modified"};
    KindCase const photo{"MediaNewestFirst", 9, &MediaCursor::kKind, media, "photo", {"pid"}, {"core_service_id"},
                         {"created", "pid"}, nullptr, false, "created"};
    KindCase const tag{"PhotoTagsNewestFirst", 13, &PhotoTagCursor::kKind, tags, "photo_tag", {"pid", "subject"},
                       {"facebook_photo_tag_photo_service_id", "facebook_photo_tag_tagged_service_id"},
                       {"created", "pid", "subject"}, nullptr, false, "created"};
    auto variant = [](KindCase c, char const* name, char const* key, bool ascending,
                      std::vector<std::string> order) {
        c.name = name;
        c.orderKey = key;
        c.ascending = ascending;
        if (!order.empty()) c.orderFields = std::move(order);
        return c;
    };
    return {
        album,
        variant(album, "AlbumsOldestFirst", "core_object_time", true, {}),
        variant(album, "AlbumsByModificationAscending", "facebook_album_modified", true, {"modified", "aid"}),
        variant(album, "AlbumsByIdDescending", "core_service_id", false, {"aid"}),
        photo,
        variant(photo, "MediaOldestFirst", "core_object_time", true, {}),
        variant(photo, "MediaByIdAscending", "core_service_id", true, {"pid"}),
        tag,
        variant(tag, "PhotoTagsOldestFirst", "core_object_time", true, {}),
        variant(tag, "PhotoTagsByPhotoDescending", "facebook_photo_tag_photo_service_id", false, {"pid", "subject"}),
    };
}

std::string joined(Row const& row, std::vector<std::string> const& fields) {
    std::string text;
    for (std::string const& f : fields) text += (text.empty() ? "" : " ") + row.at(f);
    return text;
}

// A demo user with over a thousand albums and thousands of photos and tags; the source is signed
// in with a session of the demo user.
class PhotoLibraryCursorTest : public ::testing::TestWithParam<KindCase> {
protected:
    static void SetUpTestSuite() {
        emu::GeneratorOptions generator;
        generator.users = 40;
        generator.demoFriends = 3;
        generator.friendsPerUser = 2;
        generator.albumsPerUser = kAlbums;
        generator.photosPerAlbum = kPhotosPerAlbum;
        generator.tagsPerPhoto = 1;
        generator.postsPerUser = 1;
        generator.threadsPerUser = 1;
        generator.messagesPerThread = 1;
        generator.friendRequests = 1;
        host = new EmulatorHost(generator);
        std::string error;
        ASSERT_TRUE(host->start(error)) << error;
        source = &host->addSource(host->demoGroup(kSourceName, true));
    }

    static void TearDownTestSuite() {
        delete host;
        host = nullptr;
    }

    void SetUp() override {
        rows_ = referenceRows(GetParam());
        host->emulator().log().clear();
    }

    // The kind's rows in the cursor's order, read in one statement by a client of its own.
    static std::vector<Row> referenceRows(KindCase const& c) {
        Vector<Map<String, String>> answer;
        unsigned count = 0;
        EXPECT_OK(host->demoClient()->runFqlQuery(String(c.reference), String(c.table), answer, 0, count));
        std::vector<Row> rows;
        for (auto const& fields : answer) {
            Row row;
            for (auto const& [k, v] : fields) row[k.str()] = v.str();
            rows.push_back(row);
        }
        std::sort(rows.begin(), rows.end(), [&](Row const& a, Row const& b) {
            std::string const x = joined(a, c.orderFields), y = joined(b, c.orderFields);
            return c.ascending ? x < y : x > y;
        });
        return rows;
    }

    static Cursor open(KindCase const& c, std::int64_t position = -1) {
        Vector<IQueryItems::Column> columns;
        if (c.orderKey != nullptr) {
            EXPECT_OK(columns.pushBack({Metadata::Key(c.orderKey, TRELM_TYPES::STRING), c.ascending}));
        }
        IQueryItems::StartQueryMessage msg(
            columns, Vector<Constraint>{Constraint{Metadata::Key("core_object_type", TRELM_TYPES::INT32),
                                                   Variant(c.type), Constraint::Equal}},
            position);
        msg.interactive = position == -1;
        EXPECT_OK(source->onMessage(msg));
        return msg.cursor;
    }

    std::string identityOf(SmartPtr<Map<String, Variant>> const& record) const {
        std::string text;
        for (std::string const& key : GetParam().identityKeys) {
            Variant const* v = record->search(String(key));
            text += (text.empty() ? "" : " ") + (v ? v->asString().str() : std::string("?"));
        }
        return text;
    }
    std::string identityAt(Cursor const& cursor) const {
        SmartPtr<Map<String, Variant>> row;
        EXPECT_OK(cursor->getRow(row));
        return row ? identityOf(row) : "";
    }
    std::string expectedAt(std::size_t index) const { return joined(rows_[index], GetParam().identity); }
    std::vector<std::string> expectedOrder() const {
        std::vector<std::string> out;
        for (std::size_t i = 0; i < rows_.size(); ++i) out.push_back(expectedAt(i));
        return out;
    }

    static EmulatorHost* host;
    static FacebookSource* source;
    std::vector<Row> rows_;
};

EmulatorHost* PhotoLibraryCursorTest::host = nullptr;
FacebookSource* PhotoLibraryCursorTest::source = nullptr;

TEST_P(PhotoLibraryCursorTest, WalksBothWaysVisitEveryRowOnceInOrderWithOneStatementPerPage) {
    KindCase const& c = GetParam();
    std::size_t const n = rows_.size();
    ASSERT_GE(n, 1000u);

    Cursor cursor = open(c);
    ASSERT_TRUE(cursor);
    std::vector<std::string> seen;
    std::set<GUID> guids;
    int moved = 1;
    while (moved != 0) {
        SmartPtr<Map<String, Variant>> row;
        ASSERT_OK(cursor->getRow(row));
        seen.push_back(identityOf(row));
        guids.insert(row->search("core_object_id")->asGUID());
        ASSERT_CODE(cursor->seek(1, moved), seen.size() == n ? unsigned(kNoData) : kSuccess);
    }
    EXPECT_EQ(seen, expectedOrder());
    EXPECT_EQ(guids.size(), n) << "every row has a GUID of its own";

    // One statement per window and one more that finds the end; each later page starts after
    // the last row of the window before it.
    std::vector<std::string> statements = host->fqlStatements();
    ASSERT_EQ(statements.size(), n / kWindow + 1);
    EXPECT_EQ(statements[0].rfind("select " + std::string(c.kind->fields) + " from " + c.table + " where ", 0), 0u)
        << statements[0];
    EXPECT_EQ(statements[0].find(" and ("), std::string::npos) << "the first page has no keyset";
    EXPECT_NE(statements[0].find(c.ascending ? " ASC limit 150" : " DESC limit 150"), std::string::npos)
        << statements[0];
    for (std::size_t k = 1; k < statements.size(); ++k) {
        std::string const key = "'" + joined(rows_[k * kWindow - 1], c.orderFields) + "')";
        EXPECT_NE(statements[k].find(key), std::string::npos) << "page " << k << ": " << statements[k];
    }

    // Back from the end, the same rows in reverse, again one statement per window.
    host->emulator().log().clear();
    ASSERT_OK(cursor->jumpEnd());
    seen.clear();
    moved = -1;
    while (moved != 0) {
        seen.push_back(identityAt(cursor));
        ASSERT_TRUE(cursor->seek(-1, moved).ok());
    }
    std::reverse(seen.begin(), seen.end());
    EXPECT_EQ(seen, expectedOrder());
    statements = host->fqlStatements();
    ASSERT_EQ(statements.size(), n / kWindow + 1);
    EXPECT_NE(statements[0].find(c.ascending ? " DESC limit 150" : " ASC limit 150"), std::string::npos)
        << statements[0];
}

TEST_P(PhotoLibraryCursorTest, JumpsSeeksAndCountsLandOnTheRightRowAndKnowItsIndex) {
    int const n = static_cast<int>(rows_.size());
    Cursor cursor = open(GetParam());
    unsigned count = 0;
    ASSERT_OK(cursor->numRows(count));
    EXPECT_EQ(count, unsigned(n));
    std::vector<std::string> statements = host->fqlStatements();
    ASSERT_EQ(statements.size(), 1u);
    EXPECT_EQ(statements[0].rfind("select '' from ", 0), 0u) << statements[0];
    EXPECT_EQ(statements[0].find("ORDER BY"), std::string::npos) << statements[0];

    struct Move {
        enum Op { Jump, Seek, Beginning, End } op;
        int arg;
        unsigned code;
        int index;  // where the cursor must stand afterwards
        int moved;  // for Seek
    };
    int const half = n / 2;
    Move const moves[] = {
        {Move::Jump, half, kSuccess, half, 0},
        {Move::Seek, -400, kSuccess, half - 400, -400},  // back across window edges
        {Move::Seek, 100, kSuccess, half - 300, 100},    // forward across the edge of that window
        {Move::Seek, 700, kSuccess, half + 400, 700},
        {Move::Seek, 5 * n, kNoData, n - 1, n - 1 - (half + 400)},  // stops on the last row
        {Move::Seek, 0, kSuccess, n - 1, 0},
        {Move::Seek, -5 * n, kNoData, 0, -(n - 1)},  // stops on the first row
        {Move::Jump, n, kNoData, n - 1, 0},
        {Move::Jump, 149, kSuccess, 149, 0},
        {Move::Jump, 150, kSuccess, 150, 0},
        {Move::End, 0, kSuccess, n - 1, 0},
        {Move::Seek, -150, kSuccess, n - 151, -150},
        {Move::Beginning, 0, kSuccess, 0, 0},
    };
    for (Move const& m : moves) {
        SCOPED_TRACE("move " + std::to_string(m.op) + " " + std::to_string(m.arg));
        int moved = 0;
        uError err;
        switch (m.op) {
            case Move::Jump: err = cursor->jump(static_cast<unsigned>(m.arg)); break;
            case Move::Seek: err = cursor->seek(m.arg, moved); break;
            case Move::Beginning: err = cursor->jumpBeginning(); break;
            case Move::End: err = cursor->jumpEnd(); break;
        }
        ASSERT_CODE(err, m.code);
        if (m.op == Move::Seek) {
            EXPECT_EQ(moved, m.moved);
        }
        EXPECT_EQ(identityAt(cursor), expectedAt(static_cast<std::size_t>(m.index)));
        unsigned index = 0;
        ASSERT_OK(cursor->curRow(index));
        EXPECT_EQ(index, unsigned(m.index));
    }
}

// The since mode: one statement without a row limit for the rows changed at or after the given
// time, the whole answer in one window.
TEST_P(PhotoLibraryCursorTest, PositionFetchesEverythingSinceThatTimeInOneStatement) {
    KindCase const& c = GetParam();
    // A time in the middle of the rows' own, so that about half of them count.
    std::vector<long long> times;
    for (Row const& row : rows_) times.push_back(std::stoll(row.at(c.sinceField)));
    std::sort(times.begin(), times.end());
    long long const since = times[times.size() / 2];
    std::vector<std::string> expected;
    for (std::size_t i = 0; i < rows_.size(); ++i) {
        if (std::stoll(rows_[i].at(c.sinceField)) >= since) expected.push_back(expectedAt(i));
    }
    ASSERT_GT(expected.size(), size_t(kWindow)) << "more than a page, so that a paged cursor would page";

    Cursor cursor = open(c, since);
    ASSERT_TRUE(cursor);
    std::vector<std::string> seen;
    int moved = 1;
    while (moved != 0) {
        seen.push_back(identityAt(cursor));
        ASSERT_TRUE(cursor->seek(1, moved).ok());
    }
    EXPECT_EQ(seen, expected);
    unsigned count = 0;
    ASSERT_OK(cursor->numRows(count));
    EXPECT_EQ(count, expected.size());
    ASSERT_OK(cursor->jumpEnd());
    unsigned index = 0;
    ASSERT_OK(cursor->curRow(index));
    EXPECT_EQ(index, expected.size() - 1);
    ASSERT_OK(cursor->jump(3));
    EXPECT_EQ(identityAt(cursor), expected[3]);

    // The jumps move over the window; the one statement is neither limited nor keyed.
    std::vector<std::string> const statements = host->fqlStatements();
    ASSERT_FALSE(statements.empty());
    EXPECT_EQ(statements.size(), 1u);
    for (std::string const& s : statements) {
        EXPECT_EQ(s, statements[0]);
        EXPECT_EQ(s.find("limit"), std::string::npos) << s;
        EXPECT_NE(s.find(" and " + c.sinceField + " >= " + std::to_string(since) + " ORDER BY "), std::string::npos)
            << s;
    }
}

// Every field of the kind's answer lands under its key, converted by the key's type.
TEST_P(PhotoLibraryCursorTest, RecordsCarryEveryAnswerFieldUnderItsKeyAndTheSourcesIdentity) {
    KindCase const& c = GetParam();
    Cursor cursor = open(c);
    SmartPtr<Map<String, Variant>> record;
    ASSERT_OK(cursor->getRow(record));
    std::string where;
    for (std::size_t i = 0; i < c.identity.size(); ++i) {
        where += (i ? " and " : "") + c.identity[i] + " = '" +
                 record->search(String(c.identityKeys[i]))->asString().str() + "'";
    }
    Vector<Map<String, String>> answer;
    unsigned total = 0;
    ASSERT_OK(host->demoClient()->runFqlQuery(
        String("select " + std::string(c.kind->fields) + " from " + c.table + " where " + where), String(c.table),
        answer, 0, total));
    ASSERT_EQ(answer.size(), 1u);
    for (PhotoLibraryCursor::FieldMapping const& m : c.kind->fieldMap) {
        SCOPED_TRACE(m.recordKey);
        String const* field = answer[0].search(m.rowField);
        Variant const* got = record->search(m.recordKey);
        if (field == nullptr) {
            EXPECT_EQ(got, nullptr) << "a field the answer lacks leaves its key unset";
            continue;
        }
        ASSERT_NE(got, nullptr);
        EXPECT_EQ(got->asString(), *field);
        TRELM_TYPES::TYPES type = TRELM_TYPES::STRING;
        ASSERT_OK(Metadata::getType(m.recordKey, type));
        EXPECT_EQ(got->type(), type == TRELM_TYPES::INT32 ? Variant::Int32 : Variant::String);
    }
    std::vector<std::pair<char const*, Variant>> const fixed = {
        {"core_object_type", Variant(c.type)},
        {"core_object_source", Variant(kSourceName)},
        {"core_object_origin_importcomponent", Variant(kSourceName)},
        {"core_object_origin_servicename", Variant("Facebook")},
        {"core_object_deleted", Variant(false)},
    };
    for (auto const& [key, value] : fixed) {
        ASSERT_NE(record->search(key), nullptr) << key;
        EXPECT_EQ(*record->search(key), value) << key;
    }
}

INSTANTIATE_TEST_SUITE_P(Kinds, PhotoLibraryCursorTest, ::testing::ValuesIn(kindCases()),
                         [](auto const& info) { return std::string(info.param.name); });

}  // namespace
}  // namespace trelm::test
