#include "RuntimeConfiguration.h"

#include <gtest/gtest.h>

#include <stdlib.h>
#include <sys/stat.h>

#include <filesystem>
#include <fstream>
#include <thread>
#include <vector>

#include "ComponentRegistry.h"
#include "ErrorAssertions.h"
#include "GetRuntimeConfigurationMessage.h"
#include "ResetRuntimeConfigurationMessage.h"
#include "RuntimeConfigurationMessage.h"

namespace trelm {
namespace {

// A fresh private directory, removed with its contents at the end of the test.
struct TempDir {
    std::string path = [] {
        std::string pattern = (std::filesystem::temp_directory_path() / "trelm-store-test-XXXXXX").string();
        return std::string(::mkdtemp(pattern.data()));
    }();
    ~TempDir() { std::filesystem::remove_all(path); }
    std::string file(std::string const& name) const { return path + "/" + name; }
};

// A registry with one "RuntimeConfiguration" component; talks to it by messages as components do.
class RuntimeConfigurationTest : public ::testing::Test {
protected:
    void SetUp() override {
        ASSERT_OK(registry_.add("RuntimeConfiguration", &store_));
        registry_.activate();
    }

    uError put(String const& tag, std::initializer_list<std::pair<char const*, Variant>> values) {
        Set<Configuration::Value> set;
        for (auto const& [k, v] : values) EXPECT_OK(set.insert(Configuration::Value(k, v)));
        RuntimeConfigurationMessage msg(tag, set);
        return msg.send("RuntimeConfiguration");
    }
    // The values under tag for keys; "-" marks a key that stayed empty.
    std::vector<std::string> get(String const& tag, std::vector<char const*> const& keys) {
        Map<String, Variant> values;
        for (char const* k : keys) EXPECT_OK(values.insert(k, Variant()));
        GetRuntimeConfigurationMessage msg(tag, values);
        uError e = msg.send("RuntimeConfiguration");
        EXPECT_OK(e);
        std::vector<std::string> out;
        for (char const* k : keys) {
            Variant const& v = *values.search(k);
            EXPECT_TRUE(v.empty() || v.type() == Variant::String) << k;
            out.push_back(v.empty() ? "-" : v.asString().str());
        }
        return out;
    }

    RuntimeConfiguration store_;
    ComponentRegistry registry_;
};

using Texts = std::vector<std::string>;

TEST_F(RuntimeConfigurationTest, StoredValuesComeBackAsTextAndUnknownKeysStayEmpty) {
    ASSERT_OK(put("src", {{"session", Variant("s1")},
                          {"empty", Variant("")},
                          {"count", Variant(42)},
                          {"big", Variant(-5000000000LL)},
                          {"flag", Variant(true)},
                          {"bytes", Variant(String(std::string("a\0b", 3)))}}));
    EXPECT_EQ(get("src", {"session", "empty", "count", "big", "flag", "bytes", "unknown"}),
              (Texts{"s1", "", "42", "-5000000000", "true", std::string("a\0b", 3), "-"}));
}

// Configuring the store again keeps its values (an in-memory store opened afresh would lose
// them). A file store's values reaching the next run: HostProgramTest.
TEST_F(RuntimeConfigurationTest, StoringAgainReplacesAndResetForgetsOnlyNamedKeysOfItsTag) {
    Configuration::Group const group("RuntimeConfiguration");
    ASSERT_OK(store_.sendConfig(group));
    ASSERT_OK(put("src", {{"a", Variant("1")}, {"b", Variant("2")}, {"c", Variant("3")}}));
    ASSERT_OK(put("other", {{"a", Variant("100")}, {"b", Variant("200")}}));
    ASSERT_OK(put("src", {{"a", Variant("one")}}));
    ResetRuntimeConfigurationMessage reset("src", Set<String>{"b", "never-stored"});
    ASSERT_OK(reset.send("RuntimeConfiguration"));
    ASSERT_OK(store_.sendConfig(group));
    EXPECT_EQ(get("src", {"a", "b", "c"}), (Texts{"one", "-", "3"}));
    EXPECT_EQ(get("other", {"a", "b"}), (Texts{"100", "200"}));

    Map<String, Variant> values{{"absent", Variant("caller's")}};  // unknown keys keep the caller's value
    GetRuntimeConfigurationMessage msg("src", values);
    ASSERT_OK(msg.send("RuntimeConfiguration"));
    EXPECT_EQ(values.search("absent")->asString(), "caller's");
}

TEST_F(RuntimeConfigurationTest, ValueWithoutTextFormStoresNothingOfItsMessage) {
    uError e = put("src", {{"a", Variant("1")}, {"list", Variant(Vector<String>{"x"})}, {"z", Variant("2")}});
    EXPECT_CODE(e, kInvalid);
    EXPECT_EQ(get("src", {"a", "list", "z"}), (Texts{"-", "-", "-"}));
}

TEST_F(RuntimeConfigurationTest, StoreFileIsPrivateWhateverTheUmask) {
    TempDir dir;
    std::string const created = dir.file("new.db"), existing = dir.file("existing.db");
    std::ofstream(existing) << "";
    ::chmod(existing.c_str(), 0666);
    mode_t const old = ::umask(0);
    RuntimeConfiguration other("Other");
    EXPECT_OK(store_.open(String(created)));
    EXPECT_OK(put("src", {{"secret", Variant("x")}}));
    EXPECT_OK(other.open(String(existing)));
    ::umask(old);
    for (std::string const& p : {created, existing}) {
        struct stat st {};
        ASSERT_EQ(::stat(p.c_str(), &st), 0) << p;
        EXPECT_EQ(st.st_mode & 07777, 0600u) << p;
    }
}

TEST_F(RuntimeConfigurationTest, FailedOpenLeavesNoStoreInsteadOfAFreshOne) {
    TempDir dir;
    EXPECT_CODE(store_.open(String(dir.file("missing/dir/x.db"))), kFailure);
    EXPECT_CODE(put("src", {{"a", Variant("1")}}), kFailure);

    EXPECT_CODE(store_.open(""), kInvalid);
    EXPECT_OK(store_.open(":memory:"));
    EXPECT_OK(put("src", {{"a", Variant("1")}}));
}

// Without the store's lock, one thread's transaction runs into another's.
TEST_F(RuntimeConfigurationTest, ConcurrentWritersAndReadersSeeWholeValues) {
    std::vector<std::thread> threads;
    std::atomic<int> failures{0};
    for (int t = 0; t < 4; ++t) {
        threads.emplace_back([&, t] {
            for (int i = 0; i < 50; ++i) {
                String const tag = String::from(t), value = String::from(i);
                Set<Configuration::Value> const set{Configuration::Value("a", Variant(value)),
                                                    Configuration::Value("b", Variant(value))};
                Map<String, Variant> values{{"a", Variant()}, {"b", Variant()}};
                if (store_.store(tag, set).failed() || store_.get(tag, values).failed() ||
                    values.search("a")->asString() != value || values.search("b")->asString() != value) {
                    ++failures;
                }
            }
        });
    }
    for (auto& th : threads) th.join();
    EXPECT_EQ(failures.load(), 0);
}

}  // namespace
}  // namespace trelm
