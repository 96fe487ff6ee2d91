#pragma once

#include "tin/bbox.h"
#include "tin/point.h"
#include "tin/tinexport.h"
#include "tin/triangle.h"
#include "tin/triangleid.h"

#include <cstdint>
#include <vector>

namespace kelm::tin {

class AabbTree;

/// A surface: an array of vertices, an array of triangles over them, and the XY base that leads
/// from surface-local to map coordinates.
///
/// A `float` argument is surface-local, a `double` argument is a map coordinate. Map x is local x
/// plus the base's x; the same holds for y. Heights have no base. A surface knows no file, no datum
/// and no index. To make its queries fast, build an AabbTree over it and pass it along.
///
/// A surface is empty, with both arrays null, or has vertices and triangles. Only an assignment or
/// a move changes which arrays it has. A surface made from arrays owns them; they must come from
/// the array form of new. What its accessors hand out stays its own.
///
/// A copy refers to the same arrays but does not own them. Do not use it after the owner is gone. A
/// move hands the ownership on; the source still refers to the arrays, as a copy does.
///
/// The constant operations may run on any number of threads at a time, as long as nobody writes.
class KELM_TIN_EXPORT Tin {
  public:
    /// Makes the triangles from index triples.
    /// @param vertices taken over if both counts are above zero; else it stays the caller's
    /// @param ids released with the array form of delete, whatever the counts; each index must be
    /// below vertexCount, which is not tested
    /// @param vertexCount,triangleCount if one is zero the surface is empty; at most 2^31 - 1
    /// @param xBase,yBase map coordinates of the local origin
    /// @throw kelm::DataException if both counts are above zero and an array is null;
    /// std::bad_alloc. Nothing has been taken over or released then
    Tin(point3_t<float>* const vertices, unsigned vertexCount, Triangle_Id* const ids,
        unsigned triangleCount, const double& xBase, const double& yBase);
    /// Takes ready triangles, whose vertices lie in `vertices` and whose boxes are set. Both arrays
    /// are taken over if both counts are above zero; else both stay the caller's.
    /// @throw kelm::DataException as above
    Tin(point3_t<float>* const vertices, unsigned vertexCount, Triangle* const triangles,
        unsigned triangleCount, const double& xBase, const double& yBase);
    /// The copy owns nothing.
    Tin(const Tin& other);
    /// Copies as the constructor does. Arrays that the target owned are not released: take their
    /// addresses before, and delete them, or move another surface into the target instead. If both
    /// refer to the same arrays and the target owned them, it still does.
    Tin& operator=(const Tin& other);
    /// Takes over what the other owns.
    Tin(Tin&& other) noexcept;
    /// The same. Releases arrays that the target owned, unless the other refers to them as well.
    Tin& operator=(Tin&& other) noexcept;
    ~Tin();

    unsigned GetVertexCount() const { return mnVertices; }
    unsigned GetTriangleCount() const { return mnTriangles; }
    /// @return the vertex, or null if i is not below the count
    point3_t<float>* GetVertex(unsigned i) const;
    /// @return the triangle, or null if i is not below the count
    Triangle* GetTriangle(unsigned i) const;
    void GetVertexList(point3_t<float>*& list, unsigned& count) const;
    void GetTriangleList(Triangle*& list, unsigned& count) const;
    void GetXYBase(double& x, double& y) const;

    /// Box of all vertices, surface-local, also of those that no triangle uses; z is the height
    /// range. The box of an empty surface is the origin.
    BBox<float, point3_t<float>>& GetBBox() { return moBBox; }
    const BBox<float, point3_t<float>>& GetBBox() const { return moBBox; }
    /// The box in map coordinates.
    void GetRawBBox(BBox<double, point3_t<double>>& box) const;
    /// Overwrites the height range of the box, untested; vertices do not change.
    void SetHeightRange(float low, float high);
    void GetHeightRange(float& low, float& high) const;
    /// Computes the box of every triangle anew, after vertices have moved.
    void ComputeTriBBox();

    /// @return bytes held by this surface
    std::uint64_t GetObjBytes() const;
    /// @return bytes that a surface of these counts will hold
    static std::uint64_t EstimateObjBytes(unsigned vertexCount, unsigned triangleCount);

    // The queries. `tree` is an index of this surface, or null to scan all triangles. An index of
    // another number of triangles is refused with a kelm::ParameterException; one without a root
    // finds nothing. All of them can throw std::bad_alloc.

