#pragma once

#include "services/vectorlayer.h"
#include "tin/load/cornerhash.h"
#include "tin/load/weld.h"
#include "tin/triangleid.h"

#include <array>
#include <cstddef>
#include <cstdint>
#include <memory>
#include <vector>

namespace kelm::tin::load {

/// Gathers the triangles of a load and welds their corners as they come, so that a corner that
/// several triangles share is held once.
///
/// From the first corner on that only the octree can decide, all corners are held, and the octree
/// welds them at the end.
class Welder {
  public:
    /// @param shapeCount shapes that may come, 0 or more @param isPart can it be far fewer?
    Welder(int shapeCount, bool isPart);

    /// Adds the triangle of a shape's first three vertices.
    /// @throw std::length_error beyond 2147483647 corners; std::bad_alloc
    void AddTriangle(const ZARShape& shape) {
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
        const auto get = [&](unsigned point) { return shape.vertices[ring.vertices[point]]; };
        for (const Triangle_Id& id : ring.triangles)
            Add(get(id.id0), get(id.id1), get(id.id2));
    }

    /// @return all that was added; the welder is of no use from then on @throw std::bad_alloc
    Welded Finish();

  private:
    using Point = CornerHash::Point;

    /// Triangles that are hashed together, so that the slots of their corners are fetched ahead.
    static constexpr std::size_t MOST_WAITING = 32;

    void Add(const ZARVertex& a, const ZARVertex& b, const ZARVertex& c) {
        Point* const to = &maWaiting[3 * mnWaiting];
        to[0] = {a.x, a.y, a.z};
        to[1] = {b.x, b.y, b.z};
        to[2] = {c.x, c.y, c.z};
        if (++mnWaiting == MOST_WAITING)
            TakeWaiting();
    }

    void TakeWaiting();
    void TestCount() const;
    void Hash();
    void Unfold();
    void HoldWaiting();

    std::unique_ptr<CornerHash> mpoHash; ///< null once the octree must weld
    std::array<Point, 3 * MOST_WAITING> maWaiting;
    std::size_t mnWaiting = 0;      ///< triangles
    std::vector<Triangle_Id> moIds; ///< lead to the kept corners of the hash
    std::vector<Point> moPoints;    ///< three a triangle; empty while there is a hash
    Ring moRing;
};

} // namespace kelm::tin::load
