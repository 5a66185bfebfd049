// The album, media and photo-tag cursors against the in-process emulator: one suite over the three
// kinds in their orderings and both senses, checked against what a client of its own reads.
#include <gtest/gtest.h>

#include <algorithm>
#include <map>
#include <ostream>
#include <set>
#include <string>
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

struct KindCase {
    char const* name;
    int type;
    PhotoLibraryCursor::Kind const* kind;
    std::string where;                      // the kind's default rows
    std::vector<std::string> identity;      // row fields that identify a row
    std::vector<std::string> identityKeys;  // the record keys they land in
    std::vector<std::string> orderFields;   // row fields whose blank-joined text is the order
    char const* orderKey;                   // the ordering column asked for; null: the default
    bool ascending;
    std::string sinceField;                 // the row field a position compares
};

void PrintTo(KindCase const& c, std::ostream* os) { *os << c.name; }

std::vector<KindCase> kindCases() {
    KindCase const album{"AlbumsNewestFirst", 11, &AlbumCursor::kKind, "owner = " + kDemoUid, {"aid"},
                         {"core_service_id"}, {"created", "aid"}, nullptr, false, "modified"};
    KindCase const media{"MediaNewestFirst", 9, &MediaCursor::kKind, "owner = " + kDemoUid, {"pid"},
                         {"core_service_id"}, {"created", "pid"}, nullptr, false, "created"};
    KindCase const tag{"PhotoTagsNewestFirst", 13, &PhotoTagCursor::kKind, "subject = " + kDemoUid,
                       {"pid", "subject"},
                       {"facebook_photo_tag_photo_service_id", "facebook_photo_tag_tagged_service_id"},
                       {"created", "pid", "subject"}, nullptr, false, "created"};
    auto ordered = [](KindCase c, char const* name, char const* key, bool ascending, std::vector<std::string> fields) {
        c.name = name;
        c.orderKey = key;
        c.ascending = ascending;
        c.orderFields = fields.empty() ? c.orderFields : fields;
        return c;
    };
    return {album,
            ordered(album, "AlbumsOldestFirst", "core_object_time", true, {}),
            ordered(album, "AlbumsByModification", "facebook_album_modified", true, {"modified", "aid"}),
            ordered(album, "AlbumsByIdDescending", "core_service_id", false, {"aid"}),
            media,
            ordered(media, "MediaByIdAscending", "core_service_id", true, {"pid"}),
            tag,
            ordered(tag, "PhotoTagsByPhotoDescending", "facebook_photo_tag_photo_service_id", false, {"pid", "subject"})};
}

std::string joined(Row const& row, std::vector<std::string> const& fields) {
    std::string text;
    for (std::string const& f : fields) text += (text.empty() ? "" : " ") + row.at(f);
    return text;
}

// A demo user with over a thousand albums and thousands of photos and tags naming it.
class PhotoLibraryCursorTest : public EmulatorSuite, public ::testing::WithParamInterface<KindCase> {
protected:
    // Few users with content: the demo user holds the rows that count.
    static void SetUpTestSuite() { startSuite({.users = 10, .demoFriends = 3, .albumsPerUser = 1200, .photosPerAlbum = 2}); }

    // The kind's rows with every field, in the cursor's order, read in one statement.
    void SetUp() override {
        KindCase const& c = GetParam();
        rows_ = host->fqlRows("select " + std::string(c.kind->fields) + " from " + c.kind->table + " where " + c.where,
                              c.kind->table);
        std::sort(rows_.begin(), rows_.end(), [&](Row const& a, Row const& b) {
            return c.ascending ? joined(a, c.orderFields) < joined(b, c.orderFields)
                               : joined(a, c.orderFields) > joined(b, c.orderFields);
        });
        ASSERT_GE(rows_.size(), 1000u);
        host->emulator().log().clear();
    }

    static Cursor open(std::int64_t position = -1) {
        KindCase const& c = GetParam();
        Vector<IQueryItems::Column> columns;
        if (c.orderKey != nullptr) {
            EXPECT_OK(columns.pushBack({Metadata::Key(c.orderKey, TRELM_TYPES::STRING), c.ascending}));
        }
        return EmulatorHost::open(*source, c.type, columns, {}, position);
    }

