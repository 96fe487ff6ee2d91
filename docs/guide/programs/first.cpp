#include <cstdio>
#include <tin/aabbtree.h>
#include <tin/tin.h>

int main() {
    auto* vertices = new point3_t<float>[4]; // metres from the base; z is the height itself
    vertices[0] = {0.0f, 0.0f, 210.0f};
    vertices[1] = {100.0f, 0.0f, 214.0f};
    vertices[2] = {100.0f, 100.0f, 220.0f};
    vertices[3] = {0.0f, 100.0f, 212.0f};
    auto* ids = new Triangle_Id[2]{{0, 1, 2}, {0, 2, 3}};

    const kelm::tin::Tin surface(vertices, 4, ids, 2, 500000.0, 4649776.0); // takes both over
    const kelm::tin::AabbTree tree(&surface);

    float height;
    if (surface.GetHeight(500030.0, 4649796.0, height, &tree))
        std::printf("%.3f m\n", static_cast<double>(height));
    else
        std::puts("no surface there");
}
