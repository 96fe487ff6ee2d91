#include <tin/aabbtree.h>
#include <tin/tin.h>

#include <cstdio>
#include <limits>

using namespace kelm::tin;

namespace {

void Print(const char* what, bool found, float height) {
    if (found)
        std::printf("%-28s %.3f m\n", what, static_cast<double>(height));
    else if (height == std::numeric_limits<float>::lowest())
        std::printf("%-28s inside the box, but in no triangle\n", what);
    else
        std::printf("%-28s outside the box, height untouched: %g\n", what,
                    static_cast<double>(height));
}

} // namespace

int main() {
    // Two triangles that do not touch. Above the second one lies a roof at 50 m.
    auto* vertices = new point3_t<float>[9];
    vertices[0] = {0.0f, 0.0f, 10.0f};
    vertices[1] = {100.0f, 0.0f, 20.0f};
    vertices[2] = {0.0f, 100.0f, 30.0f};
    vertices[3] = {300.0f, 0.0f, 10.0f};
    vertices[4] = {400.0f, 0.0f, 10.0f};
    vertices[5] = {300.0f, 100.0f, 10.0f};
    vertices[6] = {300.0f, 0.0f, 50.0f};
    vertices[7] = {400.0f, 0.0f, 50.0f};
    vertices[8] = {300.0f, 100.0f, 50.0f};
    auto* ids = new Triangle_Id[3]{{0, 1, 2}, {3, 4, 5}, {6, 7, 8}};
    const Tin surface(vertices, 9, ids, 3, 500000.0, 4650000.0);
    const AabbTree tree(&surface);

    float height = -1.0f;
    bool found = surface.GetHeight(500020.0, 4650030.0, height, &tree); // double: map coordinates
    Print("map position", found, height);
    found = surface.GetHeight(20.0f, 30.0f, height, &tree); // float: relative to the base
    Print("the same, surface-local", found, height);
    found = surface.GetHeight(20.0f, 30.0f, height, nullptr); // no index: tries all triangles
    Print("the same, without an index", found, height);
    found = surface.GetHeight(320.0f, 30.0f, height, &tree);
    Print("below the roof", found, height);
    found = surface.GetHeight(200.0f, 30.0f, height, &tree);
    Print("between the triangles", found, height);
    height = -1.0f;
    found = surface.GetHeight(-5.0f, 30.0f, height, &tree);
    Print("beside them", found, height);
}
