#include "tin/raster.h"
#include "tests/support/oddsurfaces.h"
#include "tin/heightgrid.h"

namespace kelm::tin::test {
namespace {

Point2 GetVertexOf(const OpenTin& tin, unsigned number) {
    if (tin.GetVertexCount() == 0)
        return {};
    const Point& vertex = *tin.GetVertex(number * 7919 % tin.GetVertexCount());
    return {vertex.x, vertex.y};
}

/// Puts a grid over what a surface's vertices in the middle of the list span.
RasterFrame MakeFrame(const OpenTin& tin, unsigned kind) {
    static constexpr unsigned SIDES[][2] = {{43, 31}, {3, 9}, {70, 2}, {1, 1}, {17, 23}};
    RasterFrame frame;
    frame.nColumns = SIDES[kind % 5][0];
    frame.nRows = SIDES[kind % 5][1];
    const auto& box = tin.GetBBox();
    const double dx = (double(box.max.x) - double(box.min.x)) / frame.nColumns;
    const double dy = (double(box.max.y) - double(box.min.y)) / frame.nRows;
    double* t = frame.adfTransform;
    // Cells so fine that several have one float for a centre, which is that of a vertex.
    const Point2 at = kind % 6 < 4 ? Point2{} : GetVertexOf(tin, kind);
    const double fx = std::fabs(double(at.x)) * 0x1p-26, fy = std::fabs(double(at.y)) * 0x1p-26;
    const double turn = kind % 4 == 0 ? 0 : dx / 9; // or the rows alone are turned
    const double transforms[][6] = {
        {500 + double(box.min.x), dx, 0, double(box.max.y) - 3, 0, -dy},     // as usual
        {500 + double(box.min.x) - dx / 2, dx, 0, double(box.min.y), 0, dy}, // upside down
        {500 + double(box.min.x), dx, turn, double(box.max.y), dy / 3, -dy}, // turned
        {500 + double(box.max.x), -dx, 0, double(box.max.y), 0, -dy},        // mirrored
        {500 + double(at.x) - fx, fx, 0, double(at.y) - 3 + fy, 0, -fy},     // fine
        {500 + double(at.x) - fx, fx, 0, double(at.y) - 3 - fy, 0, fy}};     // and upside down
    std::copy(transforms[kind % 6], transforms[kind % 6] + 6, t);
    return frame;
}

TEST(Raster, HoldsInEachCellWhatASingleHeightTellsThere) {
    Random random;
    unsigned kind = 0;
    for (const OddSurface& odd : MakeOddSurfaces(random)) {
        SCOPED_TRACE(odd.sName);
        OpenTin tin = odd.oMesh.MakeTin(500, -3);
        odd.disturb(tin);
        const HeightGrid grid(tin);
        for (const EdgeRule rule : {ER_Float, ER_Closed})
            for (unsigned i = 0; i < 5; ++i) {
                const RasterFrame frame = MakeFrame(tin, kind++);
                const double* t = frame.adfTransform;
                std::vector<float> cells(frame.nColumns * frame.nRows, UNTOUCHED), same = cells;
                const int threads = i % 2 == 0 ? 1 : 8;
                const auto found = RasterizeHeights(tin, frame, cells.data(), threads, rule);
                EXPECT_EQ(RasterizeHeights(grid, frame, same.data(), threads, rule), found);
                std::size_t count = 0;
                for (std::size_t k = 0; k < cells.size(); ++k) {
                    const double col = double(k % frame.nColumns) + 0.5;
                    const double row = double(k / frame.nColumns) + 0.5;
                    const double x = t[0] + col * t[1] + row * t[2];
                    const double y = t[3] + col * t[4] + row * t[5];
                    float h;
                    const bool isFound = tin.GetHeight(x, y, h, nullptr, rule);
                    count += isFound;
                    h = isFound ? h : NOT_A_NUMBER;
                    ASSERT_TRUE(IsSameBits(cells[k], h) && IsSameBits(same[k], h))
                        << cells[k] << ", " << same[k] << ", not " << h << " in cell " << k;
                }
                EXPECT_EQ(count, found);
            }
    }
}

TEST(Raster, IsTheSameOnManyThreads) {
    Random random;
    const OpenTin tin = MakeSheet(3, random).MakeTin();
    RasterFrame frame{700, 600, {0, 0.33, 0, 233, 0, -0.4}};
    std::vector<float> one(700 * 600), many = one;
    const auto found = RasterizeHeights(tin, frame, one.data(), 1);
    EXPECT_GT(found, 300000U);
    EXPECT_EQ(RasterizeHeights(tin, frame, many.data(), 8), found);
    EXPECT_EQ(std::memcmp(one.data(), many.data(), one.size() * sizeof(float)), 0);
    frame.nRows = 0;
    EXPECT_EQ(RasterizeHeights(tin, frame, nullptr), 0U);
}

} // namespace
} // namespace kelm::tin::test
