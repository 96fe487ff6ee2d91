#include "services/exception.h"
#include "services/reporting.h"
#include "services/vectorlayer.h"
#include "tests/support/sheets.h"
#include "tin/tinreader.h"
#include "tin/tinreaderfactory.h"

#include <cpl_conv.h>
#include <cpl_error.h>

namespace kelm::tin::test {

constexpr double NaN = std::numeric_limits<double>::quiet_NaN();
constexpr double FAR = std::numeric_limits<double>::max();
using MapPoint = point2_t<double>;

TEST(BadArguments, OfReadersAreRefused) {
    const char* const good = KELM_TIN_DATA_DIR "/jacksboro.gpkg";
    const auto open = [](const char* name, int layer, double scale = 1, int datum = 2002) {
        return std::unique_ptr<TinReader>(
            TinReaderFactory::CreateTinReader(name, layer, 0, scale, ogc::cs::DatumType(datum)));
    };
    for (const char* name : {"", "/", "%s%n", "/dev/null", static_cast<const char*>(nullptr)})
        EXPECT_THROW(open(name, 1), DataException);
    EXPECT_THROW(open(good, 2), DataException);
    EXPECT_THROW(open(good, 1, 0), ParameterException);
    EXPECT_THROW(open(good, 1, 1, 3000), DataException);
    const auto reader = open(good, -9); // the first layer
    EXPECT_THROW(reader->SetOutputVerticalDatum(ogc::cs::DatumType(1000)), ParameterException);
    EXPECT_THROW(ZARGetNext(nullptr, -1), ParameterException);
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
    EXPECT_THROW(Tin(v, 3, static_cast<Triangle_Id*>(nullptr), 1, 0, 0), DataException);
    EXPECT_THROW(Tin(nullptr, 3, ids, 1, 0, 0), DataException);
    EXPECT_THROW(AabbTree{nullptr}, ParameterException);
    EXPECT_THROW(Triangle{nullptr}, DataException);
    EXPECT_THROW(t.SetVertices(hole), DataException);
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

TEST(BadArguments, ARefusalTellsWhereAndWhatWasExpected) {
    ParameterException kept("", ParameterException::PT_Invalid, "", "", "", "", "", 0);
    DataException plain("", "", "", 0);
    try {
        AabbTree().CreateTree(nullptr);
    } catch (const ParameterException& refusal) {
        kept = refusal;
        plain = refusal;
    }
    EXPECT_EQ(kept.GetParameter(), "poTin");
    EXPECT_TRUE(kept.GetActual().empty() && kept.GetExpected().empty());
    EXPECT_EQ(kept.GetType(), ParameterException::PT_Invalid);
    EXPECT_EQ(plain.GetMessage(), "The TIN used to create AabbTree cannot be empty");
    EXPECT_TRUE(plain.what() == kept.GetMessage() && plain.GetSourcePath() == "tin/aabbtree");
    EXPECT_NE(DataException(plain).GetFunction().find("CreateTree"), std::string::npos);
    EXPECT_GT(ParameterException(kept).GetLine(), 0U);
}

TEST(BadArguments, ATextForTheHostIsNoFormat) {
    static std::string last;
    const std::string text = FormatString("%d %s%%s%%n", 7, std::string(20000, 'x').c_str());
    EXPECT_EQ(text, "7 " + std::string(20000, 'x') + "%s%n");
    CPLPushErrorHandler([](CPLErr, int, const char* pszText) { last = pszText; });
    CPLSetThreadLocalConfigOption("CPL_DEBUG", "TIN");
    tellus::Warning::Warn(text, "tin/tinreader", 12);
    EXPECT_EQ(last, text + " (tin/tinreader:12)");
    tellus::Report::AddInfo(text);
    EXPECT_EQ(last, "TIN: " + text);
    CPLSetThreadLocalConfigOption("CPL_DEBUG", nullptr);
    CPLPopErrorHandler();
}

} // namespace kelm::tin::test
