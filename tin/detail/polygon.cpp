#include "tin/detail/polygon.h"

#include "services/exception.h"
#include "services/reporting.h"
#include "services/rings/cutting/simplering.h"
#include "tin/ray2.h"
#include "tin/rules/extent.h"

#include <algorithm>
#include <iterator>

namespace kelm::tin {

template <typename T>
Polygon<T>::Polygon(const ZARShape* poShape, const PolygonOrient eOrient) {
    const int vertices = poShape->vertexCount;
    if (vertices < 4)
        throw DataException(FormatString("%d points could not forma polygon", vertices),
                            "tin/detail/polygon", __PRETTY_FUNCTION__, __LINE__);
    mnPoints = static_cast<unsigned>(vertices) - 1U;
    mpoPoints = mnPoints <= std::size(moNearPoints) ? moNearPoints : new point2_t<T>[mnPoints];
    for (unsigned i = 0; i < mnPoints; ++i)
        mpoPoints[i] = {poShape->vertices[i].x, poShape->vertices[i].y};
    ComputeBBox();
    if (eOrient != PO_Undefined)
        SetOrient(eOrient);
    RemoveRepeatedPoints();
}

template <typename T>
Polygon<T>::~Polygon() {
    if (mpoPoints != moNearPoints && mbOwnsPoints)
        delete[] mpoPoints;
}

template <typename T>
void Polygon<T>::ComputeBBox() {
    rules::Extent<T> extent;
    for (unsigned i = 0; i < mnPoints; ++i)
        extent.Add(mpoPoints[i]);
    moBBox.min = extent.GetMin();
    moBBox.max = extent.GetMax();
}

template <typename T>
void Polygon<T>::SetOrient(PolygonOrient eOrient) {
    meOrient = eOrient;
    const T area = GetSignedArea();
    const PolygonOrient actual = area > T(0)   ? PO_CounterClockwise
                                 : area < T(0) ? PO_Clockwise
                                               : PO_Undefined;
    if (actual != eOrient)
        std::reverse(mpoPoints, mpoPoints + mnPoints);
}

template <typename T>
void Polygon<T>::RemoveRepeatedPoints() {
    unsigned kept = 0;
    rings::VisitKept(mpoPoints, mnPoints, [&](unsigned i) { mpoPoints[kept++] = mpoPoints[i]; });
    mnPoints = kept;
}

template <typename T>
T Polygon<T>::GetSignedArea() const {
    return rings::ComputeSignedArea<T>(mpoPoints, mnPoints);
}

template <typename T>
bool Polygon<T>::IsSimple() const {
    return rings::IsSimple(mpoPoints, mnPoints);
}

template <typename T>
bool Polygon<T>::IsPointInside(const T& dfX, const T& dfY) const {
    bool inside = false;
    for (unsigned i = 0, j = mnPoints - 1; i < mnPoints; j = i++) {
        const point2_t<T>& p = mpoPoints[i];
        const point2_t<T>& q = mpoPoints[j];
        if ((dfY > p.y && q.y >= dfY) || (dfY > q.y && p.y >= dfY)) {
            const T crossing = (q.x - p.x) * (dfY - p.y) / (q.y - p.y) + p.x;
            inside ^= dfX > crossing;
        }
    }
    return inside;
}

template <typename T>
bool Polygon<T>::IsIntersected(const BBox<T, point2_t<T>>& oWindow) const {
    if (!TestOverlap(oWindow, moBBox))
        return false;
    if (TestInside(moBBox, oWindow.min.x, oWindow.min.y) &&
        IsPointInside(oWindow.min.x, oWindow.min.y))
        return true;
    if (TestInside(oWindow, mpoPoints[0].x, mpoPoints[0].y))
        return true;
    for (unsigned i = 0; i < mnPoints; ++i) {
        const point2_t<T>& p = mpoPoints[i];
        const point2_t<T>& q = mpoPoints[i + 1 == mnPoints ? 0 : i + 1];
        if (detail::TestSegment(oWindow, Ray2<T>(p, {q.x - p.x, q.y - p.y})))
            return true;
    }
    return false;
}

template class Polygon<double>;

void detail::FindRingVertices(const ZARShape& oShape, std::vector<unsigned>& rVertices) {
    rings::VisitKept(oShape.vertices, static_cast<unsigned>(oShape.vertexCount) - 1U,
                     [&](unsigned i) { rVertices.push_back(i); });
}

} // namespace kelm::tin
