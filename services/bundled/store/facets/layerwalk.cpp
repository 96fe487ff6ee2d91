#include "services/bundled/store/facets/layerwalk.h"

namespace kelm::store {

void LayerWalk::Restart() {
    moReader.Restart();
    moFacets.Restart(0);
    mbTriangle = false;
    mnFacet = 0;
    mnShapes = 0;
}

void LayerWalk::Restart(const FeatureRun& run) {
    moReader.Restart(run);
    moFacets.Restart(run.mnPolygons);
    mbTriangle = false;
    mnFacet = 0;
    mnShapes = run.mnShapes;
}

bool LayerWalk::Advance() {
    if (mnFacet + 1 < GetFacetCount())
        ++mnFacet;
    else if (!ReadFeature())
        return false;
    ++mnShapes;
    return true;
}

/// @return false behind the last feature
bool LayerWalk::ReadFeature() {
    moFacets.SkipTriangle();
    mnFacet = 0;
    const StoredFeature* stored = moReader.Next();
    mbTriangle = stored && stored->mbTriangle;
    if (!stored)
        return false;
    mnFeature = stored->mnId;
    if (mbTriangle) {
        moTriangle.SetVertices(stored->maTriangle.data(), stored->maTriangle.size());
        moTriangle.mbFlat = stored->mbFlat;
    } else {
        moFacets.Assign(stored->mpoFeature->GetGeometryRef());
    }
    return true;
}

} // namespace kelm::store
