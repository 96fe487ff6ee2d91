#include "services/bundled/layerwalk.h"

namespace kelm::store {

void LayerWalk::Restart() {
    moReader.Restart();
    moFacets.Clear();
    mnFacet = 0;
    mnShapes = 0;
}

bool LayerWalk::Advance() {
    if (mnFacet + 1 < moFacets.GetCount()) {
        ++mnFacet;
    } else {
        moFacets.Clear();
        mnFacet = 0;
        const OGRFeature* poFeature = moReader.Next();
        if (!poFeature)
            return false;
        mnFeature = poFeature->GetFID();
        moFacets.Assign(poFeature->GetGeometryRef());
    }
    ++mnShapes;
    return true;
}

} // namespace kelm::store
