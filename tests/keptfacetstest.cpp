#include "services/bundled/store/facets/keptfacets.h"
#include "tests/support/filetest.h"

#include <cmath>
#include <cstring>
#include <thread>

using namespace kelm::test;
using kelm::store::FacetFault;
using kelm::store::KeptFacets;
namespace fs = std::filesystem;

namespace {

using Shapes = std::vector<std::pair<int, Ring>>;
using Vertices = std::vector<ZARVertex>;

/// The walk from a shape on, -1 for all; the ring of a shape that is refused is empty.
Shapes Walk(ZARLayer_t* poLayer, std::string& rRefusals, int nFrom = -1) {
    Shapes oShapes;
    for (int nId = ZARGetNext(poLayer, nFrom); nId != -1; nId = ZARGetNext(poLayer, nId))
        try {
            oShapes.emplace_back(nId, Ring());
            oShapes.back().second = ReadShape(poLayer, nId);
        } catch (const kelm::DataException& e) {
            rRefusals.append(e.what()) += '\n';
        }
    return oShapes;
}

Shapes Walk(ZARLayer_t* poLayer) {
    std::string refusals;
    return Walk(poLayer, refusals);
}

/// @return the bytes that this process has read so far
std::size_t GetBytesRead() {
    std::ifstream oFile("/proc/self/io");
    std::string name;
    std::size_t nBytes = 0;
    oFile >> name >> nBytes;
    return nBytes;
}

struct KeptFacetsTest : FileTest {
    /// Features of all kinds, so many times.
    static LayerText MakeLayer(int nTimes, bool bMixed) {
        const std::vector<std::string> oMixed = {
            "POLYGON Z ((0 0 1,2 0 2,2 2 3,0 2 4,0 0 1),(0.5 0.5 1,1 0.5 1,1 1 1,0.5 0.5 1))",
            "",
            "MULTIPOLYGON Z (((0 0 1,2 0 2,2 2 3,0 0 1)),((5 0 1,7 0 2,7 2 3,6 3 4,5 0 1)))",
            "POINT Z (1 1 1)",
            "LINESTRING Z (0 0 1,1 1 1)",
            "POLYGON Z EMPTY",
            "POLYGON Z ((0 0 0,4 0 0,4 0 3,0 0 3,0 0 0))",
            "POLYGON ((0 0,0 1,1 0,0 0))"};
        LayerText oText{{}, bMixed ? OGR_GT_SetZ(wkbUnknown) : wkbPolygon25D};
        for (int n = 0; n < nTimes; ++n) {
            oText.moGeometries.push_back(MakeTriangle(n, 0, n));
            oText.moGeometries.push_back("POLYGON Z ((0 0 1,3 0 2,2 2 3,0 2 4,0 0 1))");
            oText.moGeometries.push_back("POLYGON Z ((0 0 1,1 1 1,1 0 1,0 1 1,0 0 1))");
            if (bMixed)
                oText.moGeometries.insert(oText.moGeometries.end(), oMixed.begin(), oMixed.end());
        }
        return oText;
    }

    /// Waits until what was written is older than the ticks of the clock of the file system.
    static void Settle() { std::this_thread::sleep_for(std::chrono::milliseconds(60)); }

    /// Replaces the last record of a Shapefile of triangles, but for its number, by the one in
    /// front of it, and hides it.
    static void Change(const std::string& path) {
        constexpr long RECORD = 168, CONTENT = 160;
        const auto tBefore = fs::last_write_time(path);
        std::fstream oFile(path, std::ios::in | std::ios::out | std::ios::binary);
        std::string record(CONTENT, '\0');
        oFile.seekg(-RECORD - CONTENT, std::ios::end).read(&record[0], CONTENT);
        oFile.seekp(-CONTENT, std::ios::end).write(record.data(), CONTENT);
        oFile.close();
        fs::last_write_time(path, tBefore);
    }

