// The FQL cursors that page by keyset (contacts, albums, media, photo tags) against the in-process
// emulator: one suite over the kinds in their orderings and both senses, checked against what a
// client of its own reads in one statement.
#include <gtest/gtest.h>

#include <algorithm>
#include <cctype>
#include <map>
#include <memory>
#include <ostream>
#include <set>
#include <string>
#include <utility>
#include <vector>

#include "AlbumCursor.h"
#include "EmulatorHost.h"
#include "ErrorAssertions.h"
#include "MediaCursor.h"
#include "PhotoTagCursor.h"
#include "trelm/GUID.h"

namespace trelm::test {
namespace {

using Constraint = IQueryItems::Constraint;
using Cursor = SmartPtr<IQueryItems::ICursor>;
using Row = std::map<std::string, std::string>;

constexpr unsigned kWindow = 150;
std::string const kDemoUid = std::to_string(emu::DemoAccount::uid);
std::string const kFriendsOfDemo = "uid in (select uid2 from friend where uid1='" + kDemoUid + "')";

struct KindCase {
    char const* name;
    int type;
    std::string select;                    // the kind's default rows with every field
    std::vector<std::string> identity;     // row fields that identify a row
    std::vector<std::string> orderFields;  // row fields whose blank-joined text is the order
    std::string sinceField;                // the row field a position compares; empty: no unpaged mode
    std::vector<std::pair<std::string, std::string>> fields;  // record key <- answer field
    char const* orderKey = nullptr;        // the ordering column asked for; null: the default
    bool ascending = false;
};

void PrintTo(KindCase const& c, std::ostream* os) { *os << c.name; }

KindCase library(char const* name, int type, PhotoLibraryCursor::Kind const& kind, std::string const& where,
                 std::vector<std::string> identity, std::vector<std::string> order, char const* since) {
    std::string const select = "select " + std::string(kind.fields) + " from " + kind.table + " where " + where;
    KindCase c{name, type, select, identity, order, since, {}};
    for (PhotoLibraryCursor::FieldMapping const& m : kind.fieldMap) c.fields.emplace_back(m.recordKey, m.rowField);
    return c;
}

std::vector<KindCase> kindCases() {
    KindCase contact{
        "ContactsByIdText", 2, "select uid,name,pic_big from user where " + kFriendsOfDemo, {"uid"}, {"uid"}, "", {}};
    contact.fields = {
        {"core_contact_service_id", "uid"}, {"core_contact_name", "name"}, {"core_contact_display_name", "name"}};
    contact.ascending = true;
    KindCase const album = library("AlbumsNewestFirst", 11, AlbumCursor::kKind, "owner = " + kDemoUid, {"aid"},
                                   {"created", "aid"}, "modified");
    KindCase const media = library("MediaNewestFirst", 9, MediaCursor::kKind, "owner = " + kDemoUid, {"pid"},
                                   {"created", "pid"}, "created");
    KindCase const tag = library("PhotoTagsNewestFirst", 13, PhotoTagCursor::kKind, "subject = " + kDemoUid,
                                 {"pid", "subject"}, {"created", "pid", "subject"}, "created");
    auto ordered = [](KindCase c, char const* name, char const* key, bool ascending, std::vector<std::string> fields) {
        c.name = name;
        c.orderKey = key;
        c.ascending = ascending;
        c.orderFields = fields.empty() ? c.orderFields : fields;
        return c;
    };
    return {contact, album,
            ordered(album, "AlbumsOldestFirst", "core_object_time", true, {}),
            ordered(album, "AlbumsByModification", "facebook_album_modified", true, {"modified", "aid"}),
            ordered(album, "AlbumsByIdDescending", "core_service_id", false, {"aid"}),
            media, ordered(media, "MediaByIdAscending", "core_service_id", true, {"pid"}),
            tag, ordered(tag, "PhotoTagsByPhotoDescending", "facebook_photo_tag_photo_service_id", false, {"pid", "subject"})};
}

std::string joined(Row const& row, std::vector<std::string> const& fields) {
    std::string text;
    for (std::string const& f : fields) text += (text.empty() ? "" : " ") + row.at(f);
    return text;
}

std::string lower(std::string text) {
    std::transform(text.begin(), text.end(), text.begin(), [](unsigned char c) { return std::tolower(c); });
    return text;
}

// A demo user with over a thousand friends (contacts), or one with over a thousand albums and
// thousands of photos and tags naming it (few users with content: the demo user holds the rows
// that count). One host at a time, started when the kinds change over: two emulators would share
// the service's host name in the client's connections.
class FqlCursorWalkTest : public ::testing::TestWithParam<KindCase> {
protected:
    static void TearDownTestSuite() { host.reset(); }