    /// The greatest height of the triangles at a position, surface-local or in map coordinates. A
    /// map position is narrowed to `float` once the base is subtracted. A NaN finds no height.
    /// @param height untouched if the position lies outside the surface's box; the lowest finite
    /// `float` if it lies inside the box but in no triangle
    /// @return is there a height?
    bool GetHeight(const float& x, const float& y, float& height, const AabbTree* tree) const;
    bool GetHeight(const double& x, const double& y, float& height, const AabbTree* tree) const;

    /// The highest crossing of the segment from a to b with the surface, as the segment's own
    /// height there.
    /// @param h untouched if the segment misses the surface's box in plan; the lowest finite
    /// `float` if it meets the box but crosses no triangle. `h` may refer to a coordinate of a or b
    /// @return is there a crossing?
    bool GetLineIntersectHeight(const point3_t<float>& a, const point3_t<float>& b, float& h,
                                const AabbTree* tree) const;
    bool GetLineIntersectHeight(const point3_t<double>& a, const point3_t<double>& b, float& h,
                                const AabbTree* tree) const;

    /// A new surface of the triangles that meet a region, with the vertices that they use; the
    /// caller deletes it. It shares nothing with this one. Without an index it takes the triangles
    /// of which an edge meets the region, in ascending order. With one it takes all triangles of
    /// each leaf whose box meets the region, in tree order.
    /// @return null if there is none. Without an index a NaN bound leaves its side open. With one
    /// it meets no box
    Tin* SubsetByRegion(const BBox<float, point2_t<float>>& region, const AabbTree* tree) const;
    Tin* SubsetByRegion(const BBox<double, point2_t<double>>& region, const AabbTree* tree) const;
    /// The same for the triangles that the segments between consecutive points touch in plan, in
    /// ascending order with an index and without. With one, a segment that grazes a box of the
    /// index within rounding can miss triangles in it.
    /// @param points count points; fewer than two, or null, select nothing
    Tin* SubsetByLineString(const point2_t<float>* points, unsigned count,
                            const AabbTree* tree) const;
    Tin* SubsetByLineString(const point2_t<double>* points, unsigned count,
                            const AabbTree* tree) const;

  protected:
    /// Computes the box from the vertices. A NaN coordinate takes no part.
    void ComputeBBox();
    /// Stores the arrays as the constructors do and computes the box; releases nothing and leaves
    /// the base alone.
    void Init(point3_t<float>* const vertices, unsigned vertexCount, Triangle* const triangles,
              unsigned triangleCount);

    /// Triangles that hold a position, surface-local. Without a tree they are ascending and
    /// appended to `result`. With one they are in tree order, and earlier entries of `result` that
    /// do not hold the position are removed.
    void FindTrianglesByPoint(const float& x, const float& y, std::vector<unsigned>& result,
                              const AabbTree* tree) const;
    /// Triangles of a region, surface-local, as SubsetByRegion tells; appended to `result`.
    void FindTrianglesByRegion(const BBox<float, point2_t<float>>& region,
                               std::vector<unsigned>& result, const AabbTree* tree) const;
    /// Triangles that the segment from a to b touches in plan, surface-local. For P of
    /// point2_t<float> and point3_t<float>.
    /// @param out empty at the call; ascending without a tree, in tree order with one
    template <typename P>
    void FindTrianglesByLine(const P& a, const P& b, std::vector<unsigned>& out,
                             const AabbTree* tree) const;

    /// A new surface of the triangles whose byte in the mask is 1, as SubsetByRegion gives it. In a
    /// mask that is too short the missing bytes count as 0; in one that is too long the rest is
    /// ignored.
    Tin* Subset(const std::vector<unsigned char>& mask) const;
    /// A new surface of the listed triangles, in list order, repeats included. Vertices keep the
    /// order they have here. @return null if the list is empty
    /// @throw kelm::ParameterException if an index is not below the triangle count
    Tin* Subset(const std::vector<unsigned>& indices) const;

  private:
    void Release() noexcept;
    void TestTree(const AabbTree* tree) const;

    Triangle* mpoTriangles = nullptr;
    std::uint32_t mnTriangles = 0;
    point3_t<float>* mpoVertices = nullptr;
    std::uint32_t mnVertices = 0;
    double mdfXBase;
    double mdfYBase;
    BBox<float, point3_t<float>> moBBox;
    std::int32_t mnThreads; ///< most threads of a scan; the thread setting at construction
    bool mbOwnsArrays = false;
};

static_assert(sizeof(Tin) == 88, "a surface accounts 88 bytes for itself");

} // namespace kelm::tin
