#pragma once

#include "tin/progress.h"

namespace kelm::tin {

/// How an index is built. A plain value.
struct BuildOptions {
    int threads = 0; ///< most threads of the build; 0 for the runtime's default
    /// Most bytes a triangle that the index may take; 0 for the default of its class. What does not
    /// fit is indexed in a slower way, with the same answers.
    unsigned bytesPerTriangle = 0;
    Progress progress;
};

} // namespace kelm::tin
