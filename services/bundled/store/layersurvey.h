#pragma once

#include "services/bundled/store/facets/keptfacets.h"
#include "services/bundled/store/facets/layerwalk.h"
#include "services/bundled/store/handles/openfile.h"
#include "services/bundled/store/runs/featureblocks.h"
#include "services/bundled/store/shapeids.h"
#include "services/vectorlayer.h"

namespace kelm::store {

/// What the store knows of a layer before its shapes are asked for.
struct LayerSurvey {
    int mnShapes = 0; ///< facets, those included that cannot be delivered
    int mnType = 2;   ///< 2 if the layer holds any facets, else 3 for lines, 1 for points
    ShapeIds moIds;
    FeatureBlocks moBlocks; ///< to be used only if feature ids rise
    KeptFacets moKept;      ///< what the walk has found, for one more walk
    /// Corners of the extents of the deliverable shapes, heights as stored; zero if there is none.
    ZARVertex moLow{};
    ZARVertex moHigh{};

    /// @return false for a layer that the survey has not read, and none is to read
    bool IsRead() const { return mnType == 2 || mnShapes > 0; }
};

/// Walks a layer once from its first facet to its last. Warns of the facets that cannot
/// be used, once a reason, of missing heights and of what GDAL warned of. A layer that says that it
/// is of points or lines is not read: a warning tells it, and it counts as one without shapes.
/// @param progress is told some hundred times
/// @throw kelm::DataException if the layer cannot be read or holds more shapes than an int counts;
/// what the progress throws
LayerSurvey SurveyLayer(LayerWalk& walk, const ProgressCall& progress);

} // namespace kelm::store
