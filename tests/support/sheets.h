#pragma once

#include "tin/aabbtree.h"
#include "tin/tin.h"

#include <algorithm>
#include <gtest/gtest.h>
#include <limits>
#include <memory>

namespace kelm::tin::test {

using Point = point3_t<float>;
using Point2 = point2_t<float>;
using Box = BBox<float, Point2>;
using Indices = std::vector<unsigned>;

constexpr float LOWEST = -std::numeric_limits<float>::max();
constexpr float NOT_A_NUMBER = std::numeric_limits<float>::quiet_NaN();
constexpr float UNTOUCHED = -7.0F;

/// Linear congruential generator (Knuth, The Art of Computer Programming, volume 2, section 3.3.4).
/// Each failure prints the seed, which TIN_TEST_SEED changes.
class Random {
  public:
    Random();
    /// @return an integer from 0 to n - 1
    unsigned Below(unsigned n);
    float Between(float low, float high);

  private:
    std::uint64_t mnState;
    testing::ScopedTrace moTrace;
};

struct OpenTin : Tin {
    using Tin::FindTrianglesByLine;
    using Tin::FindTrianglesByPoint;
    using Tin::FindTrianglesByRegion;
    using Tin::Subset;
    using Tin::Tin;
    Indices GetAll() const;
};

/// What a surface is made from.
struct Mesh {
    std::vector<Point> vertices;
    std::vector<Triangle_Id> ids;
    /// Adds a triangle with vertices of its own.
    void Add(const Point& a, const Point& b, const Point& c);
    OpenTin MakeTin(double dfXBase = 0, double dfYBase = 0) const;
};

/// cells by cells squares of 10 by 10, two triangles each; each node moves by up to fJitter.
Mesh MakeSheet(unsigned cells, float fJitter, Random& random);
/// One triangle; a regular sheet; a jittered one; one with holes, repeats, walls, points, slivers,
/// a second sheet, a large triangle over all and a NaN height.
std::vector<Mesh> MakeMeshes(Random& random);
/// A vertex, the nearest float to a point of an edge, a step beside a vertex, a whole number, or
/// any position in the box and a margin.
Point2 MakePosition(const Tin& tin, Random& random);

/// The triangles of a list that pass a test, in its order.
template <typename Test>
Indices Filter(const Tin& tin, Indices list, const Test& test) {
    const auto fails = [&](unsigned i) { return !test(*tin.GetTriangle(i)); };
    list.erase(std::remove_if(list.begin(), list.end(), fails), list.end());
    return list;
}

/// What a walk must deliver, in order: the lists of the leaves reached through boxes that pass.
template <typename Meets>
Indices CollectLeaves(const AabbNode* node, const Meets& meets) {
    if (node == nullptr || !meets(node->GetBBox()))
        return {};
    Indices list = node->GetLeaves();
    for (const AabbNode* child : {node->GetLeft(), node->GetRight()})
        for (const unsigned i : CollectLeaves(child, meets))
            list.push_back(i);
    return list;
}
Indices Sorted(Indices list);

} // namespace kelm::tin::test
