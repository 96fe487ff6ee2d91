#pragma once

#include "tin/bbox.h"
#include "tin/point.h"
#include "tin/tinexport.h"

#include <cstddef>
#include <new>
#include <vector>

/// Result of crossing a triangle with a segment in space.
enum IntersectRelation : int {
    IR_Disjoint = 0, ///< parallel to the plane, or the plane lies beyond the segment's ends
    IR_Inside = 1,   ///< crosses the plane inside the triangle; a height was delivered
    IR_Outside = 2   ///< crosses the plane, but outside the triangle
};

namespace kelm::tin {

namespace rules {
class Barycentric;
}

/// Axis of a vertex in plan.
enum Axis : int { AX_X = 0, AX_Y = 1 };

/// Triangle of a surface: three vertices by reference, and their box in plan.
///
/// All coordinates are surface-local `float`. The vertices belong to whoever made them and must
/// outlive the triangle. The winding has no meaning. Predicates on a position work in plan and
/// without tolerance: a position is inside while its computed weights lie from 0 to 1, so edges and
/// vertices are inside as far as `float` arithmetic tells. A triangle without area in plan holds no
/// position. Weights let a NaN pass: only the tests that start with a box refuse a NaN position.
///
/// A default triangle has no vertices. It holds no position, meets nothing, and its centre is NaN.
///
/// Any number of threads may query one triangle; setting vertices or box excludes all others.
class KELM_TIN_EXPORT Triangle {
  public:
    /// No vertices; the box is the point at the origin.
    Triangle();
    /// Sets the vertices from a list of three. @throw kelm::DataException if it or one is null
    explicit Triangle(point3_t<float>** list);
    /// The copy shares the vertices.
    Triangle(const Triangle&) = default;
    Triangle& operator=(const Triangle&) = default;
    ~Triangle() = default;
    /// Arrays of a surface are large, and come on large pages where the system has such.
    static void* operator new[](std::size_t bytes);
    static void* operator new[](std::size_t bytes, const std::nothrow_t&) noexcept {
        return ::operator new[](bytes, std::nothrow);
    }
    static void* operator new[](std::size_t, void* place) noexcept { return place; }
    static void operator delete[](void* array) noexcept { ::operator delete[](array); }

    /// Sets the three vertices and computes the box. @throw kelm::DataException if one is null; the
    /// triangle then stays as it was
    void SetVertices(point3_t<float>* const a, point3_t<float>* const b, point3_t<float>* const c);
    void SetVertices(point3_t<float>* const* const list);
    /// Computes the box anew, after a vertex has moved. A default triangle keeps its box.
    void ComputeBBox();

    BBox<float, point2_t<float>>& GetBBox() { return bbox; }
    const BBox<float, point2_t<float>>& GetBBox() const { return bbox; }
    /// @param i 0, 1 or 2 @return the vertex; null for any other i, and in a default triangle
    point3_t<float>* GetVertex(int i) const {
        return static_cast<unsigned>(i) < 3 ? vertices[i] : nullptr;
    }
    void GetVertices(point3_t<float>*& a, point3_t<float>*& b, point3_t<float>*& c) const;
    /// @param list three entries of the caller's
    void GetVertexList(point3_t<float>** const list) const;

    /// Centroid on one axis, summed and divided in `float`.
    double GetCenterAt(Axis axis) const;
    /// Centroid in plan. @param out x, then y
    void GetCenterXY(float* out) const;
    void GetCenterXY(point2_t<float>* out) const;

    /// Height of the plane at a position, if the weights say that it is inside. A NaN position
    /// counts as inside and has the height NaN. @return false, with h untouched, if it is outside
    bool GetHeight(float x, float y, float& h) const;
    /// Is the position inside, by the box first and then by the weights? A NaN position is not.
    bool IsPointInside(float x, float y) const;
    /// Is the position inside, by the weights alone? The answer holds also while the box is out of
    /// date. A NaN position is inside.
    bool IsPointInsideLT(float x, float y) const;

