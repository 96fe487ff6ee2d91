#include "services/crs.h"
#include "services/interpgrid3d.h"
#include "services/vectorlayer.h"
#include "tests/support/gdaltranscript.h"
#include "tests/support/temporaryfolder.h"

#include <ogr_srs_api.h>
#include <proj.h>
#include <proj_experimental.h>

#include <algorithm>
#include <cmath>
#include <limits>

using namespace kelm::ogc;

namespace {

using CRSPtr = std::unique_ptr<cs::ICRS>;
using TransformPtr = std::unique_ptr<ct::IMathTransform>;
using PjPtr = std::unique_ptr<PJ, decltype(&proj_destroy)>;
using Points = std::vector<double>;

constexpr double kNan = std::numeric_limits<double>::quiet_NaN();
constexpr cs::DatumType kOrtho = cs::VD_Orthometric;
constexpr cs::DatumType kEllips = cs::VD_Ellipsoidal;

/// A data folder of PROJ of few files, from now on, whatever the machine has.
struct DataFolder : kelm::test::TemporaryFolder {
    DataFolder() {
        using std::filesystem::create_symlink;
        const std::string geoid = proj_grid_info("egm96_15.gtx").filename;
        const std::string database = proj_context_get_database_path(nullptr);
        create_symlink(geoid, GetPath("egm96_15.gtx"));
        create_symlink(geoid, GetPath("g1999u07.gtx")); // in place of the true one
        create_symlink(std::filesystem::path(geoid).replace_filename("BETA2007.gsb"),
                       GetPath("BETA2007.gsb"));
        create_symlink(database, GetPath("proj.db"));
        create_symlink(geoid, moHostFolder.GetPath("g1999u03.gtx"));
        create_symlink(database, moHostFolder.GetPath("proj.db"));
        for (const char* pszName : {"PROJ_DATA", "PROJ_LIB", "PROJ_USER_WRITABLE_DIRECTORY"})
            setenv(pszName, GetPath("").c_str(), 1);
        proj_log_level(nullptr, PJ_LOG_NONE);
    }
    kelm::test::TemporaryFolder moHostFolder; ///< another one, of which only GDAL is told
};

struct CRSTest : testing::Test {
    static const DataFolder& GetFolder() {
        static const DataFolder oFolder;
        return oFolder;
    }
    static void SetUpTestSuite() { GetFolder(); }
    kelm::test::GdalTranscript moTranscript;
};

/// @param text anything that PROJ takes for a CRS, and is handed on in one of the two forms; or any
/// other text
CRSPtr ReadCRS(const std::string& text, bool bWkt = true) {
    const PjPtr po(proj_create(nullptr, text.c_str()), proj_destroy);
    ProjInfo_t oInfo{!po    ? text
                     : bWkt ? proj_as_wkt(nullptr, po.get(), PJ_WKT2_2019, nullptr)
                            : " \n" + std::string(proj_as_projjson(nullptr, po.get(), nullptr))};
    return CRSPtr(ProjectionEngine::GetProjInfoFactory(PE_Default)->CreateCRS(&oInfo));
}

CRSPtr MakeCompound(const CRSPtr& poMap, cs::DatumType eDatum) {
    return CRSPtr(utils::CreateCompoundCS(poMap->GetHorizontalCRS(), eDatum, cs::LU_Default));
}

TransformPtr MakeTransform(const std::string& crs, cs::DatumType eFrom = kEllips,
                           cs::DatumType eTo = kOrtho, bool bWkt = true) {
    const CRSPtr poMap = ReadCRS(crs, bWkt);
    const CRSPtr poFrom = MakeCompound(poMap, eFrom), poTo = MakeCompound(poMap, eTo);
    EXPECT_EQ(poMap->GetDimension() + 1, poFrom->GetDimension()) << crs;
    return TransformPtr(utils::CreateCRSTransform(poFrom.get(), poTo.get(), 0.0));
}

/// @return the points with their heights converted, and one more
Points Transform(const TransformPtr& poTransform, const Points& points) {
    Points target(points.size() + 3);
    poTransform->TransformPoints(points.data(), target.data(),
                                 static_cast<unsigned>(points.size() / 3));
    return target;
}

/// @return the height of a point by the operation of this name among those that PROJ lists
double AskProj(const std::string& crs, const std::string& name, const Points& points) {
    const PjPtr poMap(proj_create(nullptr, crs.c_str()), proj_destroy),
        poFrom(proj_crs_promote_to_3D(nullptr, nullptr, poMap.get()), proj_destroy),
        poTo(proj_create(nullptr, (crs + "+5773").c_str()), proj_destroy);
    auto* const poSearch = proj_create_operation_factory_context(nullptr, nullptr);
    proj_operation_factory_context_set_spatial_criterion(
        nullptr, poSearch, PROJ_SPATIAL_CRITERION_PARTIAL_INTERSECTION);
    auto* const poList = proj_create_operations(nullptr, poFrom.get(), poTo.get(), poSearch);
    double dfHeight = kNan;
    for (int n = 0; n < proj_list_get_count(poList); ++n) {
        const PjPtr po(proj_list_get(nullptr, poList, n), proj_destroy);
        const PjPtr poOurs(proj_normalize_for_visualization(nullptr, po.get()), proj_destroy);
        const PJ_COORD oPoint = proj_coord(points[0], points[1], points[2], HUGE_VAL);
        if (proj_get_name(po.get()) == name)
            dfHeight = proj_trans(poOurs.get(), PJ_FWD, oPoint).xyz.z;
    }
    proj_list_destroy(poList);
    proj_operation_factory_context_destroy(poSearch);
    return dfHeight;
}

/// @return the height of the first point
template <typename... Arguments>
double Convert(const std::string& crs, const Points& points, Arguments... arguments) {
    return Transform(MakeTransform(crs, arguments...), points)[2];
}

const std::string kFromUtm = "+inv +proj=utm +zone=16 +ellps=WGS84 ";
const std::string kFromWebMercator = "+inv +proj=webmerc +ellps=WGS84 ";
const std::string kFromTennessee =
    "+inv +proj=lcc +lat_0=34.3333333333333 +lon_0=-86 +lat_1=35.25 +lat_2=36.4166666666667 "
    "+x_0=600000 +units=us-ft +vunits=m +ellps=GRS80 ";
const std::string kFromDegrees = "+proj=unitconvert +xy_in=deg +xy_out=rad ";
const struct {
    const char* mpszCRS;
    double x, y;
    std::string moSteps; ///< of PROJ, from there to the geoid grid
    double mdfUnit = 1;  ///< of heights, in metres
} kConversions[] = {
    {"EPSG:32616", 738669, 4045105, kFromUtm},
    {"EPSG:4326", -84.2, 36.3, kFromDegrees}, // x is the longitude, whatever the authority says
    {"EPSG:2193", 1748735, 5427916,
     "+inv +proj=tmerc +lon_0=173 +k=0.9996 +x_0=1600000 +y_0=10000000 +ellps=GRS80 "},
    // In the Canaries: beside the area of the operation, in that of the CRS.
    {"EPSG:3035", 1835000, 1030000,
     "+inv +proj=laea +lat_0=52 +lon_0=10 +x_0=4321000 +y_0=3210000 +ellps=GRS80 "},
    {"+proj=longlat +datum=WGS84 +vunits=ft +type=crs", -84.2, 36.3, kFromDegrees, 0.3048},
    {"+proj=utm +zone=16 +ellps=WGS84 +towgs84=0,0,100 +vunits=ft +type=crs", 738669, 4045105,
     kFromUtm + "+step +proj=cart +step +proj=helmert +z=100 +step +inv +proj=cart ", 0.3048},
    // Positions in feet and no height axis: heights are metres, and a warning says so.
    {"EPSG:2274", 2400000, 700000, kFromTennessee},
    {"EPSG:3857", -9373101, 4344013, kFromWebMercator},
    {"EPSG:3857+5773", 1e6, 7e6, kFromWebMercator},
    // Of 17 ways to WGS 84 and back, most for one state, none moves a height or needs its grid.
    {"EPSG:26916", 738669, 4e6, kFromUtm},
    {"EPSG:4269", -86.8, 36.5, kFromDegrees}, // on the border of two states
    {"EPSG:4807", 2, 54,                      // grades east of Paris
     "+proj=unitconvert +xy_in=grad +xy_out=rad +step +inv +proj=longlat +ellps=clrk80ign "
     "+pm=paris +step +proj=cart +ellps=clrk80ign +step +proj=helmert +x=-168 +y=-60 +z=320 "
     "+step +inv +proj=cart +ellps=WGS84 "},
    // Of these two, one operation shifts positions alone and the other points in space.
    {"EPSG:31467", 3513000, 5403000,
     "+inv +proj=tmerc +lon_0=9 +x_0=3500000 +ellps=bessel +step +proj=hgridshift "
     "+grids=BETA2007.gsb "},
    {"EPSG:28992", 155000, 463000,
     "+inv +proj=sterea +lat_0=52.1561605555556 +lon_0=5.38763888888889 +k=0.9999079 +x_0=155000 "
     "+y_0=463000 +ellps=bessel +step +proj=cart +ellps=bessel +step +proj=helmert +x=565.4171 "
     "+y=50.3319 +z=465.5524 +rx=0.398957388243134 +ry=-0.343987817378283 +rz=1.87740163998045 "
     "+s=4.0725 +convention=coordinate_frame +step +inv +proj=cart +ellps=WGS84 "},
    {R"(COMPD_CS["x",GEOGCS["bound",DATUM["x",SPHEROID["WGS 84",6378137,298.257223563],)"
     R"(TOWGS84[0,0,100,0,0,0,0]],PRIMEM["Greenwich",0],UNIT["degree",0.0174532925199433]],)"
     R"(VERT_CS["EGM96 height",VERT_DATUM["EGM96 geoid",2005],UNIT["foot",0.3048]]])",
     -84.2, 36.3,
     kFromDegrees + "+step +proj=cart +step +proj=helmert +z=100 +step +inv +proj=cart ", 0.3048},
    {"EPSG:2274+5773", 2400000, 700000, kFromTennessee}};

/// Longitudes, latitudes and heights: each pair of braces is a call.
const struct {
    const char* mpszCRS;
    std::vector<Points> moCalls;
} kChoices[] = {
    // Operations of 5 m, 7 m (beyond the 180th meridian, too), 10 m for all, and 11 m.
    {"EPSG:4284",
     {{50, 42, 9},
      {37, 55, 9, 50, 42, 9},
      {37, 55, 9, -170, 65, 9, 190, 65, 9, 24, 57, 9},
      {44.5, 40, 9, 45, 40, 9},
      {44.5, 40, 9, 45, 40, 9, 37, 55, 9},
      {-160, 65, 9, 37, 55, 9, 0, 55, 9}}},
    {"EPSG:4740",
     {{37, 55, 9}, {0, 0, 9}, {37, 55, 9, 0, 0, 9}}}, // one of the world is the coarser
    // The shifts for Czechia and Slovakia, equally accurate in plan, are 45 m apart in height.
    {"EPSG:4156",
     {{14, 50, 9}, {17.5, 49, 9}, {14, 50, 9, 17.5, 49, 9}, {20, 48.5, 9, 14, 50, 9}, {14, 48, 9}}},
    {"EPSG:4283",
     {{151, -33, 9}, {95, -33, 9}}}, // of three equals, that of the smallest area lacks its grid
    {"EPSG:4272", {}},
    // The northern one is the narrower, the southern one the smaller.
    {"EPSG:4204", {{47.5, 29.3, 9}}},
    // Better ones for places in the same latitudes, farther west and farther east.
    {"EPSG:4630", {{-139.5, -8.9, 9}}},
    {"EPSG:4230", {{-13, 36, 9}, {-3, 40, 9}, {9, 56, 9}}},
    {"EPSG:8996", {{175, -40, 9}, {130, -25, 9}}}, // drifts with a time that is not known
    // A failure, of which the next call knows nothing, and what is no place of a vertex.
    {"EPSG:4326",
     {{10, 50, 1, 10, 150, 2, 10, 151, 3},
      {10, 50, 9},
      {10, 50, 1e8, kNan, 50, 9, 10, kNan, 9, 10, 50, kNan, 10, 50, -1.1e8, 10, 50, 1.1e8}}},
    {"EPSG:4301", {{139, 36, 9}}}, // a shift of 4 m for Korea, and none below 9 m for Japan
    {"+proj=longlat +datum=GGRS87 +type=crs", {{0, 0, 9}}}, // the area of the CRS is not known
    {"EPSG:4176", {{100, -80, 9}, {20, -80, 9}}},
    // Of two zones only the southern has its grid; beside all, in the area of the CRS.
    {"EPSG:32616+5703", {{738669, 4745105, 9}, {5e5, 6.65e6, 9}}}};

const struct {
    const char* mpszCRS;
    Points moPoints; ///< empty: there is no transform at all
} kRefusals[] = {
    {"no CRS at all", {}},
    {"EPSG:4978", {}},
    {"EPSG:5773", {}},
    {R"(ELLIPSOID["no CRS",6378137,298])", {}},
    {"", {1, 2, 3}},
    {"EPSG:32616+3855", {}},
    {"+proj=utm +zone=16 +datum=WGS84 +geoidgrids=no.gtx +type=crs", {}},
    {"+proj=utm +zone=16 +ellps=WGS84 +type=crs", {}},
    {"EPSG:4131", {}},
    {"EPSG:8252", {0, 0, 9}}, // an area without a name
};

} // namespace

