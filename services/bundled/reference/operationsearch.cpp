#include "services/bundled/reference/operationsearch.h"

#include "services/bundled/reference/heightmeaning.h"
#include "services/exception.h"
#include "services/reporting.h"

#include <algorithm>
#include <string>
#include <utility>

namespace kelm::ogc {

namespace {

constexpr const char* SOURCE = "services/bundled/reference/operationsearch";

using FactoryContextPtr = std::unique_ptr<PJ_OPERATION_FACTORY_CONTEXT, ProjRelease>;

/// @return the operations in PROJ's order; null if there is none
PjListPtr SearchOperations(ProjSession& session, const PJ* source, const PJ* target,
                           PROJ_GRID_AVAILABILITY_USE grids, bool ballpark) {
    PJ_CONTEXT* const context = session.Get();
    const FactoryContextPtr factory(proj_create_operation_factory_context(context, nullptr));
    if (!factory)
        return nullptr;
    proj_operation_factory_context_set_grid_availability_use(context, factory.get(), grids);
    proj_operation_factory_context_set_spatial_criterion(
        context, factory.get(), PROJ_SPATIAL_CRITERION_PARTIAL_INTERSECTION);
    proj_operation_factory_context_set_allow_ballpark_transformations(context, factory.get(),
                                                                      ballpark ? 1 : 0);
    PjListPtr list(proj_create_operations(context, source, target, factory.get()));
    return list && proj_list_get_count(list.get()) > 0 ? std::move(list) : nullptr;
}

/// The order by accuracy; of equals the usable ones come first, then those of the smaller area.
bool IsBetter(const ProjOperation& a, const ProjOperation& b) {
    if (a.mdfAccuracy != b.mdfAccuracy)
        return a.mdfAccuracy < b.mdfAccuracy;
    if (a.IsUsable() != b.IsUsable())
        return a.IsUsable();
    return a.GetSize() < b.GetSize();
}

/// Takes an operation over into one of the same steps. @return false if there is none
bool MergeSame(std::vector<ProjOperation>& kept, const ProjOperation& operation) {
    const auto same = std::find_if(kept.begin(), kept.end(), [&](const ProjOperation& other) {
        return !operation.moSteps.empty() && other.moSteps == operation.moSteps;
    });
    if (same != kept.end())
        same->Merge(operation);
    return same != kept.end();
}

/// @return the operations from the best on, without those that a better one covers. Operations of
/// the same steps are one: PROJ's figures of accuracy then differ by a shift that is taken back
std::vector<ProjOperation> RankOperations(std::vector<ProjOperation> operations) {
    std::stable_sort(operations.begin(), operations.end(), IsBetter);
    std::vector<ProjOperation> kept;
    for (ProjOperation& operation : operations) {
        const auto covers = [&](const ProjOperation& better) { return better.Covers(operation); };
        if (!MergeSame(kept, operation) && std::none_of(kept.begin(), kept.end(), covers))
            kept.push_back(std::move(operation));
    }
    return kept;
}

/// @return all operations that are not mere guesses. A grid file that nobody distributes counts
/// only if there is no operation without such a file
std::vector<ProjOperation> FindOperations(ProjSession& session, const PJ* source, const PJ* target,
                                          const OperationNeeds& needs) {
    for (const PROJ_GRID_AVAILABILITY_USE grids :
         {PROJ_GRID_AVAILABILITY_KNOWN_AVAILABLE, PROJ_GRID_AVAILABILITY_IGNORED}) {
        const PjListPtr list = SearchOperations(session, source, target, grids, false);
        std::vector<ProjOperation> operations = DescribeOperations(session, list.get(), needs);
        if (!operations.empty())
            return operations;
    }
    return {};
}

/// @return which grids are missing where, the most accurate operation first
std::string GetMissingText(const std::vector<ProjOperation>& operations) {
    const ProjOperation& best = operations.front();
    std::string text = FormatString("grid files are missing: '%s' (%s, %s) needs %s",
                                    best.moName.c_str(), best.GetAccuracyText().c_str(),
                                    best.moAreaName.c_str(), best.moMissingGrids.c_str());
    for (std::size_t i = 1; i < operations.size(); ++i)
        if (!operations[i].IsUsable())
            text += FormatString("; in %s: %s", operations[i].moAreaName.c_str(),
                                 operations[i].moMissingGrids.c_str());
    return text;
}

/// One of the two compounds of a search.
struct Side {
    PjPtr mpo;
    bool mbEllipsoidal;

