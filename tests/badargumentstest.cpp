#include "services/reporting.h"
#include "services/vectorlayer.h"
#include "tests/support/gdaltranscript.h"
#include "tests/support/sheets.h"
#include "tin/tinreader.h"
#include "tin/tinreaderfactory.h"

namespace kelm::tin::test {

constexpr double NaN = std::numeric_limits<double>::quiet_NaN();
constexpr double FAR = std::numeric_limits<double>::max();
using MapPoint = point2_t<double>;

TEST(BadArgumentsTest, OfReadersAreRefused) {
    kelm::test::GdalTranscript transcript;
    transcript.moFolder = KELM_TIN_DATA_DIR;
    const char *const good = KELM_TIN_DATA_DIR "/jacksboro.gpkg", *const none = nullptr;
    const auto open = [](const char* name, int layer, double scale = 1, int datum = 2002) {
        return std::unique_ptr<TinReader>(
            TinReaderFactory::CreateTinReader(name, layer, 0, scale, ogc::cs::DatumType(datum)));
    };
    for (const auto& work : std::vector<std::function<void()>>{
             [&] { open("", 1); }, [&] { open("%s%n", 1); }, [&] { open(none, 1); },
             [&] { open(good, 2); }, [&] { open(good, 1, 0); }, [&] { open(good, 1, NaN); },
             [&] { open(good, 1, -HUGE_VAL); }, [&] { open(good, 1, 1, 3000); },
             [&] { ZARGetNext(nullptr, -1); }, [&] { ZAROpen(good, "r+"); },
             [&] { ZAROpen(good, none); }, [&] { ZAROpen("", "r"); }, [&] { ZAROpen(none, "r"); }})
        EXPECT_TRUE(transcript.Refuses(work));
    EXPECT_EQ(ZARSegNext(nullptr, 116, 0), 0);
    const auto window = MakeBox(MapPoint{NaN, FAR}, MapPoint{1, -FAR});
    EXPECT_EQ(open(good, -9)->Load(&window), nullptr); // the first layer
}

TEST(BadArgumentsTest, OfSurfacesTreesAndTrianglesAreRefusedOrFindNothing) {
    kelm::test::Transcript transcript;
    Mesh mesh;
    mesh.Add({0, 0, 1}, {8, 0, 2}, {0, 8, 3});
    const OpenTin tin = mesh.MakeTin(10, 20);
    Triangle t = *tin.GetTriangle(0);
    Point *const v = tin.GetVertex(0), *const hole[] = {v + 1, v, nullptr};
    for (const auto& work : std::vector<std::function<void()>>{
             [] { AabbTree{nullptr}; }, [] { AabbTree().CreateTree(nullptr); },
             [] { Triangle{nullptr}; }, [&] { t.SetVertices(hole); }})
        EXPECT_TRUE(transcript.Refuses(work));
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

TEST(BadArgumentsTest, ARefusalIsCopiedWholeAndATextForTheHostIsNoFormat) {
    kelm::test::GdalTranscript transcript;
    ParameterException kept("", ParameterException::PT_Invalid, "", "", "", "", "", 0);
    DataException plain("", "", "", 0);
    const ParameterException refusal("p", ParameterException::PT_Invalid, "actual", "expected",
                                     "message", "source", "function", 7);
    kept = refusal;
    plain = refusal;
    transcript.Refuses([&] { throw ParameterException(kept); });
    transcript.Refuses([&] { throw DataException(plain); });
    EXPECT_TRUE(plain.GetFunction() == "function" && DataException(plain).GetLine() == 7);
    const std::string text = FormatString("%d %s%%s%%n", 7, std::string(20000, 'x').c_str());
    EXPECT_EQ(text, "7 " + std::string(20000, 'x') + "%s%n");
    tellus::Warning::Warn(text, "tin/tinreader", 12);
    tellus::Report::AddInfo(text);
    EXPECT_EQ(transcript.Take(), "source: p=actual!expected: message\nsource: message\n" + text +
                                     " (tin/tinreader)\nTIN: " + text + '\n');
}

} // namespace kelm::tin::test
