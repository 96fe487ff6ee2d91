#include "tests/support/sheets.h"

#include <cmath>
#include <cstdlib>
#include <numeric>

namespace kelm::tin::test {

Random::Random()
    : mnState(std::strtoull(std::getenv("TIN_TEST_SEED") ? std::getenv("TIN_TEST_SEED") : "1",
                            nullptr, 10)),
      moTrace(__FILE__, __LINE__, "TIN_TEST_SEED=" + std::to_string(mnState)) {}

unsigned Random::Below(unsigned n) {
    mnState = mnState * 6364136223846793005U + 1442695040888963407U;
    return static_cast<unsigned>(((mnState >> 32) * n) >> 32);
}

float Random::Between(float low, float high) {
    const double from = static_cast<double>(low), to = static_cast<double>(high);
    return static_cast<float>(from + (to - from) * Below(1U << 31) / 0x1p31);
}

Indices OpenTin::GetAll() const {
    Indices all(GetTriangleCount());
    std::iota(all.begin(), all.end(), 0U);
    return all;
}

void Mesh::Add(const Point& a, const Point& b, const Point& c) {
    const unsigned first = static_cast<unsigned>(vertices.size());
    vertices.insert(vertices.end(), {a, b, c});
    ids.push_back({first, first + 1, first + 2});
}

OpenTin Mesh::MakeTin(double dfXBase, double dfYBase) const {
    Point* points = new Point[vertices.size()];
    std::copy(vertices.begin(), vertices.end(), points);
    Triangle_Id* triples = new Triangle_Id[ids.size()];
    std::copy(ids.begin(), ids.end(), triples);
    return OpenTin(points, static_cast<unsigned>(vertices.size()), triples,
                   static_cast<unsigned>(ids.size()), dfXBase, dfYBase);
}

Mesh MakeSheet(unsigned cells, float fJitter, Random& random) {
    Mesh mesh;
    const unsigned side = cells + 1;
    for (unsigned i = 0; i < side * side; ++i) {
        const unsigned x = i % side * 10, y = i / side * 10;
        mesh.vertices.push_back({static_cast<float>(x) + random.Between(0, fJitter),
                                 static_cast<float>(y) + random.Between(0, fJitter),
                                 random.Between(0, 50)});
    }
    for (unsigned i = 0; i < cells * cells; ++i) {
        const unsigned a = i / cells * side + i % cells;
        mesh.ids.insert(mesh.ids.end(), {{a, a + 1, a + side + 1}, {a + side + 1, a + side, a}});
    }
    return mesh;
}

std::vector<Mesh> MakeMeshes(Random& random) {
    Mesh single, mesh = MakeSheet(10, 3.0F, random);
    const Mesh second = MakeSheet(7, 4.0F, random);
    single.Add({1, 2, 3}, {40, 5, 60}, {20, 30, 10});
    for (unsigned left = 200; left > 175; --left)
        mesh.ids.erase(mesh.ids.begin() + random.Below(left));
    for (const Triangle_Id& id : second.ids)
        mesh.Add(second.vertices[id.id0], second.vertices[id.id1], second.vertices[id.id2]);
    for (unsigned i = 0; i < 20; ++i) {
        const Triangle_Id id = mesh.ids[random.Below(175)];
        const Point a = mesh.vertices[id.id0], b = mesh.vertices[id.id1];
        mesh.ids.push_back(id);
        mesh.Add(a, b, {b.x, b.y, b.z + 30.0F});
        mesh.Add(a, a, a);
        mesh.Add(a, b, {b.x, std::nextafter(b.y, 1e9F), 70.0F});
    }
    mesh.Add({0, 0, 20}, {200, 0, 20}, {0, 200, 20});
    mesh.Add({20, 20, NOT_A_NUMBER}, {50, 20, 20}, {20, 50, 20});
    return {single, MakeSheet(8, 0, random), MakeSheet(16, 3, random), mesh};
}

Point2 MakePosition(const Tin& tin, Random& random) {
    const Triangle& triangle = *tin.GetTriangle(random.Below(tin.GetTriangleCount()));
    const Point &a = *triangle.GetVertex(0), &b = *triangle.GetVertex(1);
    const Point &low = tin.GetBBox().min, &high = tin.GetBBox().max;
    const float t = random.Between(0, 1);
    const Point2 positions[] = {
        {a.x, a.y},
        {a.x + t * (b.x - a.x), a.y + t * (b.y - a.y)},
        {std::nextafter(a.x, t * 200), std::nextafter(a.y, -9.0F)},
        {std::floor(a.x), std::floor(b.y)},
        {random.Between(low.x - 2, high.x + 2), random.Between(low.y - 2, high.y + 2)}};
    return positions[random.Below(5)];
}

Indices Sorted(Indices list) {
    std::sort(list.begin(), list.end());
    return list;
}

} // namespace kelm::tin::test
