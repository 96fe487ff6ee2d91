#include "tests/support/filetest.h"

#include <algorithm>

using namespace kelm::test;
namespace fs = std::filesystem;

namespace {

/// What a progress function was told, and when it is to stop.
struct Listener {
    std::vector<double> moShares;
    double mdfStop = 2.0; ///< share from which on it stops
    bool mbThrows = false;

    kelm::tin::Progress Get() { return {&Listener::Hear, this}; }
    static int Hear(double done, const char* message, void* data) {
        auto& self = *static_cast<Listener*>(data);
        EXPECT_NE(message, nullptr);
        self.moShares.push_back(done);
        if (done >= self.mdfStop && self.mbThrows)
            throw std::out_of_range("of the host");
        return done < self.mdfStop;
    }
    void ExpectWhole(std::size_t nLeast) const {
        EXPECT_GE(moShares.size(), nLeast);
        EXPECT_LE(moShares.size(), 500U);
        EXPECT_TRUE(std::is_sorted(moShares.begin(), moShares.end()));
        EXPECT_EQ(moShares.back(), 1.0);
        EXPECT_GE(moShares.front(), 0.0);
    }
};

struct SurveyTest : FileTest {
    /// Triangles, a polygon with a hole, which is cut, one that crosses itself, and a point.
    static LayerText MakeLayer(unsigned nTriangles) {
        LayerText oText{{"POLYGON Z ((0 5 1,9 5 2,9 9 3,0 9 4,0 5 1),(1 6 1,2 6 1,2 7 1,1 6 1))",
                         "POLYGON Z ((0 0 1,1 1 1,1 0 1,0 1 1,0 0 1))", "POINT Z (4 4 4)"}};
        for (unsigned n = 0; n < nTriangles; ++n)
            oText.moGeometries.push_back(MakeTriangle(n % 100, 10 + n / 100, n));
        return oText;
    }
    bool Refuses(const std::string& path, const std::string& survey, int nLayer = 0) {
        return moTranscript.Refuses([&] { OpenSurveyed(path, survey, nLayer); });
    }
    static kelm::tin::LoadOptions With(Listener& oListener) {
        kelm::tin::LoadOptions oOptions;
        oOptions.progress = oListener.Get();
        return oOptions;
    }
};

TEST_F(SurveyTest, OpensWithoutReadingTheLayer) {
    const std::string path = Write(MakeLayer(3), "GPKG", "a.gpkg", true);
    const auto poFirst = OpenReader(path, 2);
    const std::string survey = poFirst->GetSurvey();
    EXPECT_EQ(OpenReader(path)->GetSurvey(), OpenReader(path, 1)->GetSurvey());
    EXPECT_NE(poFirst->GetCRSText().find("UTM zone 32N"), std::string::npos);
    moTranscript.moLines.clear();
    const auto poSecond = OpenSurveyed(path, survey); // the warnings were given once
    EXPECT_EQ(poSecond->GetShapeCount(), poFirst->GetShapeCount());
    EXPECT_EQ(poSecond->GetBBox().max.y, poFirst->GetBBox().max.y);
    EXPECT_EQ(poSecond->GetCRSText(), poFirst->GetCRSText());
    EXPECT_EQ(poSecond->GetSurvey(), survey);
    for (const auto& poReader : {poFirst.get(), poSecond.get()})
        EXPECT_EQ(std::unique_ptr<kelm::tin::Tin>(poReader->Load(nullptr))->GetTriangleCount(),
                  10U);
    Listener oListener;
    OpenSurveyed(path, survey, 2, oListener.Get());
    EXPECT_TRUE(oListener.moShares.empty());
    EXPECT_TRUE(Refuses(path, survey, 1));
}

TEST_F(SurveyTest, AStaleSurveyIsRefused) {
    const std::string path = Write(MakeLayer(9));
    const std::string survey = OpenReader(path)->GetSurvey();
    moTranscript.moLines.clear();
    const auto tNow = fs::last_write_time(path);
    fs::last_write_time(path, tNow + std::chrono::nanoseconds(100));
    EXPECT_TRUE(Refuses(path, survey)); // another time
    fs::last_write_time(path, tNow);
    EXPECT_NE(OpenSurveyed(path, survey), nullptr);
    fs::resize_file(path, fs::file_size(path) + 4096);
    fs::last_write_time(path, tNow);
    EXPECT_TRUE(Refuses(path, survey)); // another size
    fs::resize_file(path, fs::file_size(path) - 4096);
    fs::last_write_time(path, tNow);
    moFolder.WriteFile("a.gpkg-wal", "not empty");
    EXPECT_TRUE(Refuses(path, survey)); // a journal
    fs::remove(path + "-wal");
    fs::rename(path, moFolder.GetPath("b.gpkg"));
    EXPECT_TRUE(Refuses(moFolder.GetPath("b.gpkg"), survey)); // another file
}

TEST_F(SurveyTest, APartOfAShapefileCounts) {
    const std::string path =
        Write({{MakeTriangle(0, 0, 0)}, wkbPolygon25D}, "ESRI Shapefile", "a.shp");
    const std::string survey = OpenReader(path)->GetSurvey();
    const std::string index = moFolder.GetPath("a.shx");
    fs::last_write_time(index, fs::last_write_time(index) - std::chrono::seconds(1));
    EXPECT_TRUE(Refuses(path, survey));
}

TEST_F(SurveyTest, ADamagedSurveyIsRefused) {
    const std::string path = Write({{MakeTriangle(0, 0, 0), MakeTriangle(1, 0, 0)}});
    const std::string survey = OpenReader(path)->GetSurvey();
    for (std::size_t n = 0; n < survey.size(); ++n) {
        std::string other = survey;
        other[n] = char(other[n] ^ 64);
        EXPECT_THROW(OpenSurveyed(path, other), kelm::DataException) << n;
        other.resize(n); // an empty one is none
        EXPECT_TRUE(n == 0 || Refuses(path, other)) << n;
    }
    EXPECT_THROW(OpenSurveyed(path, survey + ' '), kelm::DataException);
    moTranscript.moLines.clear();
    std::string other = survey;
    ++other[other.find("GDAL") + 5];
    EXPECT_TRUE(Refuses(path, other));
    EXPECT_TRUE(Refuses(path, survey.substr(1)));
}

TEST_F(SurveyTest, ProgressOfOpeningAndLoading) {
    for (const auto& [format, name] :
         {std::pair("GPKG", "a.gpkg"), {"GeoJSON", "a.geojson"}, {"FlatGeobuf", "a.fgb"}}) {
        SCOPED_TRACE(format);
        const std::string path = Write(MakeLayer(9000), format, name);
        Listener oSurvey, oLoad, oWindowed;
        const auto poReader = OpenSurveyed(path, "", 0, oSurvey.Get());
        oSurvey.ExpectWhole(3);
        const std::unique_ptr<kelm::tin::Tin> poTin(poReader->Load(nullptr, With(oLoad)));
        oLoad.ExpectWhole(100);
        kelm::tin::BBox<double, point2_t<double>> oWindow;
        oWindow.min = {3, 50};
        oWindow.max = {5, 51};
        delete poReader->Load(&oWindow, With(oWindowed));
        oWindowed.ExpectWhole(4);
    }
    moTranscript.moLines.clear();
}

TEST_F(SurveyTest, AStopLeavesNothingBehind) {
    const std::string path = Write(MakeLayer(9000));
    const auto poReader = OpenReader(path);
    const auto Count = [&] {
        return std::unique_ptr<kelm::tin::Tin>(poReader->Load(nullptr))->GetTriangleCount();
    };
    const unsigned nTriangles = Count();
    for (int nTenth = 0; nTenth <= 10; ++nTenth)
        for (const bool bThrows : {false, true}) {
            Listener oListener;
            oListener.mdfStop = 0.1 * nTenth;
            oListener.mbThrows = bThrows;
            const auto Load = [&] {
                const HostCall oCall;
                delete poReader->Load(nullptr, With(oListener));
            };
            const auto Open = [&] { OpenSurveyed(path, "", 0, oListener.Get()); };
            if (bThrows) {
                EXPECT_THROW(Load(), std::out_of_range);
                EXPECT_THROW(Open(), std::out_of_range);
            } else {
                EXPECT_THROW(Load(), kelm::tin::CancelledException);
                EXPECT_THROW(Open(), kelm::tin::CancelledException);
            }
            EXPECT_EQ(Count(), nTriangles);
        }
    moTranscript.moLines.clear();
    Listener oHalf;
    oHalf.mdfStop = 0.4; // what was met until then is told
    const std::string counted = Write(MakeLayer(9000), "FlatGeobuf", "a.fgb");
    EXPECT_THROW(OpenSurveyed(counted, "", 0, oHalf.Get()), kelm::tin::CancelledException);
}

} // namespace
