#include "tin/tin.h"

#include "services/exception.h"
#include "tin/parallel/parallelblocks.h"
#include "tin/rules/extent.h"
#include "tin/rules/frame.h"

#include <cassert>
#include <limits>
#include <memory>
#include <utility>

namespace kelm::tin {

namespace {

/// Triangle count above which a loop over the triangles is worth a team.
constexpr unsigned PARALLEL_ABOVE = 1000;

/// Range of one coordinate over all vertices.
template <float point3_t<float>::*Coordinate>
void ComputeRange(const point3_t<float>* vertices, unsigned count, float& low, float& high) {
    rules::Range<float> range;
    for (unsigned i = 0; i < count; ++i)
        range.Add(vertices[i].*Coordinate);
    low = range.low;
    high = range.high;
}

void SetTriangles(Triangle* triangles, unsigned triangleCount, point3_t<float>* vertices,
                  [[maybe_unused]] unsigned vertexCount, const Triangle_Id* ids) {
    const auto fill = [=](unsigned, unsigned first, unsigned last) {
        for (unsigned i = first; i < last; ++i) {
            const Triangle_Id& id = ids[i];
            assert(id.id0 < vertexCount && id.id1 < vertexCount && id.id2 < vertexCount);
            triangles[i].SetVertices(&vertices[id.id0], &vertices[id.id1], &vertices[id.id2]);
        }
    };
    parallel::ParallelBlocks(triangleCount, parallel::GetTeamAbove(PARALLEL_ABOVE, triangleCount),
                             fill);
}

/// @param cells triangles, or the index triples of them
void TestArrays(const void* vertices, unsigned vertexCount, const void* cells,
                unsigned triangleCount, const char* expected, unsigned line) {
    if (vertexCount > 0 && triangleCount > 0 && (vertices == nullptr || cells == nullptr))
        throw DataException(expected, "tin/tin", __PRETTY_FUNCTION__, line);
}

} // namespace

Tin::Tin(point3_t<float>* const vertices, unsigned vertexCount, Triangle_Id* const ids,
         unsigned triangleCount, const double& xBase, const double& yBase)
    : mdfXBase(xBase), mdfYBase(yBase) {
    TestArrays(vertices, vertexCount, ids, triangleCount,
               "vertices and index triples must be non-null", __LINE__);
    // Without vertices a triple leads nowhere, and the array is released unread.
    std::unique_ptr<Triangle[]> triangles(new Triangle[vertexCount > 0 ? triangleCount : 0]);
    if (vertexCount > 0)
        SetTriangles(triangles.get(), triangleCount, vertices, vertexCount, ids);
    delete[] ids;
    Init(vertices, vertexCount, triangles.get(), triangleCount);
    if (mbOwnsArrays)
        triangles.release();
}

Tin::Tin(point3_t<float>* const vertices, unsigned vertexCount, Triangle* const triangles,
         unsigned triangleCount, const double& xBase, const double& yBase)
    : mdfXBase(xBase), mdfYBase(yBase) {
    TestArrays(vertices, vertexCount, triangles, triangleCount,
               "vertices and triangles must be non-null", __LINE__);
    Init(vertices, vertexCount, triangles, triangleCount);
}

Tin::Tin(const Tin& other)
    : mpoTriangles(other.mpoTriangles), mnTriangles(other.mnTriangles),
      mpoVertices(other.mpoVertices), mnVertices(other.mnVertices), mdfXBase(other.mdfXBase),
      mdfYBase(other.mdfYBase), moBBox(other.moBBox), mnThreads(other.mnThreads) {}

Tin& Tin::operator=(const Tin& other) {
    mbOwnsArrays = mbOwnsArrays && mpoTriangles == other.mpoTriangles;
    mpoTriangles = other.mpoTriangles;
    mnTriangles = other.mnTriangles;
    mpoVertices = other.mpoVertices;
    mnVertices = other.mnVertices;
    mdfXBase = other.mdfXBase;
    mdfYBase = other.mdfYBase;
    moBBox = other.moBBox;
    mnThreads = other.mnThreads;
    return *this;
}

Tin::Tin(Tin&& other) noexcept {
    *this = std::move(other);
}

Tin& Tin::operator=(Tin&& other) noexcept {
    if (&other == this)
        return *this;
    if (mpoTriangles != other.mpoTriangles)
        Release();
    *this = static_cast<const Tin&>(other);
    mbOwnsArrays = std::exchange(other.mbOwnsArrays, false) || mbOwnsArrays;
    return *this;
}

Tin::~Tin() {
    Release();
}

void Tin::Release() noexcept {
    if (!mbOwnsArrays)
        return;
    delete[] mpoTriangles;
    delete[] mpoVertices;
}

void Tin::Init(point3_t<float>* const vertices, unsigned vertexCount, Triangle* const triangles,
               unsigned triangleCount) {
    mbOwnsArrays = vertexCount > 0 && triangleCount > 0;
    mpoTriangles = mbOwnsArrays ? triangles : nullptr;
    mnTriangles = mbOwnsArrays ? triangleCount : 0;
    mpoVertices = mbOwnsArrays ? vertices : nullptr;
    mnVertices = mbOwnsArrays ? vertexCount : 0;
    if (mbOwnsArrays)
        ComputeBBox();
    // Behind the box, whose team of three holds for its own region alone.
    mnThreads = omp_get_max_threads();
}

void Tin::ComputeBBox() {
    point3_t<float>& low = moBBox.min;
    point3_t<float>& high = moBBox.max;
#pragma omp parallel sections num_threads(3) default(none) shared(low, high)
    {
#pragma omp section
        ComputeRange<&point3_t<float>::x>(mpoVertices, mnVertices, low.x, high.x);
#pragma omp section
        ComputeRange<&point3_t<float>::y>(mpoVertices, mnVertices, low.y, high.y);
#pragma omp section
        ComputeRange<&point3_t<float>::z>(mpoVertices, mnVertices, low.z, high.z);
    }
}

void Tin::ComputeTriBBox() {
    const auto compute = [this](unsigned, unsigned first, unsigned last) {
        for (unsigned i = first; i < last; ++i)
            mpoTriangles[i].ComputeBBox();
    };
    parallel::ParallelBlocks(mnTriangles, parallel::GetTeamAbove(PARALLEL_ABOVE, mnTriangles),
                             compute);
}

point3_t<float>* Tin::GetVertex(unsigned i) const {
    return i < mnVertices ? &mpoVertices[i] : nullptr;
}

Triangle* Tin::GetTriangle(unsigned i) const {
    return i < mnTriangles ? &mpoTriangles[i] : nullptr;
}

void Tin::GetVertexList(point3_t<float>*& list, unsigned& count) const {
    list = mpoVertices;
    count = mnVertices;
}

void Tin::GetTriangleList(Triangle*& list, unsigned& count) const {
    list = mpoTriangles;
    count = mnTriangles;
}

void Tin::GetXYBase(double& x, double& y) const {
    x = mdfXBase;
    y = mdfYBase;
}

void Tin::GetRawBBox(BBox<double, point3_t<double>>& box) const {
    const rules::Frame frame(mdfXBase, mdfYBase);
    box.min = frame.ToMap(moBBox.min);
    box.max = frame.ToMap(moBBox.max);
}

void Tin::SetHeightRange(float low, float high) {
    moBBox.min.z = low;
    moBBox.max.z = high;
}

void Tin::GetHeightRange(float& low, float& high) const {
    low = moBBox.min.z;
    high = moBBox.max.z;
}

std::uint64_t Tin::GetObjBytes() const {
    return EstimateObjBytes(mnVertices, mnTriangles);
}

std::uint64_t Tin::EstimateObjBytes(unsigned vertexCount, unsigned triangleCount) {
    return std::uint64_t{12} * vertexCount + std::uint64_t{48} * triangleCount + 88;
}

} // namespace kelm::tin
