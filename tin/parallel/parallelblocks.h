#pragma once

#include <omp.h>

#include <cstdint>
#include <exception>

namespace kelm::tin::parallel {

/// @return the size of the team for a loop over `count` items: the runtime's default above the
/// threshold, else 1
inline int GetTeamAbove(unsigned threshold, unsigned count) {
    return count > threshold ? omp_get_max_threads() : 1;
}

/// Runs body(thread, first, last) over 0 .. count-1 on at most `team` threads. Each thread gets one
/// contiguous block, and blocks ascend in thread order.
///
/// An exception that left the region would end the process. So the first one is kept and thrown
/// again behind the region; the other blocks still run to their ends.
template <typename Body>
void ParallelBlocks(unsigned count, int team, const Body& body) {
    std::exception_ptr failure;
#pragma omp parallel num_threads(team) default(none) shared(count, body, failure)
    {
        const auto threads = static_cast<std::uint64_t>(omp_get_num_threads());
        const auto thread = static_cast<std::uint64_t>(omp_get_thread_num());
        const auto first = static_cast<unsigned>(count * thread / threads);
        const auto last = static_cast<unsigned>(count * (thread + 1) / threads);
        try {
            body(static_cast<unsigned>(thread), first, last);
        } catch (...) {
#pragma omp critical(kelm_tin_failure)
            if (!failure)
                failure = std::current_exception();
        }
    }
    if (failure)
        std::rethrow_exception(failure);
}

} // namespace kelm::tin::parallel
