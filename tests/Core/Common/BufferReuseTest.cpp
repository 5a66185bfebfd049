// The additions made so that parsing reuses storage: Map::insertIfAbsent keeps the first value of
// a key (and leaves a refused value unmoved), String::assign replaces the bytes in place.
#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "ErrorAssertions.h"
#include "trelm/Map.h"
#include "trelm/String.h"

namespace trelm {
namespace {

TEST(BufferReuseTest, InsertIfAbsentKeepsTheFirstValueAndLeavesARefusedOneUnmoved) {
    struct Step {
        char const* key;
        char const* value;
        char const* stored;  // the key's value afterwards
        bool moved;          // the offered value was taken
    } const steps[] = {
        {"b", "first", "first", true},
        {"b", "second", "first", false},
        {"a", "a long value that does not fit in a short string", "a long value that does not fit in a short string",
         true},
        {"a", "", "a long value that does not fit in a short string", false},
        {"c", "", "", true},
    };
    Map<String, String> map;
    for (Step const& s : steps) {
        String offered(s.value);
        ASSERT_OK(map.insertIfAbsent(String(s.key), std::move(offered)));
        ASSERT_NE(map.search(String(s.key)), nullptr) << s.key;
        EXPECT_EQ(*map.search(String(s.key)), s.stored) << s.key << " " << s.value;
        if (!s.moved) {
            EXPECT_EQ(offered, s.value) << "a refused value must stay with the caller";
        }
    }
    std::vector<std::string> keys;
    for (auto const& [key, value] : map) keys.push_back(key.str());
    EXPECT_EQ(keys, (std::vector<std::string>{"a", "b", "c"}));
}

TEST(BufferReuseTest, AssignReplacesTheBytesWhateverWasThereBefore) {
    std::string const longText(100, 'x');
    struct Case {
        std::string before;
        std::string assigned;
    } const cases[] = {
        {"", "short"},
        {"short", ""},
        {longText, "short"},
        {"short", longText},
        {longText, std::string("nul\0inside", 10)},
    };
    for (Case const& c : cases) {
        String s(c.before);
        s.assign(c.assigned.data(), static_cast<unsigned>(c.assigned.size()));
        EXPECT_EQ(s.str(), c.assigned);
        EXPECT_EQ(s.size(), c.assigned.size());
    }
}

}  // namespace
}  // namespace trelm
