#pragma once

#include "services/vectorlayer.h"

#include <vector>

namespace kelm::store {

/// How a polygon stands: how far its corners spread in plan along a line, and aside of it.
class Stance {
  public:
    /// @param corners one or more
    explicit Stance(const std::vector<ZARVertex>& corners);

    /// Are the corners in one vertical line?
    bool IsVertical() const { return mdfLength == 0.0; }
    /// Are the corners in one vertical plane, but for the rounding of their coordinates?
    bool IsExactlyUpright() const;
    /// Are the corners in one vertical plane, as far as anybody builds and measures walls?
    bool IsUpright() const;
    /// Do corners stand above each other while the ring encloses nothing in plan? Such a ring
    /// follows walls that are not in one plane.
    bool IsFolded() const { return mbFolded; }
    /// @return true if the plane runs rather along x than along y
    bool RunsAlongX() const { return mbAlongX; }

  private:
    double mdfLength = 0.0; ///< of the line
    double mdfAside = 0.0;  ///< greatest distance of a corner from the line
    bool mbAlongX = true;
    bool mbFolded = false;
};

/// @return is there area between the corners in space, in any direction?
bool HasAreaInSpace(const std::vector<ZARVertex>& corners);

} // namespace kelm::store