    ~KeptFacetsTest() override { moTranscript.moLines.clear(); } // other tests read these
};

TEST_F(KeptFacetsTest, TheFirstWalkGivesWhatLaterOnesReadFromTheFile) {
    const std::tuple<const char*, const char*, bool> aCases[] = {{"GPKG", "a.gpkg", true},
                                                                 {"ESRI Shapefile", "a.shp", false},
                                                                 {"FlatGeobuf", "a.fgb", true},
                                                                 {"GML", "a.gml", true}};
    for (const auto& [pszFormat, pszFile, bMixed] : aCases) {
        SCOPED_TRACE(pszFormat);
        const std::string path = Write(MakeLayer(300, bMixed), pszFormat, pszFile);
        Settle();
        const File oFile = OpenFile(path);
        ZARLayer_t* const poLayer = ZARGetLayer(oFile.get(), 1);
        std::string refusals, refusalsRead;
        const std::size_t nOpened = GetBytesRead();
        const Shapes oKept = Walk(poLayer, refusals);
        const std::size_t nWalked = GetBytesRead();
        EXPECT_EQ(Walk(poLayer, refusalsRead), oKept);
        EXPECT_EQ(refusalsRead, refusals);
        EXPECT_EQ(refusals.empty(), !bMixed);
        EXPECT_EQ(int(oKept.size()), poLayer->shapeCount);
        // Of a database the pages are in memory already.
        EXPECT_TRUE(std::string(pszFormat) == "GPKG" ||
                    10 * (nWalked - nOpened) < GetBytesRead() - nWalked);
    }
}

TEST_F(KeptFacetsTest, AWalkThatIsBrokenOffIsRepeatedAndLayersTakeTurns) {
    LayerText oText = MakeLayer(1, false);
    for (int n = 0; n < 450; ++n) { // round polygons, more than a block of them
        std::string ring;
        for (int k = 0; k <= 400; ++k)
            ring +=
                FormatString("%s%f %f %d", k == 0 ? "" : ",", n + 100 * std::cos(k * M_PI / 200),
                             100 * std::sin(k * M_PI / 200), n);
        oText.moGeometries.push_back("POLYGON Z ((" + ring + "))");
    }
    const std::string path = Write(oText, "GPKG", "a.gpkg", true);
    Settle();
    const File oFile = OpenFile(path), oOther = OpenFile(path);
    ZARLayer_t* const poLayer = ZARGetLayer(oFile.get(), 1);
    ZARLayer_t* const poSecond = ZARGetLayer(oFile.get(), 2);
    const Shapes oAll = Walk(ZARGetLayer(oOther.get(), 1));
    ASSERT_EQ(oAll.size(), 453U);
    for (const std::size_t nSteps : {3U, 440U, 3U}) {
        int nId = -1, nSecond = -1;
        for (std::size_t n = 0; n < nSteps; ++n) {
            nId = ZARGetNext(poLayer, nId);
            nSecond = ZARGetNext(poSecond, nSecond);
            EXPECT_EQ(nId, nSecond);
        }
        for (const std::size_t n : {nSteps, nSteps, nSteps - 1})
            EXPECT_EQ(ReadShape(poLayer, oAll[n].first), oAll[n].second) << "out of turn";
        EXPECT_EQ(ReadShape(poSecond, nSecond), oAll[nSteps - 1].second);
        std::string refusals;
        EXPECT_EQ(Walk(poLayer, refusals, oAll[nSteps].first),
                  Shapes(oAll.begin() + long(nSteps) + 1, oAll.end()));
    }
    EXPECT_EQ(Walk(poLayer), oAll);
    EXPECT_EQ(Walk(poSecond), oAll);
}

TEST_F(KeptFacetsTest, AFileThatWasTouchedIsReadAgainEvenIfItLooksAsItWas) {
    for (const bool bSettled : {true, false})
        for (const bool bChanged : {true, false}) {
            LayerText oText{{}, wkbPolygon25D};
            for (int n = 0; n < 100; ++n)
                oText.moGeometries.push_back(MakeTriangle(n, 0, n));
            const std::string path = Write(oText, "ESRI Shapefile", "a.shp");
            if (bSettled)
                Settle();
            const File oFile = OpenFile(path);
            ZARLayer_t* const poLayer = ZARGetLayer(oFile.get(), 1);
            if (bChanged)
                Change(path);
            const Ring oLast = Walk(poLayer).back().second;
            ASSERT_FALSE(oLast.empty());
            EXPECT_EQ(oLast[0][0], bChanged ? 98 : 99) << bSettled;
        }
}

TEST_F(KeptFacetsTest, FacetsComeBackToTheBitOrNotAtAll) {
    const double dfNaN = std::nan("7");
    const std::pair<FacetFault, Vertices> aFacets[] = {
        {FacetFault::None, {{0, 0, 0}, {-0.0, 0, 0}, {0, 0, 7}, {0, 0, 0}}},
        {FacetFault::None, {{1, 2, 3}, {4, 5, 6}, {7, 8, 9}, {1, 2, 3}}},
        {FacetFault::None, {{4, 5, 6}, {1, 2, 8}, {7, 8, 9}, {4, 5, 6}}},
        {FacetFault::None, {{1, 2, 8}, {7, 8, 9}, {4, 5, 6}, {1, 2, 8}}},
        {FacetFault::None, {{0.0, 2, 3}, {4, 5, 6}, {7, 8, dfNaN}, {-0.0, 2, 3}}},
        {FacetFault::Uncut, {}},
        {FacetFault::NoGeometry, {{1, 1, 1}}},
        {FacetFault::None, Vertices(5, {1, 2, 3})},
        {FacetFault::None, Vertices(200000, {1, 2, 3})}}; // more than a block
    constexpr std::size_t MOST = std::size_t{28} << 20;
    for (const int nRounds : {0, 2, 3, 4}) { // four need more
        KeptFacets oKept(MOST);
        for (int n = 0; n < nRounds; ++n)
            for (const auto& [eFault, oVertices] : aFacets)
                oKept.Add(1000 + n, std::size_t(n), eFault, oVertices);
        ASSERT_EQ(oKept.AreWhole(), nRounds > 0 && nRounds < 4);
        if (!oKept.AreWhole())
            continue;
        ASSERT_TRUE(oKept.Advance());
        oKept.Restart();
        for (int n = 0; n < nRounds; ++n)
            for (const auto& [eFault, oVertices] : aFacets) {
                Vertices oFound;
                ASSERT_TRUE(oKept.Advance());
                EXPECT_EQ(oKept.GetFeature(), 1000 + n);
                EXPECT_EQ(oKept.GetFacetNumber(), std::size_t(n));
                ASSERT_EQ(oKept.Read(oFound), eFault);
                if (eFault != FacetFault::None)
                    continue;
                ASSERT_EQ(oFound.size(), oVertices.size());
                EXPECT_EQ(std::memcmp(oFound.data(), oVertices.data(), oFound.size() * 24), 0);
            }
        EXPECT_EQ(oKept.GetShapes(), 9 * nRounds);
        EXPECT_FALSE(oKept.Advance());
        EXPECT_FALSE(oKept.AreWhole());
    }
}

} // namespace
