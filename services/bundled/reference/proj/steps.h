#pragma once

#include <string>

namespace kelm::ogc {

/// @param steps a PROJ pipeline. @return the pipeline without those horizontal grid shifts that it
/// later takes back. Its heights differ by what the geoid rises over the length of the shift
std::string RemoveCancelledShifts(const std::string& steps);

/// @return true if the pipeline shifts positions by a grid, which leaves ellipsoidal heights alone
bool HasHorizontalShift(const std::string& steps);

/// @return true if the pipeline moves points in space, with their ellipsoidal heights
bool HasSpatialShift(const std::string& steps);

} // namespace kelm::ogc
