#include <tin/tin.h>

#include <cstdio>

using namespace kelm::tin;

namespace {

void Print(const char* what, const Tin& surface, float x, float y) {
    float height;
    if (surface.GetHeight(x, y, height, nullptr))
        std::printf("%-21s %.1f m\n", what, static_cast<double>(height));
    else
        std::printf("%-21s no height\n", what);
}

} // namespace

int main() {
    auto* vertices = new point3_t<float>[9];
    vertices[0] = {0.0f, 0.0f, 10.0f}; // a square of two triangles
    vertices[1] = {10.0f, 0.0f, 10.0f};
    vertices[2] = {10.0f, 10.0f, 10.0f};
    vertices[3] = {0.0f, 10.0f, 10.0f};
    vertices[4] = {10.0f, 0.0f, 40.0f}; // a wall on its eastern side
    vertices[5] = {10.0f, 10.0f, 40.0f};
    vertices[6] = {4.0f, 0.0f, 25.0f}; // a sheet above it
    vertices[7] = {8.0f, 0.0f, 25.0f};
    vertices[8] = {8.0f, 4.0f, 25.0f};
    auto* ids = new Triangle_Id[5]{{0, 1, 2}, {0, 2, 3}, {1, 2, 5}, {1, 5, 4}, {6, 7, 8}};
    const Tin surface(vertices, 9, ids, 5, 0.0, 0.0);
    Print("on the inner edge", surface, 2.0f, 2.0f);
    Print("on a vertex", surface, 0.0f, 10.0f);
    Print("at the foot of a wall", surface, 10.0f, 5.0f);
    Print("below a sheet", surface, 7.0f, 2.0f);
    Print("on the sheet's edge", surface, 8.0f, 2.0f);

    // Lines meet a wall; height queries do not.
    float height;
    if (surface.GetLineIntersectHeight(point3_t<float>{5, 5, 20}, point3_t<float>{15, 5, 20},
                                       height, nullptr))
        std::printf("%-21s %.1f m\n", "a line into the wall", static_cast<double>(height));
}
