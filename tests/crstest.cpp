#include "services/crs.h"
#include "services/vectorlayer.h"
#include "tests/support/refusal.h"
#include "tests/support/temporaryfolder.h"
#include "tests/support/transcript.h"

#include <gtest/gtest.h>
#include <proj.h>

#include <cmath>
#include <memory>
#include <vector>

using namespace kelm::ogc;
using kelm::test::GetRefusal, kelm::test::IsLike;

namespace {

using CRSPtr = std::unique_ptr<cs::ICRS>;
using PjPtr = std::unique_ptr<PJ, decltype(&proj_destroy)>;
using Points = std::vector<double>;

constexpr cs::DatumType kOrtho = cs::VD_Orthometric;
constexpr cs::DatumType kEllips = cs::VD_Ellipsoidal;

/// A data folder of PROJ of three files, from now on, whatever the machine has.
struct DataFolder : kelm::test::TemporaryFolder {
    DataFolder() {
        using std::filesystem::create_symlink;
        const std::string geoid = proj_grid_info("egm96_15.gtx").filename;
        create_symlink(geoid, GetPath("egm96_15.gtx"));
        create_symlink(geoid, GetPath("g1999u07.gtx")); // in place of the true one
        create_symlink(proj_context_get_database_path(nullptr), GetPath("proj.db"));
        for (const char* pszName : {"PROJ_DATA", "PROJ_LIB", "PROJ_USER_WRITABLE_DIRECTORY"})
            setenv(pszName, GetPath("").c_str(), 1);
        proj_log_level(nullptr, PJ_LOG_NONE);
    }
};

struct CRSTest : testing::Test {
    static void SetUpTestSuite() { static const DataFolder oFolder; }
    kelm::test::Transcript moTranscript;
};

/// @param text anything that PROJ takes for a CRS, and is handed on as WKT; or any other text
CRSPtr ReadCRS(const std::string& text) {
    const PjPtr po(proj_create(nullptr, text.c_str()), proj_destroy);
    ProjInfo_t oInfo{po ? proj_as_wkt(nullptr, po.get(), PJ_WKT2_2019, nullptr) : text};
    return CRSPtr(ProjectionEngine::GetProjInfoFactory(PE_Default)->CreateCRS(&oInfo));
}

CRSPtr MakeCompound(const CRSPtr& poMap, cs::DatumType eDatum) {
    return CRSPtr(utils::CreateCompoundCS(poMap->GetHorizontalCRS(), eDatum, cs::LU_Default));
}

/// @return the height of the first point
double Convert(const std::string& crs, const Points& points, cs::DatumType eFrom = kEllips,
               cs::DatumType eTo = kOrtho) {
    const CRSPtr poMap = ReadCRS(crs);
    const CRSPtr poFrom = MakeCompound(poMap, eFrom), poTo = MakeCompound(poMap, eTo);
    EXPECT_EQ(poMap->GetDimension() + 1, poFrom->GetDimension()) << crs;
    Points target(points.size() + 3);
    std::unique_ptr<ct::IMathTransform>(utils::CreateCRSTransform(poFrom.get(), poTo.get(), 0.0))
        ->TransformPoints(points.data(), target.data(), static_cast<unsigned>(points.size() / 3));
    return target[2];
}

const std::string kFromUtm = "+proj=pipeline +step +inv +proj=utm +zone=16 +ellps=WGS84 ";
const std::string kFromDegrees = "+proj=pipeline +step +proj=unitconvert +xy_in=deg +xy_out=rad ";
const struct {
    const char* mpszCRS;
    double x, y;
    std::string moSteps; ///< of PROJ, from there to the geoid grid
    double mdfUnit = 1;  ///< of ellipsoidal heights, in metres
    const char* mpszAccuracy = "1 m";
} kConversions[] = {
    {"EPSG:32616", 738669, 4045105, kFromUtm},
    {"EPSG:4326", -84.2, 36.3, kFromDegrees}, // x is the longitude, whatever the authority says
    {"EPSG:2193", 1748735, 5427916,
     "+proj=pipeline +step +inv +proj=tmerc +lon_0=173 +k=0.9996 +x_0=1600000 +y_0=10000000 "
     "+ellps=GRS80 ",
     1, "3 m"},
    {"+proj=longlat +datum=WGS84 +vunits=ft +type=crs", -84.2, 36.3, kFromDegrees, 0.3048},
    {"+proj=utm +zone=16 +ellps=WGS84 +towgs84=0,0,100 +type=crs", 738669, 4045105,
     kFromUtm + "+step +proj=cart +step +proj=helmert +z=100 +step +inv +proj=cart ", 1,
     "unknown"}};

// A * stands for texts of PROJ and its database.
const std::string kGuess = "projoperation: No conversion from '* with ellipsoidal heights to '",
                  kFirst = "points cannot be converted, the first at x ",
                  kWithout = "; not usable without us_noaa_",
                  kEgm96 = "; grids: us_nga_egm96_15.tif (*/egm96_15.gtx)",
                  kHeights = "TIN: Heights in *: '*', accuracy ",
                  kWorld = kHeights + "1 m" + kEgm96;
const struct {
    const char* mpszCRS;
    Points moPoints; ///< empty: there is no transform at all
    std::string moRefusal;
    std::string moNotes = "";
} kRefusals[] = {
    {"no CRS at all",
     {},
     "projsession: The text is no coordinate reference system that can be read: no CRS at all "
     "(PROJ: *)"},
    {"EPSG:4978",
     {},
     "projcrs: The coordinate reference system 'WGS 84' is geocentric; a layer needs one with map "
     "coordinates"},
    {"EPSG:5773",
     {},
     "projcrs: The coordinate reference system 'EGM96 height' is vertical only; a layer needs one "
     "with map coordinates"},
    {"",
     {1, 2, 3},
     "projtransform: Heights of a local coordinate reference system cannot be brought to another "
     "vertical datum"},
    {"EPSG:32616+3855",
     {},
     kGuess + "* + EGM2008 height': grid files are missing: '*' (accuracy 1 m, World) needs "
              "us_nga_egm08_25.tif (https://*)"},
    {"+proj=utm +zone=16 +datum=WGS84 +geoidgrids=no.gtx +type=crs",
     {},
     kGuess + "*': grid files are missing: '*' (accuracy unknown, World) needs no.gtx"},
    {"+proj=utm +zone=16 +ellps=WGS84 +type=crs",
     {},
     kGuess + "* + EGM96 height': PROJ has no operation that is more than a guess"},
    // An operation without grid exists for all of North America; a better one for Tennessee.
    {"EPSG:26916",
     {738669, 4e6, 300},
     "projtransform: 1 of 1 " + kFirst +
         "738669, y 4000000, z 300: '*' (accuracy 5 m) needs "
         "us_noaa_TN.tif (https://*), which is not installed",
     kHeights + "5 m" + kEgm96 + ", us_noaa_*.tif (https://*)" + kWithout + "*" + kHeights + "9 m" +
         kEgm96 + '\n'},
    // Of two zones only the southern one has its grid.
    {"EPSG:32616+5703",
     {738669, 4745105, 250},
     "projtransform: 1 of 1 " + kFirst +
         "738669, y 4745105, z 250: '*' (accuracy 2.05 m) needs "
         "us_noaa_g1999u03.tif (https://*), which is not installed",
     kHeights + "2.05 m; grids: us_noaa_g1999u07.tif (*/g1999u07.gtx)\n" + kHeights +
         "2.05 m; grids: us_noaa_g1999u03.tif (https://*)" + kWithout +
         "g1999u03.tif (https://*)\n" + kHeights + "4.015 m; *" + kWithout +
         "g2018u0.tif (https://*)\n" + kHeights + "unknown; *\n"},
    // The shifts for Czechia and Slovakia, equally accurate in plan, are 45 m apart in height.
    {"EPSG:5514",
     {-5e5, -1.26e6, 300, -7.5e5, -1.04e6, 300},
     "projtransform: 2 of 2 " + kFirst +
         "-500000, y -1260000, z 300: no operation serves all of them at the accuracy that is to "
         "be "
         "had: '*84 (4)*' (accuracy 3 m, Slovakia.) holds 1; '*84 (5)*' (accuracy 3 m, Czechia.) "
         "holds 1; '*84 (3)*' (accuracy 13 m, Czechia; Slovakia.) holds 2",
     kHeights + "3 m" + kEgm96 + '\n' + kHeights + "3 m" + kEgm96 + '\n' + kHeights + "13 m" +
         kEgm96 + '\n'},
    {"EPSG:4326",
     {10, 50, 1, 10, 150, 2, 10, 151, 3},
     "projtransform: 2 of 3 " + kFirst + "10, y 150, z 2: '*' fails: *outside grid",
     kWorld + '\n'},
    {"EPSG:4326",
     {10, 50, 1, 11, 50, std::nan(""), 10, 50, -3.4e38},
     "projtransform: 2 of 3 " + kFirst +
         "11, y 50, z nan: a coordinate is not finite, or the "
         "height is none on the earth",
     kWorld + '\n'},
    {"EPSG:2193",
     {1748735, 5427916, 1, 1748735, 9e6, 2},
     "projtransform: 1 of 2 " + kFirst +
         "1748735, y 9000000, z 2: outside the area of use of "
         "every operation",
     kHeights + "3 m" + kEgm96 + '\n'}};

} // namespace

