#include "services/bundled/reference/proj/heightunit.h"

#include "services/exception.h"
#include "services/reporting.h"

#include <proj_experimental.h>

#include <array>

namespace kelm::ogc {

namespace {

constexpr const char* SOURCE = "services/bundled/reference/proj/heightunit";

/// @return the coordinate system of a CRS with three axes, the last one in this unit
PjPtr CreateAxes(ProjSession& session, const PJ* crs, const HeightUnit& unit) {
    const PjPtr system(proj_crs_get_coordinate_system(session.Get(), crs));
    if (!system || proj_cs_get_axis_count(session.Get(), system.get()) != 3)
        return nullptr;
    const PJ_COORDINATE_SYSTEM_TYPE type = proj_cs_get_type(session.Get(), system.get());
    std::array<PJ_AXIS_DESCRIPTION, 3> axes;
    for (int i = 0; i < 3; ++i) {
        const char *name, *abbreviation, *direction, *unitName;
        PJ_AXIS_DESCRIPTION& axis = axes[static_cast<std::size_t>(i)];
        if (!proj_cs_get_axis_info(session.Get(), system.get(), i, &name, &abbreviation, &direction,
                                   &axis.unit_conv_factor, &unitName, nullptr, nullptr))
            return nullptr;
        // PROJ copies the texts, which it takes as not constant.
        axis.name = const_cast<char*>(name);
        axis.abbreviation = const_cast<char*>(abbreviation);
        axis.direction = const_cast<char*>(direction);
        axis.unit_name = const_cast<char*>(unitName);
        const bool isAngle = i < 2 && type == PJ_CS_TYPE_ELLIPSOIDAL;
        axis.unit_type = isAngle ? PJ_UT_ANGULAR : PJ_UT_LINEAR;
    }
    axes[2].unit_name = const_cast<char*>(unit.moName.c_str());
    axes[2].unit_conv_factor = unit.mdfMetres;
    return PjPtr(proj_create_cs(session.Get(), type, 3, axes.data()));
}

/// @return the CRS with other axes, or null
PjPtr CreateWithAxes(ProjSession& session, const PJ* crs, PJ* axes) {
    const char* name = proj_get_name(crs);
    const PjPtr base(proj_get_source_crs(session.Get(), crs));
    if (proj_get_type(crs) == PJ_TYPE_PROJECTED_CRS) {
        const PjPtr conversion(proj_crs_get_coordoperation(session.Get(), crs));
        return PjPtr(
            proj_create_projected_crs(session.Get(), name, base.get(), conversion.get(), axes));
    }
    PjPtr datum(proj_crs_get_datum_ensemble(session.Get(), crs));
    if (!datum)
        datum.reset(proj_crs_get_datum(session.Get(), crs));
    return PjPtr(proj_create_geographic_crs_from_datum(session.Get(), name, datum.get(), axes));
}

/// @return the CRS with heights in another unit, or null
PjPtr Change(ProjSession& session, const PJ* crs, const HeightUnit& unit) {
    const PJ_TYPE type = proj_get_type(crs);
    if (type == PJ_TYPE_VERTICAL_CRS)
        return PjPtr(proj_crs_alter_cs_linear_unit(session.Get(), crs, unit.moName.c_str(),
                                                   unit.mdfMetres, nullptr, nullptr));
    if (type == PJ_TYPE_BOUND_CRS) {
        const PjPtr bound(proj_get_source_crs(session.Get(), crs));
        const PjPtr changed = Change(session, bound.get(), unit);
        const PjPtr hub(proj_get_target_crs(session.Get(), crs));
        const PjPtr shift(proj_crs_get_coordoperation(session.Get(), crs));
        return PjPtr(
            proj_crs_create_bound_crs(session.Get(), changed.get(), hub.get(), shift.get()));
    }
    const PjPtr axes = CreateAxes(session, crs, unit);
    return axes ? CreateWithAxes(session, crs, axes.get()) : nullptr;
}

} // namespace

HeightUnit GetHeightUnit(ProjSession& session, const PJ* crs) {
    const PJ_TYPE type = proj_get_type(crs);
    if (type == PJ_TYPE_BOUND_CRS || type == PJ_TYPE_COMPOUND_CRS) {
        const PjPtr part(type == PJ_TYPE_BOUND_CRS ? proj_get_source_crs(session.Get(), crs)
                                                   : proj_crs_get_sub_crs(session.Get(), crs, 1));
        return part ? GetHeightUnit(session, part.get()) : HeightUnit{};
    }
    const PjPtr system(proj_crs_get_coordinate_system(session.Get(), crs));
    const int axes = system ? proj_cs_get_axis_count(session.Get(), system.get()) : 0;
    HeightUnit unit;
    const char* name = nullptr;
    if (axes > 0 && proj_cs_get_axis_info(session.Get(), system.get(), axes - 1, nullptr, nullptr,
                                          nullptr, &unit.mdfMetres, &name, nullptr, nullptr))
        unit.moName = name;
    return unit;
}

PjPtr SetHeightUnit(ProjSession& session, const PJ* crs, const HeightUnit& unit) {
    if (GetHeightUnit(session, crs).mdfMetres == unit.mdfMetres)
        return PjPtr(proj_clone(session.Get(), crs));
    PjPtr changed = Change(session, crs, unit);
    if (!changed)
        throw DataException(FormatString("The coordinate reference system '%s' cannot have heights "
                                         "in the unit %s%s",
                                         proj_get_name(crs), unit.moName.c_str(),
                                         session.TakeMessages().c_str()),
                            SOURCE, __PRETTY_FUNCTION__, __LINE__);
    return changed;
}

} // namespace kelm::ogc
