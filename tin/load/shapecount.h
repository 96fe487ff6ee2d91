#pragma once

#include "services/vectorlayer.h"

namespace kelm::tin::load {

/// Number of shapes of a layer by its record; -1 if the record does not know.
inline int GetShapeCount(const ZARLayer_t& oLayer) {
    return oLayer.shapeCountValid != 0 ? oLayer.shapeCount : -1;
}

} // namespace kelm::tin::load