TEST_F(CRSTest, HeightsAreThoseOfTheGeoidGridAndComeBack) {
    for (const auto& [pszCRS, x, y, steps, dfUnit, accuracy] : kConversions) {
        const std::string geoid = "+step +inv +proj=vgridshift +grids=egm96_15.gtx +multiplier=1";
        const PjPtr po(proj_create(nullptr, (steps + geoid).c_str()), proj_destroy);
        const PJ_COORD oSource = proj_coord(x, y, 300 * dfUnit, HUGE_VAL);
        const double dfHeight = Convert(pszCRS, {x, y, 300});
        EXPECT_NEAR(dfHeight, proj_trans(po.get(), PJ_FWD, oSource).xyz.z, 1e-6);
        EXPECT_NEAR(Convert(pszCRS, {x, y, dfHeight}, kOrtho, kEllips), 300, 1e-5) << pszCRS;
        const std::string note = kHeights + accuracy + kEgm96 + '\n';
        EXPECT_TRUE(IsLike(moTranscript.Take(), note + note));
    }
    EXPECT_NEAR(Convert("EPSG:32616+5703", {738669, 4045105, 300}), 330.5, 1.5) << "NAD83";
    EXPECT_TRUE(IsLike(moTranscript.Take(), "TIN: Heights in *\nTIN: 1 heights by '*HARN*(7)*'\n"));
}

