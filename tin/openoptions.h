#pragma once

#include "tin/progress.h"

#include <string>

namespace kelm::tin {

/// How a layer is opened, beside which. A plain value.
struct OpenOptions {
    /// What TinReader::GetSurvey gave for the same layer of the same file, in this process or
    /// another. The layer is then opened without being read. Empty: it is read.
    std::string survey = {};
    /// Is told how far the reading is. It stays at 0 where the number of features is not known.
    Progress progress = {};
};

} // namespace kelm::tin
