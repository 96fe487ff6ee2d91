#pragma once

#include "containers/keypoint.h"
#include "services/memory/largepages.h"
#include "services/vectorlayer.h"
#include "tin/triangleid.h"

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <stdexcept>
#include <vector>

namespace kelm::tin::load {

/// Corners and triangles that a load gathers. Each triangle has three corners of its own.
///
/// The lists grow by a fixed step rather than by a factor, since the first reservation fits a layer
/// of triangles.
class CornerList {
  public:
    /// @param shapeCount shapes of the layer, 0 or more
    explicit CornerList(int shapeCount) {
        memory::ReserveLarge(moIds, static_cast<std::size_t>(shapeCount));
        memory::ReserveLarge(moPoints, 3 * static_cast<std::size_t>(shapeCount));
    }

    /// Adds the triangle of a shape's first three vertices.
    /// @throw std::length_error beyond 2147483647 corners; std::bad_alloc
    void AddTriangle(const ZARShape& shape) {
        Reserve(1);
        Add(shape.vertices[0], shape.vertices[1], shape.vertices[2]);
    }

    /// How the ring of one shape is cut.
    struct Ring {
        std::vector<Triangle_Id> triangles; ///< point numbers
        std::vector<unsigned> vertices;     ///< of the shape, by point number
    };

    /// @return an empty ring, the same one each time: its lists keep their memory
    Ring& GetEmptyRing() {
        moRing.triangles.clear();
        moRing.vertices.clear();
        return moRing;
    }

    /// Adds the triangles of the ring of a shape. Throws as AddTriangle does.
    void AddRing(const ZARShape& shape, const Ring& ring) {
        Reserve(ring.triangles.size());
        const auto get = [&](unsigned point) { return shape.vertices[ring.vertices[point]]; };
        for (const Triangle_Id& id : ring.triangles)
            Add(get(id.id0), get(id.id1), get(id.id2));
    }

    std::vector<containers::KeyPoint<double>>& GetPoints() { return moPoints; }
    std::vector<Triangle_Id>& GetIds() { return moIds; }

  private:
    static constexpr std::size_t POINT_STEP = 10000;
    static constexpr std::size_t ID_STEP = 5000;
    static constexpr std::size_t MOST_CORNERS = 2147483647;

    void Reserve(std::size_t triangles) {
        if (moPoints.size() + 3 * triangles > moPoints.capacity())
            memory::ReserveLarge(moPoints,
                                 moPoints.capacity() + std::max(3 * triangles, POINT_STEP));
        if (moIds.size() + triangles > moIds.capacity())
            memory::ReserveLarge(moIds, moIds.capacity() + std::max(triangles, ID_STEP));
    }

    void Add(const ZARVertex& a, const ZARVertex& b, const ZARVertex& c) {
        if (moPoints.size() > MOST_CORNERS - 3)
            throw std::length_error("the corners of a load are limited to 2147483647");
        const auto first = static_cast<std::uint32_t>(moPoints.size());
        for (const ZARVertex* vertex : {&a, &b, &c})
            moPoints.push_back({vertex->x, vertex->y, vertex->z});
        moIds.push_back({first, first + 1, first + 2});
    }

    std::vector<containers::KeyPoint<double>> moPoints;
    std::vector<Triangle_Id> moIds;
    Ring moRing;
};

} // namespace kelm::tin::load
