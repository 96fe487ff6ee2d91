// The coordinate reference services by PROJ.

#include "services/crs.h"

#include "services/bundled/reference/createcrs.h"
#include "services/bundled/reference/projcrs.h"
#include "services/bundled/reference/projtransform.h"
#include "services/exception.h"
#include "services/reporting.h"
#include "services/vectorlayer.h"

#include <algorithm>

namespace kelm::ogc {

namespace {

constexpr const char* SOURCE = "services/bundled/reference/crs";

[[noreturn]] void RefuseArgument(const char* name, const char* actual, const char* expected) {
    throw ParameterException(name, ParameterException::PT_Invalid, actual, expected,
                             FormatString("%s must be %s, but is %s", name, expected, actual),
                             SOURCE, __PRETTY_FUNCTION__, __LINE__);
}

/// @return the object behind a CRS. @throw kelm::ParameterException if it is not of these services
const ProjCRS& GetProjCRS(const cs::ICRS* crs, const char* name) {
    if (!crs)
        RefuseArgument(name, "NULL", "non-NULL");
    const ProjCRS* object = dynamic_cast<const ProjCRS*>(crs);
    if (!object)
        RefuseArgument(name, "of another implementation", "a CRS of these services");
    return *object;
}

/// @return a compound. @throw kelm::ParameterException if the CRS is none
const ProjCRS& GetCompound(const cs::ICRS* crs, const char* name) {
    const ProjCRS& object = GetProjCRS(crs, name);
    if (object.GetDimension() != 3)
        RefuseArgument(name, "of two dimensions", "of three dimensions");
    return object;
}

class ProjInfoFactory final : public IProjInfoFactory {
  public:
    cs::ICRS* CreateCRS(ProjInfo_t* poInfo) override {
        if (!poInfo)
            RefuseArgument("poInfo", "NULL", "non-NULL");
        return ReadCRS(poInfo->definition).release();
    }
};

/// Between equal CRSs: copies the triples bit for bit.
class IdentityTransform final : public ct::IMathTransform {
  public:
    bool TransformPoints(const double* source, double* target, unsigned int nCount) override {
        std::copy_n(source, std::size_t{3} * nCount, target);
        return true;
    }
};

/// Between different heights of local CRSs, which nothing can convert: every call with a point
/// throws.
class RefusingTransform final : public ct::IMathTransform {
  public:
    bool TransformPoints(const double*, double*, unsigned int nCount) override {
        if (nCount > 0)
            throw DataException("Heights of a local coordinate reference system cannot be brought "
                                "to another vertical datum",
                                SOURCE, __PRETTY_FUNCTION__, __LINE__);
        return true;
    }
};

} // namespace

cs::ICRS::~ICRS() = default;
ct::IMathTransform::~IMathTransform() = default;
IProjInfoFactory::~IProjInfoFactory() = default;

IProjInfoFactory* ProjectionEngine::GetProjInfoFactory(const PEType&) {
    static ProjInfoFactory factory;
    return &factory;
}

namespace utils {

bool IsCRSLocal(const cs::ICRS* poCRS) {
    return !poCRS || GetProjCRS(poCRS, "poCRS").GetText().mbLocal;
}

cs::ICRS* CreateCompoundCS(cs::ICRS* poHorizontal, cs::DatumType eDatum, cs::LinearUnitType eUnit) {
    const ProjCRS& map = GetProjCRS(poHorizontal, "poHorizontal").GetMap();
    if (eUnit != cs::LU_Default)
        RefuseArgument("eUnit", FormatString("%d", static_cast<int>(eUnit)).c_str(), "LU_Default");
    return CreateCompound(map, eDatum).release();
}

ct::IMathTransform* CreateCRSTransform(const cs::ICRS* poSource, const cs::ICRS* poTarget, double) {
    const ProjCRS& source = GetCompound(poSource, "poSource");
    const ProjCRS& target = GetCompound(poTarget, "poTarget");
    if (source.IsSame(target))
        return new IdentityTransform;
    if (!source.GetText().mbLocal && !target.GetText().mbLocal)
        return new ProjTransform(source, target);
    if (source.GetText().mbLocal && target.GetText().mbLocal)
        return new RefusingTransform;
    throw DataException("There is no transform between a local coordinate reference system and "
                        "one of the earth",
                        SOURCE, __PRETTY_FUNCTION__, __LINE__);
}

} // namespace utils
} // namespace kelm::ogc
