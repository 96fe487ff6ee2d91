#pragma once

#include "python/native/numpy.h"

#include <tin/crossingtree.h>
#include <tin/heightgrid.h>
#include <tin/raster.h>
#include <tin/tin.h>

#include <memory>
#include <mutex>
#include <string>

namespace kelm::python {

/// A surface, and the indexes over it, each built when it is first asked for. It never changes, so
/// any number of threads may query it. Arrays have the shapes that the package has checked.
///
/// Every operation that takes long releases the interpreter's lock.
class Surface {
  public:
    explicit Surface(std::unique_ptr<tin::Tin> poTin);

    /// @param vertices n x 3, relative to the base @param triangles m x 3, each index below n
    static std::unique_ptr<Surface> FromArrays(const Array<float>& vertices,
                                               const Array<std::uint32_t>& triangles, double xBase,
                                               double yBase);

    /// A view of the vertices, which keeps `self` alive.
    static py::array GetPoints(const py::object& self);
    /// The same of the vertex numbers of the triangles.
    static py::array GetTriangles(const py::object& self);
    std::pair<double, double> GetBase() const;
    /// @return xmin, ymin, zmin, xmax, ymax, zmax in map coordinates
    std::array<double, 6> GetBox() const;
    /// @return bytes of the surface and of what has been built for it
    std::uint64_t GetBytes() const;

    float GetHeight(double x, double y, bool isClosed) const;
    Array<float> GetHeights(const Array<double>& positions, int threads, bool isClosed) const;
    /// @param segments n x 6: both ends of each
    Array<float> GetCrossings(const Array<double>& segments, int threads) const;
    /// @param transform as GDAL has it
    Array<float> Rasterize(unsigned columns, unsigned rows, const std::array<double, 6>& transform,
                           int threads, bool isClosed) const;
    /// @return null if no triangle meets the region
    std::unique_ptr<Surface> Subset(const std::array<double, 4>& bounds) const;
    std::unique_ptr<Surface> SubsetAlong(const Array<double>& line) const;

  private:
    const tin::HeightGrid& GetGrid() const;
    const tin::CrossingTree& GetTree() const;
    const std::vector<Triangle_Id>& GetIds() const;

    std::unique_ptr<const tin::Tin> mpoTin;
    mutable std::mutex moMutex; ///< never held while waiting for the interpreter's lock
    mutable std::unique_ptr<const tin::HeightGrid> mpoGrid;
    mutable std::unique_ptr<const tin::CrossingTree> mpoTree;
    mutable std::vector<Triangle_Id> moIds;
};

} // namespace kelm::python
