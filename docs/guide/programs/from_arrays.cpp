#include <tin/aabbtree.h>
#include <tin/tin.h>

#include <cstdio>
#include <memory>

using namespace kelm::tin;

namespace {

constexpr unsigned SIDE = 101; // vertices on a side, 10 m apart

std::unique_ptr<Tin> MakeHill() {
    auto vertices = std::make_unique<point3_t<float>[]>(SIDE * SIDE);
    for (unsigned row = 0; row < SIDE; ++row)
        for (unsigned col = 0; col < SIDE; ++col) {
            const float x = 10.0f * static_cast<float>(col) - 500.0f;
            const float y = 10.0f * static_cast<float>(row) - 500.0f;
            const float z = 300.0f - 0.0004f * (x * x + y * y);
            vertices[row * SIDE + col] = {x, y, z};
        }

    const unsigned count = 2 * (SIDE - 1) * (SIDE - 1);
    auto ids = std::make_unique<Triangle_Id[]>(count);
    unsigned next = 0;
    for (unsigned row = 0; row + 1 < SIDE; ++row)
        for (unsigned col = 0; col + 1 < SIDE; ++col) {
            const unsigned low = row * SIDE + col;
            ids[next++] = {low, low + 1, low + 1 + SIDE};
            ids[next++] = {low, low + 1 + SIDE, low + SIDE};
        }

    // x and y of the vertices are relative to the base, heights are not. The surface takes both
    // arrays over and releases them with delete[].
    return std::make_unique<Tin>(vertices.release(), SIDE * SIDE, ids.release(), count, 500000.0,
                                 4650000.0);
}

} // namespace

int main() {
    const std::unique_ptr<Tin> hill = MakeHill();
    const AabbTree tree(hill.get());
    BBox<double, point3_t<double>> box;
    hill->GetRawBBox(box);
    std::printf("%u triangles, x %.0f to %.0f, heights %.1f to %.1f m\n", hill->GetTriangleCount(),
                box.min.x, box.max.x, box.min.z, box.max.z);

    float height;
    if (hill->GetHeight(500012.5, 4650040.0, height, &tree))
        std::printf("%.3f m\n", static_cast<double>(height));
}
