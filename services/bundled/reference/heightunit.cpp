#include "services/bundled/reference/heightunit.h"

#include <cpl_json.h>

namespace kelm::ogc {

namespace {

/// @return the CRS without what binds it to another
CPLJSONObject GetCore(const CPLJSONObject& crs) {
    return crs.GetString("type") == "BoundCRS" ? GetCore(crs.GetObj("source_crs")) : crs;
}

CPLJSONObject CreateUnit(const HeightUnit& unit) {
    CPLJSONObject object;
    object.Add("type", "LinearUnit");
    object.Add("name", unit.moName);
    object.Add("conversion_factor", unit.mdfMetres);
    return object;
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

std::string SetHeightUnit(ProjSession& session, const std::string& definition,
                          const HeightUnit& unit) {
    const PjPtr crs = session.CreateFromText(definition);
    if (GetHeightUnit(session, crs.get()).mdfMetres == unit.mdfMetres)
        return definition;
    CPLJSONDocument document;
    if (!document.LoadMemory(definition))
        return definition;
    CPLJSONObject core = GetCore(document.GetRoot());
    const CPLJSONArray axes = core.GetArray("coordinate_system/axis");
    CPLJSONObject height = axes[axes.Size() - 1];
    height.Delete("unit");
    height.Add("unit", CreateUnit(unit));
    // The code stands for the CRS with its former unit.
    core.Delete("id");
    return document.SaveAsString();
}

} // namespace kelm::ogc
