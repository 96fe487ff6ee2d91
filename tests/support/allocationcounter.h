#pragma once

#include <gtest/gtest.h>

#include <atomic>
#include <new>

// The operators of clang's thread sanitizer cannot be replaced; tests that count then skip.
#ifdef __clang__
#if __has_feature(thread_sanitizer)
#define KELM_TIN_FOREIGN_NEW
#endif
#endif

namespace kelm::tin::test {

/// Counts the requests to operator new of all threads while it lives, and fails one of them. There
/// is one at a time. Under the address sanitizer the array form goes uncounted.
struct AllocationCounter {
    /// @param nFailAt the request that throws, from 1 on; 0 for none
    explicit AllocationCounter(long nFailAt = 0) {
        mnRequests = mnBalance = 0;
        mnFailAt = nFailAt;
        mbCounts = true;
    }
    AllocationCounter(const AllocationCounter&) = delete;
    ~AllocationCounter() { mbCounts = false; }

#ifdef KELM_TIN_FOREIGN_NEW
    static constexpr bool IS_ACTIVE = false;
#else
    static constexpr bool IS_ACTIVE = true;
#endif
    inline static std::atomic<long> mnRequests{0};
    inline static std::atomic<long> mnBalance{0}; ///< requests granted, less blocks released
    inline static std::atomic<long> mnFailAt{0};
    inline static std::atomic<bool> mbCounts{false};
};

/// Runs an operation with its first request failing, then its second, and so on until it completes.
/// Expects std::bad_alloc and no block left over each time. @return the number of failures
template <typename Operation>
long FailEachRequest(const Operation& operation) {
    for (long n = 1;; ++n) {
        bool failed = false;
        try {
            const AllocationCounter counter(n);
            operation();
        } catch (const std::bad_alloc&) {
            failed = true;
        }
        EXPECT_EQ(failed, AllocationCounter::mnRequests >= n) << "request " << n;
        EXPECT_EQ(AllocationCounter::mnBalance, 0) << "request " << n;
        if (!failed)
            return n - 1;
    }
}

} // namespace kelm::tin::test
