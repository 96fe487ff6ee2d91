#include "tin/triangulate.h"

#include "services/rings/cutting/earclipping.h"

int Triangulate(const kelm::tin::Polygon<double>& oPolygon, std::vector<Triangle_Id>& oTriangles) {
    if (!oPolygon.IsSimple() || oPolygon.GetPointCount() < 3)
        return -1;
    const auto clip = [&](unsigned u, unsigned v, unsigned w) { oTriangles.push_back({u, v, w}); };
    if (kelm::rings::ClipEars(oPolygon.GetPoints(), oPolygon.GetPointCount(), clip))
        return 0;
    oTriangles.clear();
    return -1;
}
