#include "python/native/surface.h"

#include <algorithm>
#include <limits>

namespace kelm::python {

namespace {

using tin::Tin;

tin::EdgeRule GetRule(bool isClosed) {
    return isClosed ? tin::ER_Closed : tin::ER_Float;
}

template <typename T>
T* Copy(const T* from, std::size_t count) {
    auto copy = std::make_unique<T[]>(count);
    std::copy_n(from, count, copy.get());
    return copy.release();
}

} // namespace

Surface::Surface(std::unique_ptr<Tin> poTin) : mpoTin(std::move(poTin)) {}

std::unique_ptr<Surface> Surface::FromArrays(const Array<float>& vertices,
                                             const Array<std::uint32_t>& triangles, double xBase,
                                             double yBase) {
    static_assert(sizeof(point3_t<float>) == 12 && sizeof(Triangle_Id) == 12);
    const auto vertexCount = static_cast<std::size_t>(vertices.shape(0));
    const auto triangleCount = static_cast<std::size_t>(triangles.shape(0));
    const py::gil_scoped_release release;
    std::unique_ptr<point3_t<float>[]> points(
        Copy(reinterpret_cast<const point3_t<float>*>(vertices.data()), vertexCount));
    std::unique_ptr<Triangle_Id[]> ids(
        Copy(reinterpret_cast<const Triangle_Id*>(triangles.data()), triangleCount));
    auto surface =
        std::make_unique<Tin>(points.get(), static_cast<unsigned>(vertexCount), ids.get(),
                              static_cast<unsigned>(triangleCount), xBase, yBase);
    ids.release();
    if (vertexCount > 0 && triangleCount > 0)
        points.release();
    return std::make_unique<Surface>(std::move(surface));
}

py::array Surface::GetPoints(const py::object& self) {
    const Tin& surface = *self.cast<const Surface&>().mpoTin;
    return MakeView(reinterpret_cast<const float*>(surface.GetVertex(0)), surface.GetVertexCount(),
                    self);
}

py::array Surface::GetTriangles(const py::object& self) {
    const auto& ids = self.cast<const Surface&>().GetIds();
    return MakeView(reinterpret_cast<const std::uint32_t*>(ids.data()), ids.size(), self);
}

const std::vector<Triangle_Id>& Surface::GetIds() const {
    const py::gil_scoped_release release;
    const std::lock_guard<std::mutex> lock(moMutex);
    if (moIds.size() == mpoTin->GetTriangleCount())
        return moIds;
    std::vector<Triangle_Id> ids(mpoTin->GetTriangleCount());
    const point3_t<float>* first = mpoTin->GetVertex(0);
    for (unsigned i = 0; i < ids.size(); ++i) {
        const tin::Triangle& triangle = *mpoTin->GetTriangle(i);
        const auto find = [&](int corner) {
            return static_cast<unsigned>(triangle.GetVertex(corner) - first);
        };
        ids[i] = {find(0), find(1), find(2)};
    }
    moIds = std::move(ids);
    return moIds;
}

std::pair<double, double> Surface::GetBase() const {
    std::pair<double, double> base;
    mpoTin->GetXYBase(base.first, base.second);
    return base;
}

std::array<double, 6> Surface::GetBox() const {
    tin::BBox<double, point3_t<double>> box;
    mpoTin->GetRawBBox(box);
    return {box.min.x, box.min.y, box.min.z, box.max.x, box.max.y, box.max.z};
}

std::uint64_t Surface::GetBytes() const {
    const py::gil_scoped_release release;
    const std::lock_guard<std::mutex> lock(moMutex);
    return mpoTin->GetObjBytes() + (mpoGrid ? mpoGrid->GetObjBytes() : 0) +
           (mpoTree ? mpoTree->GetObjBytes() : 0) + moIds.size() * sizeof(Triangle_Id);
}

/// To be called without the interpreter's lock: another thread may wait for it while it builds.
const tin::HeightGrid& Surface::GetGrid() const {
    const std::lock_guard<std::mutex> lock(moMutex);
    if (!mpoGrid)
        mpoGrid = std::make_unique<const tin::HeightGrid>(*mpoTin);
    return *mpoGrid;
}

/// As GetGrid.
const tin::CrossingTree& Surface::GetTree() const {
    const std::lock_guard<std::mutex> lock(moMutex);
    if (!mpoTree)
        mpoTree = std::make_unique<const tin::CrossingTree>(*mpoTin);
    return *mpoTree;
}

float Surface::GetHeight(double x, double y, bool isClosed) const {
    const py::gil_scoped_release release;
    float height;
    return GetGrid().GetHeight(x, y, height, GetRule(isClosed))
               ? height
               : std::numeric_limits<float>::quiet_NaN();
}

Array<float> Surface::GetHeights(const Array<double>& positions, int threads, bool isClosed) const {
    Array<float> heights = MakeFloats(positions.shape(0));
    float* out = heights.mutable_data();
    const py::gil_scoped_release release;
    GetGrid().GetHeights(reinterpret_cast<const point2_t<double>*>(positions.data()),
                         static_cast<std::size_t>(positions.shape(0)), out, threads,
                         GetRule(isClosed));
    return heights;
}

Array<float> Surface::GetCrossings(const Array<double>& segments, int threads) const {
    Array<float> heights = MakeFloats(segments.shape(0));
    float* out = heights.mutable_data();
    const py::gil_scoped_release release;
    GetTree().GetLineIntersectHeights(reinterpret_cast<const point3_t<double>*>(segments.data()),
                                      static_cast<std::size_t>(segments.shape(0)), out, threads);
    return heights;
}

Array<float> Surface::Rasterize(unsigned columns, unsigned rows,
                                const std::array<double, 6>& transform, int threads,
                                bool isClosed) const {
    Array<float> cells(std::vector<py::ssize_t>{static_cast<py::ssize_t>(rows),
                                                static_cast<py::ssize_t>(columns)});
    float* out = cells.mutable_data();
    tin::RasterFrame frame{columns, rows, {}};
    std::copy(transform.begin(), transform.end(), frame.adfTransform);
    const py::gil_scoped_release release;
    tin::RasterizeHeights(*mpoTin, frame, out, threads, GetRule(isClosed));
    return cells;
}

std::unique_ptr<Surface> Surface::Subset(const std::array<double, 4>& bounds) const {
    const py::gil_scoped_release release;
    tin::BBox<double, point2_t<double>> region;
    region.min = {bounds[0], bounds[1]};
    region.max = {bounds[2], bounds[3]};
    std::unique_ptr<Tin> part(mpoTin->SubsetByRegion(region, nullptr));
    return part ? std::make_unique<Surface>(std::move(part)) : nullptr;
}

std::unique_ptr<Surface> Surface::SubsetAlong(const Array<double>& line) const {
    const py::gil_scoped_release release;
    std::unique_ptr<Tin> part(
        mpoTin->SubsetByLineString(reinterpret_cast<const point2_t<double>*>(line.data()),
                                   static_cast<unsigned>(line.shape(0)), nullptr));
    return part ? std::make_unique<Surface>(std::move(part)) : nullptr;
}

} // namespace kelm::python
