#pragma once

#include "services/vectorlayer.h"

#include <vector>

namespace scripted {

using Ring = std::vector<ZARVertex>;

/// What the test double of the store and of the reference services does. The last one made is in
/// force; one thread writes it before the services are called.
struct Script {
    Script() { poCurrent = this; }

    int segmentCount = 1;
    int layerType = 4;
    bool hasLayer = true;
    ZARLayer_t record{1, 1};
    std::vector<Ring> shapes; ///< with ids 100, 110 ..; empty: is null; of one vertex: throws
    bool isLocal = false;
    int dimension = 2; ///< of the CRS; 0: there is none

    static inline Script* poCurrent = nullptr;
};

/// The height that a transform makes of a position, curved in x. @param nRise target datum, less
/// source
inline double Convert(double x, double y, double z, int nRise) {
    return z * 1.1 + x * x * 1e-9 + y * 1e-6 + nRise;
}

} // namespace scripted
