#include "tin/tin.h"

#include "tin/aabbtree.h"

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

} // namespace

Tin* Tin::Subset(const std::vector<unsigned>& indices) const {
    if (indices.empty())
        return nullptr;
    std::vector<unsigned> used(mnVertices, 0U);
    const unsigned vertexCount = MarkUsed(mpoTriangles, indices, mpoVertices, used);
    std::unique_ptr<point3_t<float>[]> vertices(new point3_t<float>[vertexCount]);
    // The marks turn into the positions of the used vertices in the new array.
    unsigned position = 0;
    for (unsigned i = 0; i < mnVertices; ++i) {
        const unsigned mark = used[i];
        if (mark == 1)
            vertices[position] = mpoVertices[i];
        used[i] = position;
        position += mark;
    }
    const auto triangleCount = static_cast<unsigned>(indices.size());
    std::unique_ptr<Triangle[]> triangles(new Triangle[triangleCount]);
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
    BBox<float, point2_t<float>> local;
    local.min = {static_cast<float>(region.min.x - mdfXBase),
                 static_cast<float>(region.min.y - mdfYBase)};
    local.max = {static_cast<float>(region.max.x - mdfXBase),
                 static_cast<float>(region.max.y - mdfYBase)};
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
    std::vector<point2_t<float>> local(count);
    for (unsigned i = 0; i < count; ++i)
        local[i] = {static_cast<float>(points[i].x - mdfXBase),
                    static_cast<float>(points[i].y - mdfYBase)};
    return SubsetByLineString(local.data(), count, tree);
}

} // namespace kelm::tin
