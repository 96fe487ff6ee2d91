#include "tests/support/filetest.h"
#include "tin/triangulate.h"
#include "tin/vector3.h"

#include <cmath>
#include <random>
#include <set>

using namespace kelm::test;

namespace {

using Corner = std::array<double, 3>;

/// The triangles that the library makes of a ring: it takes four vertices as they stand.
std::vector<Ring> CutAsTheLibrary(const Ring& ring) {
    if (ring.size() == 4)
        return {{ring[0], ring[1], ring[2]}};
    std::vector<ZARVertex> vertices;
    for (const auto& [x, y, z] : ring)
        vertices.push_back({x, y, z});
    const ZARShape shape{vertices.data(), static_cast<int>(vertices.size())};
    const kelm::tin::Polygon<double> polygon(&shape, PO_Undefined);
    std::vector<Triangle_Id> ids;
    static_cast<void>(Triangulate(polygon, ids));
    const auto getCorner = [&](unsigned id) {
        const point2_t<double>& point = polygon.GetPoints()[id];
        return *std::find_if(ring.begin(), ring.end(), [&](const Corner& corner) {
            return corner[0] == point.x && corner[1] == point.y;
        });
    };
    std::vector<Ring> triangles;
    for (const Triangle_Id& id : ids)
        triangles.push_back({getCorner(id.id0), getCorner(id.id1), getCorner(id.id2)});
    return triangles;
}

/// @return area in space, or in plan: negative if the triangle is clockwise
double ComputeArea(const Ring& t, bool plan) {
    using kelm::tin::Vector3;
    const Vector3 a(t[1][0] - t[0][0], t[1][1] - t[0][1], t[1][2] - t[0][2]);
    const Vector3 b(t[2][0] - t[0][0], t[2][1] - t[0][1], t[2][2] - t[0][2]);
    return (plan ? (a ^ b).z : (a ^ b).Length()) / 2;
}

std::set<Corner> FindCorners(const std::string& text) {
    const OGRGeometryUniquePtr geometry = Parse(text);
    std::set<Corner> corners;
    for (const OGRLinearRing* ring : *geometry->toPolygon())
        for (const OGRPoint& point : *ring)
            corners.insert({point.getX(), point.getY(), point.getZ()});
    return corners;
}

struct FacetsTest : FileTest {
    File Open(const std::vector<std::string>& polygons) {
        return OpenFile(Write({polygons, wkbPolygon25D}));
    }
};

std::string MakeStar(unsigned corners) {
    std::mt19937 random(7);
    std::string text = "POLYGON Z ((";
    for (unsigned i = 0; i < corners; ++i) {
        const double radius = random() % 2 ? 1e-3 : 1e-2, angle = 2 * M_PI * i / corners;
        text += FormatString("%.17g %.17g %u,", 9 + radius * std::cos(angle),
                             50 + radius * std::sin(angle), i);
    }
    text.back() = ')';
    return text + ')';
}

const struct {
    std::string moText;
    std::size_t mnTriangles;
    double mdfArea; ///< exact, in plan; of one that stands upright in space
    bool mbUpright = false;
} CASES[] = {
    // Degrees: each ear has less than the library asks for. Powers of two have exact areas.
    {"POLYGON Z ((8 50 1,8.000244140625 50 2,8.000244140625 50.000244140625 3,"
     "8 50.000244140625 4,8 50 1))",
     2, 0x1p-24},
    {"POLYGON Z ((8 50 1,8.00048828125 50 2,8.00048828125 50.000244140625 3,"
     "8.000244140625 50.000244140625 4,8.000244140625 50.00048828125 5,8 50.00048828125 6,"
     "8 50.000244140625 7,8 50 1))",
     5, 3 * 0x1p-24}, // not convex, and a corner within an edge
    {MakeStar(10000), 9998, 0},
    // Holes, in any order and sense; one corner of them may touch another ring.
    {"POLYGON Z ((0 0 1,20 0 2,20 9 3,0 9 4,0 0 1),(15 3 5,18 3 6,18 6 7,15 6 8,15 3 5),"
     "(1 3 5,1 6 6,4 6 7,4 3 8,1 3 5))",
     14, 162},
    {"POLYGON Z ((0 0 1,9 0 2,9 9 3,0 9 4,0 0 1),(0 3 5,3 6 6,6 3 7,0 3 5))", 6, 72},
    {"POLYGON Z ((0 0 1,9 0 2,9 9 3,0 9 4,0 0 1),(0 0 1,3 6 6,6 3 7,0 0 1))", 5, 67.5},
    {"POLYGON Z ((0 0 1,9 0 2,9 9 3,0 9 4,2 4 9,0 0 1),(2 2 5,2 6 6,4 4 7,2 2 5))", 7, 68},
    {"POLYGON Z ((0 0 1,9 0 2,9 9 3,0 9 4,0 0 1),(1 1 5,4 4 6,1 4 7,1 1 5),(4 4 6,8 4 9,8 8 8,4 4 "
     "6))",
     10, 68.5},
    {"POLYGON Z ((0 0 1,9 0 2,9 9 3,0 9 4,0 0 1),(1 1 5,2 2 5,1 1 5))", 2, 81}, // encloses nothing
    {"POLYGON Z ((0 0 1,9 0 2,9 9 3,0 9 4,0 4 8,3 6 6,3 3 5,0 4 8,0 0 1))", 6,
     76.5}, // the ring makes a hole of itself
    // Upright: quads along x, along y and aslant, not quite in one plane, a gable, two windows.
    {"POLYGON Z ((0 5 0,8 5 0,8 5 3,0 5 3,0 5 0))", 2, 24, true},
    {"POLYGON Z ((5 0 0,5 8 0,5 8 3,5 0 3))", 2, 24, true}, // not closed, though closed in plan
    {"POLYGON Z ((0 0 0,3 4 0,3 4 8,0 0 8,0 0 0))", 2, 40, true},
    {"POLYGON Z ((0 0 0,8 0.0625 0,8 0 3,0 0.0625 3,0 0 0))", 2, 24, true},
    {"POLYGON Z ((0 5 0,8 5 0,8 5 3,4 5 6,0 5 3,0 5 0))", 3, 36, true},
    {"POLYGON Z ((0 5 0,8 5 0,8 5 3,0 5 3,0 5 0),(1 5 1,2 5 1,2 5 2,1 5 2,1 5 1),"
     "(5 5 1,6 5 1,6 5 2,5 5 2,5 5 1))",
     14, 22, true},
    // Rings that are not clean, of triangles and of others.
    {"POLYGON Z ((0 0 1,8 0 2,0 8 3,0 0 1,0 0 1))", 1, 32},
    {"POLYGON Z ((0 0 1,8 0 2,0 8 3,0.0000000005 0 1))", 1, 32},
    {"POLYGON Z ((0 5 1,8 5 2,0 5 9,0 5 1,0 5 1))", 1, 32, true},
    {"POLYGON Z ((0 0 1,8 0 2,8 8 3,8 8 3,0 8 4,0 0.0000000005 1))", 2, 64}};

TEST_F(FacetsTest, WhatIsValidIsCoveredExactlyAndKeepsItsCornersAndHeights) {
    for (const auto& [text, count, area, upright] : CASES) {
        const auto file = Open({text});
        ZARLayer_t* layer = ZARGetLayer(file.get(), 1);
        std::vector<std::pair<int, Ring>> shapes;
        const std::set<Corner> corners = FindCorners(text);
        std::size_t triangles = 0;
        double sum = 0;
        for (int id = ZARGetNext(layer, -1); id != -1; id = ZARGetNext(layer, id)) {
            shapes.emplace_back(id, ReadShape(layer, id));
            for (const Ring& triangle : CutAsTheLibrary(shapes.back().second)) {
                ++triangles;
                sum += ComputeArea(triangle, !upright);
                EXPECT_NE(ComputeArea(triangle, !upright), 0);
                for (const Corner& corner : triangle)
                    EXPECT_EQ(corners.count(corner), 1U) << text;
            }
        }
        EXPECT_EQ(triangles, count) << text.substr(0, 200);
        EXPECT_TRUE(area == 0 || std::fabs(sum - area) <= (upright ? 1e-2 : 0)) << text << sum;
        for (const std::size_t i : {shapes.size() - 1, shapes.size() / 2, std::size_t{0}})
            EXPECT_EQ(ReadShape(layer, shapes[i].first), shapes[i].second);
    }
    moTranscript.Take(); // the rule of the shape ids
}

// What the library cuts itself is not touched, or surfaces that people know would change.
TEST_F(FacetsTest, ARingIsDeliveredAsItIsStoredIfTheLibraryCutsItAndElseCutIfItIsValid) {
    std::mt19937 engine(5);
    const auto draw = [&](unsigned most) { return static_cast<unsigned>(engine()) % most; };
    std::vector<Ring> rings;
    std::vector<std::string> texts;
    for (unsigned n = 0; n < 4000; ++n) {
        const double size = std::pow(10, static_cast<int>(draw(8)) - 5);
        const unsigned count = 4 + draw(5);
        Ring ring;
        for (unsigned i = 0; i < count; ++i) {
            const double angle = 2 * M_PI * i / count, radius = 1 + draw(n % 2 ? 1 : 4);
            ring.push_back({738669 + size * radius * std::cos(angle),
                            4045105 + size * radius * std::sin(angle), double(i)});
            if (draw(9) == 0)
                std::swap(ring.back(), ring[draw(i + 1)]);
        }
        ring.push_back(ring.front());
        texts.emplace_back("POLYGON Z (");
        for (const auto& [x, y, z] : ring)
            texts.back() +=
                FormatString("%c%.17g %.17g %g", texts.back().size() > 11 ? ',' : '(', x, y, z);
        texts.back() += "))";
        rings.push_back(ring);
    }
    const auto file = Open(texts);
    ZARLayer_t* layer = ZARGetLayer(file.get(), 1);
    std::size_t taken = 0, cut = 0;
    const CPLErrorHandlerPusher quiet(CPLQuietErrorHandler); // it says why one is not valid
    const int factor = ZARGetNext(layer, -1);                // the shape id of feature 1
    for (std::size_t n = 0; n < rings.size(); ++n) {
        const Ring shape = ReadShape(layer, static_cast<int>(n + 1) * factor);
        if (!CutAsTheLibrary(rings[n]).empty()) {
            ASSERT_EQ(shape, rings[n]) << texts[n];
            ++taken;
        } else if (Parse(texts[n])->IsValid()) {
            ASSERT_EQ(shape.size(), 4U) << texts[n];
            ++cut;
        }
    }
    EXPECT_GT(taken, 1000U);
    EXPECT_GT(cut, 300U);
    moTranscript.Take();
}

TEST_F(FacetsTest, WhatCannotBeUsedIsToldWithItsReason) {
    std::vector<std::string> texts{MakeTriangle(0, 0, 0)};
    for (const char* text :
         {"(0 0 1,9 9 1,9 0 1,0 9 1,0 0 1)",                            // a bow tie
          "(0 0 1,9 0 1,9 9 1,0 9 1,0 0 1),(1 1 1,1 5 1,12 5 1,1 1 1)", // its hole crosses
          "(0 5 0,8 5 3,8 5 0,0 5 3,0 5 0)",                            // an upright bow tie
          "(0 0 1,9 0 1,5 0 1,2 0 1,0 0 1)",                            // a line
          "(0 0 1,3 3 2,6 6 3,9 9 4,0 0 1)",                            // one that rises
          "(1 5 1,4 9 2,4 9 2,7 13 3,1 5 1)",                           // three corners on a line
          "(0 0 1,9 0 1,0 0 1,9 0 1,0 0 1)",                            // to and fro
          "(5 5 0,14 5 0,14 14 0,14 14 3,14 5 3,5 5 3,5 5 0)",          // two walls of a house
          "(0 0 0,9 0 0,9 0 0,0 0 0,0 0 0,0 0 0)",                      // two corners
          "(0 0 1,9 9 1,9 0 1,0 9 1,0 0 1)", "(0 0 1,9 9 1,9 0 1,0 9 1,0 0 1)"})
        texts.push_back(std::string("POLYGON Z (") + text + ")");
    const auto file = Open(texts);
    ZARLayer_t* layer = ZARGetLayer(file.get(), 1);
    for (int id = ZARGetNext(layer, -1); id != -1; id = ZARGetNext(layer, id))
        moTranscript.Refuses([&] {
            EXPECT_EQ(CutAsTheLibrary(ReadShape(layer, id)).size(), id == 1 ? 1U : 0U) << id;
        });
}

TEST_F(FacetsTest, AFileOfBadPolygonsSilencesNobody) {
    const std::string given = "Triangulate(): Polygon# ";
    std::string told;
    for (const std::size_t bowTies : {1500U, 3U, 100U, 3U}) {
        const std::string path =
            Write({std::vector<std::string>(bowTies, "POLYGON Z ((0 0 1,9 9 1,9 0 1,0 9 1,0 0 1))"),
                   wkbPolygon25D});
        {
            const HostCall call; // closing tells what was left out
            EXPECT_EQ(OpenReader(path)->Load(nullptr), nullptr);
        }
        std::istringstream lines(moTranscript.Take());
        int count = 0;
        for (std::string line; getline(lines, line);)
            if (line.rfind(given, 0) == 0)
                ++count;
            else if (line != " (tin/tinreader)")
                told += line + '\n';
        told += FormatString("%d given\n", count);
    }
    moTranscript.moLines = told;
}

} // namespace