TEST_F(CRSTest, WhatCannotBeConvertedIsRefusedAndNamed) {
    const auto Refuse = [](const auto& work) { return GetRefusal(work).substr(17); };
    for (const auto& [pszCRS, points, refusal, notes] : kRefusals) {
        EXPECT_TRUE(IsLike(Refuse([&, &p = points, &c = pszCRS] { Convert(c, p); }), refusal));
        EXPECT_TRUE(IsLike(moTranscript.Take(), notes)) << pszCRS;
    }
    struct : cs::ICRS {
        int GetDimension() const override { return 3; }
        ICRS* GetHorizontalCRS() const override { return nullptr; }
    } oForeign;
    const CRSPtr poUtm = ReadCRS("EPSG:32616"), po3D = MakeCompound(poUtm, kOrtho);
    const CRSPtr poLocal = MakeCompound(ReadCRS(""), kOrtho);
    const auto Transform = [&](const cs::ICRS* poSource, const cs::ICRS* poTarget) {
        return Refuse([&] { utils::CreateCRSTransform(poSource, poTarget, 0.0); });
    };
    EXPECT_EQ(Transform(po3D.get(), poLocal.get()),
              "crs: There is no transform between a local coordinate reference system and one of "
              "the earth");
    EXPECT_EQ(Transform(poUtm.get(), po3D.get()),
              "crs: poSource=of two dimensions!of three dimensions: poSource must be of three "
              "dimensions, but is of two dimensions");
    EXPECT_EQ(Transform(po3D.get(), nullptr),
              "crs: poTarget=NULL!non-NULL: poTarget must be non-NULL, but is NULL");
    EXPECT_EQ(
        Refuse([&] { utils::IsCRSLocal(&oForeign); }),
        "crs: poCRS=of another implementation!a CRS of these services: poCRS must be a CRS of "
        "these services, but is of another implementation");
    EXPECT_EQ(Refuse([&] {
                  utils::CreateCompoundCS(poUtm.get(), kOrtho, static_cast<cs::LinearUnitType>(7));
              }),
              "crs: eUnit=7!LU_Default: eUnit must be LU_Default, but is 7");
    EXPECT_EQ(Refuse([] { ProjectionEngine::GetProjInfoFactory(PE_Default)->CreateCRS(nullptr); }),
              "crs: poInfo=NULL!non-NULL: poInfo must be non-NULL, but is NULL");
}

TEST_F(CRSTest, EqualHeightsPassBitForBitEvenIfNothingCouldConvertThem) {
    const char* pszUndefined = R"(GEOGCS["Undefined geographic SRS",DATUM["unknown",SPHEROID)"
                               R"(["x",6378137,298]],PRIMEM["x",0],UNIT["degree",0.017]])";
    for (const std::string crs :
         {"", pszUndefined, "LOCAL_CS[\"site\"]", "EPSG:32616+3855", "EPSG:26916"}) {
        const bool bLocal = crs[0] != 'E';
        EXPECT_EQ(utils::IsCRSLocal(ReadCRS(crs).get()), bLocal) << crs;
        const auto eDatum = bLocal ? static_cast<cs::DatumType>(2345) : kOrtho;
        EXPECT_EQ(Convert(crs, {0.3, 1e7, 0.1 + 0.2}, eDatum, eDatum), 0.1 + 0.2) << crs;
    }
}
