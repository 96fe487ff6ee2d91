#pragma once

#include "services/bundled/store/facets/layerwalk.h"

#include <ogrsf_frmts.h>

namespace kelm::store {

/// Tells the type of a layer from what was met in it.
class LayerType {
  public:
    /// Takes note of one facet, or of what stands in its place.
    void Add(FacetFault fault);
    /// @return 2 if any facet was met, usable or not; else 3 for lines, 1 for points. If nothing of
    /// the kind was met, what the layer says of itself
    int Get(OGRLayer& layer) const;
    bool HasFacets() const { return mbFacets; }

  private:
    bool mbFacets = false;
    bool mbLines = false;
    bool mbPoints = false;
};

/// @return what a layer says of itself: 1 for points, 3 for lines, 2 for all else
int GetDeclaredType(OGRLayer& layer);

/// Reads a layer up to its first facet. One that says that it is of points or lines is not read.
/// @return true if there is a facet. @throw kelm::DataException if the layer cannot be read so far
bool HoldsFacets(Dataset& dataset, OGRLayer& layer);

} // namespace kelm::store
