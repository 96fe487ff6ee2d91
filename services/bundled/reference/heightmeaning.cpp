#include "services/bundled/reference/heightmeaning.h"

#include "services/bundled/reference/proj/steps.h"
#include "services/reporting.h"

#include <cmath>

namespace kelm::ogc {

namespace {

constexpr const char* SOURCE = "services/bundled/reference/heightmeaning";

constexpr double MODERN_AXIS = 6378137.0;     ///< metres; of WGS 84 and GRS 80
constexpr double MODERN_FLATTENING = 298.257; ///< inverse
constexpr double MOST_AXIS_DIFFERENCE = 1.0;  ///< metres
constexpr double MOST_FLATTENING_DIFFERENCE = 0.01;

PjPtr GetEllipsoid(ProjSession& session, const PJ* crs) {
    return PjPtr(proj_get_ellipsoid(session.Get(), crs));
}

/// @return the unit of a projected CRS's positions; metres of any other
HeightUnit GetMapUnit(ProjSession& session, const PJ* map) {
    if (proj_get_type(map) == PJ_TYPE_BOUND_CRS)
        return GetMapUnit(session, PjPtr(proj_get_source_crs(session.Get(), map)).get());
    return proj_get_type(map) == PJ_TYPE_PROJECTED_CRS ? GetHeightUnit(session, map) : HeightUnit{};
}

} // namespace

bool IsGeocentricEllipsoid(ProjSession& session, const PJ* crs) {
    const PjPtr ellipsoid = GetEllipsoid(session, crs);
    double axis = 0.0;
    double flattening = 0.0;
    return ellipsoid &&
           proj_ellipsoid_get_parameters(session.Get(), ellipsoid.get(), &axis, nullptr, nullptr,
                                         &flattening) &&
           std::abs(axis - MODERN_AXIS) < MOST_AXIS_DIFFERENCE &&
           std::abs(flattening - MODERN_FLATTENING) < MOST_FLATTENING_DIFFERENCE;
}

std::string FindOldEllipsoid(ProjSession& session, const PJ* crs) {
    const PjPtr ellipsoid = GetEllipsoid(session, crs);
    return ellipsoid && !IsGeocentricEllipsoid(session, crs) ? proj_get_name(ellipsoid.get()) : "";
}

void WarnOfEllipsoid(const std::string& map, const std::string& ellipsoid,
                     const ProjOperation& operation) {
    const bool spatial = HasSpatialShift(operation.moSteps);
    if (!spatial && !HasHorizontalShift(operation.moSteps))
        return;
    const std::string meaning =
        spatial ? FormatString("heights above the ellipsoid '%s'", ellipsoid.c_str())
                : FormatString("heights above the ellipsoid of the geoid model and not above '%s', "
                               "because its shift of datum leaves heights as they are",
                               ellipsoid.c_str());
    tellus::Warning::Warn(FormatString("Ellipsoidal heights of '%s' are, by PROJ's operation '%s', "
                                       "%s",
                                       map.c_str(), operation.moName.c_str(), meaning.c_str()),
                          SOURCE, __LINE__);
}

void WarnOfUnit(ProjSession& session, const CRSText& text, const PJ* map, const HeightUnit& unit) {
    if (unit.mdfMetres != 1.0)
        return tellus::Warning::Warn(
            FormatString("Heights of '%s' have the unit %s of its height axis in the change of "
                         "datum; offset and scale of a load come before it",
                         text.moName.c_str(), unit.moName.c_str()),
            SOURCE, __LINE__);
    if (!text.moVertical.empty() || !text.moEllipsoidal.empty())
        return;
    if (const HeightUnit ofMap = GetMapUnit(session, map); ofMap.mdfMetres != 1.0)
        tellus::Warning::Warn(
            FormatString("'%s' has the unit %s and no height axis: heights count as metres in the "
                         "change of datum",
                         text.moName.c_str(), ofMap.moName.c_str()),
            SOURCE, __LINE__);
}

} // namespace kelm::ogc
