#pragma once

#include "services/vectorlayer.h"
#include "tin/bbox.h"
#include "tin/point.h"
#include "tin/tinexport.h"

#include <vector>

/// Turning sense of a ring, by the sign of its signed area: positive is counter-clockwise with y
/// growing upward.
enum PolygonOrient : int {
    PO_Undefined = -1,       ///< asked for: keep the order; measured: the area is zero or no number
    PO_CounterClockwise = 0, ///< signed area above 0
    PO_Clockwise = 1         ///< signed area below 0
};

namespace kelm::tin {

/// One closed ring in map coordinates, without heights, holes or parts. The one instance is
/// Polygon<double>.
///
/// The ring closes implicitly from its last point to its first. A polygon is made whole by its
/// constructor and changes no more; different polygons may be used on different threads.
template <typename T>
class Polygon {
  public:
    /// Takes the ring of a shape but for its last vertex, which is dropped unread, and removes
    /// repeated points last.
    /// @param poShape only its vertices' x and y are read @param eOrient sense that the points are
    /// brought into; a ring whose area has no sign is reversed by either request
    /// @throw kelm::DataException for fewer than four vertices; std::bad_alloc
    Polygon(const ZARShape* poShape, const PolygonOrient eOrient);
    Polygon(const Polygon&) = delete;
    Polygon& operator=(const Polygon&) = delete;
    ~Polygon();

    T GetSignedArea() const;
    /// @return true if no two edges meet that are not neighbours. Touching is meeting; parallel
    /// edges never meet, however much they overlap. @throw std::bad_alloc for a large ring
    bool IsSimple() const;
    /// Crossing test. Of an edge its upper end is part, its lower end is not; a point on an edge
    /// counts as left of it.
    bool IsPointInside(const T& dfX, const T& dfY) const;
    /// Does the polygon share a point with the window? Touching counts.
    bool IsIntersected(const BBox<T, point2_t<T>>& oWindow) const;

    /// @return GetPointCount() points in ring order, owned by the polygon
    const point2_t<T>* GetPoints() const { return mpoPoints; }
    unsigned GetPointCount() const { return mnPoints; }
    /// Box of the ring as it was read, repeated points included.
    const BBox<T, point2_t<T>>& GetBBox() const { return moBBox; }

  private:
    void ComputeBBox();
    void SetOrient(PolygonOrient eOrient);
    void RemoveRepeatedPoints();

    bool mbOwnsPoints = true;
    BBox<T, point2_t<T>> moBBox;
    PolygonOrient meOrient = PO_Undefined;
    point2_t<T>* mpoPoints = nullptr;
    unsigned mnPoints = 0;
    point2_t<T> moNearPoints[16]; ///< the array of a ring that fits into it
};

extern template class KELM_TIN_EXPORT Polygon<double>;

namespace detail {

/// Lists the shape vertex of each point of the polygon that a shape gives with PO_Undefined.
/// @param rVertices is appended to @throw std::bad_alloc
void FindRingVertices(const ZARShape& oShape, std::vector<unsigned>& rVertices);

} // namespace detail

} // namespace kelm::tin
