#include "RuntimeConfiguration.h"

#include <gtest/gtest.h>

#include "ErrorAssertions.h"
#include <sys/stat.h>

#include <fstream>
#include <thread>
#include <vector>

#include "ComponentRegistry.h"
#include "GetRuntimeConfigurationMessage.h"
#include "ResetRuntimeConfigurationMessage.h"
#include "RuntimeConfigurationMessage.h"
#include "TempDir.h"

namespace trelm {
namespace {

using test::TempDir;

// A registry with one "RuntimeConfiguration" component; talks to it by messages as components do.
class RuntimeConfigurationTest : public ::testing::Test {
protected:
    void SetUp() override {
        ASSERT_EQ(registry_.add("RuntimeConfiguration", &store_).code(), kSuccess);
        registry_.activate();
    }

    uError put(String const& tag, std::initializer_list<std::pair<char const*, Variant>> values) {
        Set<Configuration::Value> set;
        for (auto const& [k, v] : values) EXPECT_OK(set.insert(Configuration::Value(k, v)));
        RuntimeConfigurationMessage msg(tag, set);
        return msg.send("RuntimeConfiguration");
    }
    uError reset(String const& tag, Set<String> keys) {
        ResetRuntimeConfigurationMessage msg(tag, std::move(keys));
        return msg.send("RuntimeConfiguration");
    }
    // The values under tag for keys; "-" marks a key that stayed empty.
    std::vector<std::string> get(String const& tag, std::vector<char const*> const& keys) {
        Map<String, Variant> values;
        for (char const* k : keys) EXPECT_OK(values.insert(k, Variant()));
        GetRuntimeConfigurationMessage msg(tag, values);
        uError e = msg.send("RuntimeConfiguration");
        EXPECT_EQ(e.code(), kSuccess) << e;
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
    ASSERT_EQ(put("src", {{"session", Variant("s1")},
                          {"empty", Variant("")},
                          {"count", Variant(42)},
                          {"big", Variant(-5000000000LL)},
                          {"flag", Variant(true)},
                          {"bytes", Variant(String(std::string("a\0b", 3)))}})
                  .code(),
              kSuccess);
    EXPECT_EQ(get("src", {"session", "empty", "count", "big", "flag", "bytes", "unknown"}),
              (Texts{"s1", "", "42", "-5000000000", "true", std::string("a\0b", 3), "-"}));
}

TEST_F(RuntimeConfigurationTest, StoringAgainReplacesAndResetForgetsOnlyNamedKeysOfItsTag) {
    ASSERT_EQ(put("src", {{"a", Variant("1")}, {"b", Variant("2")}, {"c", Variant("3")}}).code(), kSuccess);
    ASSERT_EQ(put("other", {{"a", Variant("100")}, {"b", Variant("200")}}).code(), kSuccess);
    ASSERT_EQ(put("src", {{"a", Variant("one")}}).code(), kSuccess);
    ASSERT_EQ(reset("src", {"b", "never-stored"}).code(), kSuccess);
    EXPECT_EQ(get("src", {"a", "b", "c"}), (Texts{"one", "-", "3"}));
    EXPECT_EQ(get("other", {"a", "b"}), (Texts{"100", "200"}));

    Map<String, Variant> values{{"absent", Variant("caller's")}};  // unknown keys keep the caller's value
    GetRuntimeConfigurationMessage msg("src", values);
    ASSERT_EQ(msg.send("RuntimeConfiguration").code(), kSuccess);
    EXPECT_EQ(values.search("absent")->asString(), "caller's");
}

TEST_F(RuntimeConfigurationTest, ValueWithoutTextFormStoresNothingOfItsMessage) {
    uError e = put("src", {{"a", Variant("1")}, {"list", Variant(Vector<String>{"x"})}, {"z", Variant("2")}});
    EXPECT_EQ(e.code(), kInvalid) << e;
    EXPECT_EQ(get("src", {"a", "list", "z"}), (Texts{"-", "-", "-"}));
}

TEST_F(RuntimeConfigurationTest, FileStoreKeepsValuesAcrossReopen) {
    TempDir dir;
    std::string path = dir.file("runtime.db");
    Configuration::Group group("RuntimeConfiguration", {{"path", Variant(String(path))}});
    ASSERT_EQ(store_.sendConfig(group).code(), kSuccess);
    ASSERT_EQ(put("src", {{"session", Variant("kept")}}).code(), kSuccess);
    store_.close();

    RuntimeConfiguration again("RuntimeConfiguration2");
    ASSERT_EQ(again.open(String(path)).code(), kSuccess);
    Map<String, Variant> values{{"session", Variant()}};
    ASSERT_EQ(again.get("src", values).code(), kSuccess);
    EXPECT_EQ(values.search("session")->asString(), "kept");
}

TEST_F(RuntimeConfigurationTest, StoreFileIsPrivateWhateverTheUmask) {
    TempDir dir;
    std::string created = dir.file("new.db");
    std::string existing = dir.file("existing.db");
    std::ofstream(existing) << "";
    ::chmod(existing.c_str(), 0666);

    mode_t old = ::umask(0);
    uError a = store_.open(String(created));
    ASSERT_EQ(put("src", {{"secret", Variant("x")}}).code(), kSuccess);
    RuntimeConfiguration other("Other");
    uError b = other.open(String(existing));
    ::umask(old);
    ASSERT_EQ(a.code(), kSuccess) << a;
    ASSERT_EQ(b.code(), kSuccess) << b;

    for (std::string const& p : {created, existing}) {
        struct stat st {};
        ASSERT_EQ(::stat(p.c_str(), &st), 0) << p;
        EXPECT_EQ(st.st_mode & 07777, 0600u) << p;
    }
}

TEST_F(RuntimeConfigurationTest, FailedOpenLeavesNoStoreInsteadOfAFreshOne) {
    TempDir dir;
    EXPECT_EQ(store_.open(String(dir.file("missing/dir/x.db"))).code(), kFailure);
    EXPECT_EQ(put("src", {{"a", Variant("1")}}).code(), kFailure);

    std::string notDb = dir.file("text.db");
    std::ofstream(notDb) << "this is not a database file, not at all, really not";
    EXPECT_EQ(store_.open(String(notDb)).code(), kFailure);

    EXPECT_EQ(store_.open("").code(), kInvalid);
    EXPECT_EQ(store_.open(":memory:").code(), kSuccess);
    EXPECT_EQ(put("src", {{"a", Variant("1")}}).code(), kSuccess);
}

TEST_F(RuntimeConfigurationTest, ConfiguringTheSameStoreAgainKeepsItsValues) {
    Configuration::Group group("RuntimeConfiguration");
    ASSERT_EQ(store_.sendConfig(group).code(), kSuccess);
    ASSERT_EQ(put("src", {{"a", Variant("1")}}).code(), kSuccess);
    ASSERT_EQ(store_.sendConfig(group).code(), kSuccess);
    EXPECT_EQ(get("src", {"a"}), (Texts{"1"}));
}

TEST_F(RuntimeConfigurationTest, ConcurrentWritersAndReadersSeeWholeValues) {
    constexpr int kThreads = 4;
    constexpr int kRounds = 50;
    std::vector<std::thread> threads;
    std::atomic<int> failures{0};
    for (int t = 0; t < kThreads; ++t) {
        threads.emplace_back([&, t] {
            String tag = String::from(t);
            for (int i = 0; i < kRounds; ++i) {
                Set<Configuration::Value> const set{Configuration::Value("a", Variant(String::from(i))),
                                                    Configuration::Value("b", Variant(String::from(i)))};
                if (store_.store(tag, set).failed()) ++failures;
                Map<String, Variant> values{{"a", Variant()}, {"b", Variant()}};
                if (store_.get(tag, values).failed() || values.search("a")->asString() != String::from(i) ||
                    values.search("b")->asString() != String::from(i)) {
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
