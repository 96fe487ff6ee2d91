#include "tests/support/filetest.h"

#include <algorithm>
#include <random>

using namespace kelm::test;
namespace fs = std::filesystem;

namespace {

using Shapes = std::vector<std::pair<int, Ring>>;
using Window = kelm::tin::BBox<double, point2_t<double>>;

/// All that the layer gives by one walk; the ring of a shape that is refused is empty.
Shapes Walk(ZARLayer_t* poLayer) {
    Shapes oShapes;
    for (int nId = ZARGetNext(poLayer, -1); nId != -1; nId = ZARGetNext(poLayer, nId))
        try {
            oShapes.emplace_back(nId, Ring());
            oShapes.back().second = ReadShape(poLayer, nId);
        } catch (const kelm::DataException&) {
        }
    return oShapes;
}

/// Does the box of a ring share a point with the window?
bool Meets(const Ring& oRing, const Window& oWindow) {
    bool abBeside[4] = {true, true, true, true};
    for (const auto& [x, y, z] : oRing) {
        abBeside[0] &= !(x >= oWindow.min.x);
        abBeside[1] &= !(x <= oWindow.max.x);
        abBeside[2] &= !(y >= oWindow.min.y);
        abBeside[3] &= !(y <= oWindow.max.y);
    }
    return std::none_of(abBeside, abBeside + 4, [](bool bBeside) { return bBeside; });
}

std::string Print(kelm::tin::Tin* poLoaded) {
    const std::unique_ptr<kelm::tin::Tin> poTin(poLoaded);
    std::string text;
    for (unsigned n = 0; poTin && n < 3 * poTin->GetTriangleCount(); ++n) {
        const point3_t<float>& v = *poTin->GetTriangle(n / 3)->GetVertex(int(n % 3));
        text += FormatString("%a %a %a\n", double(v.x), double(v.y), double(v.z));
    }
    return text;
}

void MakeOlder(const std::string& path) {
    fs::last_write_time(path, fs::last_write_time(path) - std::chrono::seconds(5));
}

struct WindowTest : FileTest {
    /// Triangles in rows, and among them all that is cut, refused or of many parts.
    static LayerText MakeLayer(unsigned nFeatures, bool bMixed) {
        LayerText oText{{}, bMixed ? OGR_GT_SetZ(wkbUnknown) : wkbPolygon25D};
        for (unsigned n = 0; n < nFeatures; ++n) {
            const double x = 3.0 * (n % 20), y = 3.0 * (n / 20);
            const auto Ring = [&](double dx, double dy, double s) {
                return FormatString("(%f %f 1,%f %f 2,%f %f 3,%f %f 4,%f %f 1)", x + dx, y + dy,
                                    x + dx + s, y + dy, x + dx + s, y + dy + s, x + dx, y + dy + s,
                                    x + dx, y + dy);
            };
            const std::string apKinds[] = {
                MakeTriangle(x, y, n),
                "POLYGON Z (" + Ring(0, 0, 2) + ")",
                "POLYGON Z (" + Ring(0, 0, 2) + "," + Ring(0.5, 0.5, 1) + ")",
                bMixed ? "" : MakeTriangle(x, y + 1, n),
                "POLYGON Z ((0 0 1,1 1 1,1 0 1,0 1 1,0 0 1))",
                bMixed ? "MULTIPOLYGON Z ((" + Ring(0, 0, 2) + "),(" + Ring(90, 0, 2) + "))"
                       : "POLYGON Z (" + Ring(0, 0, 2.5) + ")"};
            oText.moGeometries.push_back(apKinds[n * 7 % 11 < 5 ? 0 : n * 7 % 6]);
        }
        oText.moGeometries.push_back(MakeTriangle(1, 1, 1));
        return oText;
    }

