#pragma once

#include "tin/detail/parallelblocks.h"

#include <algorithm>
#include <vector>

namespace kelm::tin::detail {

/// A filter that drops nothing.
struct NoFilter {
    bool operator()(unsigned) const { return true; }
};

/// Appends to `result` the items of 0 .. count-1 that pass a test, ascending on any number of
/// threads: each thread lists those of its own block, and the lists are joined in thread order.
///
/// @param lists number of lists; the team stays within it, also if the thread setting has been
/// raised since it was noted
/// @param filter cheap; passes whatever passes the test. It is put to four items without a branch
/// in between, and if one passes the test is put to all four
/// @throw std::bad_alloc, from a worker too
template <typename Test, typename Filter = NoFilter>
void ParallelScan(unsigned count, int lists, const Test& test, std::vector<unsigned>& result,
                  const Filter& filter = {}) {
    std::vector<std::vector<unsigned>> found(static_cast<std::size_t>(lists));
    const auto scan = [&](unsigned thread, unsigned first, unsigned last) {
        std::vector<unsigned>& list = found[thread];
        const auto keep = [&](unsigned from, unsigned to) {
            for (unsigned i = from; i < to; ++i)
                if (test(i))
                    list.push_back(i);
        };
        unsigned i = first;
        for (; last - i >= 4; i += 4) {
            bool anyPasses = false;
            for (unsigned k = 0; k < 4; ++k)
                anyPasses |= filter(i + k);
            if (anyPasses)
                keep(i, i + 4);
        }
        keep(i, last);
    };
    ParallelBlocks(count, std::min(lists, omp_get_max_threads()), scan);
    for (const std::vector<unsigned>& list : found)
        result.insert(result.end(), list.begin(), list.end());
}

} // namespace kelm::tin::detail
