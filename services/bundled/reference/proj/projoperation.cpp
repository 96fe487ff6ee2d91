#include "services/bundled/reference/proj/projoperation.h"

#include "services/reporting.h"

#include <cmath>
#include <cstring>
#include <limits>
#include <utility>

namespace kelm::ogc {

namespace {

/// Some areas are named by a list of all their counties.
constexpr std::size_t LONGEST_AREA_NAME = 80;

void AppendItem(std::string& list, const std::string& item) {
    list.append(list.empty() ? "" : ", ").append(item);
}

/// Adds the grid with this number to the operation's texts.
void AddGrid(ProjSession& session, ProjOperation& operation, int number) {
    const char* name = nullptr;
    const char* path = nullptr;
    const char* url = nullptr;
    int available = 0;
    if (!proj_coordoperation_get_grid_used(session.Get(), operation.mpo.get(), number, &name, &path,
                                           nullptr, &url, nullptr, nullptr, &available))
        return;
    const char* place = available ? path : url;
    const std::string grid =
        place && *place ? FormatString("%s (%s)", name, place) : std::string(name);
    AppendItem(operation.moGrids, grid);
    if (!available)
        AppendItem(operation.moMissingGrids, grid);
}

void ListGrids(ProjSession& session, ProjOperation& operation) {
    const int count = proj_coordoperation_get_grid_used_count(session.Get(), operation.mpo.get());
    for (int number = 0; number < count; ++number)
        AddGrid(session, operation, number);
}

void SetAccuracy(ProjSession& session, ProjOperation& operation) {
    const double accuracy = proj_coordoperation_get_accuracy(session.Get(), operation.mpo.get());
    operation.mdfAccuracy = accuracy >= 0.0 ? accuracy : std::numeric_limits<double>::infinity();
}

void SetArea(ProjSession& session, ProjOperation& operation) {
    const char* name = nullptr;
    ReadArea(session, operation.mpo.get(), operation.moArea, name);
    operation.moAreaName =
        name && *name ? ShortenText(name, LONGEST_AREA_NAME) : operation.moArea.GetText();
}

/// @return true for an operation that does nothing although the kinds of heights differ
bool IsEmpty(ProjSession& session, const PJ* object, bool heightsDiffer) {
    const char* steps =
        heightsDiffer ? proj_as_proj_string(session.Get(), object, PJ_PROJ_5, nullptr) : nullptr;
    return steps && std::strcmp(steps, "+proj=noop") == 0;
}

/// @return true if PROJ can carry the operation out, given its grids
bool IsPossible(ProjSession& session, const ProjOperation& operation) {
    return !operation.IsUsable() ||
           proj_coordoperation_is_instantiable(session.Get(), operation.mpo.get());
}

/// @return the operation; without object if it is a guess or PROJ cannot carry it out
ProjOperation DescribeOperation(ProjSession& session, PjPtr object, bool heightsDiffer) {
    ProjOperation operation{std::move(object), {}, 0.0, {}, {}, {}, {}};
    const PJ* const raw = operation.mpo.get();
    operation.moName = proj_get_name(raw);
    SetAccuracy(session, operation);
    SetArea(session, operation);
    ListGrids(session, operation);
    if (!IsPossible(session, operation) ||
        proj_coordoperation_has_ballpark_transformation(session.Get(), raw) ||
        IsEmpty(session, raw, heightsDiffer))
        operation.mpo.reset();
    else if (operation.IsUsable())
        operation.mpo.reset(proj_normalize_for_visualization(session.Get(), raw));
    return operation;
}

} // namespace

std::string ProjOperation::GetAccuracyText() const {
    return std::isfinite(mdfAccuracy) ? FormatString("accuracy %g m", mdfAccuracy)
                                      : std::string("accuracy unknown");
}

std::vector<ProjOperation> DescribeOperations(ProjSession& session, const PJ_OBJ_LIST* list,
                                              bool heightsDiffer) {
    std::vector<ProjOperation> operations;
    const int count = list ? proj_list_get_count(list) : 0;
    for (int i = 0; i < count; ++i) {
        PjPtr object(proj_list_get(session.Get(), list, i));
        if (!object)
            continue;
        ProjOperation operation = DescribeOperation(session, std::move(object), heightsDiffer);
        if (operation.mpo)
            operations.push_back(std::move(operation));
    }
    return operations;
}

} // namespace kelm::ogc
