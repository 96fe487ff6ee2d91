#include "services/bundled/projoperation.h"

#include "services/exception.h"
#include "services/reporting.h"

#include <algorithm>
#include <cmath>
#include <cstring>
#include <limits>
#include <utility>

namespace kelm::ogc {

namespace {

constexpr const char* kSource = "services/bundled/projoperation";

/// Areas of use are registered to a hundredth of a degree.
constexpr double kAreaMargin = 0.01;

/// Some areas are named by a list of all their counties.
constexpr std::size_t kLongestAreaName = 80;

using FactoryContextPtr = std::unique_ptr<PJ_OPERATION_FACTORY_CONTEXT, ProjRelease>;

/// @return the operations in PROJ's order; null if there is none
PjListPtr SearchOperations(ProjSession& oSession, const PJ* poSource, const PJ* poTarget,
                           PROJ_GRID_AVAILABILITY_USE eGrids, bool bBallpark) {
    PJ_CONTEXT* const poContext = oSession.Get();
    const FactoryContextPtr poFactory(proj_create_operation_factory_context(poContext, nullptr));
    if (!poFactory)
        return nullptr;
    proj_operation_factory_context_set_grid_availability_use(poContext, poFactory.get(), eGrids);
    proj_operation_factory_context_set_spatial_criterion(
        poContext, poFactory.get(), PROJ_SPATIAL_CRITERION_PARTIAL_INTERSECTION);
    proj_operation_factory_context_set_allow_ballpark_transformations(poContext, poFactory.get(),
                                                                      bBallpark ? 1 : 0);
    PjListPtr poList(proj_create_operations(poContext, poSource, poTarget, poFactory.get()));
    return poList && proj_list_get_count(poList.get()) > 0 ? std::move(poList) : nullptr;
}

void AppendItem(std::string& list, const std::string& item) {
    list.append(list.empty() ? "" : ", ").append(item);
}

void ListGrids(ProjSession& oSession, ProjOperation& oOperation) {
    const PJ* const po = oOperation.mpo.get();
    const int nGrids = proj_coordoperation_get_grid_used_count(oSession.Get(), po);
    for (int i = 0; i < nGrids; ++i) {
        const char* pszName = nullptr;
        const char* pszPath = nullptr;
        const char* pszUrl = nullptr;
        int bAvailable = 0;
        if (!proj_coordoperation_get_grid_used(oSession.Get(), po, i, &pszName, &pszPath, nullptr,
                                               &pszUrl, nullptr, nullptr, &bAvailable))
            continue;
        const char* pszPlace = bAvailable ? pszPath : pszUrl;
        const std::string grid = pszPlace && *pszPlace ? FormatString("%s (%s)", pszName, pszPlace)
                                                       : std::string(pszName);
        AppendItem(oOperation.moGrids, grid);
        if (!bAvailable)
            AppendItem(oOperation.moMissingGrids, grid);
    }
}

void SetArea(ProjSession& oSession, ProjOperation& oOperation) {
    const char* pszName = nullptr;
    ReadArea(oSession, oOperation.mpo.get(), oOperation.moArea, pszName);
    oOperation.moAreaName =
        pszName && *pszName ? ShortenText(pszName, kLongestAreaName) : oOperation.moArea.GetText();
}

/// @return true for an operation that does nothing although one of the two CRSs has ellipsoidal
/// heights and the other has not
bool TestEmpty(ProjSession& oSession, const PJ* po, bool bHeightsDiffer) {
    const char* pszSteps =
        bHeightsDiffer ? proj_as_proj_string(oSession.Get(), po, PJ_PROJ_5, nullptr) : nullptr;
    return pszSteps && std::strcmp(pszSteps, "+proj=noop") == 0;
}

/// @return the operation, without object if PROJ has no means to carry it out at all
ProjOperation DescribeOperation(ProjSession& oSession, PjPtr po, bool bHeightsDiffer) {
    ProjOperation oOperation{std::move(po), {}, 0.0, {}, {}, {}, {}};
    PJ* const poRaw = oOperation.mpo.get();
    oOperation.moName = proj_get_name(poRaw);
    const double dfAccuracy = proj_coordoperation_get_accuracy(oSession.Get(), poRaw);
    oOperation.mdfAccuracy =
        dfAccuracy >= 0.0 ? dfAccuracy : std::numeric_limits<double>::infinity();
    SetArea(oSession, oOperation);
    ListGrids(oSession, oOperation);
    const bool bPossible =
        !oOperation.TestUsable() || proj_coordoperation_is_instantiable(oSession.Get(), poRaw);
    if (!bPossible || proj_coordoperation_has_ballpark_transformation(oSession.Get(), poRaw) ||
        TestEmpty(oSession, poRaw, bHeightsDiffer))
        oOperation.mpo.reset();
    else if (oOperation.TestUsable())
        oOperation.mpo.reset(proj_normalize_for_visualization(oSession.Get(), poRaw));
    return oOperation;
}

/// @return the operations of PROJ's list that are not mere guesses, in its order
std::vector<ProjOperation> DescribeOperations(ProjSession& oSession, const PJ_OBJ_LIST* poList,
                                              bool bHeightsDiffer) {
    std::vector<ProjOperation> operations;
    const int nCount = poList ? proj_list_get_count(poList) : 0;
    for (int i = 0; i < nCount; ++i) {
        PjPtr po(proj_list_get(oSession.Get(), poList, i));
        if (!po)
            continue;
        ProjOperation oOperation = DescribeOperation(oSession, std::move(po), bHeightsDiffer);
        if (oOperation.mpo)
            operations.push_back(std::move(oOperation));
    }
    return operations;
}

/// Sorts by accuracy; of equals the usable ones come first, then those of the smaller area. Then
/// drops what is covered.
void RankOperations(std::vector<ProjOperation>& operations) {
    std::stable_sort(operations.begin(), operations.end(),
                     [](const ProjOperation& oA, const ProjOperation& oB) {
                         if (oA.mdfAccuracy != oB.mdfAccuracy)
                             return oA.mdfAccuracy < oB.mdfAccuracy;
                         if (oA.TestUsable() != oB.TestUsable())
                             return oA.TestUsable();
                         return oA.moArea.GetSize() < oB.moArea.GetSize();
                     });
    std::vector<ProjOperation> kept;
    for (ProjOperation& oOperation : operations) {
        const auto Covers = [&](const ProjOperation& oBetter) {
            return oBetter.moArea.TestArea(oOperation.moArea);
        };
        if (std::none_of(kept.begin(), kept.end(), Covers))
            kept.push_back(std::move(oOperation));
    }
    operations = std::move(kept);
}

/// @return the name of a compound, with the kind of heights where PROJ's name leaves it out
std::string GetHeightsText(const PJ* po, cs::DatumType eDatum) {
    return FormatString("'%s'%s", proj_get_name(po),
                        eDatum == cs::VD_Ellipsoidal ? " with ellipsoidal heights" : "");
}

/// @return which grids are missing where, the most accurate operation first
std::string GetMissingText(const std::vector<ProjOperation>& operations) {
    const ProjOperation& oBest = operations.front();
    std::string text = FormatString("grid files are missing: '%s' (%s, %s) needs %s",
                                    oBest.moName.c_str(), oBest.GetAccuracyText().c_str(),
                                    oBest.moAreaName.c_str(), oBest.moMissingGrids.c_str());
    for (std::size_t i = 1; i < operations.size(); ++i)
        text += FormatString("; in %s: %s", operations[i].moAreaName.c_str(),
                             operations[i].moMissingGrids.c_str());
    return text;
}

} // namespace

bool AreaOfUse::TestWorld() const {
    return mdfWest <= -180.0 && mdfSouth <= -90.0 && mdfEast >= 180.0 && mdfNorth >= 90.0;
}

bool AreaOfUse::TestPoint(double dfLongitude, double dfLatitude) const {
    const double dfTurned = std::remainder(dfLongitude, 360.0);
    const bool bEastOfWest = dfTurned >= mdfWest - kAreaMargin;
    const bool bWestOfEast = dfTurned <= mdfEast + kAreaMargin;
    const bool bInLongitude =
        mdfWest <= mdfEast ? bEastOfWest && bWestOfEast : bEastOfWest || bWestOfEast;
    return bInLongitude && dfLatitude >= mdfSouth - kAreaMargin &&
           dfLatitude <= mdfNorth + kAreaMargin;
}

double AreaOfUse::GetSize() const {
    const double dfWidth = mdfEast - mdfWest;
    return (dfWidth < 0.0 ? dfWidth + 360.0 : dfWidth) * (mdfNorth - mdfSouth);
}

std::string AreaOfUse::GetText() const {
    return FormatString("longitude %g to %g, latitude %g to %g", mdfWest, mdfEast, mdfSouth,
                        mdfNorth);
}

bool AreaOfUse::TestArea(const AreaOfUse& oOther) const {
    if (oOther.mdfSouth < mdfSouth || oOther.mdfNorth > mdfNorth)
        return false;
    if (mdfWest <= -180.0 && mdfEast >= 180.0)
        return true;
    const bool bSameForm = (mdfWest <= mdfEast) == (oOther.mdfWest <= oOther.mdfEast);
    return bSameForm && oOther.mdfWest >= mdfWest && oOther.mdfEast <= mdfEast;
}

bool ReadArea(ProjSession& oSession, const PJ* po, AreaOfUse& oArea, const char*& pszName) {
    AreaOfUse oRead;
    // PROJ gives -1000 for a bound that it does not know.
    if (!proj_get_area_of_use(oSession.Get(), po, &oRead.mdfWest, &oRead.mdfSouth, &oRead.mdfEast,
                              &oRead.mdfNorth, &pszName) ||
        !(oRead.mdfWest > -1000.0))
        return false;
    oArea = oRead;
    return true;
}

PjPtr CreateToDegrees(ProjSession& oSession, const PJ* poMap) {
    const PjPtr poWorld(
        proj_create_from_database(oSession.Get(), "EPSG", "4326", PJ_CATEGORY_CRS, 0, nullptr));
    const PjListPtr poList =
        poWorld ? SearchOperations(oSession, poMap, poWorld.get(),
                                   PROJ_GRID_AVAILABILITY_DISCARD_OPERATION_IF_MISSING_GRID, true)
                : nullptr;
    const int nCount = poList ? proj_list_get_count(poList.get()) : 0;
    PjPtr poDegrees;
    for (int i = 0; i < nCount && !poDegrees; ++i) {
        const PjPtr po(proj_list_get(oSession.Get(), poList.get(), i));
        // One without grid knows no bounds, and areas of use are not that fine.
        if (po && proj_coordoperation_get_grid_used_count(oSession.Get(), po.get()) == 0)
            poDegrees.reset(proj_normalize_for_visualization(oSession.Get(), po.get()));
    }
    if (!poDegrees)
        throw DataException(FormatString("'%s' cannot be brought to longitude and latitude%s",
                                         proj_get_name(poMap), oSession.TakeMessages().c_str()),
                            kSource, __PRETTY_FUNCTION__, __LINE__);
    return poDegrees;
}

std::string ProjOperation::GetAccuracyText() const {
    return std::isfinite(mdfAccuracy) ? FormatString("accuracy %g m", mdfAccuracy)
                                      : std::string("accuracy unknown");
}

std::vector<ProjOperation> ListOperations(ProjSession& oSession, const ProjCRS& oSource,
                                          const ProjCRS& oTarget) {
    const PjPtr poSource = oSession.CreateFromWkt(oSource.GetText().moDefinition);
    const PjPtr poTarget = oSession.CreateFromWkt(oTarget.GetText().moDefinition);
    const bool bHeightsDiffer =
        (oSource.GetDatum() == cs::VD_Ellipsoidal) != (oTarget.GetDatum() == cs::VD_Ellipsoidal);
    std::vector<ProjOperation> operations;
    // A grid file that nobody distributes counts only if nothing else is left to name.
    for (const PROJ_GRID_AVAILABILITY_USE eGrids :
         {PROJ_GRID_AVAILABILITY_KNOWN_AVAILABLE, PROJ_GRID_AVAILABILITY_IGNORED}) {
        const PjListPtr poList =
            SearchOperations(oSession, poSource.get(), poTarget.get(), eGrids, false);
        operations = DescribeOperations(oSession, poList.get(), bHeightsDiffer);
        if (!operations.empty())
            break;
    }
    RankOperations(operations);
    const std::string messages = oSession.TakeMessages();
    if (std::none_of(operations.begin(), operations.end(),
                     [](const ProjOperation& oOperation) { return oOperation.TestUsable(); }))
        throw DataException(
            FormatString(
                "No conversion from %s to %s: %s",
                GetHeightsText(poSource.get(), oSource.GetDatum()).c_str(),
                GetHeightsText(poTarget.get(), oTarget.GetDatum()).c_str(),
                operations.empty()
                    ? ("PROJ has no operation that is more than a guess" + messages).c_str()
                    : GetMissingText(operations).c_str()),
            kSource, __PRETTY_FUNCTION__, __LINE__);
    return operations;
}

} // namespace kelm::ogc
