#pragma once

#include "services/bundled/store/layersurvey.h"
#include "services/bundled/store/runs/filestamp.h"

#include <string>
#include <vector>

namespace kelm::store {

/// A survey, and all that tells whether it is that of a layer: what travels from one process to
/// another.
struct HandedSurvey {
    std::string moFile; ///< name without folders
    std::string moLayer;
    int mnSegment = 0;
    FileStamp moStamp; ///< of the file that was surveyed, from before the survey
    LayerSurvey moSurvey;
    std::vector<bool> moWhole; ///< see FacetList::GetWhole
};

/// The bytes are those of one machine and of one state of the libraries that read layers: the byte
/// order, and the versions of GDAL and GEOS, must be the same where they are read.
std::string WriteSurvey(const HandedSurvey& survey);

/// @param file name, for messages @throw kelm::DataException if the bytes are damaged, or were
/// written by other versions
HandedSurvey ReadSurvey(const std::string& bytes, const std::string& file);

/// @throw kelm::DataException always
[[noreturn]] void RefuseSurvey(const std::string& file, const std::string& reason);

} // namespace kelm::store
