#pragma once

#include "tin/detail/parallelblocks.h"

#include <algorithm>
#include <vector>

namespace kelm::tin::detail {

/// Appends to `result` the items of 0 .. count-1 that pass a test, ascending on any number of
/// threads: each thread lists those of its own block, and the lists are joined in thread order.
///
/// @param lists number of lists; the team stays within it, also if the thread setting has been
/// raised since it was noted @throw std::bad_alloc, from a worker too
template <typename Test>
void ParallelScan(unsigned count, int lists, const Test& test, std::vector<unsigned>& result) {
    std::vector<std::vector<unsigned>> found(static_cast<std::size_t>(lists));
    ParallelBlocks(count, std::min(lists, omp_get_max_threads()),
                   [&](unsigned thread, unsigned first, unsigned last) {
                       std::vector<unsigned>& list = found[thread];
                       for (unsigned i = first; i < last; ++i)
                           if (test(i))
                               list.push_back(i);
                   });
    for (const std::vector<unsigned>& list : found)
        result.insert(result.end(), list.begin(), list.end());
}

} // namespace kelm::tin::detail
