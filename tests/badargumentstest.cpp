#include "services/reporting.h"
#include "services/vectorlayer.h"
#include "tests/support/refusal.h"
#include "tests/support/sheets.h"
#include "tests/support/transcript.h"
#include "tin/tinreader.h"
#include "tin/tinreaderfactory.h"

namespace kelm::tin::test {

using kelm::test::GetRefusal;

constexpr double NaN = std::numeric_limits<double>::quiet_NaN();
constexpr double FAR = std::numeric_limits<double>::max();
using MapPoint = point2_t<double>;

TEST(BadArguments, OfReadersAreRefused) {
    kelm::test::Transcript transcript;
    const char* const good = KELM_TIN_DATA_DIR "/jacksboro.gpkg";
    const auto open = [](const char* name, int layer, double scale = 1, int datum = 2002) {
        return std::unique_ptr<TinReader>(
            TinReaderFactory::CreateTinReader(name, layer, 0, scale, ogc::cs::DatumType(datum)));
    };
    const std::string factory = "tin/tinreaderfactory: ", crs = "services/bundled/";
    for (const auto& [name, reason] :
         {std::pair("", "The name of the file to open is empty"),
          {"%s%n",
           "The file %s%n cannot be opened: expected a readable local file of one of the formats "
           "GeoPackage, ESRI Shapefile, FlatGeobuf, GeoJSON, GML, DXF, File Geodatabase, SQLite; "
           "found: No such file or directory"}}) {
        EXPECT_EQ(GetRefusal([&] { open(name, 1); }),
                  factory + "The format of file " + name + " is not supported by ZAR");
        EXPECT_EQ(transcript.Take(), std::string("TIN: ") + reason + '\n');
    }
    EXPECT_EQ(GetRefusal([&] { open(nullptr, 1); }),
              factory + "The name of the file must be non-null");
    EXPECT_EQ(GetRefusal([&] { open(good, 2); }),
              factory + "ZARGetLayer failed on the provided vector layer 2 in the input file " +
                  good + ".");
    EXPECT_EQ(GetRefusal([&] { open(good, 1, 0); }),
              "tin/tinreader: dfScale=0.0!non-zero: The scale parameter may not be zero");
    EXPECT_EQ(GetRefusal([&] { open(good, 1, 1, 3000); }),
              crs + "projcrs: The vertical datum code 3000 is not supported: use VD_Orthometric "
                    "(2001) or VD_Ellipsoidal (2002)");
    const auto reader = open(good, -9); // the first layer
    EXPECT_EQ(GetRefusal([] { ZARGetNext(nullptr, -1); }),
              crs + "vectorlayer: layer=null!: A layer of an open file is needed");
    for (const char* mode : {"r+", static_cast<const char*>(nullptr)})
        EXPECT_EQ(GetRefusal([&] { ZAROpen(good, mode); }),
                  crs + "vectorlayer: mode=" + (mode ? mode : "null") +
                      "!r: The vector layer store opens files for reading only");
    for (const char* name : {"", static_cast<const char*>(nullptr)})
        EXPECT_EQ(GetRefusal([&] { ZAROpen(name, "r"); }),
                  crs + "datasetfile: name=" + (name ? "" : "null") +
                      "!the path of a file: The name of the file to open is empty");
    EXPECT_EQ(ZARSegNext(nullptr, 116, 0), 0);
    const auto window = MakeBox(MapPoint{NaN, FAR}, MapPoint{1, -FAR});
    EXPECT_EQ(reader->Load(&window), nullptr);
}

TEST(BadArguments, OfSurfacesTreesAndTrianglesAreRefusedOrFindNothing) {
    Mesh mesh;
    mesh.Add({0, 0, 1}, {8, 0, 2}, {0, 8, 3});
    const OpenTin tin = mesh.MakeTin(10, 20);
    Triangle t = *tin.GetTriangle(0);
    Triangle_Id ids[1] = {};
    Point *const v = tin.GetVertex(0), *const hole[] = {v + 1, v, nullptr};
    const std::string arrays = "tin/tin: vertices and index triples must be non-null";
    EXPECT_EQ(GetRefusal([&] { Tin(v, 3, static_cast<Triangle_Id*>(nullptr), 1, 0, 0); }), arrays);
    EXPECT_EQ(GetRefusal([&] { Tin(nullptr, 3, ids, 1, 0, 0); }), arrays);
    for (const auto& work : {+[] { AabbTree{nullptr}; }, +[] { AabbTree().CreateTree(nullptr); }})
        EXPECT_EQ(GetRefusal(work),
                  "tin/aabbtree: poTin=!: The TIN used to create AabbTree cannot be empty");
    EXPECT_EQ(GetRefusal([] { Triangle{nullptr}; }), ": vertices must be non-null");
    EXPECT_EQ(GetRefusal([&] { t.SetVertices(hole); }), ": vertices must be non-null");
    EXPECT_TRUE(t.GetVertex(0) == v && tin.GetVertex(3) == nullptr && !tin.GetTriangle(~0U));
    const AabbTree tree(&tin), rootless, *const indices[] = {nullptr, &tree, &rootless};
    float h = UNTOUCHED;
    for (const AabbTree* index : indices) {
        for (const double bad : {NaN, FAR, -FAR}) {
            EXPECT_FALSE(tin.GetHeight(bad, 21.0, h, index) || tin.GetHeight(11.0, bad, h, index));
            const auto box = MakeBox(MapPoint{bad, bad}, MapPoint{-bad, bad});
            const std::unique_ptr<Tin> subset(tin.SubsetByRegion(box, index));
            // Without an index a NaN leaves its side of the region open.
            EXPECT_TRUE(subset == nullptr || (std::isnan(bad) && index == nullptr));
        }
        EXPECT_EQ(tin.SubsetByLineString(static_cast<MapPoint*>(nullptr), 2, index), nullptr);
        EXPECT_EQ(tin.SubsetByLineString(static_cast<Point2*>(nullptr), 2, index), nullptr);
    }
    EXPECT_TRUE(h == UNTOUCHED && !tin.GetHeight(11.0, 21.0, h, &rootless));
    EXPECT_EQ(t.GetGridPointsNum(9, 0) + t.GetGridPointsNum(-9, 9), 0U);
}

TEST(BadArguments, ARefusalIsCopiedWhole) {
    ParameterException kept("", ParameterException::PT_Invalid, "", "", "", "", "", 0);
    DataException plain("", "", "", 0);
    const ParameterException refusal("p", ParameterException::PT_Invalid, "actual", "expected",
                                     "message", "source", "function", 7);
    kept = refusal;
    plain = refusal;
    EXPECT_EQ(GetRefusal([&] { throw ParameterException(kept); }),
              "source: p=actual!expected: message");
    EXPECT_EQ(GetRefusal([&] { throw DataException(plain); }), "source: message");
    EXPECT_TRUE(plain.GetFunction() == "function" && DataException(plain).GetLine() == 7);
}

TEST(BadArguments, ATextForTheHostIsNoFormat) {
    kelm::test::Transcript transcript;
    const std::string text = FormatString("%d %s%%s%%n", 7, std::string(20000, 'x').c_str());
    EXPECT_EQ(text, "7 " + std::string(20000, 'x') + "%s%n");
    tellus::Warning::Warn(text, "tin/tinreader", 12);
    tellus::Report::AddInfo(text);
    EXPECT_EQ(transcript.Take(), text + " (tin/tinreader)\nTIN: " + text + '\n');
}

} // namespace kelm::tin::test
