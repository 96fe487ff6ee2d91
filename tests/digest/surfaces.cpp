#include "surfaces.h"

#include <algorithm>
#include <cmath>
#include <vector>

namespace digest {

Tin MakeSheet(unsigned cells, double xBase, double yBase, Random& random) {
    const unsigned side = cells + 1;
    auto* vertices = new point3_t<float>[side * side];
    for (unsigned i = 0; i < side * side; ++i)
        vertices[i] = {static_cast<float>(10 * (i % side) + random.Milli(3)),
                       static_cast<float>(10 * (i / side) + random.Milli(3)),
                       static_cast<float>(200 + random.Milli(50))};
    std::vector<Triangle_Id> ids;
    for (unsigned row = 0; row < cells; ++row)
        for (unsigned col = 0; col < cells; ++col) {
            const unsigned a = row * side + col;
            if (random.Below(50) != 0)
                ids.push_back({a, a + 1, a + side + 1});
            if (random.Below(50) != 0)
                ids.push_back({a, a + side + 1, a + side});
            const unsigned rowAway = std::min(row + random.Below(8), cells);
            const unsigned colAway = std::min(col + random.Below(8), cells);
            if (random.Below(100) == 0)
                ids.push_back({a, a + 1, rowAway * side + colAway});
        }
    const unsigned count = static_cast<unsigned>(ids.size());
    auto* list = new Triangle_Id[count];
    std::copy(ids.begin(), ids.end(), list);
    return Tin(vertices, side * side, list, count, xBase, yBase);
}

/// The float nearest to a point on the way from a to b, in thousandths of it.
static float Between(float a, float b, double t) {
    const double low = static_cast<double>(a);
    return static_cast<float>(low + t * (static_cast<double>(b) - low));
}

point2_t<float> MakePosition(const Tin& tin, Random& random) {
    const unsigned extent = static_cast<unsigned>(tin.GetBBox().max.x) + 4;
    const kelm::tin::Triangle* triangle = tin.GetTriangle(random.Below(tin.GetTriangleCount()));
    const point3_t<float>& a = *triangle->GetVertex(0);
    const point3_t<float>& b = *triangle->GetVertex(1);
    const double u = random.Milli(extent);
    const double v = random.Milli(extent);
    switch (random.Below(4)) {
    case 0:
        return {a.x, a.y};
    case 1:
        return {Between(a.x, b.x, u / extent), Between(a.y, b.y, u / extent)};
    case 2:
        return {static_cast<float>(std::floor(u)), static_cast<float>(std::floor(v))};
    default:
        return {static_cast<float>(u - 2), static_cast<float>(v - 2)};
    }
}

} // namespace digest