TEST_F(CRSTest, HeightsAreThoseOfTheGeoidGridAndComeBack) {
    bool bWkt = false;
    std::string told;
    const auto CountLines = [](const std::string& text) {
        return std::count(text.begin(), text.end(), '\n');
    };
    for (const auto& [pszCRS, x, y, steps, dfUnit] : kConversions) {
        bWkt = !bWkt;
        const std::string geoid = "+step +inv +proj=vgridshift +grids=egm96_15.gtx +multiplier=1";
        const std::string pipeline = "+proj=pipeline +step " + steps + geoid;
        const PjPtr po(proj_create(nullptr, pipeline.c_str()), proj_destroy);
        const PJ_COORD oSource = proj_coord(x, y, 300 * dfUnit, HUGE_VAL);
        const double dfHeight = Convert(pszCRS, {x, y, 300}, kEllips, kOrtho, bWkt);
        EXPECT_NEAR(dfHeight * dfUnit, proj_trans(po.get(), PJ_FWD, oSource).xyz.z, 1e-6) << pszCRS;
        const std::string there = moTranscript.Take();
        EXPECT_NEAR(Convert(pszCRS, {x, y, dfHeight}, kOrtho, kEllips), 300, 2e-4) << pszCRS;
        const std::string back = moTranscript.Take(); // the same of the inverse
        EXPECT_EQ(CountLines(back), CountLines(there)) << back;
        told += there;
    }
    moTranscript.moLines = told;
    const double dfMetres = Convert("EPSG:32616+5703", {738669, 4045105, 300});
    EXPECT_NEAR(dfMetres, 330.5, 1.5) << "NAD83";
    EXPECT_NEAR(Convert("EPSG:32616+6360", {738669, 4045105, 300}) - 300,
                (dfMetres - 300) / 1200 * 3937, 1e-6);
}

