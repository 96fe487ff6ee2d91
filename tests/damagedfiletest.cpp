#include "tests/support/filetest.h"

#include <functional>

using namespace kelm::test;
using namespace kelm::tin;
namespace fs = std::filesystem;

namespace {

using Bytes = std::string;
using Damage = std::function<void(Bytes&)>;

/// Replaces bytes from a place on.
Damage Put(std::size_t at, const Bytes& bytes) {
    return [=](Bytes& rBytes) { rBytes.replace(at, bytes.size(), bytes); };
}

/// Replaces the first text behind a mark.
Damage Change(const std::string& mark, const std::string& old, const std::string& text) {
    return [=](Bytes& rBytes) {
        rBytes.replace(rBytes.find(old, rBytes.find(mark)), old.size(), text);
    };
}

Damage Cut(std::size_t size) {
    return [=](Bytes& rBytes) { rBytes.resize(size); };
}

struct DamagedFileTest : FileTest {
    /// Writes triangles at x = 0 to 3, each with heights from x on.
    std::string Write(const char* pszFormat, const std::string& name) {
        LayerText oText{{}, wkbPolygon25D};
        for (int n = 0; n < 4; ++n)
            oText.moGeometries.push_back(MakeTriangle(n, 0, n));
        return FileTest::Write(oText, pszFormat, name);
    }

    void Edit(const std::string& name, const Damage& oDamage) {
        std::ifstream stream(moFolder.GetPath(name), std::ios::binary);
        Bytes bytes{std::istreambuf_iterator<char>(stream), {}};
        oDamage(bytes);
        moFolder.WriteFile(name, bytes);
    }

    /// Loads a layer. A refusal is told with all its reasons. @return the x of its triangles
    std::string Load(const std::string& path, int nLayer = 0) {
        const HostCall oCall;
        std::string columns;
        try {
            const std::unique_ptr<Tin> poTin(OpenReader(path, nLayer)->Load(nullptr));
            for (unsigned n = 0; poTin && n < poTin->GetTriangleCount(); ++n) {
                double dfX, dfY;
                poTin->GetXYBase(dfX, dfY);
                const double dfCorner = static_cast<double>(poTin->GetTriangle(n)->GetVertex(0)->x);
                columns += FormatString("%g ", dfX + dfCorner);
            }
        } catch (const std::exception& e) {
            Tell(e);
        }
        return columns;
    }