    Side(ProjSession& session, const ProjCRS& crs)
        : mpo(session.CreateFromText(crs.GetText().moDefinition)),
          mbEllipsoidal(crs.GetDatum() == cs::VD_Ellipsoidal) {}
    /// @return the name, with the kind of heights where PROJ's name leaves it out
    std::string GetText() const {
        return FormatString("'%s'%s", proj_get_name(mpo.get()),
                            mbEllipsoidal ? " with ellipsoidal heights" : "");
    }
};

/// @return why no operation serves. @param messages what PROJ has said
std::string GetReason(const std::vector<ProjOperation>& operations, const std::string& messages) {
    if (operations.empty())
        return "PROJ has no operation that is more than a guess" + messages;
    return operations.front().IsFine() ? GetMissingText(operations)
                                       : operations.front().GetCoarseText();
}

/// @throw kelm::DataException unless an operation serves. @param messages what PROJ has said
void TestUsable(const std::vector<ProjOperation>& operations, const Side& source,
                const Side& target, const std::string& messages) {
    if (std::any_of(operations.begin(), operations.end(), [](const ProjOperation& operation) {
            return operation.IsUsable() && operation.IsFine();
        }))
        return;
    throw DataException(FormatString("No conversion from %s to %s: %s", source.GetText().c_str(),
                                     target.GetText().c_str(),
                                     GetReason(operations, messages).c_str()),
                        SOURCE, __PRETTY_FUNCTION__, __LINE__);
}

/// @return the first operation of the list that needs no grid; null if there is none
PjPtr FindWithoutGrid(ProjSession& session, const PJ_OBJ_LIST* list) {
    const int count = list ? proj_list_get_count(list) : 0;
    PjPtr found;
    for (int i = 0; i < count && !found; ++i) {
        const PjPtr object(proj_list_get(session.Get(), list, i));
        if (object && proj_coordoperation_get_grid_used_count(session.Get(), object.get()) == 0)
            found.reset(proj_normalize_for_visualization(session.Get(), object.get()));
    }
    return found;
}

} // namespace

std::vector<ProjOperation> ListOperations(ProjSession& session, const ProjCRS& source,
                                          const ProjCRS& target) {
    const Side from(session, source);
    const Side to(session, target);
    const OperationNeeds needs{from.mbEllipsoidal != to.mbEllipsoidal,
                               IsGeocentricEllipsoid(session, from.mpo.get())};
    std::vector<ProjOperation> operations =
        RankOperations(FindOperations(session, from.mpo.get(), to.mpo.get(), needs));
    TestUsable(operations, from, to, session.TakeMessages());
    return operations;
}

PjPtr CreateToDegrees(ProjSession& session, const PJ* map) {
    const PjPtr world(
        proj_create_from_database(session.Get(), "EPSG", "4326", PJ_CATEGORY_CRS, 0, nullptr));
    const PjListPtr list =
        world ? SearchOperations(session, map, world.get(),
                                 PROJ_GRID_AVAILABILITY_DISCARD_OPERATION_IF_MISSING_GRID, true)
              : nullptr;
    // A grid gives no answer outside its bounds, and areas of use are too coarse to need one.
    PjPtr degrees = FindWithoutGrid(session, list.get());
    if (!degrees)
        throw DataException(FormatString("'%s' cannot be brought to longitude and latitude%s",
                                         proj_get_name(map), session.TakeMessages().c_str()),
                            SOURCE, __PRETTY_FUNCTION__, __LINE__);
    return degrees;
}

} // namespace kelm::ogc
