#include "services/crs.h"

#include "services/bundled/projcrs.h"
#include "services/bundled/projtransform.h"
#include "services/exception.h"
#include "services/reporting.h"
#include "services/vectorlayer.h"

namespace kelm::ogc {

namespace {

constexpr const char* kSource = "services/bundled/crs";

[[noreturn]] void RefuseArgument(const char* pszName, const char* pszActual,
                                 const char* pszExpected) {
    throw ParameterException(
        pszName, ParameterException::PT_Invalid, pszActual, pszExpected,
        FormatString("%s must be %s, but is %s", pszName, pszExpected, pszActual), kSource,
        __PRETTY_FUNCTION__, __LINE__);
}

/// @return the object behind a CRS. @throw kelm::ParameterException if it is not of these services
const ProjCRS& GetProjCRS(const cs::ICRS* poCRS, const char* pszName) {
    if (!poCRS)
        RefuseArgument(pszName, "NULL", "non-NULL");
    const ProjCRS* po = dynamic_cast<const ProjCRS*>(poCRS);
    if (!po)
        RefuseArgument(pszName, "of another implementation", "a CRS of these services");
    return *po;
}

/// @return a compound. @throw kelm::ParameterException if the CRS is none
const ProjCRS& GetCompound(const cs::ICRS* poCRS, const char* pszName) {
    const ProjCRS& oCRS = GetProjCRS(poCRS, pszName);
    if (oCRS.GetDimension() != 3)
        RefuseArgument(pszName, "of two dimensions", "of three dimensions");
    return oCRS;
}

class ProjInfoFactory final : public IProjInfoFactory {
  public:
    cs::ICRS* CreateCRS(ProjInfo_t* poInfo) override {
        if (!poInfo)
            RefuseArgument("poInfo", "NULL", "non-NULL");
        return ReadCRS(poInfo->definition).release();
    }
};

} // namespace

cs::ICRS::~ICRS() = default;
ct::IMathTransform::~IMathTransform() = default;
IProjInfoFactory::~IProjInfoFactory() = default;

IProjInfoFactory* ProjectionEngine::GetProjInfoFactory(const PEType&) {
    static ProjInfoFactory oFactory;
    return &oFactory;
}

namespace utils {

bool IsCRSLocal(const cs::ICRS* poCRS) {
    return !poCRS || GetProjCRS(poCRS, "poCRS").GetText().mbLocal;
}

cs::ICRS* CreateCompoundCS(cs::ICRS* poHorizontal, cs::DatumType eDatum, cs::LinearUnitType eUnit) {
    const ProjCRS& oMap = GetProjCRS(poHorizontal, "poHorizontal").GetMap();
    if (eUnit != cs::LU_Default)
        RefuseArgument("eUnit", FormatString("%d", static_cast<int>(eUnit)).c_str(), "LU_Default");
    return CreateCompound(oMap, eDatum).release();
}

ct::IMathTransform* CreateCRSTransform(const cs::ICRS* poSource, const cs::ICRS* poTarget, double) {
    const ProjCRS& oSource = GetCompound(poSource, "poSource");
    const ProjCRS& oTarget = GetCompound(poTarget, "poTarget");
    if (oSource.TestSame(oTarget))
        return new IdentityTransform;
    if (!oSource.GetText().mbLocal && !oTarget.GetText().mbLocal)
        return new ProjTransform(oSource, oTarget);
    if (oSource.GetText().mbLocal && oTarget.GetText().mbLocal)
        return new RefusingTransform;
    throw DataException("There is no transform between a local coordinate reference system and "
                        "one of the earth",
                        kSource, __PRETTY_FUNCTION__, __LINE__);
}

} // namespace utils
} // namespace kelm::ogc
