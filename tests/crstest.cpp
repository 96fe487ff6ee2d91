#include "services/crs.h"
#include "services/exception.h"
#include "services/vectorlayer.h"

#include <gtest/gtest.h>
#include <proj.h>

#include <cmath>
#include <cstdlib>
#include <filesystem>
#include <functional>
#include <limits>
#include <map>
#include <memory>
#include <random>
#include <string>
#include <thread>
#include <vector>

using namespace kelm::ogc;
namespace fs = std::filesystem;

namespace {

using CRSPtr = std::unique_ptr<cs::ICRS>;
using TransformPtr = std::unique_ptr<ct::IMathTransform>;
using Points = std::vector<double>;

constexpr cs::DatumType kOrtho = cs::VD_Orthometric;
constexpr cs::DatumType kEllips = cs::VD_Ellipsoidal;

/// PROJ called directly.
struct Proj {
    Proj() : mpo(proj_context_create()) {}
    ~Proj() { proj_context_destroy(mpo); }
    Proj(const Proj&) = delete;
    Proj& operator=(const Proj&) = delete;

    /// @return WKT 2 of anything that PROJ knows by a short name
    std::string GetWkt(const char* pszName) const {
        PJ* po = proj_create(mpo, pszName);
        std::string text = proj_as_wkt(mpo, po, PJ_WKT2_2019, nullptr);
        proj_destroy(po);
        return text;
    }
    double GetHeight(const std::string& steps, double x, double y, double z) const {
        PJ* po = proj_create(mpo, ("+proj=pipeline " + steps).c_str());
        const double dfHeight = proj_trans(po, PJ_FWD, proj_coord(x, y, z, HUGE_VAL)).xyz.z;
        proj_destroy(po);
        return dfHeight;
    }

    PJ_CONTEXT* mpo;
};

CRSPtr ReadCRS(const std::string& definition) {
    ProjInfo_t oInfo{definition};
    return CRSPtr(ProjectionEngine::GetProjInfoFactory(PE_Default)->CreateCRS(&oInfo));
}

TransformPtr MakeTransform(const std::string& definition, cs::DatumType eFrom, cs::DatumType eTo) {
    const CRSPtr poMap = ReadCRS(definition);
    cs::ICRS* const poBase = poMap->GetHorizontalCRS();
    const CRSPtr poFrom(utils::CreateCompoundCS(poBase, eFrom, cs::LU_Default));
    const CRSPtr poTo(utils::CreateCompoundCS(poBase, eTo, cs::LU_Default));
    EXPECT_EQ(poFrom->GetDimension(), 3);
    return TransformPtr(utils::CreateCRSTransform(poFrom.get(), poTo.get(), 0.0));
}

Points Convert(ct::IMathTransform& oTransform, const Points& source) {
    Points target(source.size());
    oTransform.TransformPoints(source.data(), target.data(),
                               static_cast<unsigned int>(source.size() / 3));
    return target;
}

double ConvertHeight(const std::string& definition, double x, double y, double z,
                     cs::DatumType eFrom = kEllips, cs::DatumType eTo = kOrtho) {
    return Convert(*MakeTransform(definition, eFrom, eTo), {x, y, z})[2];
}

void ExpectRefusal(const std::function<void()>& oCall, const std::vector<std::string>& words) {
    try {
        oCall();
        ADD_FAILURE() << "no exception; expected " << words.front();
    } catch (const kelm::DataException& oException) {
        for (const std::string& word : words)
            EXPECT_NE(oException.GetMessage().find(word), std::string::npos)
                << oException.GetMessage();
    }
}

/// Gives PROJ a data folder of three files, whatever is installed on the machine.
class CRSTest : public testing::Test {
  protected:
    static void SetUpTestSuite() {
        const Proj oProj;
        const fs::path geoid = proj_grid_info("egm96_15.gtx").filename;
        fs::create_directories(Folder());
        fs::create_symlink(proj_context_get_database_path(oProj.mpo), Folder() / "proj.db");
        fs::create_symlink(geoid, Folder() / "egm96_15.gtx");
        fs::create_symlink(geoid, Folder() / "g1999u07.gtx"); // stands in for the true one
        for (const char* pszName : kVariables) {
            if (const char* pszValue = std::getenv(pszName))
                Former()[pszName] = pszValue;
            setenv(pszName, Folder().c_str(), 1);
        }
    }
    static void TearDownTestSuite() {
        for (const char* pszName : kVariables)
            unsetenv(pszName);
        for (const auto& [name, value] : Former())
            setenv(name.c_str(), value.c_str(), 1);
        fs::remove_all(Folder());
    }

