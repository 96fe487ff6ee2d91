#include "services/crs.h"
#include "services/vectorlayer.h"
#include "tests/support/gdaltranscript.h"
#include "tests/support/temporaryfolder.h"

#include <gtest/gtest.h>
#include <proj.h>

#include <cmath>
#include <functional>
#include <memory>
#include <vector>

using namespace kelm::ogc;

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
    kelm::test::GdalTranscript moTranscript;
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
} kConversions[] = {
    {"EPSG:32616", 738669, 4045105, kFromUtm},
    {"EPSG:4326", -84.2, 36.3, kFromDegrees}, // x is the longitude, whatever the authority says
    {"EPSG:2193", 1748735, 5427916,
     "+proj=pipeline +step +inv +proj=tmerc +lon_0=173 +k=0.9996 +x_0=1600000 +y_0=10000000 "
     "+ellps=GRS80 "},
    // In the Canaries: beside the area of the operation, in that of the CRS.
    {"EPSG:3035", 1835000, 1030000,
     "+proj=pipeline +step +inv +proj=laea +lat_0=52 +lon_0=10 +x_0=4321000 +y_0=3210000 "
     "+ellps=GRS80 "},
    {"+proj=longlat +datum=WGS84 +vunits=ft +type=crs", -84.2, 36.3, kFromDegrees, 0.3048},
    {"+proj=utm +zone=16 +ellps=WGS84 +towgs84=0,0,100 +type=crs", 738669, 4045105,
     kFromUtm + "+step +proj=cart +step +proj=helmert +z=100 +step +inv +proj=cart "}};

const struct {
    const char* mpszCRS;
    Points moPoints; ///< empty: there is no transform at all
} kRefusals[] = {
    {"no CRS at all", {}},
    {"EPSG:4978", {}},
    {"EPSG:5773", {}},
    {"", {1, 2, 3}},
    {"EPSG:32616+3855", {}},
    {"+proj=utm +zone=16 +datum=WGS84 +geoidgrids=no.gtx +type=crs", {}},
    {"+proj=utm +zone=16 +ellps=WGS84 +type=crs", {}},
    // An operation without grid exists for all of North America; a better one for Tennessee.
    {"EPSG:26916", {738669, 4e6, 300}},
    {"EPSG:32616+5703", {738669, 4745105, 250}}, // of two zones only the southern has its grid
    // The shifts for Czechia and Slovakia, equally accurate in plan, are 45 m apart in height.
    {"EPSG:5514", {-5e5, -1.26e6, 300, -7.5e5, -1.04e6, 300}},
    {"EPSG:4326", {10, 50, 1, 10, 150, 2, 10, 151, 3}},
    {"EPSG:4326", {10, 50, 1, 11, 50, std::nan(""), 10, 50, -3.4e38}},
    {"EPSG:2193", {1748735, 5427916, 1, 1748735, 9e6, 2}}};

} // namespace

TEST_F(CRSTest, HeightsAreThoseOfTheGeoidGridAndComeBack) {
    for (const auto& [pszCRS, x, y, steps, dfUnit] : kConversions) {
        const std::string geoid = "+step +inv +proj=vgridshift +grids=egm96_15.gtx +multiplier=1";
        const PjPtr po(proj_create(nullptr, (steps + geoid).c_str()), proj_destroy);
        const PJ_COORD oSource = proj_coord(x, y, 300 * dfUnit, HUGE_VAL);
        const double dfHeight = Convert(pszCRS, {x, y, 300});
        EXPECT_NEAR(dfHeight, proj_trans(po.get(), PJ_FWD, oSource).xyz.z, 1e-6);
        EXPECT_NEAR(Convert(pszCRS, {x, y, dfHeight}, kOrtho, kEllips), 300, 1e-5) << pszCRS;
    }
    EXPECT_NEAR(Convert("EPSG:32616+5703", {738669, 4045105, 300}), 330.5, 1.5) << "NAD83";
}

TEST_F(CRSTest, WhatCannotBeConvertedIsRefusedAndNamed) {
    for (const auto& oRow : kRefusals)
        EXPECT_TRUE(moTranscript.Refuses([&] { Convert(oRow.mpszCRS, oRow.moPoints); }));
    struct : cs::ICRS {
        int GetDimension() const override { return 3; }
        ICRS* GetHorizontalCRS() const override { return nullptr; }
    } oForeign;
    const CRSPtr poUtm = ReadCRS("EPSG:32616"), po3D = MakeCompound(poUtm, kOrtho),
                 poLocal = MakeCompound(ReadCRS(""), kOrtho);
    const auto Transform = [](const CRSPtr& poSource, const CRSPtr& poTarget) {
        utils::CreateCRSTransform(poSource.get(), poTarget.get(), 0.0);
    };
    for (const auto& work : std::vector<std::function<void()>>{
             [&] { Transform(po3D, poLocal); }, [&] { Transform(poUtm, po3D); },
             [&] { Transform(po3D, nullptr); }, [&] { utils::IsCRSLocal(&oForeign); },
             [&] { utils::CreateCompoundCS(poUtm.get(), kOrtho, cs::LinearUnitType(7)); },
             [] { ProjectionEngine::GetProjInfoFactory(PE_Default)->CreateCRS(nullptr); }})
        EXPECT_TRUE(moTranscript.Refuses(work));
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
