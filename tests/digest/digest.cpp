#include "digest.h"

#include "tests/support/sheets.h"

#include <cstdio>

// Prints one digest of a million height answers over jittered sheets, and one of the answers to all
// other queries. The input is made of integers and of single IEEE operations, so it is the same on
// every machine; the answers have to be.

namespace {

using kelm::tin::AabbTree;
using kelm::tin::Tin;
using kelm::tin::test::Mesh, kelm::tin::test::Point, kelm::tin::test::Point2;

constexpr double BASE_X = 500000.25;
constexpr double BASE_Y = 4649776.5;

/// After Knuth, The Art of Computer Programming, volume 2, section 3.3.4.
struct Random {
    /// @return an integer from 0 to n - 1
    std::uint32_t Below(std::uint32_t n) {
        return static_cast<std::uint32_t>(((engine() >> 32) * n) >> 32);
    }
    /// @return thousandths from 0 to below n units
    double Milli(std::uint32_t n) { return Below(n * 1000) / 1000.0; }

    std::linear_congruential_engine<std::uint64_t, 6364136223846793005u, 1442695040888963407u, 0>
        engine{1};
};

/// Nodes 10 m apart with 3 m of jitter in millimetres, two triangles a cell with one in fifty left
/// out, and one cell in a hundred covered once more by a triangle to a node some cells away.
Tin MakeSheet(unsigned cells, Random& random) {
    Mesh mesh;
    const unsigned side = cells + 1;
    for (unsigned i = 0; i < side * side; ++i)
        mesh.vertices.push_back({static_cast<float>(10 * (i % side) + random.Milli(3)),
                                 static_cast<float>(10 * (i / side) + random.Milli(3)),
                                 static_cast<float>(200 + random.Milli(50))});
    for (unsigned row = 0; row < cells; ++row)
        for (unsigned col = 0; col < cells; ++col) {
            const unsigned a = row * side + col;
            if (random.Below(50) != 0)
                mesh.ids.push_back({a, a + 1, a + side + 1});
            if (random.Below(50) != 0)
                mesh.ids.push_back({a, a + side + 1, a + side});
            const unsigned rowAway = std::min(row + random.Below(8), cells);
            const unsigned colAway = std::min(col + random.Below(8), cells);
            if (random.Below(100) == 0)
                mesh.ids.push_back({a, a + 1, rowAway * side + colAway});
        }
    return mesh.MakeTin(BASE_X, BASE_Y);
}

/// The float nearest to a point on the way from a to b, in thousandths of it.
float Between(float a, float b, double t) {
    const double low = static_cast<double>(a);
    return static_cast<float>(low + t * (static_cast<double>(b) - low));
}

/// A local position of one of four kinds: a vertex, the float nearest to a point of an edge, a
/// whole metre, or anywhere, a margin around the sheet included.
Point2 MakePosition(const Tin& tin, Random& random) {
    const unsigned extent = static_cast<unsigned>(tin.GetBBox().max.x) + 4;
    const kelm::tin::Triangle* triangle = tin.GetTriangle(random.Below(tin.GetTriangleCount()));
    const Point &a = *triangle->GetVertex(0), &b = *triangle->GetVertex(1);
    const double u = random.Milli(extent), v = random.Milli(extent);
    const Point2 kinds[] = {{a.x, a.y},
                            {Between(a.x, b.x, u / extent), Between(a.y, b.y, u / extent)},
                            {static_cast<float>(std::floor(u)), static_cast<float>(std::floor(v))},
                            {static_cast<float>(u - 2), static_cast<float>(v - 2)}};
    return kinds[random.Below(4)];
}

void AddAnswers(const Tin& tin, unsigned count, Random& random, Digest& digest) {
    const AabbTree tree(&tin);
    for (unsigned i = 0; i < count; ++i) {
        const Point2 p = MakePosition(tin, random);
        float height = -1;
        const bool found = // in both frames in turn
            i % 2 == 0 ? tin.GetHeight(BASE_X + static_cast<double>(p.x),
                                       BASE_Y + static_cast<double>(p.y), height, &tree)
                       : tin.GetHeight(p.x, p.y, height, &tree);
        digest.AddAnswer(found, height);
    }
}

void Print(const Digest& digest, const char* answers, const char* hits) {
    std::printf("%016llx of %u %s, %u %s\n", static_cast<unsigned long long>(digest.value),
                digest.count, answers, digest.hits, hits);
}

} // namespace

int main() {
    Random random;
    Digest digest;
    const Tin small = MakeSheet(32, random), large = MakeSheet(224, random);
    AddAnswers(small, 20000, random, digest);
    AddAnswers(large, 980000, random, digest);
    Print(digest, "answers", "heights");
    Print(AskEverything(), "other answers", "found");
    return 0;
}
