#pragma once

#include <gtest/gtest.h>

#include <atomic>
#include <climits>
#include <new>

namespace kelm::tin::test {

/// Counts the requests to operator new of all threads while it lives, and fails one of them, or all
/// from one on. There is one at a time.
struct AllocationCounter {
    /// @param nFailAt the request that throws, from 1 on @param isLasting do all later ones throw?
    explicit AllocationCounter(long nFailAt = LONG_MAX, bool isLasting = false) {
        mnRequests = mnBalance = 0;
        mnFailFrom = nFailAt;
        mnFailTo = isLasting ? LONG_MAX : nFailAt;
        mbCounts = true;
    }
    AllocationCounter(const AllocationCounter&) = delete;
    ~AllocationCounter() { mbCounts = false; }

    static const bool IS_ACTIVE; ///< false if a sanitizer keeps its own operators: tests then skip
    inline static std::atomic<long> mnRequests{0}, mnFailFrom{LONG_MAX}, mnFailTo{LONG_MAX};
    inline static std::atomic<long> mnBalance{0}; ///< requests granted, less blocks released
    inline static std::atomic<bool> mbCounts{false};
};

/// Runs an operation with its first request failing, then its second, and so on until it completes;
/// with one failure, then with all later ones too. Expects std::bad_alloc, and no block left over
/// once the operation was repeated undisturbed. @return the number of failures
template <typename Operation>
long FailEachRequest(const Operation& operation) {
    long failures = 0;
    for (const bool isLasting : {false, true}) {
        bool failed = true;
        for (long n = 1; failed; ++n, failures += failed) {
            const AllocationCounter counter(n, isLasting);
            try {
                operation();
                failed = false;
            } catch (const std::bad_alloc&) {
            }
            EXPECT_EQ(failed, AllocationCounter::mnRequests >= n) << "request " << n;
            AllocationCounter::mnFailFrom = LONG_MAX;
            operation();
            EXPECT_EQ(AllocationCounter::mnBalance, 0) << "request " << n;
        }
    }
    return failures;
}

} // namespace kelm::tin::test
