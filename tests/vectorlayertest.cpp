#include "services/vectorlayer.h"

#include "services/exception.h"
#include "tests/support/layerreader.h"
#include "tests/support/layerwriter.h"
#include "tests/support/temporaryfolder.h"
#include "tests/support/warninglog.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <filesystem>

using namespace kelm::test;
namespace fs = std::filesystem;

namespace {

Ring MakeRing(double dfX, double dfY, double dfZ) {
    return {{dfX, dfY, dfZ}, {dfX + 1, dfY, dfZ + 1}, {dfX, dfY + 1, dfZ + 2}, {dfX, dfY, dfZ}};
}

/// @return the rings of a triangle as text, to be put into a geometry of several
std::string MakeFacet(double dfX, double dfY, double dfZ) {
    return MakeTriangle(dfX, dfY, dfZ).substr(std::string("POLYGON Z ").size());
}

LayerText MakeTriangles(int nCount) {
    LayerText oLayer;
    for (int n = 0; n < nCount; ++n)
        oLayer.moGeometries.push_back(MakeTriangle(n, 0, n));
    return oLayer;
}

class VectorLayer : public testing::Test {
  protected:
    std::string Write(const std::string& name, const std::string& format,
                      const LayerText& oLayer) const {
        return WriteLayer(moFolder.GetPath(name), format, oLayer);
    }
    LayerContents WriteAndRead(const LayerText& oLayer) const {
        fs::remove(moFolder.GetPath("layer.gpkg"));
        return ReadLayer(Write("layer.gpkg", "GPKG", oLayer));
    }

