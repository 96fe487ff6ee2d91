#include "bench/weld.h"

#include <meshoptimizer.h>

namespace kelm::bench {

StandIns WeldByMeshoptimizer(Corners& rCorners) {
    StandIns numbers(rCorners.size());
    meshopt_generateVertexRemap(numbers.data(), nullptr, rCorners.size(), rCorners.data(),
                                rCorners.size(), sizeof(Corners::value_type));
    return numbers;
}

} // namespace kelm::bench