    const Proj moProj;
    const std::string moUtm = moProj.GetWkt("EPSG:32616");

  private:
    static constexpr const char* kVariables[] = {"PROJ_DATA", "PROJ_LIB",
                                                 "PROJ_USER_WRITABLE_DIRECTORY"};
    static const fs::path& Folder() {
        static const fs::path folder =
            fs::path(testing::TempDir()) / ("tincrs" + std::to_string(std::random_device()()));
        return folder;
    }
    static std::map<std::string, std::string>& Former() {
        static std::map<std::string, std::string> former;
        return former;
    }
};

const std::string kUtmToEgm96 = "+step +inv +proj=utm +zone=16 +ellps=WGS84 "
                                "+step +inv +proj=vgridshift +grids=egm96_15.gtx +multiplier=1 "
                                "+step +proj=utm +zone=16 +ellps=WGS84";

} // namespace

TEST_F(CRSTest, HeightsAreThoseOfTheGeoidGridAndComeBack) {
    const double x = 738669.216, y = 4045105.427;
    const double dfOrtho = ConvertHeight(moUtm, x, y, 300.0);
    EXPECT_NEAR(dfOrtho, moProj.GetHeight(kUtmToEgm96, x, y, 300.0), 1e-9);
    EXPECT_NEAR(dfOrtho, 330.51, 0.01); // the geoid lies some 30.5 m below the ellipsoid there
    EXPECT_NEAR(ConvertHeight(moUtm, x, y, dfOrtho, kOrtho, kEllips), 300.0, 1e-6);
    EXPECT_EQ(Convert(*MakeTransform(moUtm, kEllips, kOrtho), {}).size(), 0U);
}

TEST_F(CRSTest, XIsEastingOrLongitudeWhateverTheAuthoritySays) {
    const std::string geoid = "+step +proj=unitconvert +xy_in=deg +xy_out=rad "
                              "+step +inv +proj=vgridshift +grids=egm96_15.gtx +multiplier=1";
    EXPECT_NEAR(ConvertHeight(moProj.GetWkt("EPSG:4326"), -84.2, 36.3, 300.0),
                moProj.GetHeight(geoid, -84.2, 36.3, 300.0), 1e-9);
    const std::string tmerc = "+proj=tmerc +lon_0=173 +k=0.9996 +x_0=1600000 +y_0=10000000 "
                              "+ellps=GRS80 ";
    EXPECT_NEAR(ConvertHeight(moProj.GetWkt("EPSG:2193"), 1748735.0, 5427916.0, 100.0),
                moProj.GetHeight("+step +inv " + tmerc +
                                     "+step +inv +proj=vgridshift +grids=egm96_15.gtx "
                                     "+multiplier=1",
                                 1748735.0, 5427916.0, 100.0),
                1e-9);
}

TEST_F(CRSTest, EveryKindOfLayerCRSIsBroughtToTwoDimensions) {
    for (const char* pszName :
         {"EPSG:4979", "EPSG:32616+5773", "EPSG:32616+6360",
          "+proj=utm +zone=16 +datum=WGS84 +geoidgrids=egm96_15.gtx +type=crs"}) {
        const CRSPtr poCRS = ReadCRS(moProj.GetWkt(pszName));
        EXPECT_EQ(poCRS->GetDimension(), 2) << pszName;
        EXPECT_FALSE(utils::IsCRSLocal(poCRS.get())) << pszName;
    }
    const double x = 738669.0, y = 4045105.0;
    const double dfOrtho = ConvertHeight(moUtm, x, y, 300.0);
    // The layer's own geoid, own unit of ellipsoidal heights and own datum shift are used.
    EXPECT_NEAR(ConvertHeight(moProj.GetWkt("+proj=utm +zone=16 +datum=WGS84 +vunits=us-ft "
                                            "+geoidgrids=egm96_15.gtx +type=crs"),
                              x, y, 300.0),
                dfOrtho * 3937.0 / 1200.0, 1e-6);
    EXPECT_NEAR(
        ConvertHeight(moProj.GetWkt("+proj=utm +zone=16 +ellps=WGS84 +towgs84=0,0,100 +type=crs"),
                      x, y, 300.0) -
            dfOrtho,
        100.0 * std::sin(36.52 * 3.14159265 / 180.0), 0.01);
    std::string feet = moProj.GetWkt("EPSG:4979");
    const std::string metre = "LENGTHUNIT[\"metre\",1]";
    feet.replace(feet.rfind(metre), metre.size(), "LENGTHUNIT[\"foot\",0.3048]");
    feet.erase(feet.rfind("USAGE["));
    feet.erase(feet.rfind(',')) += "]";
    EXPECT_NEAR(ConvertHeight(feet, -84.2, 36.3, 1000.0),
                ConvertHeight(moProj.GetWkt("EPSG:4326"), -84.2, 36.3, 304.8), 1e-6);
}