TEST_F(CRSTest, TheMostAccurateOperationThatHoldsAllPointsOfACallServes) {
    for (const auto& oRow : kChoices)
        moTranscript.Refuses([&] {
            const std::string told = moTranscript.moLines;
            const TransformPtr poTransform = MakeTransform(oRow.mpszCRS);
            moTranscript.moLines = told; // other tests read the list
            for (const Points& points : oRow.moCalls) {
                Points target;
                const std::size_t nTold = moTranscript.moLines.size();
                if (moTranscript.Refuses([&] { target = Transform(poTransform, points); }))
                    continue;
                std::string& lines = moTranscript.moLines;
                const std::size_t nName = lines.find('\'', nTold) + 1;
                const std::string name = lines.substr(nName, lines.find('\'', nName) - nName);
                EXPECT_NEAR(target[2], AskProj(oRow.mpszCRS, name, points), 1e-9) << oRow.mpszCRS;
                lines.resize(lines.find('\n', nTold) + 1); // the warning is told above
            }
        });
}

TEST_F(CRSTest, AnAreaOfUseServesAHundredthOfADegreeBesideIt) {
    for (const char* pszCRS : {"EPSG:4167", "EPSG:4258"}) { // the first crosses the 180th meridian
        const PjPtr po(proj_create(nullptr, pszCRS), proj_destroy);
        double w, s, e, n;
        proj_get_area_of_use(nullptr, po.get(), &w, &s, &e, &n, nullptr);
        const TransformPtr poTransform = MakeTransform(pszCRS);
        for (const double d : {-0.012, -0.008, 0.008, 0.012})
            for (const Points& point : {Points{w - d, s + 9, 9},
                                        {e + d + 360, s + 9, 9},
                                        {w + 9, s - d, 9},
                                        {w + 9, n + d, 9}})
                EXPECT_EQ(moTranscript.Refuses([&] { Transform(poTransform, point); }), d > 0.01)
                    << pszCRS << ' ' << point[0] << ' ' << point[1];
    }
    moTranscript.moLines.clear();
}

