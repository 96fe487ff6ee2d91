// Makes a surface from arrays, indexes it and asks for heights at map positions.

#include <tin/aabbtree.h>
#include <tin/tin.h>

#include <cstdio>

using kelm::tin::AabbTree;
using kelm::tin::Tin;

int main() {
    // A hill of four triangles around its top. x and y of the vertices are relative to the base, so
    // a float keeps their millimetres. Heights are not relative. All are in metres.
    const double xBase = 500000.0;
    const double yBase = 4649776.0;
    auto* vertices = new point3_t<float>[5];
    vertices[0] = {0.0f, 0.0f, 212.0f};
    vertices[1] = {100.0f, 0.0f, 208.0f};
    vertices[2] = {100.0f, 100.0f, 215.0f};
    vertices[3] = {0.0f, 100.0f, 210.0f};
    vertices[4] = {50.0f, 50.0f, 240.0f};
    auto* ids = new Triangle_Id[4]{{0, 1, 4}, {1, 2, 4}, {2, 3, 4}, {3, 0, 4}};

    // The surface takes both arrays over and releases them.
    const Tin surface(vertices, 5, ids, 4, xBase, yBase);
    const AabbTree tree(&surface);
    std::printf("%u triangles, %u tree nodes, %llu + %llu bytes\n", surface.GetTriangleCount(),
                tree.GetNodeCount(), static_cast<unsigned long long>(surface.GetObjBytes()),
                static_cast<unsigned long long>(tree.GetObjBytes()));

    // The top, a position on a shared edge, one on a slope, and one outside the surface.
    const double positions[][2] = {{500050.0, 4649826.0},
                                   {500025.0, 4649801.0},
                                   {500060.5, 4649790.25},
                                   {500150.0, 4649826.0}};
    for (const auto& [x, y] : positions) {
        float height;
        if (surface.GetHeight(x, y, height, &tree))
            std::printf("%.2f %.2f: %.3f m\n", x, y, static_cast<double>(height));
        else
            std::printf("%.2f %.2f: no surface\n", x, y);
    }
    return 0;
}
