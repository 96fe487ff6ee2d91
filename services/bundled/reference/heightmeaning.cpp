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

/// A unit of length.
struct Unit {
    std::string moName = "unknown";
    double mdfMetres = 0.0;
};

PjPtr GetEllipsoid(ProjSession& session, const PJ* crs) {
    return PjPtr(proj_get_ellipsoid(session.Get(), crs));
}

/// @return the unit of the last axis of a CRS; of the vertical part if the CRS is a compound
Unit GetHeightUnit(ProjSession& session, const PJ* crs) {
    const PJ_TYPE type = proj_get_type(crs);
    if (type == PJ_TYPE_BOUND_CRS || type == PJ_TYPE_COMPOUND_CRS) {
        const PjPtr part(type == PJ_TYPE_BOUND_CRS ? proj_get_source_crs(session.Get(), crs)
                                                   : proj_crs_get_sub_crs(session.Get(), crs, 1));
        return part ? GetHeightUnit(session, part.get()) : Unit{};
    }
    const PjPtr system(proj_crs_get_coordinate_system(session.Get(), crs));
    const int axes = system ? proj_cs_get_axis_count(session.Get(), system.get()) : 0;
    Unit unit;
    const char* name = nullptr;
    if (axes > 0 && proj_cs_get_axis_info(session.Get(), system.get(), axes - 1, nullptr, nullptr,
                                          nullptr, &unit.mdfMetres, &name, nullptr, nullptr))
        unit.moName = name;
    return unit;
}

Unit GetHeightUnit(ProjSession& session, const ProjCRS& crs) {
    const PjPtr object = session.CreateFromText(crs.GetText().moDefinition);
    return GetHeightUnit(session, object.get());
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

void ReportUnits(ProjSession& session, const ProjCRS& source, const ProjCRS& target) {
    const Unit from = GetHeightUnit(session, source);
    const Unit to = GetHeightUnit(session, target);
    if (from.mdfMetres == to.mdfMetres)
        tellus::Report::AddInfo(FormatString("Unit of the heights: %s", to.moName.c_str()));
    else
        tellus::Warning::Warn(FormatString("The change of datum also changes the unit of the "
                                           "heights, from %s to %s",
                                           from.moName.c_str(), to.moName.c_str()),
                              SOURCE, __LINE__);
}

} // namespace kelm::ogc
