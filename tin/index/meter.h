#pragma once

#include "tin/progress.h"

#include <omp.h>

#include <atomic>
#include <cstddef>

namespace kelm::tin::index {

/// Tells a progress function of the work of a team, a hundred times in all. Only the thread that
/// started the team calls it.
class Meter {
  public:
    /// @param steps all steps of the operation
    Meter(const Progress& progress, const char* message, std::size_t steps)
        : moProgress(progress), mpszMessage(message), mnSteps(steps) {}

    /// Counts one step that is done. @throw what Progress::Report throws
    void Count() {
        const std::size_t done = ++mnDone;
        if (omp_get_thread_num() == 0)
            Tell(done < mnSteps ? done * 100 / mnSteps : 100);
    }
    /// Tells that all is done.
    void Finish() { Tell(100); }

  private:
    void Tell(std::size_t percent) {
        if (percent <= mnTold)
            return;
        mnTold = percent;
        moProgress.Report(static_cast<double>(percent) / 100.0, mpszMessage);
    }

    Progress moProgress;
    const char* mpszMessage;
    std::size_t mnSteps;
    std::size_t mnTold = 0; ///< of the starting thread alone
    std::atomic<std::size_t> mnDone{0};
};

} // namespace kelm::tin::index
