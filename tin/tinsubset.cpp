#include "tin/tin.h"

#include "services/exception.h"
#include "services/reporting.h"
#include "tin/rules/frame.h"

#include <algorithm>
#include <memory>

namespace kelm::tin {

namespace {

/// Marks the vertices that the listed triangles use. @return their number
unsigned MarkUsed(const Triangle* triangles, const std::vector<unsigned>& indices,
                  const point3_t<float>* vertices, std::vector<unsigned>& used) {
    unsigned count = 0;
    for (const unsigned id : indices)
        for (int corner = 0; corner < 3; ++corner) {
            unsigned& mark = used[std::size_t(triangles[id].GetVertex(corner) - vertices)];
            count += 1 - mark;
            mark = 1;
        }
    return count;
}

using Vertices = std::unique_ptr<point3_t<float>[]>;
using Triangles = std::unique_ptr<Triangle[]>;

/// Copies the marked vertices in their order. The marks turn into positions in the new array.
Vertices CopyUsed(const point3_t<float>* source, unsigned count, std::vector<unsigned>& used) {
    Vertices vertices(new point3_t<float>[count]);
    unsigned position = 0;
    for (std::size_t i = 0; i < used.size(); ++i) {
        const unsigned mark = used[i];
        if (mark == 1)
            vertices[position] = source[i];
        used[i] = position;
        position += mark;
    }
    return vertices;
}

void TestIndices(const std::vector<unsigned>& indices, unsigned count) {
    for (const unsigned id : indices)
        if (id >= count)
            throw ParameterException(
                "indices", ParameterException::PT_Invalid, FormatString("%u", id),
                FormatString("below %u", count),
                FormatString("Subset: there is no triangle %u: the surface has %u", id, count),
                "tin/tin", __PRETTY_FUNCTION__, __LINE__);
}

} // namespace

Tin* Tin::Subset(const std::vector<unsigned>& indices) const {
    TestIndices(indices, mnTriangles);
    if (indices.empty())
        return nullptr;
    std::vector<unsigned> used(mnVertices, 0U);
    const unsigned vertexCount = MarkUsed(mpoTriangles, indices, mpoVertices, used);
    Vertices vertices = CopyUsed(mpoVertices, vertexCount, used);
    const auto triangleCount = static_cast<unsigned>(indices.size());
    Triangles triangles(new Triangle[triangleCount]);
    for (unsigned k = 0; k < triangleCount; ++k) {
        const Triangle& source = mpoTriangles[indices[k]];
        const auto renumbered = [&](int corner) {
            return &vertices[used[std::size_t(source.GetVertex(corner) - mpoVertices)]];
        };
        triangles[k].SetVertices(renumbered(0), renumbered(1), renumbered(2));
    }
    std::vector<unsigned>().swap(used);
    auto subset = std::make_unique<Tin>(vertices.get(), vertexCount, triangles.get(), triangleCount,
                                        mdfXBase, mdfYBase);
    vertices.release();
    triangles.release();
    return subset.release();
}

Tin* Tin::Subset(const std::vector<unsigned char>& mask) const {
    const std::size_t length = std::min<std::size_t>(mask.size(), mnTriangles);
    const auto end = mask.begin() + std::ptrdiff_t(length);
    std::vector<unsigned> indices;
    indices.reserve(std::size_t(std::count(mask.begin(), end, 1)));
    for (unsigned i = 0; i < length; ++i)
        if (mask[i] == 1)
            indices.push_back(i);
    return Subset(indices);
}

Tin* Tin::SubsetByRegion(const BBox<float, point2_t<float>>& region, const AabbTree* tree) const {
    std::vector<unsigned> list;
    FindTrianglesByRegion(region, list, tree);
    return Subset(list);
}

Tin* Tin::SubsetByRegion(const BBox<double, point2_t<double>>& region, const AabbTree* tree) const {
    const rules::Frame frame(mdfXBase, mdfYBase);
    BBox<float, point2_t<float>> local;
    local.min = frame.ToLocal(region.min);
    local.max = frame.ToLocal(region.max);
    return SubsetByRegion(local, tree);
}

Tin* Tin::SubsetByLineString(const point2_t<float>* points, unsigned count,
                             const AabbTree* tree) const {
    if (points == nullptr)
        return nullptr;
    std::vector<unsigned> all;
    std::vector<unsigned> part;
    for (unsigned i = 1; i < count; ++i) {
        part.clear();
        FindTrianglesByLine(points[i - 1], points[i], part, tree);
        all.insert(all.end(), part.begin(), part.end());
    }
    std::vector<unsigned>().swap(part);
    std::sort(all.begin(), all.end());
    all.erase(std::unique(all.begin(), all.end()), all.end());
    return Subset(all);
}

Tin* Tin::SubsetByLineString(const point2_t<double>* points, unsigned count,
                             const AabbTree* tree) const {
    if (points == nullptr)
        return nullptr;
    const rules::Frame frame(mdfXBase, mdfYBase);
    std::vector<point2_t<float>> local(count);
    for (unsigned i = 0; i < count; ++i)
        local[i] = frame.ToLocal(points[i]);
    return SubsetByLineString(local.data(), count, tree);
}

} // namespace kelm::tin
