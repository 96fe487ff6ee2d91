#pragma once

#include <omp.h>

#include <algorithm>
#include <atomic>
#include <cstddef>
#include <exception>

namespace kelm::tin::parallel {

/// @param threads most threads that a caller allows; 0 or less for the runtime's default
/// @return the size of a team. It stays below what a system refuses to start
inline int GetTeam(int threads) {
    constexpr int MOST = 256;
    return threads > 0 ? std::min(threads, std::max(MOST, omp_get_max_threads()))
                       : omp_get_max_threads();
}

/// @param smallest the fewest items that are worth a thread; above 0
/// @return the size of a team for `count` items
inline int GetTeamForBatch(std::size_t count, std::size_t smallest, int threads) {
    const auto most = static_cast<std::size_t>(GetTeam(threads));
    return static_cast<int>(std::clamp<std::size_t>(count / smallest, 1, most));
}

/// Runs body(first, last) over 0 .. count-1 in blocks, which the threads of a team take in turn:
/// one that is held up leaves its share to the others. A batch too small for a second thread is one
/// block on the calling thread, since the threads of a team use a processor even after their work.
///
/// An exception that left the region would end the process. So the first one is kept and thrown
/// again behind the region; no further block is started then.
/// @param smallest,threads as for GetTeamForBatch
template <typename Body>
void ParallelBatch(std::size_t count, std::size_t smallest, int threads, const Body& body) {
    constexpr std::size_t BLOCKS_PER_THREAD = 16;
    const int team = GetTeamForBatch(count, smallest, threads);
    if (team == 1) {
        if (count > 0)
            body(std::size_t{0}, count);
        return;
    }
    const std::size_t length = count / (BLOCKS_PER_THREAD * static_cast<std::size_t>(team)) + 1;
    const std::size_t blocks = (count - 1) / length + 1;
    std::atomic<std::size_t> next{0};
    std::exception_ptr failure;
#pragma omp parallel num_threads(team) default(none)                                               \
    shared(count, length, blocks, body, next, failure)
    try {
        for (std::size_t i = next++; i < blocks; i = next++)
            body(i * length, std::min(count, (i + 1) * length));
    } catch (...) {
        next = blocks;
#pragma omp critical(kelm_tin_failure)
        if (!failure)
            failure = std::current_exception();
    }
    if (failure)
        std::rethrow_exception(failure);
}

} // namespace kelm::tin::parallel
