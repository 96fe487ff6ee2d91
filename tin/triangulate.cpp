#include "tin/triangulate.h"

#include "tin/rings/earcutter.h"
#include "tin/rings/smallring.h"

int Triangulate(const kelm::tin::Polygon<double>& oPolygon, std::vector<Triangle_Id>& oTriangles) {
    using namespace kelm::tin::rings;
    const Point* const points = oPolygon.GetPoints();
    const unsigned count = oPolygon.GetPointCount();
    if (!oPolygon.IsSimple() || count < 3)
        return -1;
    const bool isForward = oPolygon.GetSignedArea() > 0.0;
    const bool isCut = count <= SmallRing::MOST_CORNERS
                           ? SmallRing(points, count, isForward).Cut(oTriangles)
                           : EarCutter(points, count, isForward).Cut(oTriangles);
    if (!isCut)
        oTriangles.clear();
    return isCut ? 0 : -1;
}
