// The host's item store on its own: counting, host ids and removals over passes, a pass kept
// open across runs, wipes, and the conditions of `items`.
#include <sys/stat.h>

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <map>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "ErrorAssertions.h"
#include "ItemQuery.h"
#include "ItemStore.h"
#include "ItemsCommand.h"
#include "WipeMessage.h"

using trelm::String;
using trelm::Variant;
using trelm::host::ItemStore;

namespace {

class ItemStoreTest : public ::testing::Test {
protected:
    void SetUp() override {
        char pattern[] = "/tmp/item-store-test-XXXXXX";
        ASSERT_NE(mkdtemp(pattern), nullptr);
        folder_ = pattern;
        ASSERT_OK(store_.open(String(path())));
    }
    void TearDown() override {
        store_.close();
        std::filesystem::remove_all(folder_);
    }
    std::string path() const { return folder_ + "/items.db"; }

    // One window of rows "sid" -> value of the field "v", counted into `counts`; the field "t",
    // which keeps the value first stored, is made up anew by every pass (as the source does for
    // friend requests' times).
    void commit(ItemStore::Pass const& pass, std::map<std::string, int> const& rows, ItemStore::Scope const& scope,
                ItemStore::Counts& counts) {
        std::vector<ItemStore::Incoming> incoming;
        for (auto const& [sid, value] : rows) {
            incoming.push_back(
                {String(sid), ItemStore::Record{{"v", Variant(value)}, {"t", Variant(static_cast<int>(pass.id))}}});
        }
        EXPECT_OK(store_.commitWindow(scope, pass, incoming, {"t"}, counts));
    }
    std::map<std::string, ItemStore::Item> items(bool withRemoved = true) {
        std::vector<ItemStore::Item> list;
        EXPECT_OK(store_.list(String(), 2, withRemoved, list));
        std::map<std::string, ItemStore::Item> bySid;
        for (ItemStore::Item const& item : list) bySid[item.serviceId.str()] = item;
        return bySid;
    }

