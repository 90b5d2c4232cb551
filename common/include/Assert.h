/// Assertions: broken invariants are bugs, logged at halt level, and end the process with exit status 1.
///
/// The condition is evaluated once. Its text is logged exactly as in the source. The checks of consistency only log.

#ifndef COMMON_INCLUDE_ASSERT_H
#define COMMON_INCLUDE_ASSERT_H

#include "common/include/Log.h"

/// Logs the text of the assertion that failed, and ends the process through exit(1). If several threads fail, one runs
/// exit and the others wait for the end. A thread that fails again while it runs exit ends the process at once. Marked
/// as cold, so that the code around a call stays fast.
[[noreturn, gnu::cold]] void failAssertion(unsigned aLine, const char* apFunction, const char* apFile,
                                           const char* apText) noexcept;

#define ZT_ASSERT_IMPL(aCondition, aText)                            \
    do {                                                             \
        if (!(aCondition)) [[unlikely]] {                            \
            failAssertion(__LINE__, __func__, ZT_FILE_LABEL, aText); \
        }                                                            \
    } while (false)

#define ZT_ASSERT_MSG_IMPL(aCondition, aText, ...)                   \
    do {                                                             \
        if (!(aCondition)) [[unlikely]] {                            \
            ZT_LOG_HALT(__VA_ARGS__);                                \
            failAssertion(__LINE__, __func__, ZT_FILE_LABEL, aText); \
        }                                                            \
    } while (false)

#define ZT_ASSERT(aCondition) ZT_ASSERT_IMPL(aCondition, #aCondition)
#define ZT_CHECK(aCondition) ZT_ASSERT_IMPL(aCondition, #aCondition)
#define ZT_CHECK_RETERR(aCondition, aError) ZT_ASSERT_IMPL(aCondition, #aCondition)
#define ZT_REQUIRE(aCondition) ZT_ASSERT_IMPL(aCondition, #aCondition)
#define ZT_ENSURE(aCondition) ZT_ASSERT_IMPL(aCondition, #aCondition)
#define ZT_INVARIANT(aCondition) ZT_ASSERT_IMPL(aCondition, #aCondition)
#define ZT_BASE_INVARIANT(aCondition) ZT_ASSERT_IMPL(aCondition, #aCondition)

#define ZT_ASSERT_MSG(aCondition, ...) ZT_ASSERT_MSG_IMPL(aCondition, #aCondition, __VA_ARGS__)
#define ZT_CHECK_MSG(aCondition, ...) ZT_ASSERT_MSG_IMPL(aCondition, #aCondition, __VA_ARGS__)
#define ZT_CHECK_RETERR_MSG(aCondition, aError, ...) ZT_ASSERT_MSG_IMPL(aCondition, #aCondition, __VA_ARGS__)
#define ZT_REQUIRE_MSG(aCondition, ...) ZT_ASSERT_MSG_IMPL(aCondition, #aCondition, __VA_ARGS__)
#define ZT_ENSURE_MSG(aCondition, ...) ZT_ASSERT_MSG_IMPL(aCondition, #aCondition, __VA_ARGS__)
#define ZT_INVARIANT_MSG(aCondition, ...) ZT_ASSERT_MSG_IMPL(aCondition, #aCondition, __VA_ARGS__)
#define ZT_BASE_INVARIANT_MSG(aCondition, ...) ZT_ASSERT_MSG_IMPL(aCondition, #aCondition, __VA_ARGS__)

/// For a place that no run reaches.
#define ZT_NEVER_GET_HERE() ZT_ASSERT(false)

#define ZT_CHECK_CONSISTENCY(aCondition)                                  \
    do {                                                                  \
        if (!(aCondition)) [[unlikely]] {                                 \
            ZT_LOG_ERR("Check consistency [ %s ] failed\n", #aCondition); \
        }                                                                 \
    } while (false)

#define ZT_CHECK_CONSISTENCY_MSG(aCondition, ...)                         \
    do {                                                                  \
        if (!(aCondition)) [[unlikely]] {                                 \
            ZT_LOG_ERR("Check consistency [ %s ] failed\n", #aCondition); \
            ZT_LOG_ERR(__VA_ARGS__);                                      \
        }                                                                 \
    } while (false)

#define ZT_REPORT_INCONSISTENCY(...) ZT_LOG(ZTLL_Error, "-E-", __VA_ARGS__)

#endif
