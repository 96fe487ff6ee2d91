#pragma once

#include "tin/parallel/parallelblocks.h"

#include <algorithm>
#include <vector>

namespace kelm::tin::parallel {

/// A filter that drops nothing.
struct NoFilter {
    bool operator()(unsigned) const { return true; }
};

/// Calls visit(i) for the items of first .. last-1, ascending, but for most of those that the
/// filter drops: it is put to four items without a branch in between, and if one passes all four
/// are visited.
template <typename Filter, typename Visit>
void VisitBlock(unsigned first, unsigned last, const Filter& filter, const Visit& visit) {
    unsigned i = first;
    for (; last - i >= 4; i += 4) {
        bool anyPasses = false;
        for (unsigned k = 0; k < 4; ++k)
            anyPasses |= filter(i + k);
        for (unsigned k = 0; anyPasses && k < 4; ++k)
            visit(i + k);
    }
    for (; i < last; ++i)
        visit(i);
}

/// Visits the items 0 .. count-1 by VisitBlock with one result a thread: visit(result, i).
///
/// @param most number of results; the team stays within it, also if the thread setting has been
/// raised since it was noted
/// @return the results in thread order, which is the order of their items
template <typename Result, typename Filter, typename Visit>
std::vector<Result> ParallelScan(unsigned count, int most, const Filter& filter,
                                 const Visit& visit) {
    std::vector<Result> results(static_cast<std::size_t>(most));
    const auto scan = [&](unsigned thread, unsigned first, unsigned last) {
        Result& result = results[thread];
        VisitBlock(first, last, filter, [&](unsigned i) { visit(result, i); });
    };
    ParallelBlocks(count, std::min(most, omp_get_max_threads()), scan);
    return results;
}

} // namespace kelm::tin::parallel
