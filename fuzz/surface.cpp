// Index triples over any coordinates: every query with an index against the scan,
// subsets and grid.

#include "fuzz/bytes.h"
#include "tin/aabbtree.h"
#include "tin/crossingtree.h"
#include "tin/heightgrid.h"
#include "tin/ray2.h"
#include "tin/tin.h"

#include <algorithm>
#include <array>
#include <cmath>
#include <memory>

using fuzz::Require;
using kelm::tin::AabbTree;
using kelm::tin::BBox;
using kelm::tin::CrossingTree;
using kelm::tin::HeightGrid;
using kelm::tin::Tin;
using kelm::tin::Triangle;

namespace {

using Point = point3_t<float>;
using List = std::vector<unsigned>;

struct Opened : Tin {
    using Tin::FindTrianglesByLine;
    using Tin::FindTrianglesByPoint;
    using Tin::Subset;
    using Tin::Tin;
};

/// Copies that make cells crowded and the batch of the index of lines take turns.
constexpr unsigned CROWD = 10;

/// Of +0 and -0 the first one found stands, which a tree and a scan find in their own order.
bool IsSame(float a, float b) {
    return std::memcmp(&a, &b, sizeof a) == 0 || (a == 0.0F && b == 0.0F);
}

List Sorted(List list) {
    std::sort(list.begin(), list.end());
    return list;
}

void TestPoint(const Opened& surface, const AabbTree& tree, float x, float y) {
    List scanned;
    List found;
    surface.FindTrianglesByPoint(x, y, scanned, nullptr);
    surface.FindTrianglesByPoint(x, y, found, &tree);
    Require(Sorted(found) == scanned);
    float low = 0.5F;
    float high = 0.5F;
    Require(surface.GetHeight(x, y, low, nullptr) == surface.GetHeight(x, y, high, &tree));
    Require(IsSame(low, high));
}

/// The index of heights must give the bits of the scan, by both rules.
void TestGridHeight(const Opened& surface, const HeightGrid& grid, float x, float y) {
    for (const auto rule : {kelm::tin::ER_Float, kelm::tin::ER_Closed}) {
        float wanted = 0.5F;
        float h = 0.5F;
        Require(surface.GetHeight(x, y, wanted, nullptr, rule) == grid.GetHeight(x, y, h, rule));
        Require(std::memcmp(&wanted, &h, sizeof h) == 0);
    }
}

constexpr unsigned MOST_POSITIONS = 9;

/// The same in a batch: a run of positions from one to another.
void TestGridRun(const Opened& surface, const HeightGrid& grid, const Point& a, const Point& b,
                 unsigned count) {
    std::array<point2_t<double>, MOST_POSITIONS> positions;
    for (unsigned i = 0; i < count; ++i) {
        const double step = i / double(count);
        positions[i] = {1000.0 + double(a.x) + (double(b.x) - double(a.x)) * step,
                        double(a.y) - 2000.0 + (double(b.y) - double(a.y)) * step};
    }
    std::array<float, MOST_POSITIONS> heights;
    for (const auto rule : {kelm::tin::ER_Float, kelm::tin::ER_Closed}) {
        grid.GetHeights(positions.data(), count, heights.data(), 1, rule);
        for (unsigned i = 0; i < count; ++i) {
            float wanted = 0.5F;
            const bool isFound =
                surface.GetHeight(positions[i].x, positions[i].y, wanted, nullptr, rule);
            Require(isFound ? std::memcmp(&wanted, &heights[i], sizeof wanted) == 0
                            : std::isnan(heights[i]));
        }
    }
}

/// Does the segment stay on the rim of the triangle's box, where rounding decides? Out of range it
/// always may, and the boxes of the tree leave out a coordinate that is NaN.
bool IsGrazed(const Triangle& triangle, const Point& a, const Point& b) {
    const BBox<float, point2_t<float>>& box = triangle.GetBBox();
    float reach = 0.0F;
    for (const float v : {a.x, a.y, b.x, b.y, box.min.x, box.min.y, box.max.x, box.max.y}) {
        if (!(std::fabs(v) < 1e6F))
            return true;
        reach = std::max(reach, std::fabs(v));
    }
    if (std::fabs(b.x - a.x) + std::fabs(b.y - a.y) < 1e-6F)
        return true;
    BBox<double, point2_t<double>> core;
    const double margin = 1e-5 * double(reach);
    core.min = {double(box.min.x) + margin, double(box.min.y) + margin};
    core.max = {double(box.max.x) - margin, double(box.max.y) - margin};
    const kelm::tin::Ray2<double> ray({double(a.x), double(a.y)},
                                      {double(b.x) - double(a.x), double(b.y) - double(a.y)});
    return core.min.x > core.max.x || core.min.y > core.max.y ||
           !kelm::tin::detail::TestSegment(core, ray);
}

void TestLine(const Opened& surface, const AabbTree& tree, const Point& a, const Point& b) {
    List scanned;
    List found;
    surface.FindTrianglesByLine(a, b, scanned, nullptr);
    surface.FindTrianglesByLine(a, b, found, &tree);
    found = Sorted(std::move(found));
    List missing;
    std::set_difference(scanned.begin(), scanned.end(), found.begin(), found.end(),
                        std::back_inserter(missing));
    Require(scanned.size() == found.size() + missing.size());
    for (const unsigned id : missing)
        Require(IsGrazed(*surface.GetTriangle(id), a, b));
    float all = 0.5F;
    float some = 0.5F;
    const bool crosses = surface.GetLineIntersectHeight(a, b, all, nullptr);
    const bool crossesToo = surface.GetLineIntersectHeight(a, b, some, &tree);
    Require(crosses || !crossesToo);
    if (missing.empty())
        Require(crosses == crossesToo && IsSame(all, some));
}

/// The index of lines must give the bits of the scan, one by one and in a batch.
void TestCrossing(const Opened& surface, const CrossingTree& index, const Point& a,
                  const Point& b) {
    float wanted = 0.5F;
    float h = 0.5F;
    const bool isFound = surface.GetLineIntersectHeight(a, b, wanted, nullptr);
    Require(index.GetLineIntersectHeight(a, b, h) == isFound);
    Require(std::memcmp(&wanted, &h, sizeof h) == 0);
    const point3_t<double> ends[] = {{1000.0 + double(a.x), double(a.y) - 2000.0, double(a.z)},
                                     {1000.0 + double(b.x), double(b.y) - 2000.0, double(b.z)}};
    float all[2];
    Require(surface.GetLineIntersectHeights(ends, 1, all, nullptr) ==
            index.GetLineIntersectHeights(ends, 1, all + 1));
    Require(std::memcmp(all, all + 1, sizeof h) == 0);
}

void TestSubset(const std::unique_ptr<Tin>& subset, const Tin& whole) {
    if (!subset)
        return;
    Point* first;
    unsigned count;
    subset->GetVertexList(first, count);
    Require(count > 0 && count <= whole.GetVertexCount() && subset->GetTriangleCount() > 0);
    for (unsigned i = 0; i < subset->GetTriangleCount(); ++i)
        for (int k = 0; k < 3; ++k) {
            const Point* vertex = subset->GetTriangle(i)->GetVertex(k);
            Require(vertex >= first && vertex < first + count);
        }
}

void TestGrid(const Triangle& triangle, int cols, int rows) {
    const unsigned count = triangle.GetGridPointsNum(cols, rows);
    std::vector<int> cells(2 * std::size_t{count} + 1, -7);
    Require(triangle.GetGridPointsCR(cells.data(), cols, rows) == count && cells.back() == -7);
    std::vector<int> confirmed;
    std::vector<float> heights;
    Require(triangle.GetGridPoints(cols, rows, confirmed, heights) == heights.size());
    Require(confirmed.size() == 2 * heights.size() && heights.size() <= count);
    for (std::size_t i = 0; i + 1 < cells.size(); i += 2)
        Require(cells[i] >= 0 && cells[i] < cols && cells[i + 1] >= 0 && cells[i + 1] < rows);
}

/// @param copies of each triangle
std::unique_ptr<Opened> CreateSurface(fuzz::Bytes& rBytes, fuzz::Coordinates<float>& rCoordinates,
                                      unsigned copies) {
    const unsigned vertexCount = rBytes.TakeFrom(3, 40);
    const unsigned own = rBytes.TakeFrom(1, 60);
    const unsigned triangleCount = copies * own;
    auto vertices = std::make_unique<Point[]>(vertexCount);
    for (unsigned i = 0; i < vertexCount; ++i)
        vertices[i] = {rCoordinates.Take(), rCoordinates.Take(), rCoordinates.Take()};
    auto ids = std::make_unique<Triangle_Id[]>(triangleCount);
    const auto takeIndex = [&] { return rBytes.TakeFrom(0, vertexCount - 1); };
    for (unsigned i = 0; i < own; ++i)
        ids[i] = {takeIndex(), takeIndex(), takeIndex()};
    for (unsigned i = own; i < triangleCount; ++i)
        ids[i] = {ids[i - own].id1, ids[i - own].id2, ids[i - own].id0};
    return std::make_unique<Opened>(vertices.release(), vertexCount, ids.release(), triangleCount,
                                    1000.0, -2000.0);
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    fuzz::Bytes bytes(data, size);
    AabbTree tree;
    const unsigned kind = bytes.TakeFrom(0, 111);
    tree.SetCapacity(static_cast<int>(kind % 7));
    tree.GetInfo()->SetDivisionType(bytes.TakeFrom(0, 1) == 0 ? kelm::tin::DT_BestAxis
                                                              : kelm::tin::DT_LongestAxis);
    fuzz::Coordinates<float> coordinates(bytes, 6e-8F);
    const auto surface = CreateSurface(bytes, coordinates, kind / 7 == 15 ? CROWD : 1);
    tree.CreateTree(surface.get());
    const unsigned triangles = surface->GetTriangleCount();
    const CrossingTree crossings(*surface);
    const HeightGrid grid(*surface, {1, tree.GetCapacity() * 30, {}});
    do {
        const Point a{coordinates.Take(), coordinates.Take(), coordinates.Take()};
        const Point b{coordinates.Take(), coordinates.Take(), coordinates.Take()};
        TestPoint(*surface, tree, a.x, a.y);
        TestGridHeight(*surface, grid, a.x, a.y);
        TestGridRun(*surface, grid, a, b, 2 + triangles % (MOST_POSITIONS - 1));
        TestLine(*surface, tree, a, b);
        TestCrossing(*surface, crossings, a, b);
        BBox<float, point2_t<float>> region;
        region.min = {a.x, a.y};
        region.max = {b.x, b.y};
        const point2_t<double> path[] = {{1000.0 + double(a.x), double(a.y) - 2000.0},
                                         {1000.0 + double(b.x), double(b.y) - 2000.0}};
        for (const AabbTree* index :
             {static_cast<const AabbTree*>(nullptr), static_cast<const AabbTree*>(&tree)}) {
            TestSubset(std::unique_ptr<Tin>(surface->SubsetByRegion(region, index)), *surface);
            TestSubset(std::unique_ptr<Tin>(surface->SubsetByLineString(path, 2, index)), *surface);
        }
        const Triangle& one = *surface->GetTriangle(bytes.TakeFrom(0, triangles - 1));
        TestGrid(one, static_cast<int>(bytes.TakeFrom(0, 70)) - 2, 8);
        static_cast<void>(one.IsIntersected(*surface->GetTriangle(0)));
    } while (!bytes.IsEmpty());
    TestSubset(std::unique_ptr<Tin>(surface->Subset(List{triangles - 1, 0, 0})), *surface);
    return 0;
}