    void Tell(const std::exception& oFailure) try {
        moTranscript.moLines.append("refused: ").append(oFailure.what()) += '\n';
        std::rethrow_if_nested(oFailure);
    } catch (const std::exception& e) {
        Tell(e);
    }
};

// In such a Shapefile the third record stands behind 100 + 2 * 168 bytes. 44 bytes on is the number
// of its parts, then that of its points.
constexpr std::size_t kThird = 100 + 2 * 168;

const struct {
    const char* mpszFormat;
    const char* mpszFile;
    const char* mpszDamaged; ///< the part that is changed
    Damage moDamage;
    const char* mpszLoaded = "0 1 3 "; ///< a damaged record costs that record
} kDamages[] = {
    {"ESRI Shapefile", "a.shp", "a.shp", Put(kThird + 44, {"\xff\xff\xff\x7f", 4})},
    {"ESRI Shapefile", "b.shp", "b.shp", Put(kThird + 48, {"\x05\0\0\x01", 4})},
    {"ESRI Shapefile", "c.shp", "c.shp", Put(kThird + 8, {"\x63\0\0\0", 4})},
    {"GeoJSON", "a.geojson", "a.geojson", Change("[ 2.0, 0.0", "2.0, 1.0", "2.0, \"1\"")},
    {"GeoJSON", "b.geojson", "b.geojson", Change("[ 2.0, 0.0", "2.0, 1.0", "2.0, null")},
    {"GML", "a.gml", "a.gml", Change("facets.2", "</gml:posList>", " 7</gml:posList>")},
    {"OpenFileGDB", "a.gdb", "a.gdb/a00000009.gdbtable",
     [](Bytes& rBytes) { rBytes.replace(rBytes.size() - 80, 3, "\xff\xff\xff"); }},
    // A Shapefile is read whole or not at all: cut with its header, by its header only, without it.
    {"ESRI Shapefile", "a.shp", "a.shx",
     [](Bytes& rBytes) { rBytes = rBytes.substr(0, 27) + '\x3e' + rBytes.substr(28, 96); }, ""},
    {"ESRI Shapefile", "a.shp", "a.shx", Put(24, {"\0\0\0\x3e", 4}), ""},
    {"ESRI Shapefile", "a.shp", "a.shx", Cut(124), ""},
    {"ESRI Shapefile", "a.shp", "a.shp", Cut(kThird + 168), ""},
    {"ESRI Shapefile", "a.shp", "a.dbf", Put(4, {"\3\0\0\0", 4}), ""},
    {"ESRI Shapefile", "a.shp", "a.dbf", Cut(80), ""},
    // What is left of a record that became shorter, and what the header does not count.
    {"ESRI Shapefile", "a.shp", "a.shp", [](Bytes& rBytes) { rBytes.append(200, '\x07'); },
     "0 1 2 3 "},
    {"ESRI Shapefile", "a.shp", "a.shp", Put(24, {"\0\0\0\x40", 4}), "0 1 2 3 "},
};

TEST_F(DamagedFileTest, ADamagedRecordCostsThatRecordAndMoreTheFile) {
    for (const auto& [pszFormat, pszFile, pszDamaged, oDamage, pszLoaded] : kDamages) {
        const std::string path = Write(pszFormat, pszFile);
        Edit(pszDamaged, oDamage);
        EXPECT_EQ(Load(path), pszLoaded) << path;
    }
    for (const auto& [pszFormat, pszFile, pszStatement] :
         {std::tuple("GPKG", "a.gpkg", "geom = substr(geom,1,60) WHERE fid = 3"),
          {"GPKG", "a.gpkg", "geom = x'00' WHERE fid = 3"},
          {"SQLite", "a.sqlite", "geometry = substr(geometry, 1, 60) WHERE ogc_fid = 3"}}) {
        const std::string path = Write(pszFormat, pszFile);
        Execute(path, std::string("UPDATE facets SET ") + pszStatement);
        EXPECT_EQ(Load(path), "0 1 3 ") << path;
    }
}

TEST_F(DamagedFileTest, AWalkThatLosesItsTurnCountsADamagedRecordOnce) {
    LayerText oText{{}, wkbPolygon25D};
    for (int n = 0; n < 600; ++n)
        oText.moGeometries.push_back(MakeTriangle(n, 0, n));
    const std::string path = FileTest::Write(oText, "GML", "a.gml", true);
    Edit("a.gml", Change("facets.2", "</gml:posList>", " 7</gml:posList>"));
    const File poFile = OpenFile(path);
    ZARLayer_t* const poFirst = ZARGetLayer(poFile.get(), 1);
    ZARLayer_t* const poSecond = ZARGetLayer(poFile.get(), 2);
    fs::last_write_time(path, fs::file_time_type::clock::now()); // or what was read would serve
    int nFirst = -1, nSecond = -1, nShapes = 0;
    for (; (nFirst = ZARGetNext(poFirst, nFirst)) != -1; ++nShapes)
        nSecond = ZARGetNext(poSecond, nSecond);
    EXPECT_TRUE(nShapes == 599 && nSecond == 598);
}

TEST_F(DamagedFileTest, MessagesForWhoeverDebugsGdalAreNoWarnings) {
    const std::string path = Write("GPKG", "a.gpkg");
    CPLSetCurrentErrorHandlerCatchDebug(FALSE); // they go past the transcript
    CPLSetThreadLocalConfigOption("CPL_DEBUG", "ON");
    EXPECT_EQ(Load(path), "0 1 2 3 ");
    CPLSetThreadLocalConfigOption("CPL_DEBUG", "TIN");
}

TEST_F(DamagedFileTest, ADatabaseIsReadWithTheLogBesideItOrNotAtAll) {
    const std::string path = Write("GPKG", "a.gpkg"), copy = moFolder.GetPath("b.gpkg"),
                      blocked = moFolder.GetPath("c.gpkg");
    CPLSetThreadLocalConfigOption("OGR_SQLITE_JOURNAL", "WAL");
    GDALDatasetUniquePtr poWriter = OpenForUpdate(path);
    CPLSetThreadLocalConfigOption("OGR_SQLITE_JOURNAL", nullptr);
    AddFeatures(*poWriter->GetLayer(0), {{MakeTriangle(4, 0, 4)}});
    for (const char* pszEnd : {"", "-wal"})
        for (const std::string& to : {copy, blocked})
            fs::copy(path + pszEnd, to + pszEnd);
    fs::create_symlink("none", blocked + "-shm"); // as in a folder that cannot be written to
    EXPECT_EQ(Load(path), "0 1 2 3 4 ");
    EXPECT_EQ(Load(copy), "0 1 2 3 4 ");
    EXPECT_EQ(Load(blocked), "");
    poWriter.reset(); // ends the log
    fs::remove(blocked + "-wal");
    fs::copy(path, blocked, fs::copy_options::overwrite_existing);
    EXPECT_EQ(Load(blocked), "0 1 2 3 4 ");
}

TEST_F(DamagedFileTest, LayerZeroIsTheFirstWithPolygonsAndARefusalNamesThem) {
    const std::pair<const char*, LayerText> layers[] = {
        {"stakes", {{"POINT Z (0 0 1)"}, wkbPoint25D}},
        {"empty", {{MakeTriangle(6, 0, 0)}, wkbPolygon25D}},
        {"paths", {{"LINESTRING Z (0 0 1,1 1 1)"}}},
        {"roofs", {{"", MakeTriangle(7, 0, 0)}}},
        {"walls", {{MakeTriangle(8, 0, 0)}, wkbPolygon25D}}};
    for (const std::size_t nLayers : {5U, 3U}) {
        const std::string path = moFolder.GetPath("a.gpkg");
        GDALDatasetUniquePtr poDataset = Create(path, "GPKG");
        for (std::size_t n = 0; n < nLayers; ++n)
            AddFeatures(*poDataset->CreateLayer(layers[n].first, nullptr, layers[n].second.meType),
                        layers[n].second);
        poDataset.reset();
        Execute(path, "DELETE FROM empty");
        for (const int nLayer : {0, -5, 5, 1, 2, 3, 6})
            moTranscript.moLines += FormatString("%d: %s\n", nLayer, Load(path, nLayer).c_str());
    }
}

TEST_F(DamagedFileTest, TheReasonWhyAFileCannotBeOpenedIsNested) {
    const std::string loop = moFolder.GetPath("loop.gpkg"), locked = Write("GPKG", "locked.gpkg");
    fs::create_symlink(loop, loop);
    CPLSetThreadLocalConfigOption("SQLITE_BUSY_TIMEOUT", "0");
    GDALDatasetUniquePtr poOwner = OpenForUpdate(locked);
    poOwner->ExecuteSQL("BEGIN EXCLUSIVE", nullptr, nullptr);
    for (const std::string& path :
         {moFolder.GetPath("none"), moFolder.GetPath(""), loop, locked,
          moFolder.WriteFile("empty.shp", ""), moFolder.WriteFile("a.txt", "a text")})
        EXPECT_EQ(Load(path), "");
    poOwner.reset();
    CPLSetThreadLocalConfigOption("SQLITE_BUSY_TIMEOUT", nullptr);
    const std::string gml = Write("GML", "a.gml");
    CPLPopErrorHandler();       // GDAL would lose it
    GDALDestroyDriverManager(); // and the settings with it
    CPLPushErrorHandler(CPLQuietErrorHandler);
    moTranscript.moHost = DescribeHost();
    CPLSetThreadLocalConfigOption("GDAL_SKIP", "GML");
    EXPECT_EQ(Load(gml), "");
    EXPECT_EQ(GetGDALDriverManager()->GetDriverCount(), 7) << "those of the formats, no others";
    CPLSetThreadLocalConfigOption("GDAL_SKIP", nullptr);
    EXPECT_EQ(Load(gml), "0 1 2 3 ");
}

const std::string kFace = "0\n3DFACE\n10\n0\n20\n0\n30\n0\n11\n0\n21\n1\n31\n1\n12\n1\n22\n0\n"
                          "32\n2\n";
const std::string kBegin = "0\nSECTION\n2\nENTITIES\n", kEnd = "0\nENDSEC\n0\nEOF\n";

std::string Replace(std::string text, const std::string& old, const std::string& by) {
    for (std::size_t n = 0; (n = text.find(old, n)) + 1 != 0; n += by.size())
        text.replace(n, old.size(), by);
    return text;
}

TEST_F(DamagedFileTest, ADrawingThatWouldNeverEndIsRefusedAndNoOther) {
    const std::string whole = kBegin + kFace + kEnd, zero("\0", 1);
    std::ifstream stream(KELM_TIN_DATA_DIR "/../fuzz/regressions/file/endless.dxf");
    std::string endless{std::istreambuf_iterator<char>(stream), {}};
    EXPECT_EQ(endless.size(), 190U);
    for (const std::string& text :
         {endless.substr(1), kBegin + kFace + "8\n9\r", kBegin + kFace + "8\n9\r" + zero,
          kBegin + kFace + "1" + zero + "\n9\n" + kEnd, kBegin + kFace + "8x\n9\n" + kEnd,
          kBegin + kFace + "\n9\n" + kEnd, kBegin + kFace + "8", kBegin + kFace + "8\n",
          std::string("AutoCAD Binary DXF\r\n\x1a\0", 22)})
        EXPECT_EQ(Load(moFolder.WriteFile("a.dxf", text)), "") << text;
    // A block of bytes ends between the two of a line end.
    std::string split = Replace(kBegin + "999\n", "\n", "\r\n");
    split.append(65535 - split.size(), 'x') += Replace("\n" + kFace + kEnd, "\n", "\r\n");
    for (const std::string& text :
         {whole, split, Replace(whole, "\n", "\r\n"), Replace(whole, "\n", "\r"),
          Replace(whole, "10\n", "    10  \n"), "999\na comment\n" + whole, whole + "\n\n \n\x1a",
          Replace(whole, "EOF\n", "EOF"), kBegin + kFace + "0\nENDSEC\n", whole + "x" + zero,
          kBegin + "999\n" + std::string(70000, 'x') + "\n" + kFace + kEnd})
        EXPECT_EQ(Load(moFolder.WriteFile("a.dxf", text)), "0 ") << text.substr(0, 200);
    const File poFile = OpenFile(moFolder.GetPath("a.dxf"));
    ZARLayer_t* poLayer = ZARGetLayer(poFile.get(), 1);
    EXPECT_EQ(ReadShape(poLayer, ZARGetNext(poLayer, -1)),
              (Ring{{0, 0, 0}, {0, 1, 1}, {1, 0, 2}, {0, 0, 0}}));
}

TEST_F(DamagedFileTest, ManyPartsOfAGeodatabaseAreNotComparedWithEachOther) {
    std::string parts = "MULTIPOLYGON Z (((0 0 0,0 9 0,9 0 0,0 0 0),(1 1 0,2 1 0,1 2 0,1 1 0))";
    for (int n = 1; n < 200; ++n)
        parts += ',' + MakeTriangle(20 * n, 0, n).substr(10);
    const File poFile =
        OpenFile(FileTest::Write({{parts + ")"}, wkbMultiPolygon25D}, "OpenFileGDB", "a.gdb"));
    EXPECT_EQ(ZARGetLayer(poFile.get(), 1)->shapeCount, 205)
        << "the hole is no facet; its polygon is cut in six";
}

TEST_F(DamagedFileTest, AGmlKeepsItsVerticalCrsAndItsAxesWhateverTheHostHasSet) {
    const struct {
        const char* mpszCrs;
        const char* mpszName;
        const char* mpszPosition; ///< as the file has it
        double mdfX;
    } cases[] = {
        {"urn:ogc:def:crs,crs:EPSG::28992,crs:EPSG::5709", "NAP height", "9 4", 9},
        {"urn:ogc:def:crs:EPSG::7415", "NAP height", "9 4", 9},
        {"http://www.opengis.net/def/crs/EPSG/0/6697", "JGD2011 (vertical) height", "35 139", 139},
        {"urn:ogc:def:crs:EPSG::31467", "DHDN", "55 35", 35},
    };
    for (const char* pszKey : {"GML_INVERT_AXIS_ORDER_IF_LAT_LONG", "GML_REPORT_COMPD_CS"})
        CPLSetConfigOption(pszKey, "NO");
    for (const auto& [pszCrs, pszName, pszPosition, dfX] : cases) {
        const std::string gml = FormatString(
            "<f:C xmlns:f='f' xmlns:gml='http://www.opengis.net/gml'><gml:featureMember><f:facet>"
            "<f:g><gml:Polygon srsName='%s'><gml:exterior><gml:LinearRing>"
            "<gml:posList srsDimension='3'>%s 1 %s.5 1 0 0 1 %s 1</gml:posList></gml:LinearRing>"
            "</gml:exterior></gml:Polygon></f:g></f:facet></gml:featureMember></f:C>",
            pszCrs, pszPosition, pszPosition, pszPosition);
        const File poFile = OpenFile(moFolder.WriteFile("b.gml", gml));
        ZARLayer_t* poLayer = ZARGetLayer(poFile.get(), 1);
        EXPECT_NE(GetCrs(poLayer).find(pszName), std::string::npos) << GetCrs(poLayer);
        EXPECT_EQ(ReadShape(poLayer, ZARGetNext(poLayer, -1))[0][0], dfX);
    }
    for (const char* pszKey : {"GML_INVERT_AXIS_ORDER_IF_LAT_LONG", "GML_REPORT_COMPD_CS"})
        CPLSetConfigOption(pszKey, nullptr);
}

TEST_F(DamagedFileTest, ALayerWhoseCrsCannotBeReadCountsAsOneWithout) {
    const std::string path = Write("GPKG", "a.gpkg"), shape = Write("ESRI Shapefile", "a.shp");
    Execute(path, "UPDATE gpkg_spatial_ref_sys SET definition = 'PROJCS[\"x\"', "
                  "organization = 'NONE' WHERE srs_id = 32632");
    EXPECT_EQ(Load(path), "0 1 2 3 ");
    moFolder.WriteFile("a.prj", "PROJCS[\"x\"");
    EXPECT_EQ(Load(shape), "0 1 2 3 ");
    Execute(path, "UPDATE gpkg_geometry_columns SET column_name = 'none'");
    EXPECT_EQ(Load(path), "");
    const std::string both = FileTest::Write({{MakeTriangle(0, 0, 0)}}, "GPKG", "b.gpkg", true);
    Execute(both, "UPDATE gpkg_geometry_columns SET column_name = 'none' WHERE table_name <> "
                  "'others'");
    EXPECT_EQ(Load(both), "") << "the first is refused, not passed over";
}

} // namespace