    // The kind's rows in the cursor's order.
    void SetUp() override {
        KindCase const& c = GetParam();
        if (!host || contacts != (c.type == 2)) {
            contacts = c.type == 2;
            host.reset();
            host = std::make_unique<EmulatorHost>(
                contacts ? emu::GeneratorOptions{.users = 1700, .demoFriends = 1500, .friendsPerUser = 2, .postsPerUser = 0}
                         : emu::GeneratorOptions{.users = 10, .demoFriends = 3, .albumsPerUser = 1200, .photosPerAlbum = 2});
            std::string error;
            ASSERT_TRUE(host->start(error)) << error;
            source = &host->addSource(host->demoGroup("facebook", true));
        }
        rows_ = host->fql(c.select);
        std::sort(rows_.begin(), rows_.end(), [&](Row const& a, Row const& b) {
            return c.ascending ? joined(a, c.orderFields) < joined(b, c.orderFields)
                               : joined(a, c.orderFields) > joined(b, c.orderFields);
        });
        ASSERT_GE(rows_.size(), 1000u);
        host->emulator().log().clear();
    }

    Cursor open(std::int64_t position = -1) const {
        KindCase const& c = GetParam();
        Vector<IQueryItems::Column> columns;
        if (c.orderKey != nullptr) {
            EXPECT_OK(columns.pushBack({Metadata::Key(c.orderKey, TRELM_TYPES::STRING), c.ascending}));
        }
        return EmulatorHost::open(*source, c.type, columns, {}, position);
    }

    static std::string identity(Map<String, Variant> const& row) {
        std::string text;
        for (std::string const& field : GetParam().identity) {
            auto const& [key, f] = *std::find_if(GetParam().fields.begin(), GetParam().fields.end(),
                                                 [&](auto const& m) { return m.second == field; });
            text += (text.empty() ? "" : " ") + row.search(String(key))->asString().str();
        }
        return text;
    }
    static SmartPtr<Map<String, Variant>> rowAt(Cursor const& cursor) {
        SmartPtr<Map<String, Variant>> row;
        EXPECT_OK(cursor->getRow(row));
        return row ? row : makeSmart<Map<String, Variant>>();
    }

    // The cursor's rows from where it stands, seeking by `step` until it cannot move, in the
    // cursor's order; `guids` collects their GUIDs.
    static std::vector<std::string> walk(Cursor const& cursor, int step, std::set<GUID>* guids = nullptr) {
        std::vector<std::string> seen;
        for (auto const& row : EmulatorHost::walk(*cursor, step)) {
            seen.push_back(identity(row));
            if (guids != nullptr) guids->insert(row.search("core_object_id")->asGUID());
        }
        return seen;
    }

    std::vector<std::string> expected(std::string const& since = "") const {
        std::vector<std::string> out;
        for (Row const& row : rows_) {
            if (since.empty() || std::stoll(row.at(GetParam().sinceField)) >= std::stoll(since)) {
                out.push_back(joined(row, GetParam().identity));
            }
        }
        return out;
    }

