#include "services/bundled/projcrs.h"

#include "services/bundled/projsession.h"
#include "services/bundled/undefinedcrs.h"
#include "services/exception.h"
#include "services/reporting.h"

#include <proj_experimental.h>

#include <cstring>
#include <utility>

namespace kelm::ogc {

namespace {

constexpr const char* kSource = "services/bundled/projcrs";

/// EGM96 height: its grid comes with PROJ's basic data everywhere.
constexpr const char* kDefaultVerticalCode = "5773";

/// @return the type of a CRS, or of what a bound CRS binds; the type of null is unknown
PJ_TYPE GetCoreType(ProjSession& oSession, const PJ* po) {
    const PJ_TYPE eType = po ? proj_get_type(po) : PJ_TYPE_UNKNOWN;
    if (eType != PJ_TYPE_BOUND_CRS)
        return eType;
    const PjPtr poSource(proj_get_source_crs(oSession.Get(), po));
    return poSource ? proj_get_type(poSource.get()) : PJ_TYPE_UNKNOWN;
}

/// @return the number of axes of a CRS, or of what a bound CRS binds; 0 for a compound one
int GetAxisCount(ProjSession& oSession, const PJ* po) {
    if (proj_get_type(po) == PJ_TYPE_BOUND_CRS) {
        const PjPtr poSource(proj_get_source_crs(oSession.Get(), po));
        return poSource ? GetAxisCount(oSession, poSource.get()) : 0;
    }
    if (proj_get_type(po) == PJ_TYPE_COMPOUND_CRS)
        return 0;
    const PjPtr poSystem(proj_crs_get_coordinate_system(oSession.Get(), po));
    return poSystem ? proj_cs_get_axis_count(oSession.Get(), poSystem.get()) : 0;
}

/// @return the vertical part of a compound CRS as WKT 2, or empty
std::string FindVertical(ProjSession& oSession, const PJ* po) {
    if (proj_get_type(po) != PJ_TYPE_COMPOUND_CRS)
        return {};
    for (int i = 1;; ++i) {
        const PjPtr poPart(proj_crs_get_sub_crs(oSession.Get(), po, i));
        if (!poPart)
            return {};
        if (GetCoreType(oSession, poPart.get()) == PJ_TYPE_VERTICAL_CRS)
            return oSession.GetWkt(poPart.get());
    }
}

/// @return the part of a CRS with the map coordinates
PjPtr FindHorizontal(ProjSession& oSession, const PJ* po) {
    if (proj_get_type(po) == PJ_TYPE_COMPOUND_CRS)
        return PjPtr(proj_crs_get_sub_crs(oSession.Get(), po, 0));
    return PjPtr(proj_clone(oSession.Get(), po));
}

/// @return the parts of a CRS that has map coordinates on the earth
CRSText ReduceCRS(ProjSession& oSession, const PJ* po, const PJ* poHorizontal) {
    CRSText text;
    text.mbLocal = false;
    text.moName = proj_get_name(po);
    const PjPtr poFlat(proj_crs_demote_to_2D(oSession.Get(), nullptr, poHorizontal));
    text.moDefinition = oSession.GetWkt(poFlat.get());
    text.moVertical = FindVertical(oSession, po);
    if (GetAxisCount(oSession, poHorizontal) == 3)
        text.moEllipsoidal = oSession.GetWkt(poHorizontal);
    return text;
}

[[noreturn]] void RefuseKind(PJ_TYPE eType, const char* pszName) {
    const char* pszKind = eType == PJ_TYPE_GEOCENTRIC_CRS ? "geocentric"
                          : eType == PJ_TYPE_VERTICAL_CRS ? "vertical only"
                                                          : "neither projected nor geographic";
    throw DataException(FormatString("The coordinate reference system '%s' is %s; a layer needs "
                                     "one with map coordinates",
                                     pszName, pszKind),
                        kSource, __PRETTY_FUNCTION__, __LINE__);
}

} // namespace

ProjCRS::ProjCRS(CRSText text) : moText(std::move(text)) {}

ProjCRS::ProjCRS(const ProjCRS& oMap, cs::DatumType eDatum, std::string definition)
    : moText(oMap.moText), meDatum(eDatum), mpoMap(std::make_unique<ProjCRS>(oMap.moText)) {
    if (!moText.mbLocal)
        moText.moDefinition = std::move(definition);
}

int ProjCRS::GetDimension() const {
    return mpoMap ? 3 : 2;
}

cs::ICRS* ProjCRS::GetHorizontalCRS() const {
    return mpoMap ? mpoMap.get() : const_cast<ProjCRS*>(this);
}

bool ProjCRS::TestSame(const ProjCRS& oOther) const {
    return GetDimension() == oOther.GetDimension() && meDatum == oOther.meDatum &&
           moText.mbLocal == oOther.moText.mbLocal &&
           moText.moDefinition == oOther.moText.moDefinition;
}

std::unique_ptr<ProjCRS> ReadCRS(const std::string& definition) {
    CRSText text;
    if (definition.empty())
        return std::make_unique<ProjCRS>(text);
    ProjSession oSession;
    const PjPtr poCRS = oSession.CreateFromWkt(definition);
    const PjPtr poHorizontal = FindHorizontal(oSession, poCRS.get());
    const PJ_TYPE eType = GetCoreType(oSession, poHorizontal.get());
    const char* pszName = proj_get_name(poCRS.get());
    if (eType == PJ_TYPE_PROJECTED_CRS || eType == PJ_TYPE_GEOGRAPHIC_2D_CRS ||
        eType == PJ_TYPE_GEOGRAPHIC_3D_CRS) {
        if (!services::TestUndefinedCRS(pszName))
            text = ReduceCRS(oSession, poCRS.get(), poHorizontal.get());
    } else if (eType == PJ_TYPE_ENGINEERING_CRS) {
        text.moName = pszName;
        text.moDefinition = oSession.GetWkt(poHorizontal.get());
    } else {
        RefuseKind(eType, pszName);
    }
    return std::make_unique<ProjCRS>(std::move(text));
}

namespace {

/// @return the CRS with ellipsoidal heights as WKT 2
std::string CreateEllipsoidal(const CRSText& text) {
    if (!text.moEllipsoidal.empty())
        return text.moEllipsoidal;
    ProjSession oSession;
    const PjPtr poFlat = oSession.CreateFromWkt(text.moDefinition);
    const PjPtr poSpatial(proj_crs_promote_to_3D(oSession.Get(), nullptr, poFlat.get()));
    return oSession.GetWkt(poSpatial.get());
}

/// @return the vertical CRS that the layer names, or the default one
PjPtr CreateVertical(ProjSession& oSession, const CRSText& text) {
    if (!text.moVertical.empty())
        return oSession.CreateFromWkt(text.moVertical);
    PjPtr poVertical(proj_create_from_database(oSession.Get(), "EPSG", kDefaultVerticalCode,
                                               PJ_CATEGORY_CRS, 0, nullptr));
    if (!poVertical)
        throw DataException(FormatString("PROJ's database does not give the vertical CRS EPSG:%s%s",
                                         kDefaultVerticalCode, oSession.TakeMessages().c_str()),
                            kSource, __PRETTY_FUNCTION__, __LINE__);
    return poVertical;
}

/// @return the CRS with heights above the geoid as WKT 2
std::string CreateOrthometric(const CRSText& text) {
    ProjSession oSession;
    const PjPtr poFlat = oSession.CreateFromWkt(text.moDefinition);
    const PjPtr poVertical = CreateVertical(oSession, text);
    const std::string name =
        std::string(proj_get_name(poFlat.get())) + " + " + proj_get_name(poVertical.get());
    const PjPtr poCompound(
        proj_create_compound_crs(oSession.Get(), name.c_str(), poFlat.get(), poVertical.get()));
    return oSession.GetWkt(poCompound.get());
}

} // namespace

std::unique_ptr<ProjCRS> CreateCompound(const ProjCRS& oMap, cs::DatumType eDatum) {
    const CRSText& text = oMap.GetText();
    if (text.mbLocal)
        return std::make_unique<ProjCRS>(oMap, eDatum, std::string());
    if (eDatum == cs::VD_Ellipsoidal)
        return std::make_unique<ProjCRS>(oMap, eDatum, CreateEllipsoidal(text));
    if (eDatum == cs::VD_Orthometric)
        return std::make_unique<ProjCRS>(oMap, eDatum, CreateOrthometric(text));
    throw DataException(FormatString("The vertical datum code %d is not supported: use "
                                     "VD_Orthometric (2001) or VD_Ellipsoidal (2002)",
                                     static_cast<int>(eDatum)),
                        kSource, __PRETTY_FUNCTION__, __LINE__);
}

} // namespace kelm::ogc
