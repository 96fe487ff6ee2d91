#include "tin/tinreader.h"

#include "services/exception.h"
#include "services/reporting.h"
#include "services/vectorlayer.h"
#include "tin/load/shapecount.h"

#include <algorithm>
#include <cstdint>
#include <limits>
#include <memory>

namespace kelm::tin {

namespace {

using ogc::cs::DatumType;
using ogc::cs::ICRS;
using ogc::cs::VD_Ellipsoidal;
using ogc::cs::VD_Other;

#define THROW_PARAMETER_EXCEPTION(parameter, actual, expected, message)                            \
    throw ParameterException(parameter, ParameterException::PT_Invalid, actual, expected, message, \
                             "tin/tinreader", __PRETTY_FUNCTION__, __LINE__)

/// The 2-D CRS joined with a vertical datum, in which ellipsoidal heights stand for unknown ones.
ICRS* CreateCompound(const ICRS& oCRS, DatumType eDatum) {
    return ogc::utils::CreateCompoundCS(
        oCRS.GetHorizontalCRS(), eDatum == VD_Other ? VD_Ellipsoidal : eDatum, ogc::cs::LU_Default);
}

/// Vertices that welding is expected to leave of the triangles of so many shapes.
std::int32_t EstimateVertices(std::int32_t shapes) {
    return static_cast<std::int32_t>(
        std::min(static_cast<double>(shapes) * 1.5,
                 static_cast<double>(std::numeric_limits<std::int32_t>::max())));
}

void TestDatum(DatumType eSource, DatumType eType) {
    if (eType < 2000 || eType > 2999)
        THROW_PARAMETER_EXCEPTION("eType", "", "vertical datum",
                                  "Only VD_Ellipsoidal or VD_Orthometric datum codes can be "
                                  "specified for the output vertical datum");
    if (eSource == VD_Other && eType != VD_Other)
        THROW_PARAMETER_EXCEPTION("eType", "not VD_Other", "VD_Other",
                                  "Because the source vertical datum is VD_Other, the output "
                                  "vertical datum must also be VD_Other");
    if (eSource != VD_Other && eType == VD_Other)
        THROW_PARAMETER_EXCEPTION("eType", "VD_Other", "not VD_Other",
                                  "Because the source vertical datum is not VD_Other, the output "
                                  "vertical datum may not be VD_Other");
}

} // namespace

TinReader::TinReader(ZARLayer_t*& poLayer, const double& dfOffset, const double& dfScale,
                     DatumType eSourceDatum)
    : mpLayer(poLayer), meSourceDatum(eSourceDatum), meOutputDatum(eSourceDatum) {
    if (mpLayer == nullptr)
        return;
    Init();
    try {
        SetUp(dfOffset, dfScale);
    } catch (...) {
        ReleaseCRS();
        throw;
    }
}

TinReader::~TinReader() {
    ReleaseCRS();
    if (mpLayer != nullptr)
        ZARClose(ZARLayer2fp(mpLayer));
}

void TinReader::Init() {
    mbLocalCRS = true;
    mnShapeCount = 0;
    mpoCRS = nullptr;
    mpo3DCRS = nullptr;
    mpoOutput3DCRS = nullptr;
    mpoTransform = nullptr;
    mdfElOffset = 0.0;
    mdfElScale = 1.0;
    mdfXBase = 0.0;
    mdfYBase = 0.0;
}

void TinReader::SetUp(double dfOffset, double dfScale) {
    ProjInfo_t info{};
    ZARGetProjectionInfo(mpLayer, &info);
    ogc::IProjInfoFactory* factory = ogc::ProjectionEngine::GetProjInfoFactory(ogc::PE_Default);
    std::unique_ptr<ICRS> crs(factory->CreateCRS(&info));
    SetDbmCRS(crs.get());
    static_cast<void>(crs.release());
    SetElFactor(dfOffset, dfScale);
    SetOutputVerticalDatum(meSourceDatum);
    mnShapeCount = load::GetShapeCount(*mpLayer);
    ZARVertex low{};
    ZARVertex high{};
    ZARGetExtents(mpLayer, &low, &high);
    moBBox.min = {low.x, low.y, low.z};
    moBBox.max = {high.x, high.y, high.z};
}

void TinReader::ReleaseCRS() {
    delete mpoCRS;
    mpoCRS = nullptr;
    delete mpo3DCRS;
    mpo3DCRS = nullptr;
    delete mpoOutput3DCRS;
    mpoOutput3DCRS = nullptr;
    delete mpoTransform;
    mpoTransform = nullptr;
}

double TinReader::GetArea() const {
    return (moBBox.max.y - moBBox.min.y) * (moBBox.max.x - moBBox.min.x);
}

void TinReader::SetDbmCRS(ICRS* poCRS) {
    if (poCRS == nullptr)
        THROW_PARAMETER_EXCEPTION("poCRS", "NULL", "non-NULL",
                                  "SetDbmCRS(): CRS pointer may not be NULL");
    const int dimension = poCRS->GetDimension();
    if (dimension != 2)
        THROW_PARAMETER_EXCEPTION("poCRS", FormatString("Dimension = %d", dimension),
                                  "Dimension = 2", "SetDbmCRS(): DBM CRS dimension must be 2");
    const bool local = ogc::utils::IsCRSLocal(poCRS);
    mpo3DCRS = CreateCompound(*poCRS, meSourceDatum);
    mpoCRS = poCRS;
    mbLocalCRS = local;
}

void TinReader::SetElFactor(const double dfOffset, const double dfScale) {
    if (dfScale == 0.0)
        THROW_PARAMETER_EXCEPTION("dfScale", "0.0", "non-zero",
                                  "The scale parameter may not be zero");
    mdfElOffset = dfOffset;
    mdfElScale = dfScale;
}

void TinReader::SetOutputVerticalDatum(DatumType eType) {
    TestDatum(meSourceDatum, eType);
    const bool unknown = meSourceDatum == VD_Other && eType == VD_Other;
    if (mpoCRS != nullptr && mbLocalCRS && meSourceDatum != eType && eType != VD_Other)
        tellus::Warning::Warn("The layer has a local CRS, or none: its heights are the same in "
                              "every vertical datum.",
                              "tin/tinreader", __LINE__);
    // A reader on null has no CRS, and no heights to convert.
    if (mpoCRS != nullptr && (unknown || mpoOutput3DCRS == nullptr || eType != meOutputDatum)) {
        // Both are made before the old ones go, so that a failure changes nothing.
        std::unique_ptr<ICRS> compound(CreateCompound(*mpoCRS, eType));
        ogc::ct::IMathTransform* transform =
            ogc::utils::CreateCRSTransform(mpo3DCRS, compound.get(), 0.0);
        delete mpoOutput3DCRS;
        mpoOutput3DCRS = compound.release();
        delete mpoTransform;
        mpoTransform = transform;
    }
    meOutputDatum = eType;
    mpfnHeightConvert = meSourceDatum == eType || eType == VD_Other || mbLocalCRS
                            ? &TinReader::HeightConvertSimple
                            : &TinReader::HeightConvert;
}

std::size_t TinReader::EstimateObjBytes_Tin() const {
    const std::int64_t vertices = EstimateVertices(mnShapeCount);
    return static_cast<std::size_t>((vertices + 4 * std::int64_t{mnShapeCount}) * 12 + 88);
}

std::size_t TinReader::EstimateObjBytes_Octree() const {
    const auto nodes = 2U * static_cast<std::uint32_t>(EstimateVertices(mnShapeCount));
    return std::size_t{nodes} * 152 + 80;
}

std::size_t TinReader::EstimateLoadBytes() const {
    // The octree is gone before the surface exists.
    return static_cast<std::size_t>(mnShapeCount) * 96 +
           std::max(EstimateObjBytes_Octree(), EstimateObjBytes_Tin());
}

} // namespace kelm::tin