TEST_F(CRSTest, DataIsFoundWhereTheHostsGdalFindsIt) {
    const std::string folder = GetFolder().moHostFolder.GetPath("");
    const char* const paths[] = {folder.c_str(), nullptr};
    OSRSetPROJSearchPaths(paths);
    EXPECT_NEAR(Convert("EPSG:32616+5703", {738669, 4745105, 250}), 285, 0.5);
    OSRSetPROJSearchPaths(nullptr);
}

/// Windows as the reader lays its grid over them, each in the worst place for it.
const struct {
    const char* mpszCRS;
    double x, y, mdfWidth, mdfHeight, mdfMost;           ///< metres
} kWindows[] = {{"EPSG:4326", -156.1, 18.9, 1, 1, 1e-3}, // Hawaii, where EGM96 is roughest
                {"EPSG:4326", 10.3, 88.99, 1, 1, 1e-3},
                {"EPSG:4326", -70.6, -24.9, 1, 1, 1e-3},
                {"EPSG:4326", -160.3, 14.7, 10, 10, 1e-2},
                {"EPSG:4326", -74.6, -34.9, 10, 10, 1e-2},
                {"EPSG:32604", 750000, 2090000, 111000, 111000, 1e-3},
                {"EPSG:32719", 3e5, 7.25e6, 111000, 111000, 1e-3},
                {"EPSG:32719", 2e5, 6.5e6, 600000, 1110000, 1e-2},
                {"EPSG:3413", 2e5, -2.6e6, 340000, 1110000, 1e-2}, // Greenland
                {"EPSG:32616", 7e5, 4e6, 3000, 200, 1e-3}};

