#include "services/interpgrid3d.h"
#include "tests/scripted/readerfixture.h"

#include <algorithm>
#include <cmath>

namespace {

const double NaN = std::nan("");

TEST_F(ReaderTest, TouchingAWindowIsMeetingIt) {
    const Window meeting[] = {{4, 4, 6, 6},  {-1, -1, 11, 11}, {-1, 4.5, 11, 5.5},
                              {7, 2, 20, 3}, {10, 5, 20, 20},  {7.5, -9, 9, 2.5}};
    const Window clear[] = {{7.6, -9, 9, 2.5}, {0, 0, 2, 2},   {NaN, 0, 9, 9},
                            {0, NaN, 9, 9},    {0, 0, NaN, 9}, {0, 0, 9, NaN}};
    script.shapes = {Close({{5, 0, 0}, {10, 5, 0}, {5, 10, 0}, {0, 5, 0}})};
    const Reader reader = Open();
    for (int turn = 0; turn < 2; ++turn) {
        for (const Window& window : meeting)
            EXPECT_NE(Load(*reader, &window), nullptr) << window.min.x;
        for (const Window& window : clear)
            EXPECT_EQ(Load(*reader, &window), nullptr) << window.min.x;
        std::reverse(script.shapes[0].begin(), script.shapes[0].end());
    }
}

TEST_F(ReaderTest, AShapeOfFourVerticesIsTheTriangleOfItsFirstThree) {
    script.shapes = {{{1, 2, -0.0}, {5, 2, 4}, {5, 5, 6}, {100, 100, 100}}, // not closed
                     Close({{9, 0, 0}, {9, 1, 1}, {9, 2, 2}})};             // flat
    const Surface surface = Load(*Open());
    EXPECT_EQ(surface->GetTriangleCount(), 2U);
    EXPECT_EQ(surface->GetTriangle(0)->GetVertex(2)->y, 3.0F);
    EXPECT_TRUE(std::signbit(surface->GetVertex(0)->z)) << "+0 if anything is added";
    EXPECT_FALSE(std::signbit(Load(*Open(1e-300))->GetVertex(0)->z));
}

TEST_F(ReaderTest, WhatCannotBeUsedIsLeftOutAndTheReaderLoadsOn) {
    const Reader reader = Open();
    script.shapes.push_back({{}, {}, {}});
    for (int i = 0; i < 2; ++i) // a lock left behind would stop the second
        EXPECT_TRUE(transcript.Refuses([&] { Load(*reader); }));
    script.shapes = {{{}}, {}, {{0, 0, 0}, {9, 9, 0}, {9, 0, 0}, {0, 9, 0}, {}}, script.shapes[0]};
    EXPECT_EQ(Load(*reader)->GetTriangleCount(), 1U);
    script.shapes.pop_back();
    EXPECT_EQ(Load(*reader), nullptr);
}

TEST_F(ReaderTest, AWindowLoadsTheSameTrianglesWithABaseOfTheirOwn) {
    script.shapes = CreateStrip(1200, 50);
    for (Ring& ring : script.shapes)
        for (ZARVertex& vertex : ring)
            vertex = {vertex.x + 0.12, vertex.y + 49776.31, vertex.z};
    const Reader reader = Open();
    const Window window(500100, 4600000, 500900, 4700000);
    const Surface whole = Load(*reader), part = Load(*reader, &window);
    ASSERT_NE(part, nullptr);
    const ZARVertex& base = script.shapes[25][0]; // the first that meets the window
    kelm::tin::BBox<double, point3_t<double>> box;
    part->GetRawBBox(box);
    EXPECT_TRUE(box.min.x == base.x && box.min.y == base.y - 40 && box.max.y == base.y);
    for (double at = 500105; at < 500890; at += 1.7) {
        float height = -1, expected = -2;
        EXPECT_TRUE(whole->GetHeight(at, base.y - 20, expected, nullptr));
        EXPECT_TRUE(part->GetHeight(at, base.y - 20, height, nullptr));
        EXPECT_NEAR(height, expected, 1e-3);
    }
}

TEST_F(ReaderTest, OfEachRunOfRepeatsTheFirstVertexGivesTheHeight) {
    script.shapes = {Close({{0, 0, 0}, {0, 9e-10, -1}, {0, 18e-10, -1}, {9, 0, 0}, {0, 9, 9}})};
    const Surface surface = Load(*Open());
    ASSERT_EQ(surface->GetVertexCount(), 3U);
    for (unsigned i = 0; i < 3; ++i)
        EXPECT_EQ(surface->GetVertex(i)->z - surface->GetVertex(0)->z, surface->GetVertex(i)->y);
}

TEST_F(ReaderTest, AWildCornerSpoilsNeitherTheWeldingNorTheBase) {
    // The last corners part the first from its twins: one is left without a leaf, one with another.
    script.shapes = {Close({{0, 0, 0}, {0.95e-9, 0, 0}, {0, 0.95e-9, 0}}),
                     Close({{NaN, 8, 3}, {-1, 0, 0}, {1 + 1e-9, 0, 0}})};
    const Surface welded = Load(*Open());
    EXPECT_EQ(welded->GetVertexCount(), 4U);
    for (const int corner : {1, 2})
        EXPECT_EQ(welded->GetTriangle(0)->GetVertex(corner), welded->GetVertex(0));
    const double side = 0.63 / 1048576; // of a cell of the hash: both corners next to it are one
    for (const ZARVertex& far : {ZARVertex{1, 0, 0}, {0, 1, 0}, {0, 0, 1}})
        for (const double low : {side - 5e-11, side + 8.5e-10}) {
            const double high = 2 * side + 8e-10 - low;
            script.shapes = {
                Close({{low * far.x, low * far.y, low * far.z}, {7, 0, 1}, {0, 7, 2}}),
                Close({{high * far.x, high * far.y, high * far.z}, {8, 0, 1}, {0, 9, 2}})};
            EXPECT_EQ(Load(*Open())->GetVertexCount(), 5U);
        }
    script.shapes = {Close({{7, HUGE_VAL, 3}, {100, 200, NaN}, {103, 201, 5}})};
    EXPECT_EQ(Load(*Open())->GetVertex(2)->x, 3.0F);
}

/// Rounds where no optimiser can undo it.
double Round(double v) {
    const volatile float rounded = static_cast<float>(v);
    return static_cast<double>(rounded);
}

double Elevate(double stored) {
    return (Round(stored) + 0.3) * 0.1;
}

/// The grid in which a large surface's heights are interpolated, from the lowest to the highest.
void FillGrid(const kelm::tin::Tin& surface, double low, double high, InterpGrid3D& rGrid) {
    kelm::tin::BBox<double, point3_t<double>> box;
    surface.GetRawBBox(box);
    rGrid.SetDimension(1);
    rGrid.LayoutGrid(box.min.x, box.min.y, low, box.max.x, box.max.y, high, 100.0, 100.0,
                     std::max(1.0, Round(high - low)));
    std::vector<double> p(std::size_t{3} * rGrid.GetNumGridPoints());
    rGrid.GetGridPositions(p.data());
    for (std::size_t i = 0; i < p.size(); i += 3)
        rGrid.GetArray()[i / 3] = Round(scripted::Convert(p[i], p[i + 1], p[i + 2], 1));
}

TEST_F(ReaderTest, WindowsOfOneBaseHaveTheSameBitsAndAFarBaseIsNoted) {
    script.shapes = CreateStrip(1200, 50);
    const Reader reader = Open(0.5, 3.0);
    for (const double away : {0.0, 11e3, 15e3, 16e3, -12e4, 1e7}) {
        const kelm::tin::LoadOptions options{{{STRIP_X + 0.1 - away, STRIP_Y}}};
        const Window windows[] = {{501e3, 46e5, 5025e2, 47e5}, {502e3, 46e5, 504e3, 47e5}};
        const Surface whole(reader->Load(nullptr, options));
        EXPECT_EQ(whole->GetVertex(0)->x, float(away - 0.1));
        for (const Window& window : windows) {
            const Surface part(reader->Load(&window, options));
            double x, y;
            part->GetXYBase(x, y);
            EXPECT_TRUE(x == options.base->x && y == options.base->y);
            const point3_t<float>*const begin = whole->GetVertex(0), *const end =
                                                                         begin +
                                                                         whole->GetVertexCount();
            const auto same = [&](const point3_t<float>& v) {
                return v.x == part->GetVertex(0)->x;
            };
            const auto* const first = std::find_if(begin, end, same);
            for (unsigned i = 0; i < part->GetVertexCount(); ++i)
                ASSERT_TRUE(first[i].x == part->GetVertex(i)->x &&
                            first[i].y == part->GetVertex(i)->y &&
                            first[i].z == part->GetVertex(i)->z);
        }
    }
    for (const kelm::tin::LoadOptions& bad :
         {kelm::tin::LoadOptions{{{NaN, 0}}}, {{{0, -HUGE_VAL}}}})
        EXPECT_TRUE(transcript.Refuses([&] { reader->Load(nullptr, bad); }));
}

TEST_F(ReaderTest, NeighboursShareVerticesWhoseHeightsAreElevatedThenConvertedThenNarrowed) {
    for (const unsigned n : {999U, 1000U, 1003U, 10001U})
        for (const unsigned heights : {1U, 5U, 997U}) { // for one the factor alone
            script.shapes = CreateStrip(n, heights);
            const Reader reader = Open(0.3, 0.1, 2001);
            reader->SetOutputVerticalDatum(DatumType(heights == 1 ? 2001 : 2002));
            const Surface surface = Load(*reader);
            ASSERT_EQ(surface->GetVertexCount(), n);
            InterpGrid3D grid;
            FillGrid(*surface, Round(Elevate(700.0)), Round(Elevate(700.0 + 0.37 * (heights - 1))),
                     grid);
            for (unsigned i = 0; i < n; ++i) {
                const point3_t<float>& v = *surface->GetVertex(i);
                const ZARVertex stored = GetStripVertex(i, heights);
                ASSERT_EQ(v.x, static_cast<float>(stored.x - STRIP_X));
                double h = Elevate(stored.z);
                if (heights > 1 && n < 1000)
                    h = scripted::Convert(double(v.x) + STRIP_X, double(v.y) + STRIP_Y, h, 1);
                else if (heights > 1)
                    grid.GetVal(double(v.x) + STRIP_X, double(v.y) + STRIP_Y, h, &h);
                ASSERT_EQ(v.z, static_cast<float>(h)) << i << " of " << n << ", " << heights;
                for (int k = 0; k < 3 && i + 2 < n; ++k)
                    ASSERT_EQ(surface->GetTriangle(i)->GetVertex(k), &v + k);
            }
        }
}

} // namespace