    /// Holds walks and loads with windows against those over the whole layer.
    void Compare(const std::string& path, bool bQuick) {
        SCOPED_TRACE(path);
        const File oFile = OpenFile(path);
        ZARLayer_t* const poLayer = ZARGetLayer(oFile.get(), 1);
        const auto poWhole = OpenReader(path), poReader = OpenSurveyed(path, poWhole->GetSurvey());
        EXPECT_EQ(poReader->GetSurvey(), poWhole->GetSurvey());
        const auto tNow = fs::last_write_time(path);
        const Shapes oAll = Walk(poLayer);
        for (const Window& oWindow : MakeWindows()) {
            const ZARVertex low{oWindow.min.x, oWindow.min.y, 0},
                high{oWindow.max.x, oWindow.max.y, 0};
            ZARSetWindow(poLayer, &low, &high);
            const Shapes oFound = Walk(poLayer);
            EXPECT_TRUE(std::includes(oAll.begin(), oAll.end(), oFound.begin(), oFound.end()));
            for (const auto& oShape : oAll)
                EXPECT_TRUE(oShape.second.empty() || !Meets(oShape.second, oWindow) ||
                            std::binary_search(oFound.begin(), oFound.end(), oShape))
                    << oShape.first;
            const bool bLarge = oWindow.min.x < -99 && oWindow.max.x > 99;
            EXPECT_EQ(oFound.size() < oAll.size() / 2, bQuick && !bLarge);
            const int nCount = ZARCountShapes(poLayer, &low, &high);
            if (bQuick && !bLarge) {
                EXPECT_EQ(nCount, static_cast<int>(oFound.size()));
            }
            EXPECT_EQ(nCount, poReader->EstimateShapeCount(oWindow));
            EXPECT_LE(CountMet(oAll, oWindow), nCount);
            const int nFirst = ZARGetNext(poLayer, -1);
            ZARSetWindow(poLayer, nullptr, nullptr); // the walk goes on without it
            const auto itNext =
                std::lower_bound(oAll.begin(), oAll.end(), std::pair(nFirst + 1, Ring()));
            const int nNext = itNext == oAll.end() ? -1 : itNext->first;
            EXPECT_TRUE(nFirst == -1 || ZARGetNext(poLayer, nFirst) == nNext);
            for (const auto& oShape : {oAll.back(), oAll.front()}) { // out of turn
                EXPECT_EQ(ReadShape(poLayer, oShape.first), oShape.second);
                ZARSetWindow(poLayer, &low, &high);
                ZARGetNext(poLayer, -1);
                EXPECT_EQ(ReadShape(poLayer, oShape.first), oShape.second);
            }
            const std::string part = Print(poReader->Load(&oWindow));
            MakeOlder(path); // what was written to is read as a whole
            EXPECT_EQ(part, Print(poWhole->Load(&oWindow)));
            fs::last_write_time(path, tNow);
        }
        ZARSetWindow(poLayer, nullptr, nullptr);
        EXPECT_EQ(Walk(poLayer), oAll);
        moTranscript.moLines.clear(); // other tests read these
    }
    static int CountMet(const Shapes& oAll, const Window& oWindow) {
        return static_cast<int>(std::count_if(oAll.begin(), oAll.end(), [&](const auto& oShape) {
            return !oShape.second.empty() && Meets(oShape.second, oWindow);
        }));
    }
    static std::vector<Window> MakeWindows() {
        std::vector<Window> oWindows;
        const auto Add = [&](double x, double y, double s) {
            oWindows.emplace_back();
            oWindows.back().min = {x, y};
            oWindows.back().max = {x + s, y + s};
        };
        std::mt19937 oRandom(1);
        for (int n = 0; n < 12; ++n)
            Add(double(oRandom() % 60), double(oRandom() % 50) * 0.999, double(oRandom() % 16));
        Add(4, 4, 0);                 // a corner, which touching meets
        Add(3, 3, 0);                 // one on the other sides
        Add(-1e300, -1e300, 2e300);   // all
        Add(1e9, 1e9, 1);             // beside all
        Add(5, 5, -3);                // turned inside out
        Add(-HUGE_VAL, 10, HUGE_VAL); // not a number at one end
        return oWindows;
    }
};

TEST_F(WindowTest, AWalkGivesWhatMeetsTheWindowAsAWholeWalkDoes) {
    struct {
        const char* mpszFormat;
        const char* mpszFile;
        bool mbQuick, mbMixed;
    } const oCases[] = {
        {"GPKG", "a.gpkg", true, true},           {"GPKG", "a.gpkg", true, false},
        {"ESRI Shapefile", "a.shp", true, false}, {"FlatGeobuf", "indexed.fgb", true, false},
        {"FlatGeobuf", "a.fgb", false, false},    {"GML", "a.gml", false, true}};
    for (const auto& oCase : oCases)
        Compare(Write(MakeLayer(400, oCase.mbMixed), oCase.mpszFormat, oCase.mpszFile),
                oCase.mbQuick);
    LayerText oText = MakeLayer(400, true);
    for (GIntBig n = 0; n <= 400; ++n)
        oText.moIds.push_back((n < 200 ? 5 : 4294967296) + 3 * n); // shapes are counted, with gaps
    Compare(Write(oText), true);
}

TEST_F(WindowTest, IndexesThatLieOrLagBehindLoseNothing) {
    // What is written to after its index was made, and an index of zeros.
    const std::string shape = Write(MakeLayer(400, false), "ESRI Shapefile", "a.shp");
    Execute(shape, "CREATE SPATIAL INDEX ON a");
    const std::string tree = shape.substr(0, shape.size() - 3) + "qix";
    ASSERT_TRUE(fs::exists(tree));
    const std::string kept = tree + ".kept";
    fs::rename(tree, kept);
    GDALDatasetUniquePtr poShapes = OpenForUpdate(shape);
    AddFeatures(*poShapes->GetLayer(0), {{MakeTriangle(30.5, 30.5, 9), MakeTriangle(0, 9, 9)}});
    poShapes.reset();
    fs::rename(kept, tree);
    Compare(shape, true);

    const std::string path = Write(MakeLayer(400, false), "FlatGeobuf", "indexed.fgb");
    std::ifstream oFile(path, std::ios::binary);
    std::string content((std::istreambuf_iterator<char>(oFile)), {});
    const std::size_t nHeader = 12 + *reinterpret_cast<const std::uint32_t*>(&content[8]);
    std::fill_n(content.begin() + long(nHeader) + 40 * 10, 32, '\0'); // the box of a node
    moFolder.WriteFile("indexed.fgb", content);
    Compare(path, true);

    const std::string table = Write(MakeLayer(400, true));
    Execute(table, "DELETE FROM rtree_facets_geom WHERE id % 3 = 0");
    Compare(table, true);
}

TEST_F(WindowTest, AFileThatWasWrittenToIsReadAsItIsThen) {
    const std::string path = Write(MakeLayer(4, true));
    MakeOlder(path);
    const auto poReader = OpenReader(path);
    Window oWindow;
    oWindow.min = {6, 0};
    oWindow.max = {7, 1};
    ASSERT_NE(Print(poReader->Load(&oWindow)), "");
    Execute(path, "DELETE FROM facets WHERE fid = 1"); // beside the window
    EXPECT_TRUE(moTranscript.Refuses([&] { poReader->Load(&oWindow); }));

    // As if nothing had been written.
    const std::string survey = OpenReader(Write(MakeLayer(4, false)))->GetSurvey();
    const auto tNow = fs::last_write_time(path);
    Execute(path, "DELETE FROM facets WHERE fid = 3");
    fs::last_write_time(path, tNow);
    EXPECT_TRUE(moTranscript.Refuses([&] { OpenSurveyed(path, survey)->Load(&oWindow); }));
}

TEST_F(WindowTest, ManyFeaturesShareTheirBlocks) {
    LayerText oText{{}, wkbPolygon25D};
    constexpr int COLS = 701; // odd, so that some of the pairs lie in two rows
    const auto GetY = [](int nRow) { return nRow < 50 ? 2 * nRow : 199 - 2 * nRow; };
    for (int n = 0; n < 70000; ++n)
        oText.moGeometries.push_back(MakeTriangle(n % COLS, GetY(n / COLS), n));
    const File oFile = OpenFile(Write(oText, "ESRI Shapefile", "a.shp"));
    ZARLayer_t* const poLayer = ZARGetLayer(oFile.get(), 1);
    for (const int nCol : {0, 1, 340, 341, COLS - 1})
        for (const int nRow : {20, 21, 70, 71}) {
            const double y = GetY(nRow);
            const ZARVertex low{nCol + 0.2, y + 0.2, 0}, high{nCol + 0.3, y + 0.3, 0};
            ZARSetWindow(poLayer, &low, &high);
            std::vector<int> oFound;
            for (const auto& oShape : Walk(poLayer))
                oFound.push_back(oShape.first);
            EXPECT_LE(oFound.size(), 8U);
            EXPECT_EQ(ZARCountShapes(poLayer, &low, &high), static_cast<int>(oFound.size()));
            EXPECT_TRUE(std::binary_search(oFound.begin(), oFound.end(), nRow * COLS + nCol));
        }
}

} // namespace
