#include "services/exception.h"
#include "services/vectorlayer.h"
#include "tests/support/layerreader.h"
#include "tests/support/layerwriter.h"
#include "tests/support/temporaryfolder.h"
#include "tests/support/warninglog.h"

#include <cpl_conv.h>
#include <cpl_vsi.h>
#include <gdal_priv.h>
#include <gtest/gtest.h>
#include <netinet/in.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <thread>

using namespace kelm::test;
namespace fs = std::filesystem;

namespace {

std::string GetContent(const std::string& path) {
    std::ifstream oStream(path, std::ios::binary);
    return {std::istreambuf_iterator<char>(oStream), {}};
}

std::string GetFault(const std::string& path) {
    try {
        OpenFile(path);
    } catch (const kelm::DataException& oException) {
        return oException.what();
    }
    return {};
}

class HostileFile : public testing::Test {
  protected:
    /// Writes triangles in a row.
    std::string Write(const std::string& name, const std::string& format, int nCount) const {
        LayerText oLayer;
        oLayer.meType = wkbPolygon25D;
        for (int n = 0; n < nCount; ++n)
            oLayer.moGeometries.push_back(MakeTriangle(n, 0, n));
        return WriteLayer(moFolder.GetPath(name), format, oLayer);
    }

    TemporaryFolder moFolder;
    WarningLog moLog;
};

TEST_F(HostileFile, WhatIsNoLocalFileOfAKnownFormatIsRefusedByName) {
    const std::string point = R"({"type":"Point","coordinates":[1,2]})";
    const std::string vsimem = "/vsimem/store.geojson";
    VSIFCloseL(VSIFileFromMemBuffer(vsimem.c_str(),
                                    reinterpret_cast<GByte*>(const_cast<char*>(point.data())),
                                    point.size(), FALSE));
    const std::string shape = Write("a.shp", "ESRI Shapefile", 1);
    fs::create_directory(moFolder.GetPath("empty.gdb"));
    ASSERT_EQ(mkfifo(moFolder.GetPath("pipe.geojson").c_str(), 0600), 0);
    for (const std::string& name :
         {point, vsimem, "GeoJSON:" + shape, "/vsizip/" + shape, std::string("PG:dbname=x"),
          std::string("http://127.0.0.1:9/a.geojson"), moFolder.GetPath(""),
          moFolder.GetPath("empty.gdb"), moFolder.GetPath("pipe.geojson"),
          moFolder.GetPath("none.gpkg"), moFolder.GetPath(std::string(4096, 'n')),
          moFolder.WriteFile("empty.gpkg", ""), moFolder.WriteFile("text.gpkg", "no database"),
          moFolder.WriteFile("a.vrt", "<OGRVRTDataSource><OGRVRTLayer name=\"a\"><SrcDataSource>" +
                                          shape +
                                          "</SrcDataSource></OGRVRTLayer></OGRVRTDataSource>")}) {
        const std::string fault = GetFault(name);
        EXPECT_NE(fault.find("The file " + name + " cannot be opened"), std::string::npos) << name;
        EXPECT_NE(fault.find("GeoPackage"), std::string::npos) << fault;
    }
    EXPECT_THROW(ZAROpen(nullptr, "r"), kelm::DataException);
    EXPECT_THROW(ZAROpen("", "r"), kelm::DataException);
    EXPECT_THROW(ZAROpen(shape.c_str(), "w"), kelm::DataException);
    VSIUnlink(vsimem.c_str());
}

/// A socket that listens on this machine.
struct Listener {
    Listener() {
        moAddress.sin_family = AF_INET;
        moAddress.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
        socklen_t nLength = sizeof moAddress;
        auto* poAddress = reinterpret_cast<sockaddr*>(&moAddress);
        EXPECT_EQ(bind(mnSocket, poAddress, nLength) | listen(mnSocket, 1) |
                      getsockname(mnSocket, poAddress, &nLength),
                  0);
    }
    ~Listener() { close(mnSocket); }
    std::string GetUrl() const {
        return "http://127.0.0.1:" + std::to_string(ntohs(moAddress.sin_port)) + "/x";
    }
    bool WasCalled() const { return accept(mnSocket, nullptr, nullptr) >= 0; }

