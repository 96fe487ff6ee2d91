#include <tin/aabbtree.h>
#include <tin/tin.h>

#include <cstdio>
#include <memory>
#include <random>

using namespace kelm::tin;

namespace {

constexpr unsigned CELLS = 60; // on a side; each is 10 m wide and has two triangles
constexpr unsigned SIDE = CELLS + 1;
constexpr unsigned POINTS = 1000000;

/// @return a number from 0 up to 1; the sequence is the same on every machine
double Draw(std::mt19937& random) {
    return static_cast<double>(random()) / 4294967296.0;
}

/// @return a whole number below n
unsigned DrawBelow(unsigned n, std::mt19937& random) {
    return static_cast<unsigned>(random()) % n;
}

/// @param low x and y of the south-western corner
/// @param jitter width of the square around each grid node in which its vertex lies
std::unique_ptr<Tin> MakeSheet(double low, double jitter) {
    std::mt19937 random(1);
    auto vertices = std::make_unique<point3_t<float>[]>(SIDE * SIDE);
    for (unsigned i = 0; i < SIDE * SIDE; ++i) {
        const double x = low + 10.0 * (i % SIDE) + jitter * (Draw(random) - 0.5);
        const double y = low + 10.0 * (i / SIDE) + jitter * (Draw(random) - 0.5);
        vertices[i] = {static_cast<float>(x), static_cast<float>(y), 100.0f};
    }
    auto ids = std::make_unique<Triangle_Id[]>(2 * CELLS * CELLS);
    for (unsigned i = 0; i < CELLS * CELLS; ++i) {
        const unsigned corner = i / CELLS * SIDE + i % CELLS;
        ids[2 * i] = {corner, corner + 1, corner + 1 + SIDE};
        ids[2 * i + 1] = {corner, corner + 1 + SIDE, corner + SIDE};
    }
    return std::make_unique<Tin>(vertices.release(), SIDE * SIDE, ids.release(), 2 * CELLS * CELLS,
                                 0.0, 0.0);
}

/// Picks an edge of a random triangle in an inner cell. Such an edge has a triangle on each side.
void PickEdge(const Tin& sheet, std::mt19937& random, point3_t<float>& a, point3_t<float>& b) {
    const unsigned col = 1 + DrawBelow(CELLS - 2, random);
    const unsigned row = 1 + DrawBelow(CELLS - 2, random);
    const Triangle& t = *sheet.GetTriangle(2 * (row * CELLS + col) + DrawBelow(2, random));
    const int side = static_cast<int>(DrawBelow(3, random));
    a = *t.GetVertex(side);
    b = *t.GetVertex((side + 1) % 3);
}

/// Asks for heights at random points of inner edges. Asks again a millimetre beside each point that
/// is missed.
void Measure(const char* what, const Tin& sheet) {
    const AabbTree tree(&sheet);
    std::mt19937 random(2);
    unsigned missed = 0;
    unsigned missedBeside = 0;
    for (unsigned i = 0; i < POINTS; ++i) {
        point3_t<float> a;
        point3_t<float> b;
        PickEdge(sheet, random, a, b);
        const double t = Draw(random);
        const double ax = static_cast<double>(a.x);
        const double ay = static_cast<double>(a.y);
        const double x = ax + t * (static_cast<double>(b.x) - ax);
        const double y = ay + t * (static_cast<double>(b.y) - ay);
        float height;
        if (sheet.GetHeight(x, y, height, &tree))
            continue;
        ++missed;
        missedBeside += !sheet.GetHeight(x + 0.001, y + 0.0007, height, &tree);
    }
    std::printf("%-37s %6u missed, %u also a millimetre beside\n", what, missed, missedBeside);
}

} // namespace

int main() {
    std::printf("of %u points on inner edges of a sheet\n", POINTS);
    Measure("regular, base in its corner:", *MakeSheet(0.0, 0.0));
    Measure("regular, base in its middle:", *MakeSheet(-300.0, 0.0));
    Measure("irregular, base in its middle:", *MakeSheet(-300.0, 8.0));
    Measure("irregular, base 10 km away:", *MakeSheet(10000.0, 8.0));
}
