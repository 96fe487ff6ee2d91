#pragma once

#include "tin/aabbtree.h"
#include "tin/tin.h"

#include <algorithm>
#include <cmath>
#include <cstdlib>
#include <gtest/gtest.h>
#include <limits>
#include <malloc.h>
#include <numeric>
#include <random>

namespace kelm::tin::test {

using Point = point3_t<float>;
using Point2 = point2_t<float>;
using Box = BBox<float, Point2>;
using Indices = std::vector<unsigned>;

constexpr float LOWEST = -std::numeric_limits<float>::max();
constexpr float NOT_A_NUMBER = std::numeric_limits<float>::quiet_NaN();
constexpr float UNTOUCHED = -7;

template <typename P>
auto MakeBox(const P& low, const P& high) {
    BBox<decltype(P::x), P> box;
    box.min = low;
    box.max = high;
    return box;
}
inline const Box EVERYWHERE = MakeBox(Point2{LOWEST, LOWEST}, Point2{-LOWEST, -LOWEST});

/// Each failure prints the seed, which TIN_TEST_SEED changes.
struct Random {
    /// @return an integer from 0 to n - 1
    unsigned Below(std::size_t n) { return static_cast<unsigned>(moEngine() % n); }
    float Between(float low, float high) {
        return low + (high - low) * (static_cast<float>(moEngine()) * 0x1p-32F);
    }
    const char* mpszSeed = std::getenv("TIN_TEST_SEED");
    std::mt19937 moEngine{mpszSeed == nullptr ? 1U : static_cast<unsigned>(std::atoi(mpszSeed))};
    testing::ScopedTrace moTrace{__FILE__, __LINE__, mpszSeed == nullptr ? "seed 1" : mpszSeed};
};

struct OpenTin : Tin {
    using Tin::FindTrianglesByLine, Tin::FindTrianglesByPoint, Tin::FindTrianglesByRegion;
    using Tin::Subset, Tin::Tin;
    Indices GetAll() const {
        Indices all(GetTriangleCount());
        std::iota(all.begin(), all.end(), 0U);
        return all;
    }
};

using Corners = std::vector<Point>;

struct OwnTriangle : Triangle {
    explicit OwnTriangle(const Corners& v) : corners(v) {
        SetVertices(&corners[0], &corners[1], &corners[2]);
    }
    Corners corners;
};

struct Mesh {
    std::vector<Point> vertices;
    std::vector<Triangle_Id> ids;
    /// Adds a triangle with vertices of its own.
    void Add(const Point& a, const Point& b, const Point& c) {
        const auto first = static_cast<unsigned>(vertices.size());
        vertices.insert(vertices.end(), {a, b, c});
        ids.push_back({first, first + 1, first + 2});
    }
    OpenTin MakeTin(double dfXBase = 0, double dfYBase = 0) const {
        // A surface without triangles or vertices does not take the vertices over.
        auto* points = vertices.empty() || ids.empty() ? nullptr : new Point[vertices.size()];
        if (points != nullptr)
            std::copy(vertices.begin(), vertices.end(), points);
        auto* triples = new Triangle_Id[ids.size()];
        std::copy(ids.begin(), ids.end(), triples);
        return OpenTin(points, static_cast<unsigned>(vertices.size()), triples,
                       static_cast<unsigned>(ids.size()), dfXBase, dfYBase);
    }
};

/// @return the bytes of the heap in use; 0 with an allocator of a sanitizer
inline std::size_t GetHeapBytes() {
    const struct mallinfo2 info = mallinfo2();
    return info.uordblks + info.hblkhd;
}

/// @return the sorted triangles of a tree or node
template <typename T>
Indices GetAllLeaves(const T& tree) {
    Indices all;
    tree.FindLeaves(EVERYWHERE, all);
    std::sort(all.begin(), all.end());
    return all;
}

/// 23 by 23 squares of 10 by 10, work for a team of threads; each node moves by up to fJitter.
inline Mesh MakeSheet(float fJitter, Random& random) {
    Mesh mesh;
    for (unsigned i = 0; i < 576; ++i) {
        const auto x = static_cast<float>(i % 24 * 10), y = static_cast<float>(i / 24 * 10);
        mesh.vertices.push_back({x + random.Between(0, fJitter), y + random.Between(0, fJitter),
                                 random.Between(0, 50)});
        if (i % 24 < 23 && i < 552)
            mesh.ids.insert(mesh.ids.end(), {{i, i + 1, i + 25}, {i + 25, i + 24, i}});
    }
    return mesh;
}

/// A regular sheet; one with holes, repeats, walls, points, slivers, a large triangle over all and
/// a NaN height; wide triangles in a column, which only the axis that is not the longest divides.
inline std::vector<Mesh> MakeMeshes(Random& random) {
    Mesh wild = MakeSheet(3, random), column;
    for (float y = 0; y < 20; ++y) {
        Triangle_Id& id = wild.ids[random.Below(wild.ids.size())];
        const Point a = wild.vertices[id.id0], b = wild.vertices[id.id1];
        id = wild.ids[0];
        wild.Add(a, b, {b.x, b.y, b.z + 30});
        wild.Add(a, a, a);
        wild.Add(a, b, {b.x, std::nextafter(b.y, 1e9F), 70});
        column.Add({-50, y, 1}, {50, y, 2}, {0, y + 3, 3});
    }
    wild.Add({0, 0, 20}, {200, 0, 20}, {0, 200, 20});
    wild.Add({20, 20, NOT_A_NUMBER}, {50, 20, 20}, {20, 50, 20});
    return {MakeSheet(0, random), wild, column};
}

} // namespace kelm::tin::test