    int mnSocket = socket(AF_INET, SOCK_STREAM | SOCK_NONBLOCK, 0);
    sockaddr_in moAddress{};
};

TEST_F(HostileFile, AFileMakesTheStoreNeitherConnectNorOpenOthersNorWrite) {
    const Listener oListener;
    const std::string link = R"("crs":{"type":"link","properties":{"type":"ogcwkt","href":")" +
                             oListener.GetUrl() + "\"}}";
    const std::string head = R"({"type":"FeatureCollection",)";
    const std::string feature = R"("features":[{"type":"Feature","properties":{},"geometry":{)"
                                R"("type":"Polygon","coordinates":[[[0,0,1],[1,0,1],[0,1,1]]])";
    ReadLayer(moFolder.WriteFile("a.geojson", head + link + "," + feature + "}}]}"));
    const FilePtr poPartly =
        OpenFile(moFolder.WriteFile("b.geojson", head + feature + "," + link + "}}]}"));
    EXPECT_THROW(ZARGetLayer(poPartly.get(), 1), kelm::DataException);

    std::string text = GetContent(Write("clean.gml", "GML", 1));
    text.insert(text.find("?>") + 2,
                "<!DOCTYPE c [<!ENTITY % e SYSTEM \"" + oListener.GetUrl() + "\"> %e;]>");
    const std::string gml = moFolder.WriteFile("a.gml", text);
    moFolder.WriteFile("a.xsd", R"(<xs:schema xmlns:xs="http://www.w3.org/2001/XMLSchema">)"
                                R"(<xs:include schemaLocation=")" +
                                    oListener.GetUrl() + R"("/></xs:schema>)");
    CPLSetConfigOption("GML_PARSER", "XERCES");
    EXPECT_EQ(ReadLayer(gml).mnCount, 1);
    EXPECT_STREQ(CPLGetConfigOption("GML_PARSER", ""), "XERCES") << "the host's choice stands";
    CPLSetConfigOption("GML_PARSER", nullptr);
    EXPECT_FALSE(fs::exists(moFolder.GetPath("a.gfs")));
    EXPECT_FALSE(oListener.WasCalled());
    EXPECT_EQ(moLog.Count("network"), 2) << "both JSON files ask, the GML file does not";

    const std::string other = Write("other.shp", "ESRI Shapefile", 1);
    const std::string database = moFolder.GetPath("spy.sqlite");
    const char* const apszOptions[] = {"SPATIALITE=YES", nullptr};
    GDALDatasetUniquePtr poDatabase(GetGDALDriverManager()->GetDriverByName("SQLite")->Create(
        database.c_str(), 0, 0, 0, GDT_Unknown, const_cast<char**>(apszOptions)));
    if (!poDatabase)
        GTEST_SKIP() << "GDAL is built without the library that reads other files";
    const std::string base = other.substr(0, other.size() - 4);
    poDatabase->ExecuteSQL(
        ("CREATE VIRTUAL TABLE spy USING VirtualShape('" + base + "','UTF-8',0)").c_str(), nullptr,
        nullptr);
    poDatabase.reset();
    EXPECT_EQ(ZARSegCount(OpenFile(database).get(), ZAR_SEGMENT_VECTOR), 0);
}

/// Reads a file that was cut. @return true if it is refused or complete
bool IsSafe(const std::string& path, int nShapes) {
    try {
        const FilePtr poFile = OpenFile(path);
        if (ZARSegCount(poFile.get(), ZAR_SEGMENT_VECTOR) == 0)
            return true;
        const LayerContents oRead = ReadLayer(poFile.get());
        return oRead.mnCount == nShapes &&
               std::none_of(oRead.moRings.begin(), oRead.moRings.end(),
                            [](const Ring& oRing) { return oRing.empty(); });
    } catch (const kelm::DataException&) {
        return true;
    }
}