TEST_F(CRSTest, EqualHeightsPassBitForBitEvenIfNothingCouldConvertThem) {
    const double dfOdd = 0.1 + 0.2;
    for (const char* pszName : {"EPSG:32616+6360", "EPSG:32616+3855", "EPSG:26916"})
        for (const cs::DatumType eDatum : {kOrtho, kEllips})
            EXPECT_EQ(ConvertHeight(moProj.GetWkt(pszName), dfOdd, 1e7, dfOdd, eDatum, eDatum),
                      dfOdd);
}

TEST_F(CRSTest, AMissingGridIsNamedAndNeverReplaced) {
    ExpectRefusal([&] { MakeTransform(moProj.GetWkt("EPSG:32616+3855"), kEllips, kOrtho); },
                  {"EGM2008 height", "us_nga_egm08_25.tif", "ellipsoidal"});
    ExpectRefusal(
        [&] {
            MakeTransform(moProj.GetWkt("+proj=utm +zone=16 +datum=WGS84 +geoidgrids=no.gtx "
                                        "+type=crs"),
                          kOrtho, kEllips);
        },
        {"no.gtx"});
    // An operation without grid exists for all of North America; a better one for Tennessee.
    ExpectRefusal([&] { ConvertHeight(moProj.GetWkt("EPSG:26916"), 738669.0, 4000000.0, 300.0); },
                  {"1 of 1 points", "us_noaa_TN.tif", "5 m"});
    // Only the southern one of two zones has its grid.
    const TransformPtr po = MakeTransform(moProj.GetWkt("EPSG:32616+5703"), kEllips, kOrtho);
    EXPECT_NEAR(Convert(*po, {738669.0, 4045105.0, 300.0})[2], 330.5, 1.5);
    ExpectRefusal(
        [&] {
            Convert(*po, {738669.0, 4745105.0, 250.0});
        },
        {"y 4745105, z 250", "us_noaa_g1999u03.tif"});
}

TEST_F(CRSTest, NoStepComesBetweenThePointsOfOneCall) {
    // The two shifts for Czechia and Slovakia, equally accurate in plan, are 45 m apart in height.
    // Their areas overlap in Slovakia's west, and one for both countries is less accurate.
    const TransformPtr po = MakeTransform(moProj.GetWkt("EPSG:5514"), kEllips, kOrtho);
    const Points slovakia = {-500000, -1240000, 300,      -500000, -1220000,
                             300,     -400000,  -1240000, 300};
    const Points together = Convert(*po, slovakia);
    for (std::size_t i = 5; i < together.size(); i += 3)
        EXPECT_NEAR(together[i], together[2], 5.0);
    ExpectRefusal(
        [&] {
            Convert(*po, {-500000, -1260000, 300, -750000, -1040000, 300});
        },
        {"2 of 2 points", "S-JTSK to WGS 84 (4)", "S-JTSK to WGS 84 (5)"});
}

TEST_F(CRSTest, AGuessIsRefused) {
    ExpectRefusal(
        [&] {
            MakeTransform(moProj.GetWkt("+proj=utm +zone=16 +ellps=WGS84 +type=crs"), kEllips,
                          kOrtho);
        },
        {"No conversion", "EGM96 height"});
}

