#include "services/bundled/reference/proj/projoperation.h"

#include "services/bundled/reference/proj/steps.h"
#include "services/reporting.h"

#include <algorithm>
#include <cmath>
#include <cstring>
#include <limits>
#include <utility>

namespace kelm::ogc {

namespace {

/// Some areas are named by a list of all their counties.
constexpr std::size_t LONGEST_AREA_NAME = 80;

/// Metres, as PROJ gives it: 5 for a shift of datum, counted there and back, and 1 for a geoid
/// model. That is NAD27 by its grids. What is coarser stands for several countries at once (S-JTSK
/// 13, ED50 13 to 21), or for a survey of few points, or is marked as unknown by 999.
constexpr double COARSEST_ACCURACY = 11.0;

void AppendItem(std::string& list, const std::string& item) {
    list.append(list.empty() ? "" : ", ").append(item);
}

/// Adds the grid with this number to the operation's texts, unless its step has been left out.
void AddGrid(ProjSession& session, const PJ* object, ProjOperation& operation, int number) {
    const char* name = nullptr;
    const char* path = nullptr;
    const char* url = nullptr;
    int available = 0;
    if (!proj_coordoperation_get_grid_used(session.Get(), object, number, &name, &path, nullptr,
                                           &url, nullptr, nullptr, &available) ||
        (!operation.moSteps.empty() && operation.moSteps.find(name) == std::string::npos))
        return;
    const char* place = available ? path : url;
    const std::string grid =
        place && *place ? FormatString("%s (%s)", name, place) : std::string(name);
    AppendItem(operation.moGrids, grid);
    if (!available)
        AppendItem(operation.moMissingGrids, grid);
}

void ListGrids(ProjSession& session, const PJ* object, ProjOperation& operation) {
    const int count = proj_coordoperation_get_grid_used_count(session.Get(), object);
    for (int number = 0; number < count; ++number)
        AddGrid(session, object, operation, number);
}

void SetAccuracy(ProjSession& session, const PJ* object, ProjOperation& operation) {
    const double accuracy = proj_coordoperation_get_accuracy(session.Get(), object);
    operation.mdfAccuracy = accuracy >= 0.0 ? accuracy : std::numeric_limits<double>::infinity();
}

void SetArea(ProjSession& session, const PJ* object, ProjOperation& operation) {
    const char* name = nullptr;
    AreaOfUse area;
    ReadArea(session, object, area, name);
    operation.moAreas = {area};
    operation.moAreaName = name && *name ? ShortenText(name, LONGEST_AREA_NAME) : area.GetText();
}

/// @return PROJ's pipeline for an operation, or empty
std::string GetSteps(ProjSession& session, const PJ* object) {
    const char* steps = proj_as_proj_string(session.Get(), object, PJ_PROJ_5, nullptr);
    return steps ? steps : "";
}

/// @return true for an operation that is no more than a guess
bool IsGuess(ProjSession& session, const PJ* object, const OperationNeeds& needs) {
    return proj_coordoperation_has_ballpark_transformation(session.Get(), object) ||
           (needs.mbHeightsDiffer && GetSteps(session, object) == "+proj=noop");
}

/// Sets the object, with x as easting or longitude, and its steps.
/// @return true if PROJ can carry it out now
bool SetSteps(ProjSession& session, const PJ* object, ProjOperation& operation,
              const OperationNeeds& needs) {
    operation.mpo.reset(proj_normalize_for_visualization(session.Get(), object));
    const std::string steps = GetSteps(session, operation.mpo.get());
    operation.moSteps = needs.mbShortShifts ? RemoveCancelledShifts(steps) : steps;
    if (operation.moSteps == steps)
        return proj_coordoperation_is_instantiable(session.Get(), object) != 0;
    PjPtr reduced(proj_create(session.Get(), operation.moSteps.c_str()));
    if (!reduced)
        return false;
    operation.mpo = std::move(reduced);
    return true;
}

/// @return the operation; without object if it is a guess or PROJ cannot carry it out
ProjOperation DescribeOperation(ProjSession& session, const PJ* object,
                                const OperationNeeds& needs) {
    ProjOperation operation{};
    if (IsGuess(session, object, needs))
        return operation;
    operation.moName = proj_get_name(object);
    SetAccuracy(session, object, operation);
    SetArea(session, object, operation);
    const bool possible = SetSteps(session, object, operation, needs);
    ListGrids(session, object, operation);
    // A missing grid is told to the caller; nothing helps against another reason.
    if (!possible && operation.IsUsable())
        operation.mpo.reset();
    return operation;
}

} // namespace

std::string ProjOperation::GetAccuracyText() const {
    return std::isfinite(mdfAccuracy) ? FormatString("accuracy %g m", mdfAccuracy)
                                      : std::string("accuracy unknown");
}

bool ProjOperation::IsFine() const {
    return mdfAccuracy <= COARSEST_ACCURACY || std::isinf(mdfAccuracy);
}

std::string ProjOperation::GetCoarseText() const {
    return FormatString("the most accurate operation, '%s' (%s), is coarser than %g m",
                        moName.c_str(), GetAccuracyText().c_str(), COARSEST_ACCURACY);
}

bool ProjOperation::IsPointInside(double longitude, double latitude) const {
    return std::any_of(moAreas.begin(), moAreas.end(), [&](const AreaOfUse& area) {
        return area.IsPointInside(longitude, latitude);
    });
}

bool ProjOperation::Covers(const ProjOperation& other) const {
    const auto isCovered = [this](const AreaOfUse& inner) {
        return std::any_of(moAreas.begin(), moAreas.end(),
                           [&](const AreaOfUse& area) { return area.IsAreaInside(inner); });
    };
    return std::all_of(other.moAreas.begin(), other.moAreas.end(), isCovered);
}

double ProjOperation::GetSize() const {
    double size = 0.0;
    for (const AreaOfUse& area : moAreas)
        size = std::max(size, area.GetSize());
    return size;
}

void ProjOperation::Merge(const ProjOperation& other) {
    if (other.GetSize() > GetSize()) {
        moName = other.moName;
        moAreaName = other.moAreaName;
    }
    moAreas.insert(moAreas.end(), other.moAreas.begin(), other.moAreas.end());
}

std::vector<ProjOperation> DescribeOperations(ProjSession& session, const PJ_OBJ_LIST* list,
                                              const OperationNeeds& needs) {
    std::vector<ProjOperation> operations;
    const int count = list ? proj_list_get_count(list) : 0;
    for (int i = 0; i < count; ++i) {
        const PjPtr object(proj_list_get(session.Get(), list, i));
        if (!object)
            continue;
        ProjOperation operation = DescribeOperation(session, object.get(), needs);
        if (operation.mpo)
            operations.push_back(std::move(operation));
    }
    return operations;
}

} // namespace kelm::ogc
