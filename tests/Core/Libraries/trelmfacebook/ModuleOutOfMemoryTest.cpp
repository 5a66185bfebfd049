// getComponents when the table cannot grow: the program replaces the global allocator so that,
// while armed, the n-th allocation fails. The module's allocations resolve to this allocator too.
#include <cstddef>
#include <cstdlib>
#include <new>
#include <set>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "ErrorAssertions.h"

#include "ModuleHandle.h"

namespace {

// -1: disarmed; otherwise the number of allocations left before one fails.
thread_local long allocationsLeft = -1;

void* allocate(std::size_t size) {
    if (allocationsLeft == 0) {
        allocationsLeft = -1;
        throw std::bad_alloc();
    }
    if (allocationsLeft > 0) --allocationsLeft;
    if (void* p = std::malloc(size == 0 ? 1 : size)) return p;
    throw std::bad_alloc();
}

}  // namespace

void* operator new(std::size_t size) { return allocate(size); }
void* operator new[](std::size_t size) { return allocate(size); }
void* operator new(std::size_t size, std::nothrow_t const&) noexcept {
    try {
        return allocate(size);
    } catch (std::bad_alloc const&) {
        return nullptr;
    }
}
void* operator new[](std::size_t size, std::nothrow_t const& tag) noexcept { return operator new(size, tag); }
void operator delete(void* p) noexcept { std::free(p); }
void operator delete[](void* p) noexcept { std::free(p); }
void operator delete(void* p, std::size_t) noexcept { std::free(p); }
void operator delete[](void* p, std::size_t) noexcept { std::free(p); }
void operator delete(void* p, std::nothrow_t const&) noexcept { std::free(p); }
void operator delete[](void* p, std::nothrow_t const&) noexcept { std::free(p); }

namespace {

// For every position of the failing allocation: a failure returned by getComponents is the
// plug-in's wrapper around the table's out-of-memory error, stamped in the loader, and the table
// then holds what was inserted before the failure: nothing, or the source alone (it goes in
// first). An allocation failing outside the table's inserts may leave as an exception.
TEST(ModuleOutOfMemoryTest, FailedInsertIsWrappedAndKeepsTheEntriesInsertedBefore) {
    ModuleHandle module(TRELMFACEBOOK_MODULE);
    ASSERT_EQ(module.error(), "");
    // "ok" or "failed", then the table's identifiers; once for each outcome seen.
    std::set<std::vector<std::string>> outcomes;
    for (long failAt = 0; failAt < 64 && !outcomes.count({"ok", kConnectorId, kSourceId}); ++failAt) {
        SCOPED_TRACE("failing allocation " + std::to_string(failAt));
        ModuleHandle::Table table;
        allocationsLeft = failAt;
        try {
            trelm::uError const result = module.getComponents(table);
            allocationsLeft = -1;
            std::vector<std::string> outcome{result.ok() ? "ok" : "failed"};
            for (std::string const& id : idsOf(table)) outcome.push_back(id);
            outcomes.insert(outcome);
            if (result.failed()) {
                EXPECT_CODE(result, trelm::kFailure);
                EXPECT_STREQ(result.file(), "Core/Libraries/trelmfacebook/loader");
                ASSERT_NE(result.cause(), nullptr);
                EXPECT_CODE(*result.cause(), trelm::kOutOfMemory);
            }
        } catch (std::bad_alloc const&) {
            allocationsLeft = -1;
        }
    }
    EXPECT_EQ(outcomes,
              (std::set<std::vector<std::string>>{{"failed"}, {"failed", kSourceId}, {"ok", kConnectorId, kSourceId}}));
}

}  // namespace