TEST_F(HostileFile, ATruncatedFileNeverPassesForASmallerSurface) {
    constexpr int knShapes = 400, knCuts = 25;
    for (const auto& [pszFormat, pszName] : {std::pair{"GPKG", "t.gpkg"},
                                             {"ESRI Shapefile", "t.shp"},
                                             {"ESRI Shapefile", "x.shx"},
                                             {"FlatGeobuf", "t.fgb"},
                                             {"GeoJSON", "t.geojson"},
                                             {"GML", "t.gml"},
                                             {"SQLite", "t.sqlite"}}) {
        const std::string path = moFolder.GetPath(pszName);
        const std::string opened = fs::path(path).extension() == ".shx"
                                       ? fs::path(path).replace_extension(".shp").string()
                                       : path;
        Write(fs::path(opened).filename(), pszFormat, knShapes);
        const auto nSize = fs::file_size(path);
        EXPECT_TRUE(IsSafe(opened, knShapes));
        for (unsigned nCut = knCuts; nCut-- > 0;) {
            fs::resize_file(path, nSize * nCut / knCuts);
            EXPECT_TRUE(IsSafe(opened, knShapes)) << pszName << " cut to " << nCut << "/25";
        }
    }
}

void Walk(ZARLayer_t* poLayer) {
    for (int nId = ZARGetNext(poLayer, -1); nId != -1;)
        nId = ZARGetNext(poLayer, nId);
}

TEST_F(HostileFile, AFileThatShrinksWhileItIsOpenEndsTheWalkWithAnException) {
    for (const auto& [pszFormat, pszName] :
         {std::pair{"ESRI Shapefile", "t.shp"}, {"FlatGeobuf", "t.fgb"}}) {
        const std::string path = Write(pszName, pszFormat, 4000);
        const FilePtr poFile = OpenFile(path);
        ZARLayer_t* poLayer = ZARGetLayer(poFile.get(), 1);
        fs::resize_file(path, fs::file_size(path) / 2);
        EXPECT_THROW(Walk(poLayer), kelm::DataException) << pszName;
        EXPECT_THROW(Walk(poLayer), kelm::DataException) << pszName << ", once more";
    }
}

TEST_F(HostileFile, ALayerThatChangesWhileItIsOpenEndsTheWalkWithAnException) {
    const std::string path = Write("change.gpkg", "GPKG", 300);
    const FilePtr poFile = OpenFile(path);
    ZARLayer_t* poLayer = ZARGetLayer(poFile.get(), 1);
    GDALDatasetUniquePtr poOther(GDALDataset::Open(path.c_str(), GDAL_OF_VECTOR | GDAL_OF_UPDATE));
    poOther->ExecuteSQL("DELETE FROM facets WHERE fid > 200", nullptr, nullptr);
    poOther.reset();
    EXPECT_THROW(Walk(poLayer), kelm::DataException);
}

TEST_F(HostileFile, DifferentFilesAreReadOnDifferentThreads) {
    std::vector<std::thread> oThreads;
    for (const auto& [pszFormat, pszName] : {std::pair{"GPKG", "p.gpkg"},
                                             {"ESRI Shapefile", "p.shp"},
                                             {"GeoJSON", "p.geojson"},
                                             {"FlatGeobuf", "p.fgb"}}) {
        const std::string path = Write(pszName, pszFormat, 300);
        oThreads.emplace_back([path] {
            for (int n = 0; n < 5; ++n)
                EXPECT_EQ(ReadLayer(path).mnCount, 300);
        });
    }
    for (std::thread& oThread : oThreads)
        oThread.join();
}

} // namespace
