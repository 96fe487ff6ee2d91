#include "services/bundled/reference/createcrs.h"

#include "services/bundled/reference/proj/heightunit.h"
#include "services/bundled/reference/proj/projsession.h"
#include "services/bundled/undefinedcrs.h"
#include "services/exception.h"
#include "services/reporting.h"

#include <proj_experimental.h>

#include <utility>

namespace kelm::ogc {

namespace {

constexpr const char* SOURCE = "services/bundled/reference/createcrs";

/// EGM96 height: its grid comes with PROJ's basic data everywhere.
constexpr const char* DEFAULT_VERTICAL_CODE = "5773";

/// @return the type of a CRS, or of what a bound CRS binds; the type of null is unknown
PJ_TYPE GetCoreType(ProjSession& session, const PJ* crs) {
    const PJ_TYPE type = crs ? proj_get_type(crs) : PJ_TYPE_UNKNOWN;
    if (type != PJ_TYPE_BOUND_CRS)
        return type;
    const PjPtr bound(proj_get_source_crs(session.Get(), crs));
    return bound ? proj_get_type(bound.get()) : PJ_TYPE_UNKNOWN;
}

/// @return the number of axes of a CRS, or of what a bound CRS binds; 0 for a compound one
int GetAxisCount(ProjSession& session, const PJ* crs) {
    if (proj_get_type(crs) == PJ_TYPE_BOUND_CRS) {
        const PjPtr bound(proj_get_source_crs(session.Get(), crs));
        return bound ? GetAxisCount(session, bound.get()) : 0;
    }
    if (proj_get_type(crs) == PJ_TYPE_COMPOUND_CRS)
        return 0;
    const PjPtr system(proj_crs_get_coordinate_system(session.Get(), crs));
    return system ? proj_cs_get_axis_count(session.Get(), system.get()) : 0;
}

/// @return the vertical part of a compound CRS as PROJJSON, or empty
std::string FindVertical(ProjSession& session, const PJ* crs) {
    if (proj_get_type(crs) != PJ_TYPE_COMPOUND_CRS)
        return {};
    for (int i = 1;; ++i) {
        const PjPtr part(proj_crs_get_sub_crs(session.Get(), crs, i));
        if (!part)
            return {};
        if (GetCoreType(session, part.get()) == PJ_TYPE_VERTICAL_CRS)
            return session.GetText(part.get());
    }
}

/// @return the part of a CRS with the map coordinates
PjPtr FindHorizontal(ProjSession& session, const PJ* crs) {
    if (proj_get_type(crs) == PJ_TYPE_COMPOUND_CRS)
        return PjPtr(proj_crs_get_sub_crs(session.Get(), crs, 0));
    return PjPtr(proj_clone(session.Get(), crs));
}

/// @return true for a CRS with map coordinates on the earth
bool IsMapType(PJ_TYPE type) {
    return type == PJ_TYPE_PROJECTED_CRS || type == PJ_TYPE_GEOGRAPHIC_2D_CRS ||
           type == PJ_TYPE_GEOGRAPHIC_3D_CRS;
}

/// @return what is known of a CRS that has map coordinates on the earth
CRSText ReduceCRS(ProjSession& session, const PJ* crs, const PJ* horizontal) {
    CRSText text;
    if (services::IsUndefinedCRS(proj_get_name(crs)))
        return text;
    text.mbLocal = false;
    text.moName = proj_get_name(crs);
    const PjPtr flat(proj_crs_demote_to_2D(session.Get(), nullptr, horizontal));
    text.moDefinition = session.GetText(flat.get());
    text.moVertical = FindVertical(session, crs);
    if (GetAxisCount(session, horizontal) == 3)
        text.moEllipsoidal = session.GetText(horizontal);
    return text;
}

/// @return what is known of a local CRS
CRSText DescribeSite(ProjSession& session, const PJ* crs, const PJ* horizontal) {
    CRSText text;
    text.moName = proj_get_name(crs);
    text.moDefinition = session.GetText(horizontal);
    return text;
}

const char* GetKindText(PJ_TYPE type) {
    return type == PJ_TYPE_GEOCENTRIC_CRS ? "geocentric"
           : type == PJ_TYPE_VERTICAL_CRS ? "vertical only"
                                          : "neither projected nor geographic";
}

CRSText ReadText(ProjSession& session, const PJ* crs) {
    const PjPtr horizontal = FindHorizontal(session, crs);
    const PJ_TYPE type = GetCoreType(session, horizontal.get());
    if (IsMapType(type))
        return ReduceCRS(session, crs, horizontal.get());
    if (type == PJ_TYPE_ENGINEERING_CRS)
        return DescribeSite(session, crs, horizontal.get());
    throw DataException(FormatString("The coordinate reference system '%s' is %s; a layer needs "
                                     "one with map coordinates",
                                     proj_get_name(crs), GetKindText(type)),
                        SOURCE, __PRETTY_FUNCTION__, __LINE__);
}

/// @return the unit of all heights of a layer: that of the height axis of its CRS, else metres
HeightUnit GetLayerUnit(ProjSession& session, const CRSText& text) {
    const std::string& named = text.moVertical.empty() ? text.moEllipsoidal : text.moVertical;
    return named.empty() ? HeightUnit{}
                         : GetHeightUnit(session, session.CreateFromText(named).get());
}

/// @return the CRS with ellipsoidal heights as PROJJSON
std::string CreateEllipsoidal(const CRSText& text) {
    ProjSession session;
    const bool named = !text.moEllipsoidal.empty();
    const PjPtr crs = session.CreateFromText(named ? text.moEllipsoidal : text.moDefinition);
    // A bound CRS of three axes may have a hub of two, and PROJ's shift then leaves heights alone.
    const PjPtr spatial(proj_crs_promote_to_3D(session.Get(), nullptr, crs.get()));
    const HeightUnit unit = GetLayerUnit(session, text);
    return session.GetText(SetHeightUnit(session, spatial.get(), unit).get());
}

/// @return the vertical CRS that the layer names, or the default one
PjPtr CreateVertical(ProjSession& session, const CRSText& text) {
    if (!text.moVertical.empty())
        return session.CreateFromText(text.moVertical);
    const PjPtr vertical(proj_create_from_database(session.Get(), "EPSG", DEFAULT_VERTICAL_CODE,
                                                   PJ_CATEGORY_CRS, 0, nullptr));
    if (!vertical)
        throw DataException(FormatString("PROJ's database does not give the vertical CRS EPSG:%s%s",
                                         DEFAULT_VERTICAL_CODE, session.TakeMessages().c_str()),
                            SOURCE, __PRETTY_FUNCTION__, __LINE__);
    return SetHeightUnit(session, vertical.get(), GetLayerUnit(session, text));
}

/// @return the CRS with heights above the geoid as PROJJSON
std::string CreateOrthometric(const CRSText& text) {
    ProjSession session;
    const PjPtr flat = session.CreateFromText(text.moDefinition);
    const PjPtr vertical = CreateVertical(session, text);
    const std::string name =
        std::string(proj_get_name(flat.get())) + " + " + proj_get_name(vertical.get());
    const PjPtr compound(
        proj_create_compound_crs(session.Get(), name.c_str(), flat.get(), vertical.get()));
    return session.GetText(compound.get());
}

/// @return the compound as PROJJSON
std::string CreateDefinition(const CRSText& text, cs::DatumType datum) {
    if (datum == cs::VD_Ellipsoidal)
        return CreateEllipsoidal(text);
    if (datum == cs::VD_Orthometric)
        return CreateOrthometric(text);
    throw DataException(FormatString("The vertical datum code %d is not supported: use "
                                     "VD_Orthometric (2001) or VD_Ellipsoidal (2002)",
                                     static_cast<int>(datum)),
                        SOURCE, __PRETTY_FUNCTION__, __LINE__);
}

} // namespace

std::unique_ptr<ProjCRS> ReadCRS(const std::string& definition) {
    if (definition.empty())
        return std::make_unique<ProjCRS>(CRSText{});
    ProjSession session;
    const PjPtr crs = session.CreateFromText(definition);
    return std::make_unique<ProjCRS>(ReadText(session, crs.get()));
}

std::unique_ptr<ProjCRS> CreateCompound(const ProjCRS& map, cs::DatumType datum) {
    const CRSText& text = map.GetText();
    return std::make_unique<ProjCRS>(map, datum,
                                     text.mbLocal ? std::string() : CreateDefinition(text, datum));
}

} // namespace kelm::ogc
