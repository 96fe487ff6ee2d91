#include "services/bundled/store/facets/layerwalk.h"

namespace kelm::store {

void LayerWalk::Restart() {
    moReader.Restart();
    moFacets.Restart();
    mnFacet = 0;
    mnShapes = 0;
}

bool LayerWalk::Advance() {
    if (mnFacet + 1 < moFacets.GetCount())
        ++mnFacet;
    else if (!ReadFeature())
        return false;
    ++mnShapes;
    return true;
}

/// @return false behind the last feature
bool LayerWalk::ReadFeature() {
    moFacets.Clear();
    mnFacet = 0;
    const OGRFeature* feature = moReader.Next();
    if (!feature)
        return false;
    mnFeature = feature->GetFID();
    moFacets.Assign(feature->GetGeometryRef());
    return true;
}

} // namespace kelm::store
