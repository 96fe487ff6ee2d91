#include "services/bundled/store/features/geometrybytes.h"
#include "services/bundled/store/gdal/warnings.h"
#include "tests/support/filetest.h"

#include <sys/stat.h>

using namespace kelm::test;
namespace fs = std::filesystem;

namespace {

Ring MakeRing(double x, double y, double z) {
    return {{x, y, z}, {x, y + 1, z + 1}, {x + 1, y, z + 2}, {x, y, z}};
}

/// The first layer of a file, by one walk. The ring of a shape that is refused is empty.
struct Layer {
    Layer(const std::string& path, GdalTranscript& oTranscript) : mpoFile(OpenFile(path)) {
        for (int nId = mpo ? ZARGetNext(mpo, -1) : -1; nId != -1; nId = ZARGetNext(mpo, nId)) {
            moIds.push_back(nId);
            moRings.emplace_back();
            oTranscript.Refuses([&] { moRings.back() = ReadShape(mpo, nId); });
        }
        EXPECT_EQ(static_cast<int>(moIds.size()), mpo ? mpo->shapeCount : 0);
    }
    File mpoFile;
    ZARLayer_t* mpo = ZARGetLayer(mpoFile.get(), 1);
    std::vector<int> moIds;
    std::vector<Ring> moRings;
};

using Format = std::pair<const char*, const char*>; // driver and file
const Format kGpkg{"GPKG", "a.gpkg"}, kShape{"ESRI Shapefile", "a.shp"}, kGml{"GML", "a.gml"};

struct VectorLayerTest : FileTest {
    Layer Read(const std::string& path) { return Layer(path, moTranscript); }
    std::string WriteRow(const Format& oFormat, int nTriangles, bool bTwice = false) {
        LayerText oText{{}, wkbPolygon25D};
        for (int n = 0; n < nTriangles; ++n)
            oText.moGeometries.push_back(MakeTriangle(n, 0, n));
        return Write(oText, oFormat.first, oFormat.second, bTwice);
    }
};

TEST_F(VectorLayerTest, EachFormatGivesAllFacetsInOrderAndNeverLessWhenItIsCut) {
    std::string half; // what is said of files of half their length
    for (const Format& oFormat :
         {kGpkg, kShape, kGml, Format{"FlatGeobuf", "a.fgb"}, Format{"GeoJSON", "a.geojson"},
          Format{"SQLite", "a.sqlite"}, Format{"OpenFileGDB", "a.gdb"}}) {
        const std::string path = WriteRow(oFormat, 400);
        const std::vector<Ring> oRings = Read(path).moRings;
        ASSERT_EQ(oRings.size(), 400U) << path;
        for (std::size_t n = 0; n < 400; ++n)
            EXPECT_EQ(oRings[n], MakeRing(double(n), 0, double(n))) << path;
        EXPECT_NE(GetCrs(Read(path).mpo).find("\"WGS 84 / UTM zone 32N\""), std::string::npos)
            << path;
        EXPECT_TRUE(!fs::is_directory(path) || Read(path + '/').moRings == oRings);
        EXPECT_EQ(moTranscript.moLines, "");
        const auto nSize = fs::is_directory(path) ? 0 : fs::file_size(path);
        for (unsigned nCut = nSize > 0 ? 25 : 0; nCut-- > 0;) {
            fs::resize_file(path, nSize * nCut / 25);
            moTranscript.Refuses([&] {
                const Layer oLayer = Read(path);
                EXPECT_TRUE(!oLayer.mpo || oLayer.moRings == oRings) << path << ' ' << nCut;
            });
            if (const std::string lines = moTranscript.Take(); nCut == 12)
                half += lines;
        }
    }
    moTranscript.moLines = half;
}

const struct {
    const char* mpszText;
    std::vector<std::size_t> moCorners; ///< of each shape; 0: refused
} kKinds[] = {
    {"POLYGON Z ((0 0 1,1 0 1,1 1 1,0 1 1))", {5}}, // not closed
    {"POLYGON Z ((0 0 1,1 0 1,1 1 1,0 0 9))", {4}}, // closed in plan only
    {"GEOMETRYCOLLECTION Z (GEOMETRYCOLLECTION Z (TIN Z (((0 0 1,1 0 1,0 1 1,0 0 1)))))", {4}},
    {"GEOMETRYCOLLECTION EMPTY", {0}},
    {"CURVEPOLYGON Z (CIRCULARSTRING Z (0 0 1,1 1 1,2 0 1,1 -1 1,0 0 1))", {91}},
    {"POLYGON Z ((0 0 1,9 0 1,9 9 1,0 0 1),(5 1 1,6 1 1,6 2 1,5 1 1))", {4, 4, 4, 4, 4, 4}},
    {"POLYGON Z ((0 0 1,1 0 1,0 0 1))", {0}},
    {"POLYGON Z ((0 0 1,1e999 0 1,0 1 1,0 0 1))", {0}},
    {"POLYGON Z ((0 0 1,1 0 1,0 1 1e999,0 0 1))", {0}},
    {"", {0}},
    {"POLYGON ((3 3,4 3,3 4,3 3))", {4}},
    {"GEOMETRYCOLLECTION Z (POINT Z (0 0 1),LINESTRING Z (0 0 1,1 1 1))", {0, 0}}};

TEST_F(VectorLayerTest, EachKindOfGeometryIsDeliveredOrRefusedWithAWarning) {
    LayerText oText;
    for (const auto& oKind : kKinds)
        oText.moGeometries.emplace_back(oKind.mpszText);
    const Layer oLayer = Read(Write(oText));
    std::size_t nShape = 0;
    for (const auto& [pszText, oCorners] : kKinds)
        for (const std::size_t nCorners : oCorners)
            EXPECT_EQ(oLayer.moRings.at(nShape++).size(), nCorners) << pszText;
    ZARVertex oLow, oHigh;
    ZARGetExtents(oLayer.mpo, &oLow, &oHigh);
    EXPECT_TRUE(oLow.z == 0 && oLow.y < -0.99 && oHigh.z == 9 && oHigh.x == 9);
}

TEST_F(VectorLayerTest, TypeComesFromTheGeometriesUnlessTheLayerSaysThatItIsOfPointsOrLines) {
    const std::string point = "POINT Z (0 0 1)", line = "LINESTRING Z (0 0 1,1 1 1)";
    const auto GetType = [&](const LayerText& oText) {
        return ZARGetLayerType(Read(Write(oText)).mpo, 0);
    };
    EXPECT_EQ(GetType({{}, wkbPoint25D}), 1);
    EXPECT_EQ(GetType({{}, wkbMultiLineString25D}), 3);
    EXPECT_EQ(GetType({{MakeTriangle(0, 0, 0)}, wkbPoint25D}), 1);
    EXPECT_EQ(GetType({{"", point}}), 1) << "no geometry is no facet";
    EXPECT_EQ(GetType({{point}}), 1);
    EXPECT_EQ(GetType({{point, line}}), 3);
    EXPECT_EQ(GetType({{point, line, MakeTriangle(0, 0, 0)}}), 2);
}

TEST_F(VectorLayerTest, OnlyTheFirstGeometryColumnIsRead) {
    const std::string path = moFolder.GetPath("a.sqlite");
    GDALDatasetUniquePtr poDataset = Create(path, "SQLite");
    OGRLayer& oLayer = *poDataset->CreateLayer("facets", nullptr, wkbPolygon25D);
    OGRGeomFieldDefn oSecond("second", wkbPoint);
    oLayer.CreateGeomField(&oSecond);
    AddFeatures(oLayer, {{MakeTriangle(0, 0, 0)}});
    poDataset.reset();
    EXPECT_EQ(Read(path).moRings[0], MakeRing(0, 0, 0));
}

TEST_F(VectorLayerTest, ShapeIdsLeadToTheFeatureAndAreFoundInAnyOrder) {
    // The ids of two features, the number of facets of the second, the ids of the shapes.
    const std::tuple<std::vector<GIntBig>, int, std::vector<int>> cases[] = {
        {{0, 2147483647}, 1, {0, 2147483647}}, // the feature ids themselves
        {{3, 7}, 11, {300, 700, 701, 702, 703, 704, 705, 706, 707, 708, 709, 710}},
        {{7, 2147483648}, 1, {1, 2}},   // too large for an int
        {{7, 214748365}, 2, {1, 2, 3}}, // too large with a digit for the facet
        {{-4, 7}, 1, {1, 2}},
    };
    for (const auto& [oFeatures, nFacets, oIds] : cases) {
        std::string facets;
        for (int n = 0; n < nFacets; ++n)
            facets += (n ? "," : "(") + MakeTriangle(n, 0, n).substr(10);
        LayerText oText{{MakeTriangle(9, 9, 9)}, wkbUnknown, "", oFeatures};
        oText.moGeometries.push_back("MULTIPOLYGON Z " + facets + ")");
        const Layer oLayer = Read(Write(oText));
        ASSERT_EQ(oLayer.moIds, oIds);
        EXPECT_EQ(GetCrs(oLayer.mpo), "");
        EXPECT_EQ(oLayer.moRings.back(), MakeRing(nFacets - 1, 0, nFacets - 1));
        for (std::size_t n = oIds.size(); n-- > 0;) {
            EXPECT_EQ(ReadShape(oLayer.mpo, oIds[n]), oLayer.moRings[n]);
            EXPECT_EQ(ZARGetNext(oLayer.mpo, oIds[n]), n + 1 < oIds.size() ? oIds[n + 1] : -1);
        }
        for (const int nUnknown : {2147483646, -1, 5, 712})
            EXPECT_TRUE(moTranscript.Refuses([&] { ZARGetShapeRef(oLayer.mpo, nUnknown); }));
    }
}

TEST_F(VectorLayerTest, LayersOfOneFileCanBeReadInTurns) {
    for (const Format& oFormat : {kGpkg, kGml}) {
        const Layer oFirst = Read(WriteRow(oFormat, 200, true));
        ZARLayer_t* apoLayers[] = {oFirst.mpo, ZARGetLayer(oFirst.mpoFile.get(), 2)};
        int anIds[] = {-1, -1};
        for (int nSeen = 0; nSeen < 200; ++nSeen)
            for (const int n : {0, 1}) {
                anIds[n] = ZARGetNext(apoLayers[n], anIds[n]);
                EXPECT_EQ(ReadShape(apoLayers[n], anIds[n]), MakeRing(nSeen, 0, nSeen));
            }
    }
}

TEST_F(VectorLayerTest, WhatIsNoLocalFileOfAKnownFormatIsRefusedByName) {
    const std::string shape = WriteRow(kShape, 1), pipe = moFolder.GetPath("pipe.geojson");
    ASSERT_EQ(mkfifo(pipe.c_str(), 0600), 0);
    const std::string longer = Write({{MakeTriangle(0, 0, 0)}});
    fs::resize_file(longer, fs::file_size(longer) + 1);
    for (const std::string& name :
         {std::string(R"({"type":"Point"})"), "GeoJSON:" + shape, "/vsizip/" + shape,
          moFolder.GetPath(""), pipe, longer, moFolder.WriteFile("empty.gpkg", ""),
          moFolder.WriteFile("a.vrt", "<OGRVRTDataSource/>")})
        EXPECT_TRUE(moTranscript.Refuses([&] { Read(name); })) << name;
}

TEST_F(VectorLayerTest, AFileMakesTheStoreNeitherConnectNorOpenOthersNorWrite) {
    const std::string json = // of rings that are not closed
        R"({"type":"MultiPolygon","coordinates":[[[[0,0,1],[1,0,1],[0,1,1]]],[[[2,0,1],[3,0,1],)"
        R"([2,1,1]]]],"crs":{"type":"link","properties":{"type":"ogcwkt",)"
        R"("href":"http://127.0.0.1:9/x"}}})";
    EXPECT_EQ(Read(moFolder.WriteFile("a.geojson", json)).moIds.size(), 2U);

    std::ifstream oStream(WriteRow(kGml, 1));
    std::string gml(std::istreambuf_iterator<char>(oStream), {});
    gml.insert(gml.find("?>") + 2,
               R"(<!DOCTYPE c [<!ENTITY % e SYSTEM "http://127.0.0.1:9"> %e;]>)");
    moFolder.WriteFile("a.xsd", R"(<xs:schema xmlns:xs="http://www.w3.org/2001/XMLSchema">)"
                                R"(<xs:include schemaLocation="http://127.0.0.1:9"/></xs:schema>)");
    EXPECT_EQ(Read(moFolder.WriteFile("a.gml", gml)).moIds.size(), 1U);
    EXPECT_FALSE(fs::exists(moFolder.GetPath("a.gfs")));

    const std::string spy = moFolder.GetPath("spy.sqlite"), other = WriteRow(kShape, 1);
    const std::string table = "VirtualShape('" + other.substr(0, other.size() - 4) + "','UTF-8',0)";
    GDALDatasetUniquePtr poSpy =
        Create(spy, "SQLite", CPLStringList().AddString("SPATIALITE=YES").List());
    if (!poSpy)
        GTEST_SKIP() << "GDAL is built without the library that reads other files";
    poSpy->ExecuteSQL(("CREATE VIRTUAL TABLE spy USING " + table).c_str(), nullptr, nullptr);
    poSpy.reset();
    EXPECT_EQ(Read(spy).mpo, nullptr);
}

TEST_F(VectorLayerTest, AFileThatChangesWhileItIsOpenEndsEachWalkWithAnException) {
    // Fewer features, or more facets in one; then the last shape that is delivered.
    for (const auto& [pszChange, nLast] :
         {std::pair("DELETE FROM facets WHERE fid > 200", 200),
          {"UPDATE facets SET geom = (SELECT geom FROM others) WHERE fid = 100", 100}}) {
        const std::string path = WriteRow(kGpkg, 300);
        const std::string both = MakeTriangle(0, 0, 0) + ',' + MakeTriangle(1, 0, 0);
        AddFeatures(*OpenForUpdate(path)->CreateLayer("others"),
                    {{"GEOMETRYCOLLECTION Z (" + both + ')'}});
        const Layer oLayer = Read(path);
        Execute(path, pszChange);
        for (int nWalk = 0, nId = -1; nWalk < 2; ++nWalk, nId = -1) {
            EXPECT_TRUE(moTranscript.Refuses([&] {
                while ((nId = ZARGetNext(oLayer.mpo, nId)) != -1)
                    continue;
            }));
            EXPECT_EQ(nId, nLast) << pszChange;
        }
    }
}

using Bytes = std::vector<unsigned char>;

/// A triangle as a GeoPackage stores it. @param nFlags of the header
Bytes MakeBlob(unsigned nFlags, std::uint32_t nType) {
    const std::array<std::size_t, 5> envelopes{0, 4, 6, 6, 8};
    Bytes blob{'G', 'P', 0, static_cast<unsigned char>(nFlags), 0xF8, 0x7F, 0, 0};
    blob.resize(8 + sizeof(double) * envelopes.at(nFlags >> 1U & 7U), 1);
    const auto append = [&](const auto& oValue) {
        const auto* pFirst = reinterpret_cast<const unsigned char*>(&oValue);
        blob.insert(blob.end(), pFirst, pFirst + sizeof oValue);
    };
    blob.push_back(1);
    for (const std::uint32_t nWord : {nType, 1U, 4U})
        append(nWord);
    const std::size_t nOrdinates = nType == 3 ? 2 : nType == 3003 ? 4 : 3;
    for (const auto& oPoint : MakeRing(7, 8, 9))
        for (std::size_t n = 0; n < nOrdinates; ++n)
            append(n < 3 ? oPoint[n] : 1.0);
    return blob;
}

/// Triangles of all forms; and each with a bit changed at each place that tells the form, cut off,
/// longer, open, or with an ordinate that is no number.
std::vector<Bytes> MakeBlobs() {
    std::vector<Bytes> blobs{MakeBlob(5, 1003), MakeBlob(7, 3), MakeBlob(9, 1003)};
    for (const std::uint32_t nType : {3U, 1003U, 2003U, 3003U, 0x80000003U}) {
        const Bytes blob = MakeBlob(nType == 1003 ? 3 : 1, nType);
        blobs.insert(blobs.end(), {blob, Bytes(blob.begin(), blob.end() - 8), blob, blob, blob});
        blobs[blobs.size() - 3].push_back(0);
        blobs[blobs.size() - 2].back() ^= 1;
        std::fill_n(blobs.back().end() - 60, 8, 0xFF);
        for (std::size_t n = 0; n < 60; ++n) {
            blobs.push_back(blob);
            blobs.back()[n] ^= static_cast<unsigned char>(1U << n % 8);
        }
    }
    return blobs;
}

TEST_F(VectorLayerTest, TheBytesOfATriangleAreReadWithEachEnvelope) {
    for (const std::uint32_t nType : {3U, 1003U, 0x80000003U})
        for (const unsigned nFlags : {1U, 3U, 5U, 7U, 9U}) {
            const Bytes blob = MakeBlob(nFlags, nType);
            std::array<ZARVertex, 4> oVertices;
            bool bFlat;
            ASSERT_TRUE(kelm::store::ReadTriangleBytes(blob.data(), blob.size(), oVertices, bFlat));
            EXPECT_EQ(bFlat, nType == 3);
            EXPECT_EQ(oVertices[2].x, 8.0);
            EXPECT_EQ(oVertices[2].z, bFlat ? 0.0 : 11.0);
            for (std::size_t n = 0; n < blob.size(); ++n) {
                const std::unique_ptr<unsigned char[]> poCut(new unsigned char[n]);
                std::copy_n(blob.begin(), n, poCut.get());
                EXPECT_FALSE(kelm::store::ReadTriangleBytes(poCut.get(), n, oVertices, bFlat));
            }
        }
}

TEST_F(VectorLayerTest, TheBytesOfAGeoPackageGiveWhatItsGeometriesGive) {
    // Without a geometry in its first row, a layer is not asked for bytes. The second time, most
    // rows are triangles, and the bytes serve to the end.
    for (const int nTriangles : {0, 4}) {
        const std::string path = WriteRow(kGpkg, 1), other = moFolder.GetPath("b.gpkg");
        Execute(path, "SELECT DisableSpatialIndex('facets', 'geom')");
        {
            const CPLErrorHandlerPusher oQuiet(CPLQuietErrorHandler);
            const GDALDatasetUniquePtr poDataset = OpenForUpdate(path);
            poDataset->StartTransaction();
            for (const Bytes& blob : MakeBlobs())
                for (int n = 0; n <= nTriangles; ++n) {
                    const Bytes& row = n == 0 ? blob : MakeBlob(1, 1003);
                    const std::unique_ptr<char, decltype(&CPLFree)> hex(
                        CPLBinaryToHex(static_cast<int>(row.size()), row.data()), CPLFree);
                    poDataset->ExecuteSQL(
                        FormatString("INSERT INTO facets (geom) VALUES (x'%s')", hex.get()).c_str(),
                        nullptr, nullptr);
                }
            poDataset->CommitTransaction();
        }
        fs::copy_file(path, other, fs::copy_options::overwrite_existing);
        Execute(other, "UPDATE facets SET geom = NULL WHERE fid = 1");
        std::vector<std::vector<std::string>> said;
        std::vector<std::vector<Ring>> rings;
        for (const std::string& name : {path, other}) {
            rings.push_back(Read(name).moRings);
            rings.back().front().clear();
            said.emplace_back();
            // Of each damaged row; the sums behind them count the first row, too.
            const std::string lines = std::exchange(moTranscript.moLines, {});
            for (std::size_t n = 0; (n = lines.find("feature ", n)) < lines.find("shapes"); ++n)
                said.back().push_back(lines.substr(n, lines.find('\n', n) - n));
        }
        EXPECT_TRUE(rings[0] == rings[1]);
        EXPECT_EQ(said[0].size(), 82U);
        EXPECT_EQ(said[0], said[1]);
    }
}

TEST_F(VectorLayerTest, TextsOfWarningsBeyondAThousandAreCountedTogether) {
    kelm::store::Warnings warnings;
    for (const int nRound : {1, 2})
        for (int n = 0; n < 1002; ++n)
            kelm::store::AddWarning(warnings, std::to_string(n), nRound);
    EXPECT_EQ(warnings.size(), 1001U);
    EXPECT_EQ(warnings["further warnings"], 6);
    EXPECT_EQ(warnings["999"], 3);
}

} // namespace