TEST_F(CRSTest, InterpolatedHeightsAreThoseOfTheTransform) {
    for (const auto& [pszCRS, x, y, dfWidth, dfHeight, dfMost] : kWindows) {
        InterpGrid3D oGrid;
        oGrid.LayoutGrid(x, y, 10, x + dfWidth, y + dfHeight, 1500, 100, 100, 1490);
        const unsigned nNodes = oGrid.GetNumGridPoints();
        ASSERT_LE(nNodes, 900000U); // as long as a walk over a million triangles
        Points nodes(std::size_t{3} * nNodes), centres;
        oGrid.GetGridPositions(nodes.data());
        const TransformPtr poTransform = MakeTransform(pszCRS);
        const Points heights = Transform(poTransform, nodes);
        for (std::size_t i = 0; i < nNodes; ++i)
            oGrid.GetArray()[i] = static_cast<double>(static_cast<float>(heights[3 * i + 2]));
        std::size_t nRow = 3;
        while (nodes[nRow + 1] == y)
            nRow += 3;
        for (std::size_t j = 0, i = nRow + 3; i < nodes.size() / 2; i += 3, j += 3)
            if (nodes[i] > x)
                centres.insert(centres.end(),
                               {(nodes[j] + nodes[i]) / 2, (nodes[j + 1] + nodes[i + 1]) / 2, 755});
        const Points expected = Transform(poTransform, centres);
        for (std::size_t i = 0; i < centres.size(); i += 3) {
            double dfFound = 0;
            oGrid.GetVal(centres[i], centres[i + 1], centres[i + 2], &dfFound);
            ASSERT_NEAR(dfFound, expected[i + 2], dfMost) << pszCRS << ' ' << centres[i];
        }
        moTranscript.Take();
    }
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
    const auto Create = [](const CRSPtr& poSource, const CRSPtr& poTarget) {
        utils::CreateCRSTransform(poSource.get(), poTarget.get(), 0.0);
    };
    for (const auto& work : std::vector<std::function<void()>>{
             [&] { Create(po3D, poLocal); }, [&] { Create(poLocal, po3D); },
             [&] { Create(poUtm, po3D); }, [&] { Create(po3D, nullptr); },
             [&] { utils::IsCRSLocal(&oForeign); },
             [&] { utils::CreateCompoundCS(poUtm.get(), kOrtho, cs::LinearUnitType(7)); },
             [] { ReadCRS(std::string(199, 'x') + "\u00e9"); },
             [] { ProjectionEngine::GetProjInfoFactory(PE_Default)->CreateCRS(nullptr); }})
        EXPECT_TRUE(moTranscript.Refuses(work));
}

TEST_F(CRSTest, HeightsOfTheSameKindNeedNoChange) {
    const CRSPtr poFrom = MakeCompound(ReadCRS("EPSG:4619"), kOrtho),
                 poTo = MakeCompound(ReadCRS("EPSG:4258"), kOrtho);
    const TransformPtr poTransform(utils::CreateCRSTransform(poFrom.get(), poTo.get(), 0.0));
    EXPECT_EQ(Transform(poTransform, {15, 60, 0.3})[2], 0.3);
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
    for (const char* pszCRS : {"", "EPSG:4283"})
        Convert(pszCRS, {}); // no height, nothing to convert
}
