#include "tin/detail/polygon.h"

#include "services/exception.h"
#include "services/reporting.h"
#include "tin/ray2.h"

#include <algorithm>
#include <cmath>
#include <limits>

namespace kelm::tin {

namespace {

/// Points that differ by less than this on both axes, in map units, are one.
template <typename T>
constexpr T REPEAT_TOLERANCE = T(1e-9);

template <typename V>
bool IsRepeat(const V& point, const V& predecessor) {
    const auto dx = point.x - predecessor.x;
    const auto dy = point.y - predecessor.y;
    constexpr auto tolerance = REPEAT_TOLERANCE<decltype(point.x + dx)>;
    return dx > -tolerance && tolerance > dx && dy > -tolerance && tolerance > dy;
}

/// Do the segments A-B and P-Q meet? Their ends count; parallel segments never meet.
template <typename T>
bool TestSegmentsMeet(const point2_t<T>& a, const point2_t<T>& b, const point2_t<T>& p,
                      const point2_t<T>& q) {
    T d = (b.x - a.x) * (q.y - p.y) - (q.x - p.x) * (b.y - a.y);
    if (std::numeric_limits<T>::epsilon() > std::fabs(d))
        return false;
    T s = (a.y - p.y) * (q.x - p.x) - (a.x - p.x) * (q.y - p.y);
    T t = (a.y - p.y) * (b.x - a.x) - (a.x - p.x) * (b.y - a.y);
    if (T(0) > d) {
        d = -d;
        s = -s;
        t = -t;
    }
    return T(0) <= s && s <= d && T(0) <= t && t <= d;
}

} // namespace

template <typename T>
Polygon<T>::Polygon(const ZARShape* poShape, const PolygonOrient eOrient) {
    const int vertices = poShape->vertexCount;
    if (vertices < 4)
        throw DataException(FormatString("%d points could not forma polygon", vertices),
                            "tin/detail/polygon", __PRETTY_FUNCTION__, __LINE__);
    mnPoints = static_cast<unsigned>(vertices) - 1U;
    mpoPoints = new point2_t<T>[mnPoints];
    for (unsigned i = 0; i < mnPoints; ++i)
        mpoPoints[i] = {poShape->vertices[i].x, poShape->vertices[i].y};
    ComputeBBox();
    if (eOrient != PO_Undefined)
        SetOrient(eOrient);
    RemoveRepeatedPoints();
}

template <typename T>
Polygon<T>::~Polygon() {
    if (mpoPoints != nullptr && mbOwnsPoints)
        delete[] mpoPoints;
}

template <typename T>
void Polygon<T>::ComputeBBox() {
    constexpr T highest = std::numeric_limits<T>::max();
    moBBox.min = {highest, highest};
    moBBox.max = {-highest, -highest};
    for (unsigned i = 0; i < mnPoints; ++i) {
        const point2_t<T>& p = mpoPoints[i];
        moBBox.min = {std::min(moBBox.min.x, p.x), std::min(moBBox.min.y, p.y)};
        moBBox.max = {std::max(moBBox.max.x, p.x), std::max(moBBox.max.y, p.y)};
    }
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

/// A point is compared with its immediate predecessor, kept or not, so that a chain of close points
/// collapses to its first one.
template <typename T>
void Polygon<T>::RemoveRepeatedPoints() {
    unsigned kept = 1;
    point2_t<T> predecessor = mpoPoints[0];
    for (unsigned i = 1; i < mnPoints; ++i) {
        const point2_t<T> point = mpoPoints[i];
        if (!IsRepeat(point, predecessor))
            mpoPoints[kept++] = point;
        predecessor = point;
    }
    mnPoints = kept;
}

template <typename T>
T Polygon<T>::GetSignedArea() const {
    T sum = T(0);
    for (unsigned i = 0; i < mnPoints; ++i) {
        const point2_t<T>& p = mpoPoints[i];
        const point2_t<T>& q = mpoPoints[i + 1 == mnPoints ? 0 : i + 1];
        sum += p.x * q.y - p.y * q.x;
    }
    return sum * T(0.5);
}

template <typename T>
bool Polygon<T>::IsSimple() const {
    if (mnPoints < 4)
        return true;
    for (unsigned i = 0; i + 2 < mnPoints; ++i)
        for (unsigned j = i + 2; j < mnPoints; ++j) {
            const unsigned k = j + 1 == mnPoints ? 0 : j + 1;
            if (k != i &&
                TestSegmentsMeet(mpoPoints[i], mpoPoints[i + 1], mpoPoints[j], mpoPoints[k]))
                return false;
        }
    return true;
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

std::vector<unsigned> detail::FindRingVertices(const ZARShape& oShape) {
    std::vector<unsigned> kept{0U};
    for (unsigned i = 1; i + 1 < static_cast<unsigned>(oShape.vertexCount); ++i)
        if (!IsRepeat(oShape.vertices[i], oShape.vertices[i - 1]))
            kept.push_back(i);
    return kept;
}

} // namespace kelm::tin
