#include "tin/progress.h"

namespace kelm::tin {

void Progress::Report(double done, const char* message) const {
    if (function != nullptr && function(done, message, data) == 0)
        throw CancelledException("The operation was stopped by its progress function",
                                 "tin/progress", __PRETTY_FUNCTION__, __LINE__);
}

CancelledException::~CancelledException() = default;

} // namespace kelm::tin