    static inline std::unique_ptr<EmulatorHost> host;
    static inline FacebookSource* source = nullptr;
    static inline bool contacts = false;  // the host serves the contact kinds
    std::vector<Row> rows_;
};

TEST_P(FqlCursorWalkTest, WalksBothWaysVisitEveryRowOnceInOrderWithOneStatementPerWindow) {
    Cursor cursor = open();
    std::set<GUID> guids;
    EXPECT_EQ(walk(cursor, 1, &guids), expected());
    EXPECT_EQ(guids.size(), rows_.size()) << "every row has a GUID of its own";
    // One statement per window and one more that finds the end, each way.
    std::vector<std::string> statements = host->fqlStatements();
    EXPECT_EQ(statements.size(), rows_.size() / kWindow + 1);
    EXPECT_NE(lower(statements[0]).find(GetParam().ascending ? " asc limit 150" : " desc limit 150"), std::string::npos)
        << statements[0];

    host->emulator().log().clear();
    ASSERT_OK(cursor->jumpEnd());
    EXPECT_EQ(walk(cursor, -1), expected());
    EXPECT_EQ(host->fqlStatements().size(), rows_.size() / kWindow + 1);
}

TEST_P(FqlCursorWalkTest, JumpsSeeksAndCountsLandOnTheRightRowAndKnowItsIndex) {
    int const n = static_cast<int>(rows_.size());
    Cursor cursor = open();
    GUID const first = rowAt(cursor)->search("core_object_id")->asGUID();
    host->emulator().log().clear();
    unsigned count = 0;
    ASSERT_OK(cursor->numRows(count));
    EXPECT_EQ(count, unsigned(n));
    ASSERT_OK(cursor->numRows(count));  // from memory
    ASSERT_EQ(host->fqlStatements().size(), 1u);
    EXPECT_EQ(lower(host->fqlStatements()[0]).find(" order by"), std::string::npos) << "a count needs no ordering";

    enum Op { Jump, Seek, Beginning, End };
    struct Move {
        Op op;
        int arg;
        unsigned code;
        int index;  // where the cursor stands afterwards
        int moved;  // for Seek
    };
    int const half = n / 2;
    Move const moves[] = {
        {Jump, half, kSuccess, half, 0},
        {Seek, -400, kSuccess, half - 400, -400},  // back across window edges
        {Seek, 100, kSuccess, half - 300, 100},    // forward across the edge of that window
        {Seek, 700, kSuccess, half + 400, 700},
        {Seek, 5 * n, kNoData, n - 1, n - 1 - (half + 400)},  // past the end: stops on the last row
        {Seek, 0, kSuccess, n - 1, 0},
        {Seek, -5 * n, kNoData, 0, -(n - 1)},  // before the beginning: stops on the first
        {Jump, n, kNoData, n - 1, 0},
        {Jump, 149, kSuccess, 149, 0},
        {Jump, 150, kSuccess, 150, 0},
        {Seek, -100, kSuccess, 50, -100},  // a short backward window: rows 0..50
        {Seek, 1, kSuccess, 51, 1},        // off its last row: the next page, not the end
        {End, 0, kSuccess, n - 1, 0},
        {Seek, -150, kSuccess, n - 151, -150},
        {Beginning, 0, kSuccess, 0, 0},
    };
    std::vector<std::string> const order = expected();
    for (Move const& m : moves) {
        SCOPED_TRACE("move " + std::to_string(m.op) + " " + std::to_string(m.arg));
        int moved = 0;
        uError err = m.op == Jump   ? cursor->jump(static_cast<unsigned>(m.arg))
                     : m.op == Seek ? cursor->seek(m.arg, moved)
                     : m.op == End  ? cursor->jumpEnd()
                                    : cursor->jumpBeginning();
        ASSERT_CODE(err, m.code);
        EXPECT_EQ(moved, m.moved);
        EXPECT_EQ(identity(*rowAt(cursor)), order[static_cast<std::size_t>(m.index)]);
        unsigned index = 0;
        ASSERT_OK(cursor->curRow(index));
        EXPECT_EQ(index, unsigned(m.index));
    }
    // The cursor keeps the GUIDs it gave out across refills.
    EXPECT_EQ(rowAt(cursor)->search("core_object_id")->asGUID(), first);
}

TEST_P(FqlCursorWalkTest, PositionFetchesEverythingSinceThatTimeInOneStatement) {
    if (GetParam().sinceField.empty()) return;  // no unpaged mode: the dispatch refuses a position
    std::vector<std::string> times;
    for (Row const& row : rows_) times.push_back(row.at(GetParam().sinceField));
    std::sort(times.begin(), times.end());
    std::string const since = times[times.size() / 2];
    std::vector<std::string> const wanted = expected(since);
    ASSERT_GT(wanted.size(), size_t(kWindow)) << "more than a window";

    Cursor cursor = open(std::stoll(since));
    EXPECT_EQ(walk(cursor, 1), wanted);
    unsigned count = 0;
    ASSERT_OK(cursor->numRows(count));
    EXPECT_EQ(count, wanted.size());
    ASSERT_OK(cursor->jumpEnd());
    ASSERT_OK(cursor->curRow(count));
    EXPECT_EQ(count, wanted.size() - 1);
    ASSERT_OK(cursor->jump(3));
    EXPECT_EQ(identity(*rowAt(cursor)), wanted[3]);

    std::vector<std::string> const statements = host->fqlStatements();
    ASSERT_EQ(statements.size(), 1u);
    EXPECT_EQ(lower(statements[0]).find("limit"), std::string::npos) << statements[0];
    EXPECT_NE(statements[0].find(" and " + GetParam().sinceField + " >= " + since + " ORDER BY "), std::string::npos)
        << statements[0];
}

// Every answer field under its key by the key's type, and a copy each time (the fields every
// record of the source carries are checked for every kind by the retrieval test).
TEST_P(FqlCursorWalkTest, RecordsCarryEveryAnswerFieldUnderItsKeyByItsType) {
    Cursor cursor = open();
    SmartPtr<Map<String, Variant>> record = rowAt(cursor);
    std::string const id = identity(*record);
    Row const& row =
        *std::find_if(rows_.begin(), rows_.end(), [&](Row const& r) { return joined(r, GetParam().identity) == id; });
    for (auto const& [key, field] : GetParam().fields) {
        Variant const* got = record->search(String(key));
        ASSERT_EQ(got != nullptr, row.count(field) == 1) << key;
        if (got == nullptr) continue;
        EXPECT_EQ(got->asString().str(), row.at(field)) << key;
        bool const counted = key == "facebook_album_photocount" || key == "core_object_time";
        EXPECT_EQ(got->type(), counted ? Variant::Int32 : Variant::String) << key;
    }
    ASSERT_OK(record->insert("core_object_type", Variant(77)));
    EXPECT_EQ(*rowAt(cursor)->search("core_object_type"), Variant(GetParam().type)) << "each getRow hands out a copy";
}

// Contacts named by id: the first page is short, so it tells the count and holds the whole result.
TEST_P(FqlCursorWalkTest, ContactsByIdAreOneShortPageThatGivesTheCountWithoutAsking) {
    if (GetParam().type != 2) return;  // only contacts are asked for by a list of ids
    std::string const a = rows_[20].at("uid"), b = rows_[5].at("uid"), c = rows_[10].at("uid");
    Cursor cursor =
        EmulatorHost::open(*source, 2, {},
                           {Constraint{Metadata::Key("core_contact_service_id", TRELM_TYPES::STRING),
                                       Variant(Vector<String>{String(a), String(b), String(c)}), Constraint::InList}});
    ASSERT_OK(cursor->jumpBeginning());
    ASSERT_OK(cursor->jumpBeginning());
    unsigned count = 0;
    ASSERT_OK(cursor->numRows(count));
    EXPECT_EQ(count, 3u);
    int moved = 0;
    EXPECT_CODE(cursor->seek(10, moved), kSuccess);  // the window holds the whole result
    EXPECT_EQ(moved, 2);
    EXPECT_EQ(identity(*rowAt(cursor)), a);
    EXPECT_EQ(host->fqlStatements(),
              std::vector<std::string>{"select uid,name,pic_big from user where uid in (" + a + "," + b + "," + c +
                                       ") order by concat(uid,' ') asc limit 150"});
}

INSTANTIATE_TEST_SUITE_P(Kinds, FqlCursorWalkTest, ::testing::ValuesIn(kindCases()),
                         [](auto const& info) { return std::string(info.param.name); });

}  // namespace
}  // namespace trelm::test
