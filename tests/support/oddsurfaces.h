#pragma once

#include "tests/support/sheets.h"

#include <array>
#include <cstring>
#include <functional>
#include <string>

namespace kelm::tin::test {

inline bool IsSameBits(float a, float b) {
    return std::memcmp(&a, &b, sizeof a) == 0;
}

/// A surface that could mislead an index.
struct OddSurface {
    std::string sName;
    Mesh oMesh;
    std::function<void(OpenTin&)> disturb = [](OpenTin&) {}; ///< behind the construction
};

/// The triangles that corners(i) gives, of their own vertices each.
template <typename Trio>
Mesh MakeEach(unsigned count, const Trio& corners) {
    Mesh mesh;
    for (unsigned n = 0; n < count; ++n) {
        const std::array<Point, 3> c = corners(static_cast<float>(n));
        mesh.Add(c[0], c[1], c[2]);
    }
    return mesh;
}

/// Any corners, at any scale.
inline Mesh MakeSoup(unsigned count, const std::function<float()>& coordinate) {
    return MakeEach(count, [&](float) {
        const auto point = [&] { return Point{coordinate(), coordinate(), coordinate()}; };
        return std::array<Point, 3>{point(), point(), point()};
    });
}

/// A sheet with a patch of very many triangles, some of them in a yet smaller patch.
inline Mesh MakePatches(Random& random) {
    Mesh mesh = MakeSheet(3, random);
    for (const float scale : {1.0F, 0.02F})
        for (unsigned i = 0; i < 6000; ++i) {
            const float x = 51 + scale * random.Between(0, 4),
                        y = 52 + scale * random.Between(0, 4);
            mesh.Add({x, y, random.Between(0, 9)}, {x + 0.1F * scale, y, 7},
                     {x, y + 0.1F * scale, 3});
        }
    return mesh;
}

inline void StretchSheet(Mesh& rMesh, float x, float y) {
    for (Point& vertex : rMesh.vertices)
        vertex = {vertex.x * x, vertex.y * y, vertex.z};
}

/// Triangles apart from each other, in the box of a long one.
inline Mesh MakeLone() {
    Mesh mesh = MakeEach(60, [](float i) {
        return std::array<Point, 3>{{{20 * i, 0, 1}, {20 * i + 9, 0, 2}, {20 * i, 9, i}}};
    });
    mesh.Add({-500, -500, 0}, {1700, 500, 0}, {1700, 499, 0});
    return mesh;
}

/// Moves a vertex of each far beyond one side of its box, which stays behind.
inline void MoveLone(OpenTin& rTin) {
    for (unsigned i = 0; i < 60; ++i) {
        Point* const v = rTin.GetVertex(3 * i);
        float* const sides[] = {&v[0].x, &v[0].y, &v[1].x, &v[2].y};
        *sides[i % 4] += i % 4 < 2 ? -490.0F : 490.0F;
    }
}

inline std::vector<OddSurface> MakeOddSurfaces(Random& random) {
    using Trio = std::array<Point, 3>;
    const float far = -LOWEST, inf = std::numeric_limits<float>::infinity();
    std::vector<OddSurface> list;
    const auto add = [&](const char* name, Mesh mesh, auto disturb) {
        list.push_back({name, std::move(mesh), disturb});
    };
    const auto leave = [](OpenTin&) {};
    const auto addEach = [&](const char* name, unsigned count, const auto& corners) {
        add(name, MakeEach(count, corners), leave);
    };
    for (Mesh& mesh : MakeMeshes(random))
        add("sheet", mesh, leave);
    add("empty", {}, leave);
    add("patches", MakePatches(random), leave);
    Mesh thin = MakeSheet(3, random), small = thin, large = thin, zeros = MakeSheet(0, random);
    StretchSheet(thin, 1, 1e-6F);
    StretchSheet(small, 1e-25F, 1e-22F);
    StretchSheet(large, 2e16F, 1e19F);
    for (Point& vertex : zeros.vertices)
        vertex.z = vertex.z > 40 ? -1.0F : vertex.z > 20 ? 0.0F : -0.0F;
    add("thin", thin, leave);
    add("small", small, leave);
    add("large", large, leave);
    add("zeros", zeros, leave);
    addEach("walls", 500, [](float i) { return Trio{{{i, i, 0}, {i + 1, i + 1, 2}, {i, i, 5}}}; });
    addEach("leaning walls", 500, [](float i) {
        return Trio{{{i, i, 0}, {i + 9, std::nextafter(i + 9, 1e9F), 2}, {i + 3, i + 3, 5}}};
    });
    addEach("copies", 700, [](float i) { return Trio{{{1, 1, i}, {4, 2, 1}, {2, 5, 2}}}; });
    addEach("tower", 700, [](float i) { return Trio{{{-i, -i, 2}, {i, -i, i}, {0, i, 2}}}; });
    addEach("slivers", 700, [](float i) {
        return Trio{{{i, 0, 1}, {i + 1, 5e6F, i}, {i, -5e6F, 1}}};
    });
    addEach("diagonal slivers", 700, [](float i) {
        return Trio{{{i, 0, 1}, {i + 700, 700, i}, {i + 1, 0.5F, 2}}};
    });
    addEach("far", 300, [=](float i) {
        const float e = i * 1e34F;
        return Trio{{{LOWEST, e, -LOWEST}, {LOWEST * -1, LOWEST, 1}, {e, LOWEST, 2}}};
    });
    addEach("infinite determinants", 60, [](float i) {
        const float e = 2e19F + i * 1e17F;
        return Trio{{{std::fmod(i, 2.0F) < 1 ? e : -e, 0, 1}, {0, e, 2}, {0, -e, i}}};
    });
    addEach("determinants of epsilon and the next below", 60, [](float i) {
        const float leg = std::fmod(i, 2.0F) < 1 ? 0x1p-26F : 0x1.fffffep-27F, x = i * 0x1p-20F;
        return Trio{{{x, 0, i}, {x + 0x1p-26F, 0, 1}, {x, std::fmod(i, 3.0F) < 1 ? leg : -leg, 2}}};
    });
    addEach("crowded corner", 700, [](float i) {
        const float at = std::exp2(std::floor(i / 2) - 125), x = std::fmod(i, 2.0F) * at;
        return Trio{{{x, at - x, 1}, {x * 1.25F, at - x, i}, {x, (at - x) * 1.25F, 1}}};
    });
    Mesh covered = MakeSheet(3, random);
    for (float i = 0; i < 3; ++i)
        covered.Add({-100, -100 - i, 10 * i}, {600, -100, 20}, {-100, 600, 5});
    add("covered", covered, leave);
    add("infinite heights", MakeSheet(3, random), [=](OpenTin& rTin) {
        for (unsigned i = 0; i < 200; ++i)
            rTin.GetVertex(i)->z = i % 3 == 0 ? inf : i % 3 == 1 ? -inf : LOWEST;
    });
    add("moved", MakeSheet(3, random), [](OpenTin& rTin) { // the boxes stay behind
        for (unsigned i = 0; i < 40; ++i)
            rTin.GetVertex(i * 7)->x += 4;
    });
    add("moved beyond one side of the box", MakeLone(), MoveLone);
    add("soup", MakeSoup(400, [&] { return random.Between(-9, 9); }), leave);
    add("soup at all scales",
        MakeSoup(400,
                 [&] {
                     return std::ldexp(random.Between(-1, 1),
                                       static_cast<int>(random.Below(250)) - 125);
                 }),
        leave);
    const float values[] = {0.0F, -0.0F, 1, 2, NOT_A_NUMBER, inf, -inf, far, -far, 1e-40F, 1e19F};
    add("soup of odd values", MakeSoup(2000, [&] { return values[random.Below(11)]; }), leave);
    return list;
}

/// A position on or next to a vertex or an edge of a surface, in a triangle, or anywhere.
inline Point2 MakePosition(const OpenTin& tin, Random& random) {
    if (tin.GetTriangleCount() == 0 || random.Below(50) == 0) {
        const float odd[] = {0, NOT_A_NUMBER, std::numeric_limits<float>::infinity(), LOWEST, 3};
        return {odd[random.Below(5)], odd[random.Below(5)]};
    }
    const Triangle& t = *tin.GetTriangle(random.Below(tin.GetTriangleCount()));
    const Point &a = *t.GetVertex(0), &b = *t.GetVertex(1), &c = *t.GetVertex(2);
    const float weights[] = {0, 0, 1, 0.5F, random.Between(0, 1), random.Between(-0.1F, 1.1F)};
    const float u = weights[random.Below(6)], v = weights[random.Below(6)] * (1 - u);
    Point2 p{a.x + u * (b.x - a.x) + v * (c.x - a.x), a.y + u * (b.y - a.y) + v * (c.y - a.y)};
    if (random.Below(3) == 0)
        p.x = std::nextafter(p.x, random.Below(2) == 0 ? LOWEST : -LOWEST);
    if (random.Below(3) == 0)
        p.y = std::nextafter(p.y, random.Below(2) == 0 ? LOWEST : -LOWEST);
    return p;
}

} // namespace kelm::tin::test
