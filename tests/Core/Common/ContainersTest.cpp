#include <gtest/gtest.h>

#include <vector>

#include "ErrorAssertions.h"

#include "trelm/Map.h"
#include "trelm/Set.h"
#include "trelm/SmartPtr.h"
#include "trelm/String.h"
#include "trelm/Vector.h"

namespace trelm {
namespace {

TEST(MapTest, InsertReplacesAnEqualKeyAndAbsentKeysAreNullOrRemovedQuietly) {
    Map<String, int> m;
    Map<String, int> const& cm = m;
    EXPECT_OK(m.insert("k", 1));
    EXPECT_OK(m.insert("k", 2));
    EXPECT_EQ(m.size(), 1u);
    ASSERT_NE(cm.search("k"), nullptr);
    EXPECT_EQ(*m.search("k"), 2);
    EXPECT_EQ(m.search("none"), nullptr);
    EXPECT_EQ(cm.search("none"), nullptr);
    EXPECT_OK(m.remove("none"));
    EXPECT_OK(m.remove("k"));
    EXPECT_TRUE(m.empty());
}

TEST(VectorTest, InsertAndEraseRejectPositionsOutOfRange) {
    Vector<int> v(16);  // growth step accepted and ignored
    EXPECT_CODE(v.insert(1, 5), kInvalid);
    EXPECT_OK(v.insert(0, 2));
    EXPECT_OK(v.insert(0, 1));
    EXPECT_OK(v.insert(2, 3));  // append
    EXPECT_EQ(v, (Vector<int>{1, 2, 3}));
    EXPECT_CODE(v.erase(3), kInvalid);
    EXPECT_OK(v.erase(1));
    EXPECT_EQ(v, (Vector<int>{1, 3}));
}

struct Base {
    virtual ~Base() = default;
};
struct Derived : Base {
    explicit Derived(int* deleted) : deleted_(deleted) {}
    ~Derived() override { ++*deleted_; }
    int* deleted_;
};

TEST(SmartPtrTest, LastReferenceDeletesThroughTheCreatedType) {
    int deleted = 0;
    {
        SmartPtr<Base> base;
        {
            SmartPtr<Derived> d(new Derived(&deleted));
            base = d;
            EXPECT_EQ(base.useCount(), 2);
        }
        EXPECT_EQ(deleted, 0);
        SmartPtr<Derived> back = dynamicPointerCast<Derived>(base);
        ASSERT_TRUE(back);
        EXPECT_EQ(staticPointerCast<Derived>(base).get(), back.get());
    }
    EXPECT_EQ(deleted, 1);

    struct Other : Base {};
    SmartPtr<Base> other = makeSmart<Other>(), none;
    EXPECT_FALSE(dynamicPointerCast<Derived>(other));  // unrelated type
    EXPECT_TRUE(none == nullptr);
    EXPECT_FALSE(dynamicPointerCast<Derived>(none));
}

}  // namespace
}  // namespace trelm