    /// Crossing with the segment from a to b (Moeller and Trumbore 1997, bounded to the segment).
    /// @param h for IR_Inside the height of the segment at the crossing; else untouched
    IntersectRelation GetLineIntersectHeight(const point3_t<float>& a, const point3_t<float>& b,
                                             float& h) const;
    /// Does the segment touch the triangle in plan?
    bool IsIntersectedLine(float x1, float y1, float x2, float y2) const;
    /// Does an edge of the triangle meet the box? A box inside the triangle that touches no edge
    /// does not count.
    bool IsIntersected(const BBox<float, point2_t<float>>& box) const;
    /// Do the two triangles share a point in plan?
    bool IsIntersected(const Triangle& other) const;

    /// Lists the grid cells that the triangle covers, with the height at each.
    ///
    /// A cell is an integer position: x is read as the column, y as the row, so the vertices must
    /// be in grid coordinates. Cells come by ascending row, then column, and each is confirmed by
    /// the inside test. Coordinates beyond the range of `int` count as its nearest end; a box with
    /// a NaN covers no cell.
    /// @param cols,rows size of the grid; nothing is listed if one is below 1
    /// @param points column and row of each cell are appended
    /// @param heights one height a cell is appended
    /// @return the number of cells in `points`, earlier ones included; 0 if the box of the triangle
    /// lies outside the grid, whatever `points` holds; 4294967295 if the number is greater
    /// @throw std::bad_alloc, and both lists are then as they were
    unsigned GetGridPoints(int cols, int rows, std::vector<int>& points,
                           std::vector<float>& heights) const;
    /// Writes column and row of each cell between the two edges of every row, without the inside
    /// test: cells at both ends of a row may lie outside the triangle. Same frame and rules as
    /// GetGridPoints.
    /// @param points room for 2 * GetGridPointsNum(cols, rows) values
    /// @return the number of cells written
    unsigned GetGridPointsCR(int* points, int cols, int rows) const;
    /// @return the number of cells that GetGridPointsCR writes for the same grid. Both stop after
    /// 4294967295 cells
    unsigned GetGridPointsNum(int cols, int rows) const;

  protected:
    /// Weights of a position. @return 0 if it lies inside; -1 if not, or if the triangle has no
    /// area in plan, and then the outputs are of no use
    int GetBarycentricCoord(float x, float y, double& l0, double& l1, double& l2) const;

    /// Range of grid positions that the box holds, clipped to the grid.
    /// @return 0, or -1 if there is none; the outputs are then unclipped
    int GetGridExtent(int cols, int rows, int& xMin, int& yMin, int& xMax, int& yMax) const;
    /// Crossings of the edges with the horizontal line at y. The low end of an edge is excluded,
    /// its high end included. @param xs room for two values; ascending if the result is 2
    /// @return 0 or 2
    int Sweepline(float* xs, float y) const;
    /// Appends one cell with its height if it lies inside. @param bary room for three values
    void GetGridPoint(int col, int row, std::vector<int>& points, std::vector<float>& heights,
                      double* bary) const;
    /// Marks one cell if it lies inside: adds 1 to its count and id to its sum, by two atomic
    /// updates, so that threads may mark one pair of arrays with different triangles.
    /// @param stride entries in a row of the arrays @param counts,sums one entry a cell of the
    /// caller's @param bary room for three values, of this thread's own
    void GetGridPointIdx(int col, int row, unsigned stride, int id, unsigned* counts, int* sums,
                         double* bary) const;

  private:
    bool IsSet() const { return vertices[0] != nullptr; }
    float GetWeightedHeight(double l0, double l1, double l2) const;
    void AddGridPoint(int col, int row, std::vector<int>& points, std::vector<float>& heights,
                      const double* bary) const;
    void AddGridRun(rules::Barycentric& barycentric, int first, int last, int row,
                    std::vector<int>& points, std::vector<float>& heights) const;

    template <typename Single, typename Run>
    bool WalkGrid(int cols, int rows, Single&& single, Run&& run) const;

    point3_t<float>* vertices[3];
    BBox<float, point2_t<float>> bbox;
};

static_assert(sizeof(Triangle) == 48, "a surface accounts 48 bytes for a triangle");

} // namespace kelm::tin