TEST_F(CRSTest, PointsThatCannotBeConvertedAreCountedAndTheFirstIsTold) {
    const double dfNaN = std::numeric_limits<double>::quiet_NaN();
    const TransformPtr poWorld = MakeTransform(moProj.GetWkt("EPSG:4326"), kEllips, kOrtho);
    ExpectRefusal(
        [&] {
            Convert(*poWorld, {10, 50, 1, 10, 150, 2, 10, 151, 3});
        },
        {"2 of 3 points", "x 10, y 150, z 2", "outside grid"});
    ExpectRefusal([&] { Convert(*poWorld, {10, 50, 1, 11, 50, dfNaN}); }, {"1 of 2", "x 11"});
    ExpectRefusal([&] { Convert(*poWorld, {10, 50, -3.4e38}); }, {"height"});
    ExpectRefusal([&] { Convert(*poWorld, {1e300, 1e300, 1}); }, {"1 of 1"});
    const TransformPtr poZealand = MakeTransform(moProj.GetWkt("EPSG:2193"), kEllips, kOrtho);
    ExpectRefusal(
        [&] {
            Convert(*poZealand, {1748735, 5427916, 1, 1748735, 9000000, 2});
        },
        {"1 of 2 points", "area of use"});
}

TEST_F(CRSTest, LayersWithoutAPlaceOnTheEarthAreLocal) {
    const std::string local = "LOCAL_CS[\"site\",UNIT[\"metre\",1]]";
    const std::string undefined =
        "GEOGCS[\"Undefined geographic SRS\",DATUM[\"unknown\",SPHEROID[\"unknown\",6378137,"
        "298.257223563]],PRIMEM[\"Greenwich\",0],UNIT[\"degree\",0.0174532925199433]]";
    for (const std::string& definition : {std::string(), local, undefined}) {
        const CRSPtr poCRS = ReadCRS(definition);
        EXPECT_TRUE(utils::IsCRSLocal(poCRS.get()));
        EXPECT_EQ(poCRS->GetDimension(), 2);
        const auto eAny = static_cast<cs::DatumType>(2345);
        EXPECT_EQ(ConvertHeight(definition, 1.0, 2.0, 0.1, eAny, eAny), 0.1);
        const TransformPtr po = MakeTransform(definition, kEllips, kOrtho);
        ExpectRefusal([&] { Convert(*po, {1.0, 2.0, 3.0}); }, {"local"});
    }
    EXPECT_TRUE(utils::IsCRSLocal(nullptr));
}

TEST_F(CRSTest, UnfitArgumentsAreRefusedWithTheirNames) {
    ExpectRefusal([] { ReadCRS("no CRS at all"); }, {"no CRS at all"});
    ExpectRefusal([&] { ReadCRS(moProj.GetWkt("EPSG:4978")); }, {"WGS 84", "geocentric"});
    ExpectRefusal([&] { ReadCRS(moProj.GetWkt("EPSG:5773")); }, {"EGM96 height", "vertical"});
    ExpectRefusal([&] { MakeTransform(moUtm, static_cast<cs::DatumType>(2003), kEllips); },
                  {"2003"});
    const CRSPtr poMap = ReadCRS(moUtm);
    const CRSPtr poLocal(utils::CreateCompoundCS(ReadCRS("").get(), kOrtho, cs::LU_Default));
    const CRSPtr poUtm3(utils::CreateCompoundCS(poMap.get(), kOrtho, cs::LU_Default));
    EXPECT_EQ(poUtm3->GetHorizontalCRS()->GetDimension(), 2);
    ExpectRefusal([&] { utils::CreateCompoundCS(nullptr, kOrtho, cs::LU_Default); }, {"NULL"});
    ExpectRefusal([&] { utils::CreateCRSTransform(poMap.get(), poUtm3.get(), 0.0); }, {"poSource"});
    ExpectRefusal([&] { utils::CreateCRSTransform(poUtm3.get(), poLocal.get(), 0.0); }, {"local"});
}

TEST_F(CRSTest, ThreadsWithTransformsOfTheirOwnAgree) {
    const double dfExpected = ConvertHeight(moUtm, 738669.0, 4045105.0, 300.0);
    std::vector<double> heights(4, 0.0);
    std::vector<std::thread> threads;
    for (double& dfHeight : heights)
        threads.emplace_back([&] {
            for (int i = 0; i < 5; ++i)
                dfHeight = ConvertHeight(moUtm, 738669.0, 4045105.0, 300.0);
        });
    for (std::thread& oThread : threads)
        oThread.join();
    EXPECT_EQ(heights, std::vector<double>(4, dfExpected));
}
