#include "tin/heightgrid.h"
#include "tests/support/oddsurfaces.h"

#include <memory>
#include <stdexcept>
#include <thread>

namespace kelm::tin::test {
namespace {

constexpr std::size_t SCANNED = 60;

/// Puts positions to an index and to the scan, by both rules.
void ExpectScan(const OpenTin& tin, const HeightGrid& grid, Random& random, unsigned positions) {
    for (unsigned i = 0; i < positions && !testing::Test::HasFailure(); ++i) {
        const auto [x, y] = MakePosition(tin, random);
        for (const EdgeRule rule : {ER_Float, ER_Closed}) {
            float h = UNTOUCHED, wanted = UNTOUCHED;
            EXPECT_EQ(grid.GetHeight(x, y, h, rule), tin.GetHeight(x, y, wanted, nullptr, rule));
            EXPECT_TRUE(IsSameBits(h, wanted))
                << h << ", not " << wanted << " at " << x << ", " << y << ", rule " << rule;
        }
    }
}

/// Positions of a batch in runs of 1 to 80: all over the surface, and close to each other in a row.
std::vector<Point2> MakeRuns(const OpenTin& tin, Random& random, std::size_t count) {
    std::vector<Point2> positions;
    while (positions.size() < count) {
        const Point2 p = MakePosition(tin, random), q = MakePosition(tin, random);
        const float steps[] = {0, 1e-6F, 1e-3F, 0.01F, 0.1F};
        const float dx = (q.x - p.x) * steps[random.Below(5)];
        const float dy = (q.y - p.y) * steps[random.Below(5)];
        const unsigned length = random.Below(8) == 0 ? 80 : 1 + random.Below(10);
        for (unsigned i = 0; i < length; ++i)
            positions.push_back({p.x + float(i) * dx, p.y + float(i) * dy});
    }
    return positions;
}

/// Puts positions to an index in one batch, and to the scan, by both rules.
void ExpectScanOfRuns(const OpenTin& tin, const HeightGrid& grid, Random& random) {
    const std::vector<Point2> positions = MakeRuns(tin, random, 1 + random.Below(500));
    std::vector<point2_t<double>> map;
    for (const Point2& p : positions)
        map.push_back({double(p.x), double(p.y)});
    for (const EdgeRule rule : {ER_Float, ER_Closed}) {
        std::vector<float> heights(positions.size(), UNTOUCHED);
        std::size_t found = grid.GetHeights(map.data(), map.size(), heights.data(), 1, rule);
        for (std::size_t i = 0; i < positions.size() && !testing::Test::HasFailure(); ++i) {
            const auto [x, y] = positions[i];
            float wanted = UNTOUCHED;
            const bool isFound = tin.GetHeight(x, y, wanted, nullptr, rule);
            EXPECT_TRUE(isFound ? IsSameBits(heights[i], wanted) : std::isnan(heights[i]))
                << heights[i] << ", not " << wanted << " at " << x << ", " << y << ", rule " << rule
                << ", place " << i;
            found -= isFound ? 1 : 0;
        }
        EXPECT_EQ(found, 0U);
    }
}

TEST(HeightGrid, AnswersAsTheScanToTheBitOnOddSurfacesInAnyMemory) {
    Random random;
    for (const OddSurface& odd : MakeOddSurfaces(random)) {
        SCOPED_TRACE(odd.sName);
        OpenTin tin = odd.oMesh.MakeTin();
        odd.disturb(tin);
        for (const unsigned bytes : {0U, 1U, 30U, 100000U}) {
            BuildOptions options;
            options.bytesPerTriangle = bytes;
            const HeightGrid grid(tin, options);
            ExpectScan(tin, grid, random, 400);
            ExpectScanOfRuns(tin, grid, random);
            const std::uint64_t most = std::max(bytes, 110U);
            EXPECT_LT(grid.GetObjBytes(), most * tin.GetTriangleCount() + 25000);
        }
    }
}

// Whoever is not divided into cells answers the same, but slowly; the bytes tell.
TEST(HeightGrid, OfASheetFitsIntoItsDefaultMemory) {
    Random random;
    const OpenTin tin = MakeSheet(0, random).MakeTin();
    const auto getBytes = [&](unsigned most) {
        BuildOptions options;
        options.bytesPerTriangle = most;
        return HeightGrid(tin, options).GetObjBytes();
    };
    EXPECT_EQ(getBytes(0), getBytes(1000));
    EXPECT_EQ(HeightGrid::EstimateObjBytes(9), HeightGrid::EstimateObjBytes(9, {0, 1000, {}}));
    EXPECT_NE(getBytes(0), getBytes(1)) << "too little for cells";
    const OpenTin large = MakePatches(random).MakeTin();
    const std::size_t before = GetHeapBytes();
    const HeightGrid crowd(large, {1, 1, {}});
    EXPECT_LE(GetHeapBytes() - before, 1.2 * double(crowd.GetObjBytes()));
}

TEST(HeightGrid, IsTheSameOnAnyNumberOfThreadsAndOutlivesTheSurface) {
    Random random;
    Mesh mesh = MakeSheet(3, random);
    for (unsigned i = 0; i < 40; ++i) // enough for a team
        for (unsigned k = 0; k < 1058; ++k)
            mesh.ids.push_back(mesh.ids[random.Below(1058)]);
    auto tin = std::make_unique<OpenTin>(mesh.MakeTin(500, -3));
    std::vector<point2_t<double>> positions(30000);
    std::vector<float> wanted(positions.size());
    std::size_t found = 0;
    for (std::size_t i = 0; i < positions.size(); ++i) {
        const Point2 p = MakePosition(*tin, random);
        positions[i] = {double(p.x) + 500, double(p.y) - 3};
        if (i < SCANNED) { // a scan of all takes long
            const bool isFound = tin->GetHeight(positions[i].x, positions[i].y, wanted[i], nullptr);
            found += isFound;
            wanted[i] = isFound ? wanted[i] : NOT_A_NUMBER;
        }
    }
    std::vector<HeightGrid> grids;
    for (const int threads : {1, 2, 8}) {
        BuildOptions options;
        options.threads = threads;
        grids.emplace_back(*tin, options);
    }
    const AabbTree tree(tin.get());
    std::vector<float> heights(positions.size(), UNTOUCHED), all = heights;
    for (const int threads : {0, 1, 8}) {
        EXPECT_EQ(tin->GetHeights(positions.data(), SCANNED, heights.data(), nullptr, threads),
                  found);
        EXPECT_EQ(std::memcmp(heights.data(), wanted.data(), SCANNED * sizeof(float)), 0);
    }
    found = tin->GetHeights(positions.data(), positions.size(), all.data(), &tree, 8);
    tin.reset();
    EXPECT_EQ(std::memcmp(all.data(), wanted.data(), SCANNED * sizeof(float)), 0);
    for (const HeightGrid& grid : grids)
        for (const int threads : {1, 8}) {
            EXPECT_EQ(grid.GetObjBytes(), grids[0].GetObjBytes());
            heights.assign(positions.size(), UNTOUCHED);
            EXPECT_EQ(grid.GetHeights(positions.data(), positions.size(), heights.data(), threads),
                      found);
            EXPECT_EQ(std::memcmp(heights.data(), all.data(), all.size() * sizeof(float)), 0);
        }
    HeightGrid moved = std::move(grids[0]);
    EXPECT_EQ(moved.GetHeights(positions.data(), SCANNED, heights.data()),
              grids[1].GetHeights(positions.data(), SCANNED, all.data()));
    EXPECT_EQ(grids[0].GetHeights(positions.data(), SCANNED, heights.data()), 0U); // NOLINT
    EXPECT_EQ(moved.GetHeights(nullptr, 0, nullptr), 0U);
}

struct Told {
    double dfLast = -1.0;
    double dfStop = 2.0;
    unsigned nCalls = 0;
    std::thread::id oStarter = std::this_thread::get_id();
};

int Tell(double done, const char* message, void* data) {
    Told& told = *static_cast<Told*>(data);
    EXPECT_TRUE(done >= told.dfLast && done <= 1.0 && message != nullptr);
    EXPECT_EQ(std::this_thread::get_id(), told.oStarter);
    told.dfLast = done;
    ++told.nCalls;
    return done < told.dfStop ? -1 : 0; // any value but 0 goes on
}

TEST(HeightGrid, TellsItsProgressAndStops) {
    Random random;
    const OpenTin tin = MakePatches(random).MakeTin();
    for (const int threads : {1, 4}) {
        Told told;
        BuildOptions options;
        options.threads = threads;
        options.progress = {Tell, &told};
        const HeightGrid grid(tin, options);
        EXPECT_TRUE(told.dfLast == 1.0 && told.nCalls <= 101);
        told = {-1.0, 0.01, 0};
        EXPECT_THROW(HeightGrid(tin, options), CancelledException);
        EXPECT_EQ(told.nCalls, 1U);
    }
}

} // namespace
} // namespace kelm::tin::test