    TemporaryFolder moFolder;
    WarningLog moLog;
};

struct FormatCase {
    const char* mpszFormat;
    const char* mpszFile;
    OGRwkbGeometryType meType;
    bool mbSurfaces;  ///< the format keeps TINs and polyhedral surfaces
    bool mbClockwise; ///< the writer turns rings
};

const OGRwkbGeometryType kAny = OGR_GT_SetZ(wkbUnknown);
const FormatCase kFormats[] = {{"GPKG", "a.gpkg", kAny, true, false},
                               {"ESRI Shapefile", "a.shp", wkbPolygon25D, false, true},
                               {"FlatGeobuf", "a.fgb", kAny, true, false},
                               {"GeoJSON", "a.geojson", kAny, false, false},
                               {"GML", "a.gml", kAny, true, false},
                               {"SQLite", "a.sqlite", kAny, true, false},
                               {"OpenFileGDB", "a.gdb", wkbMultiPolygon25D, false, true}};

TEST_F(VectorLayer, EachFormatGivesItsFacetsInOrder) {
    const std::string parts = " Z (" + MakeFacet(10, 0, 5) + "," + MakeFacet(20, 0, -8) + ")";
    for (const FormatCase& oCase : kFormats) {
        SCOPED_TRACE(oCase.mpszFormat);
        const WarningLog oLog;
        LayerText oLayer = MakeTriangles(2);
        oLayer.meType = oCase.meType;
        if (oCase.mpszFormat == std::string("FlatGeobuf")) // or it sorts the features
            oLayer.moOptions = {"SPATIAL_INDEX=NO"};
        for (const char* pszKind : {"MULTIPOLYGON", "TIN", "POLYHEDRALSURFACE"})
            if (oCase.mbSurfaces || oLayer.moGeometries.size() == 2)
                oLayer.moGeometries.push_back(pszKind + parts);
        const LayerContents oRead = ReadLayer(Write(oCase.mpszFile, oCase.mpszFormat, oLayer));

        std::vector<Ring> oExpected = {MakeRing(0, 0, 0), MakeRing(1, 0, 1)};
        std::vector<int> oIds = {0, 10};
        for (int n = 2; n < (oCase.mbSurfaces ? 5 : 3); ++n) {
            oExpected.insert(oExpected.end(), {MakeRing(10, 0, 5), MakeRing(20, 0, -8)});
            oIds.insert(oIds.end(), {10 * n, 10 * n + 1});
        }
        if (oCase.mbClockwise)
            for (Ring& oRing : oExpected)
                std::reverse(oRing.begin(), oRing.end());
        for (int& nId : oIds)
            nId += oRead.moIds.at(0); // the feature ids of some formats begin with 1
        EXPECT_EQ(oRead.moRings, oExpected);
        EXPECT_EQ(oRead.moIds, oIds);
        EXPECT_EQ(oRead.mnType, 2);
        EXPECT_EQ(oRead.moLow.z, -8);
        EXPECT_EQ(oRead.moHigh.x, 21);
        EXPECT_NE(oRead.moCrs.find("PROJCRS"), std::string::npos) << oRead.moCrs;
        EXPECT_EQ(oLog.Count("heights"), 0);
    }
}

struct KindCase {
    const char* mpszText;
    std::vector<std::size_t> moCorners; ///< of each shape; 0: refused
    const char* mpszWarning;
};

const KindCase kKinds[] = {
    {"TRIANGLE Z ((0 0 1,1 0 1,0 1 1,0 0 1))", {4}, nullptr},
    {"POLYGON Z ((0 0 1,1 0 1,1 1 1,0 1 1))", {5}, nullptr}, // not closed
    {"POLYGON Z ((0 0 1,1 0 1,1 1 1,0 0 9))", {4}, nullptr}, // closed in plan only
    {"GEOMETRYCOLLECTION Z (GEOMETRYCOLLECTION Z (TIN Z (((0 0 1,1 0 1,0 1 1,0 0 1)))),POLYGON Z "
     "((0 0 1,1 0 1,1 1 1,0 1 1,0 0 1)),GEOMETRYCOLLECTION EMPTY,LINESTRING Z (0 0 1,1 1 1))",
     {4, 5, 0, 0},
     "an empty geometry"},
    {"CURVEPOLYGON Z (CIRCULARSTRING Z (0 0 1,1 1 1,2 0 1,1 -1 1,0 0 1))", {91}, nullptr},
    {"MULTISURFACE Z (((0 0 1,1 0 1,0 1 1,0 0 1)))", {4}, nullptr},
    {"POLYGON Z ((0 0 1,9 0 1,9 9 1,0 0 1),(5 1 1,6 1 1,6 2 1,5 1 1))", {0}, "with holes"},
    {"MULTIPOLYGON Z (((0 0 1,9 0 1,9 9 1,0 0 1),(5 1 1,6 1 1,6 2 1,5 1 1)),((0 0 1,1 0 1,0 1 1,0 "
     "0 1)))",
     {0, 4},
     "with holes"},
    {"POLYGON Z ((0 0 1,1 0 1,0 0 1))", {0}, "fewer than three corners"},
    {"POLYGON Z ((0 0 1,1e999 0 1,0 1 1,0 0 1))", {0}, "not a finite number"},
    {"LINESTRING Z (0 0 1,1 0 1)", {0}, "lines"},
    {"MULTIPOINT Z ((0 0 1),(1 0 1))", {0}, "points"},
    {"", {0}, "no geometry"}};

TEST_F(VectorLayer, EachKindOfGeometryIsDeliveredOrRefusedWithAWarning) {
    for (const KindCase& oCase : kKinds) {
        SCOPED_TRACE(oCase.mpszText);
        LayerText oLayer;
        // The facet around it keeps its place, whatever its neighbour is.
        oLayer.moGeometries = {oCase.mpszText, MakeTriangle(7, 7, 7)};
        const std::string path =
            Write("k" + std::to_string(&oCase - kKinds) + ".gpkg", "GPKG", oLayer);
        const WarningLog oLog;
        const LayerContents oRead = ReadLayer(path);
        std::vector<std::size_t> oExpected = oCase.moCorners;
        oExpected.push_back(4);
        EXPECT_EQ(CountVertices(oRead), oExpected);
        EXPECT_EQ(oRead.moRings.back(), MakeRing(7, 7, 7));
        EXPECT_EQ(oRead.mnType, 2);
        EXPECT_EQ(oRead.moHigh.z, 9);
        EXPECT_EQ(oLog.Count("feature 1"), oCase.mpszWarning ? oLog.GetTexts().size() : 0);
        EXPECT_TRUE(!oCase.mpszWarning || oLog.Count(oCase.mpszWarning) == 1);
    }
}

TEST_F(VectorLayer, OrdinatesThatAreNoNumbersAreRefusedAndLeaveTheExtentsAlone) {
    std::string text = R"({"type":"FeatureCollection","features":[)";
    for (const char* pszCorner : {"NaN,0,5", "0,Infinity,5", "0,0,NaN", "0,0,1e400", "0,0,5"})
        text +=
            R"({"type":"Feature","properties":{},"geometry":{"type":"Polygon","coordinates":[[[)" +
            std::string(pszCorner) + "],[1,0,5],[0,1,5],[" + pszCorner + "]]]}},";
    text.back() = ']';
    const LayerContents oRead = ReadLayer(moFolder.WriteFile("nan.geojson", text + "}"));
    EXPECT_EQ(CountVertices(oRead), (std::vector<std::size_t>{0, 0, 0, 0, 4}));
    EXPECT_EQ(oRead.moLow.z, 5);
    EXPECT_EQ(oRead.moHigh.y, 1);
    EXPECT_EQ(moLog.Count("features 0 to 3 cannot be used"), 1);
}

TEST_F(VectorLayer, ManyRefusedFeaturesInARowShareAWarning) {
    LayerText oLayer = MakeTriangles(1);
    oLayer.moGeometries.insert(oLayer.moGeometries.end(), 5000, "POINT Z (1 1 1)");
    EXPECT_EQ(WriteAndRead(oLayer).mnCount, 5001);
    EXPECT_EQ(moLog.Count("features 2 to 5001 cannot be used (shapes left out: 5000)"), 1);
    EXPECT_EQ(moLog.GetTexts().size(), 1u);
}

struct TypeCase {
    OGRwkbGeometryType meDeclared;
    std::vector<std::string> moGeometries;
    int mnType;
};

TEST_F(VectorLayer, TypeComesFromTheGeometriesAndOnlyOfAnEmptyLayerFromTheHeader) {
    const std::string point = "POINT Z (0 0 1)", line = "LINESTRING Z (0 0 1,1 1 1)";
    for (const TypeCase& oCase : {TypeCase{wkbPoint25D, {}, 1},
                                  {wkbMultiLineString25D, {}, 3},
                                  {wkbPolygon25D, {}, 2},
                                  {wkbUnknown, {point}, 1},
                                  {wkbUnknown, {point, line}, 3},
                                  {wkbUnknown, {point, line, MakeTriangle(0, 0, 0)}, 2}}) {
        LayerText oLayer;
        oLayer.meType = oCase.meDeclared;
        oLayer.moGeometries = oCase.moGeometries;
        EXPECT_EQ(WriteAndRead(oLayer).mnType, oCase.mnType);
    }
}

TEST_F(VectorLayer, ALayerWithoutHeightsHasHeightZeroAndSaysSoOnce) {
    LayerText oLayer;
    oLayer.moGeometries = {"POLYGON ((3 3,4 3,3 4,3 3))", "POLYGON ((5 3,6 3,5 4,5 3))"};
    const LayerContents oRead = WriteAndRead(oLayer);
    EXPECT_EQ(oRead.moRings.at(0), (Ring{{3, 3, 0}, {4, 3, 0}, {3, 4, 0}, {3, 3, 0}}));
    EXPECT_EQ(oRead.moLow.z, 0);
    EXPECT_EQ(moLog.Count("layer facets of file " + moFolder.GetPath("layer.gpkg") +
                          ": 2 of 2 shapes have no heights"),
              1);
    EXPECT_EQ(moLog.GetTexts().size(), 1u);
}

struct IdCase {
    std::vector<std::int64_t> moFeatures;
    std::vector<int> moFacets; ///< of each feature
    std::vector<int> moIds;
};

TEST_F(VectorLayer, ShapeIdsLeadToTheFeatureAndAreFoundInAnyOrder) {
    const IdCase oCases[] = {
        {{0, 7, 2147483647}, {1, 1, 1}, {0, 7, 2147483647}}, // the feature ids themselves
        {{3, 7}, {2, 11}, {300, 301, 700, 701, 702, 703, 704, 705, 706, 707, 708, 709, 710}},
        {{7, 2147483648}, {1, 1}, {1, 2}},   // too large for an int
        {{7, 214748365}, {1, 2}, {1, 2, 3}}, // too large with a digit for the facet
        {{-4, 7}, {1, 1}, {1, 2}},
    };
    for (const IdCase& oCase : oCases) {
        LayerText oLayer;
        oLayer.moIds = oCase.moFeatures;
        for (std::size_t n = 0; n < oCase.moFacets.size(); ++n) {
            std::string facets;
            for (int m = 0; m < oCase.moFacets[n]; ++m)
                facets += (m ? "," : "") + MakeFacet(static_cast<double>(n), m, 0);
            oLayer.moGeometries.push_back("MULTIPOLYGON Z (" + facets + ")");
        }
        fs::remove(moFolder.GetPath("layer.gpkg"));
        const FilePtr poFile = OpenFile(Write("layer.gpkg", "GPKG", oLayer));
        const LayerContents oRead = ReadLayer(poFile.get());
        ASSERT_EQ(oRead.moIds, oCase.moIds);

        ZARLayer_t* poLayer = ZARGetLayer(poFile.get(), 1);
        for (std::size_t n = oCase.moIds.size(); n-- > 0;) {
            const bool bLast = n + 1 == oCase.moIds.size();
            EXPECT_EQ(ReadShape(poLayer, oCase.moIds[n]), oRead.moRings[n]);
            EXPECT_EQ(ZARGetNext(poLayer, oCase.moIds[n]), bLast ? -1 : oCase.moIds[n + 1]);
            EXPECT_EQ(ZARGetNext(poLayer, -1), oCase.moIds[0]) << "starts over at any time";
        }
        for (const int nUnknown : {-2, 5, 712, 2147483646}) {
            EXPECT_THROW(ZARGetShapeRef(poLayer, nUnknown), kelm::DataException) << nUnknown;
            EXPECT_THROW(ZARGetNext(poLayer, nUnknown), kelm::DataException) << nUnknown;
        }
        EXPECT_EQ(ReadShape(poLayer, oCase.moIds[1]), oRead.moRings[1]);
    }
}

TEST_F(VectorLayer, LayersOfOneFileCanBeReadInTurns) {
    std::vector<LayerText> oLayers(2, MakeTriangles(200));
    oLayers[1].moName = "others";
    for (LayerText& oLayer : oLayers)
        oLayer.meType = wkbPolygon25D;
    for (const auto& [pszFormat, pszName] :
         {std::pair{"GML", "two.gml"}, {"GPKG", "two.gpkg"}, {"OpenFileGDB", "two.gdb"}}) {
        const FilePtr poFile = OpenFile(WriteLayers(moFolder.GetPath(pszName), pszFormat, oLayers));
        ASSERT_EQ(ZARSegCount(poFile.get(), ZAR_SEGMENT_VECTOR), 2);
        EXPECT_EQ(ZARSegNext(poFile.get(), ZAR_SEGMENT_VECTOR, 1), 2);
        EXPECT_EQ(ZARSegNext(poFile.get(), ZAR_SEGMENT_VECTOR, 2), 0);
        EXPECT_EQ(ZARSegCount(poFile.get(), 117), 0);
        EXPECT_EQ(ZARGetLayer(poFile.get(), 3), nullptr);
        ZARLayer_t* apoLayers[] = {ZARGetLayer(poFile.get(), 1), ZARGetLayer(poFile.get(), 2)};
        int anIds[] = {ZARGetNext(apoLayers[0], -1), ZARGetNext(apoLayers[1], -1)};
        int nSeen = 0;
        for (; anIds[0] != -1 && anIds[1] != -1; ++nSeen)
            for (const int n : {0, 1}) {
                EXPECT_EQ(ReadShape(apoLayers[n], anIds[n]).at(0).at(2), nSeen);
                anIds[n] = ZARGetNext(apoLayers[n], anIds[n]);
            }
        EXPECT_EQ(nSeen, 200);
        EXPECT_EQ(anIds[0], anIds[1]);
    }
}

TEST_F(VectorLayer, CrsIsWktOrEmpty) {
    const std::string engineering = "ENGCRS[\"Pit 4\",EDATUM[\"Pit 4\"],CS[Cartesian,2],AXIS["
                                    "\"x\",east],AXIS[\"y\",north],LENGTHUNIT[\"metre\",1]]";
    for (const auto& [crs, start] : {std::pair<std::string, std::string>{"", ""},
                                     {"EPSG:32632", "PROJCRS[\"WGS 84 / UTM zone 32N\""},
                                     {"EPSG:4326", "GEOGCRS[\"WGS 84\""},
                                     {engineering, "ENGCRS[\"Pit 4\""}})
        for (const auto& [pszFormat, pszName] :
             {std::pair{"GPKG", "c.gpkg"}, {"FlatGeobuf", "c.fgb"}}) {
            LayerText oLayer = MakeTriangles(1);
            oLayer.moCrs = crs;
            fs::remove(moFolder.GetPath(pszName));
            const std::string text = ReadLayer(Write(pszName, pszFormat, oLayer)).moCrs;
            EXPECT_EQ(text.substr(0, start.size()), start) << pszName;
            EXPECT_EQ(text.empty(), crs.empty()) << pszName << ": " << text;
        }
}

const std::string kCorners = "  10\n0\n 20\n0\n 30\n1\n 11\n1\n 21\n0\n 31\n2\n";

TEST_F(VectorLayer, DrawingsGiveTheirFacesAndRefuseTheRest) {
    std::string text = "  0\nSECTION\n  2\nENTITIES\n";
    text += "  0\n3DFACE\n  8\n0\n" + kCorners + " 12\n0\n 22\n1\n 32\n3\n 13\n0\n 23\n1\n 33\n3\n";
    text += "  0\n3DFACE\n  8\n0\n" + kCorners + " 12\n1\n 22\n1\n 32\n3\n 13\n0\n 23\n1\n 33\n4\n";
    text += "  0\nLINE\n  8\n0\n" + kCorners;
    text += "  0\nTEXT\n  8\n0\n 10\n5\n 20\n5\n 40\n1\n  1\nA\n";
    text += "  0\nPOLYLINE\n  8\n0\n 66\n1\n 70\n64\n 71\n4\n 72\n2\n";
    for (const char* pszCorner : {"0\n 20\n0", "1\n 20\n0", "1\n 20\n1", "0\n 20\n1"})
        text += "  0\nVERTEX\n  8\n0\n 10\n" + std::string(pszCorner) + "\n 30\n5\n 70\n192\n";
    for (const char* pszFace : {" 71\n1\n 72\n2\n 73\n3\n", " 71\n1\n 72\n3\n 73\n4\n"})
        text += "  0\nVERTEX\n  8\n0\n 70\n128\n" + std::string(pszFace);
    text += "  0\nSEQEND\n  8\n0\n  0\nENDSEC\n  0\nEOF\n";

    const LayerContents oRead = ReadLayer(moFolder.WriteFile("faces.dxf", text));
    EXPECT_EQ(oRead.mnType, 2);
    EXPECT_EQ(CountVertices(oRead), (std::vector<std::size_t>{4, 5, 0, 0, 4, 4}));
    EXPECT_EQ(oRead.moRings.at(0), (Ring{{0, 0, 1}, {1, 0, 2}, {0, 1, 3}, {0, 0, 1}}));
    EXPECT_EQ(oRead.moRings.at(5), (Ring{{0, 0, 5}, {1, 1, 5}, {0, 1, 5}, {0, 0, 5}}));
    EXPECT_EQ(oRead.moHigh.z, 5);
}

} // namespace