    static std::string identity(Map<String, Variant> const& row) {
        std::string text;
        for (std::string const& key : GetParam().identityKeys) {
            text += (text.empty() ? "" : " ") + row.search(String(key))->asString().str();
        }
        return text;
    }
    static std::string identityAt(Cursor const& cursor, SmartPtr<Map<String, Variant>>* record = nullptr) {
        SmartPtr<Map<String, Variant>> row;
        EXPECT_OK(cursor->getRow(row));
        if (record != nullptr) *record = row;
        return row ? identity(*row) : "?";
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

    std::vector<Row> rows_;
};


TEST_P(PhotoLibraryCursorTest, WalksBothWaysVisitEveryRowOnceInOrderWithOneStatementPerWindow) {
    Cursor cursor = open();
    std::set<GUID> guids;
    EXPECT_EQ(walk(cursor, 1, &guids), expected());
    EXPECT_EQ(guids.size(), rows_.size()) << "every row has a GUID of its own";
    // One statement per window and one more that finds the end, each way.
    std::vector<std::string> statements = host->fqlStatements();
    EXPECT_EQ(statements.size(), rows_.size() / kWindow + 1);
    EXPECT_NE(statements[0].find(GetParam().ascending ? " ASC limit 150" : " DESC limit 150"), std::string::npos)
        << statements[0];

    host->emulator().log().clear();
    ASSERT_OK(cursor->jumpEnd());
    EXPECT_EQ(walk(cursor, -1), expected());
    EXPECT_EQ(host->fqlStatements().size(), rows_.size() / kWindow + 1);
}

TEST_P(PhotoLibraryCursorTest, JumpsSeeksAndCountsLandOnTheRightRowAndKnowItsIndex) {
    int const n = static_cast<int>(rows_.size());
    Cursor cursor = open();
    unsigned count = 0;
    ASSERT_OK(cursor->numRows(count));
    EXPECT_EQ(count, unsigned(n));
    ASSERT_EQ(host->fqlStatements().size(), 1u);
    EXPECT_EQ(host->fqlStatements()[0].find(" ORDER BY"), std::string::npos) << "a count needs no ordering";

    enum Op { Jump, Seek, End };
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
        {Seek, 5 * n, kNoData, n - 1, n - 1 - (half + 400)},
        {Seek, -5 * n, kNoData, 0, -(n - 1)},
        {Jump, n, kNoData, n - 1, 0},
        {Jump, 150, kSuccess, 150, 0},
        {End, 0, kSuccess, n - 1, 0},
        {Seek, -150, kSuccess, n - 151, -150},
    };
    std::vector<std::string> const order = expected();
    for (Move const& m : moves) {
        SCOPED_TRACE("move " + std::to_string(m.op) + " " + std::to_string(m.arg));
        int moved = 0;
        uError err = m.op == Jump ? cursor->jump(static_cast<unsigned>(m.arg))
                     : m.op == Seek ? cursor->seek(m.arg, moved)
                                    : cursor->jumpEnd();
        ASSERT_CODE(err, m.code);
        EXPECT_EQ(moved, m.moved);
        EXPECT_EQ(identityAt(cursor), order[static_cast<std::size_t>(m.index)]);
        unsigned index = 0;
        ASSERT_OK(cursor->curRow(index));
        EXPECT_EQ(index, unsigned(m.index));
    }
}

// A position asks once, without a row limit, for the rows changed since that time.
TEST_P(PhotoLibraryCursorTest, PositionFetchesEverythingSinceThatTimeInOneStatement) {
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
    EXPECT_EQ(identityAt(cursor), wanted[3]);

    std::vector<std::string> const statements = host->fqlStatements();
    ASSERT_EQ(statements.size(), 1u);
    EXPECT_EQ(statements[0].find("limit"), std::string::npos) << statements[0];
    EXPECT_NE(statements[0].find(" and " + GetParam().sinceField + " >= " + since + " ORDER BY "), std::string::npos)
        << statements[0];
}

TEST_P(PhotoLibraryCursorTest, RecordsCarryEveryAnswerFieldUnderItsKeyByItsType) {
    SmartPtr<Map<String, Variant>> record;
    std::string const id = identityAt(open(), &record);
    Row const& row = *std::find_if(rows_.begin(), rows_.end(),
                                   [&](Row const& r) { return joined(r, GetParam().identity) == id; });
    for (PhotoLibraryCursor::FieldMapping const& m : GetParam().kind->fieldMap) {
        Variant const* got = record->search(m.recordKey);
        ASSERT_EQ(got != nullptr, row.count(m.rowField) == 1) << m.recordKey;
        if (got == nullptr) continue;
        EXPECT_EQ(got->asString().str(), row.at(m.rowField)) << m.recordKey;
        bool const counted = std::string(m.recordKey) == "facebook_album_photocount" ||
                             std::string(m.recordKey) == "core_object_time";
        EXPECT_EQ(got->type(), counted ? Variant::Int32 : Variant::String) << m.recordKey;
    }
    EXPECT_EQ(*record->search("core_object_type"), Variant(GetParam().type));
    EXPECT_EQ(*record->search("core_object_origin_servicename"), Variant("Facebook"));
}

INSTANTIATE_TEST_SUITE_P(Kinds, PhotoLibraryCursorTest, ::testing::ValuesIn(kindCases()),
                         [](auto const& info) { return std::string(info.param.name); });

}  // namespace
}  // namespace trelm::test
