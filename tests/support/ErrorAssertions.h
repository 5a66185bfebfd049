#pragma once

// Assertions on uError results that print the whole error chain (codes, locations, messages)
// when they fail, instead of a bare code:
//   EXPECT_OK(source.startup());
//   ASSERT_CODE(cursor->jumpEnd(), trelm::kNotSupported);
// A success means "not failed": kNoData (1) passes EXPECT_OK; assert it with EXPECT_CODE.

#include <gtest/gtest.h>

#include "trelm/uError.h"

namespace trelm::assertions {

inline ::testing::AssertionResult isOk(char const* expr, uError const& e) {
    if (e.ok()) return ::testing::AssertionSuccess();
    return ::testing::AssertionFailure() << expr << " failed:\n" << e.toText();
}

inline ::testing::AssertionResult hasCode(char const* expr, char const* /*codeExpr*/, uError const& e,
                                          unsigned code) {
    if (e.code() == code) return ::testing::AssertionSuccess();
    char want[16];
    std::snprintf(want, sizeof want, "0x%08x", code);
    return ::testing::AssertionFailure() << expr << " should give " << want << " but gave:\n" << e.toText();
}

}  // namespace trelm::assertions

#define EXPECT_OK(expr) EXPECT_PRED_FORMAT1(::trelm::assertions::isOk, (expr))
#define ASSERT_OK(expr) ASSERT_PRED_FORMAT1(::trelm::assertions::isOk, (expr))
#define EXPECT_CODE(expr, code) EXPECT_PRED_FORMAT2(::trelm::assertions::hasCode, (expr), (code))
#define ASSERT_CODE(expr, code) ASSERT_PRED_FORMAT2(::trelm::assertions::hasCode, (expr), (code))