    std::string folder_;
    ItemStore store_;
    ItemStore::Scope const contacts_{String("facebook"), String("100"), 2};
};

// A row whose "t" alone differs is unchanged.
TEST_F(ItemStoreTest, PassesCountEachRowOnceKeepHostIdsAndRemoveWhatACompletePassMissed) {
    struct Step {
        std::vector<std::map<std::string, int>> windows;
        std::vector<unsigned> counts;  // added, changed, unchanged, removed
        std::vector<std::string> live;
    };
    Step const steps[] = {
        // b arrives twice in one pass (a window read again after a resume): counted once.
        {{{{"a", 1}, {"b", 1}}, {{"b", 1}, {"c", 1}}}, {3, 0, 0, 0}, {"a", "b", "c"}},
        {{{{"a", 2}, {"b", 1}}}, {0, 1, 1, 1}, {"a", "b"}},
        // c comes back: the same host id, counted changed; b is gone now.
        {{{{"c", 1}}, {{"a", 2}}}, {0, 1, 1, 1}, {"a", "c"}},
    };
    std::map<std::string, String> hostIds;
    for (std::size_t i = 0; i < std::size(steps); ++i) {
        SCOPED_TRACE("pass " + std::to_string(i + 1));
        ItemStore::Pass pass;
        ASSERT_OK(store_.openPass(contacts_, pass));
        EXPECT_EQ(pass.id, static_cast<std::int64_t>(i + 1));
        EXPECT_FALSE(pass.continued);
        ItemStore::Counts total;
        for (auto const& window : steps[i].windows) commit(pass, window, contacts_, total);
        // Before the pass completes nothing is removed.
        EXPECT_EQ(items(false).size(), 3u);
        ASSERT_OK(store_.completePass(contacts_, pass, total));
        EXPECT_EQ((std::vector<unsigned>{total.added, total.changed, total.unchanged, total.removed}), steps[i].counts);
        std::vector<std::string> live;
        for (auto const& [sid, item] : items(false)) live.push_back(sid);
        EXPECT_EQ(live, steps[i].live);
        for (auto const& [sid, item] : items()) {
            auto [known, fresh] = hostIds.emplace(sid, item.hostId);
            if (!fresh) {
                EXPECT_EQ(known->second, item.hostId) << sid;
            }
        }
    }
    EXPECT_EQ(items().at("a").fields, R"({"t":1,"v":2})") << "t kept from the first pass";
}

TEST_F(ItemStoreTest, WipeMessageRemovesTheNamedSourcesItemsAndTheFileIsPrivate) {
    ItemStore::Scope const other{String("other"), String("7"), 2};
    ItemStore::Pass mine, theirs;
    ASSERT_OK(store_.openPass(contacts_, mine));
    ASSERT_OK(store_.openPass(other, theirs));
    ItemStore::Counts counts;
    commit(mine, {{"a", 1}, {"b", 1}}, contacts_, counts);
    commit(theirs, {{"z", 1}}, other, counts);

    trelm::WipeMessage wipe(trelm::Map<String, String>{{String("facebook"), String()}});
    ASSERT_OK(store_.onMessage(wipe));
    ASSERT_EQ(store_.wipes().size(), 1u);
    EXPECT_EQ(store_.wipes()[0].source, "facebook");
    EXPECT_EQ(store_.wipes()[0].items, 2u);
    EXPECT_EQ(items().count("z"), 1u);
    EXPECT_EQ(items().size(), 1u);
    ItemStore::Pass fresh;
    ASSERT_OK(store_.openPass(contacts_, fresh));
    EXPECT_EQ(fresh.id, 1) << "the wiped source starts over";

    struct stat st {};
    ASSERT_EQ(stat(path().c_str(), &st), 0);
    EXPECT_EQ(st.st_mode & 0777, 0600u);
}

// A file that SQLite finds damaged once open is named, with what to do about it.
TEST_F(ItemStoreTest, DamagedFileIsNamedWithWhatToDo) {
    ItemStore::Pass pass;
    ASSERT_OK(store_.openPass(contacts_, pass));
    std::map<std::string, int> rows;
    for (int i = 0; i < 500; ++i) rows["contact " + std::to_string(i)] = i;
    ItemStore::Counts counts;
    commit(pass, rows, contacts_, counts);
    store_.close();
    {
        std::fstream file(path(), std::ios::in | std::ios::out | std::ios::binary);
        file.seekp(8192);
        file << std::string(16384, '\x5a');  // every page after the first two
    }
    ASSERT_OK(store_.open(String(path())));
    std::vector<ItemStore::Item> list;
    trelm::uError const e = store_.list(String(), 2, true, list);
    EXPECT_CODE(e, trelm::kFailure);
    EXPECT_NE(e.toText().find(path() + " is damaged: move it away or delete it"), std::string::npos) << e;
}

// The store is opened by the first operation that needs it: a host command that never syncs
// neither makes items.db nor fails on a damaged one, and list or wipe make nothing.
TEST(ItemStoreOpeningTest, OnlyOperationsThatNeedTheFileMakeOrOpenIt) {
    char pattern[] = "/tmp/item-store-open-XXXXXX";
    ASSERT_NE(mkdtemp(pattern), nullptr);
    std::string const folder = pattern, path = folder + "/items.db";
    ItemStore store;
    ASSERT_OK(store.sendConfig(trelm::Configuration::Group(store.name(), {{"path", Variant(String(path))}})));
    ASSERT_OK(store.startup());
    std::vector<ItemStore::Item> listed;
    unsigned wiped = 7;
    EXPECT_OK(store.list(String(), 2, true, listed));
    EXPECT_OK(store.wipe(String("facebook"), wiped));
    EXPECT_EQ(wiped, 0u);
    EXPECT_FALSE(store.exists());
    EXPECT_FALSE(std::filesystem::exists(path));

    { std::ofstream(path) << "not a database"; }
    ASSERT_TRUE(store.exists());
    ItemStore::Pass pass;
    trelm::uError const e = store.openPass(ItemStore::Scope{String("facebook"), String("1"), 2}, pass);
    EXPECT_CODE(e, trelm::kFailure);
    EXPECT_NE(e.message().find(String(path)), String::npos) << "the error names the file";
    std::filesystem::remove_all(folder);
}

TEST(ItemsCommandTest, ConditionsCompareEachFieldByItsKind) {
    std::string const fields = R"({"n":5,"s":"abc","b":false,"none":null})";
    struct Case {
        char const* condition;
        bool matches;
    };
    Case const cases[] = {
        {"n=5", true},     {"n>4", true},  {"n<5", false},       {"n<=5", true},    {"n=4,5", true}, {"n=3,4", false},
        {"n!=5", false},   {"n=x", false}, {"s=abc", true},      {"s!=abc", false}, {"s>abb", true}, {"s=x,abc", true},
        {"b=false", true}, {"b=1", false}, {"missing=1", false}, {"none=1", false},
    };
    trelm::host::ItemQuery::Kind const& kind = *trelm::host::ItemQuery::findKind("contacts");
    for (Case const& c : cases) {
        SCOPED_TRACE(c.condition);
        trelm::host::ItemQuery query(kind);
        ASSERT_OK(query.where(c.condition));
        trelm::IQueryItems::StartQueryMessage msg;
        ASSERT_OK(query.fill(msg));
        ASSERT_EQ(msg.constraints.size(), 2u);
        EXPECT_EQ(trelm::host::ItemsCommand::matches(fields, msg.constraints[1]), c.matches);
    }
}

}  // namespace
