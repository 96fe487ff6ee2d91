#include "services/bundled/reference/projtransform.h"

#include "services/bundled/reference/areacensus.h"
#include "services/bundled/reference/failurecount.h"
#include "services/bundled/reference/heightmeaning.h"
#include "services/bundled/reference/operationsearch.h"
#include "services/bundled/reference/proj/heightunit.h"
#include "services/reporting.h"

#include <algorithm>
#include <cmath>

namespace kelm::ogc {

namespace {

constexpr std::size_t STRIDE = 3 * sizeof(double);

/// More than the radius of the earth in any unit. A greater height stands for a missing one, and
/// would drown the others where heights are interpolated.
constexpr double GREATEST_HEIGHT = 1e8;

bool IsFinite(const double* triple) {
    return std::isfinite(triple[0]) && std::isfinite(triple[1]) && std::isfinite(triple[2]);
}

bool IsUsable(const double* triple) {
    return IsFinite(triple) && std::abs(triple[2]) <= GREATEST_HEIGHT;
}

/// @return the failure of all points of a call
FailureCount FailAll(const double* source, unsigned int count) {
    return {count, source[0], source[1], source[2]};
}

/// @throw kelm::DataException if a point cannot be the place of a vertex
void TestSource(const double* source, unsigned int count) {
    FailureCount failed;
    for (std::size_t i = 0; i < count; ++i)
        if (!IsUsable(source + 3 * i))
            failed.Add(source + 3 * i);
    failed.Test(count, "a coordinate is not finite, or the height is none on the earth");
}

/// @param error PROJ's error number. @return the points that were not converted
FailureCount CountFailures(const double* source, const double* target, unsigned int count,
                           int error) {
    FailureCount failed;
    for (std::size_t i = 0; i < count; ++i)
        if (!IsFinite(target + 3 * i))
            failed.Add(source + 3 * i);
    // An error that no point shows is still an error.
    return error != 0 && failed.mnFailed == 0 ? FailAll(source, count) : failed;
}

/// @throw kelm::DataException if the operation lacks a grid file or is too coarse
void TestServes(const ProjOperation& operation, const double* source, unsigned int count) {
    if (!operation.IsFine())
        FailAll(source, count).Test(count, operation.GetCoarseText());
    if (!operation.IsUsable())
        FailAll(source, count)
            .Test(count, FormatString("'%s' (%s) needs %s, which is not installed",
                                      operation.moName.c_str(), operation.GetAccuracyText().c_str(),
                                      operation.moMissingGrids.c_str()));
}

/// Transforms triples in place. @return PROJ's error number; 0 if it met no error
int TransformTriples(PJ* operation, double* triples, std::size_t count) {
    // An unknown time; 0 would be the year 0 to an operation whose parameters drift.
    double time = HUGE_VAL;
    proj_errno_reset(operation);
    const std::size_t done =
        proj_trans_generic(operation, PJ_FWD, triples, STRIDE, count, triples + 1, STRIDE, count,
                           triples + 2, STRIDE, count, &time, 0, 1);
    return done == count ? proj_errno(operation) : PROJ_ERR_OTHER;
}

} // namespace

ProjTransform::ProjTransform(const ProjCRS& source, const ProjCRS& target)
    : moOperations(ListOperations(moSession, source, target)) {
    ReportOperations();
    const PjPtr map = moSession.CreateFromText(source.GetMap().GetText().moDefinition);
    ReportUnit(source.GetMap().GetText(), map.get(), target);
    if (source.GetDatum() == cs::VD_Ellipsoidal || target.GetDatum() == cs::VD_Ellipsoidal)
        moEllipsoid = FindOldEllipsoid(moSession, map.get());
    moMapName = source.GetMap().GetText().moName;
    moMapArea = moOperations.front().moAreas.front();
    const auto& areas = moOperations.front().moAreas;
    if (std::any_of(areas.begin(), areas.end(), [](const AreaOfUse& a) { return a.IsWorld(); }))
        return;
    mpoToDegrees = CreateToDegrees(moSession, map.get());
    const char* name = nullptr;
    ReadArea(moSession, map.get(), moMapArea, name);
}

void ProjTransform::ReportOperations() const {
    for (const ProjOperation& operation : moOperations)
        tellus::Report::AddInfo(FormatString(
            "Heights in %s: '%s', %s%s; grids: %s%s%s", operation.moAreaName.c_str(),
            operation.moName.c_str(), operation.GetAccuracyText().c_str(),
            operation.IsFine() ? "" : ", which is too coarse",
            operation.moGrids.empty() ? "none" : operation.moGrids.c_str(),
            operation.IsUsable() ? "" : "; not usable without ", operation.moMissingGrids.c_str()));
}

void ProjTransform::ReportUnit(const CRSText& text, const PJ* map, const ProjCRS& compound) {
    const PjPtr object = moSession.CreateFromText(compound.GetText().moDefinition);
    const HeightUnit unit = GetHeightUnit(moSession, object.get());
    tellus::Report::AddInfo(FormatString("Unit of the heights: %s", unit.moName.c_str()));
    WarnOfUnit(moSession, text, map, unit);
}

bool ProjTransform::TransformPoints(const double* source, double* target, unsigned int nCount) {
    TestSource(source, nCount);
    if (nCount == 0)
        return true;
    const ProjOperation& operation = ChooseOperation(source, nCount);
    tellus::Report::AddInfo(FormatString("%u heights by '%s', %s", nCount, operation.moName.c_str(),
                                         operation.GetAccuracyText().c_str()));
    if (!moEllipsoid.empty())
        WarnOfEllipsoid(moMapName, moEllipsoid, operation);
    Apply(operation, source, target, nCount);
    return true;
}

void ProjTransform::Apply(const ProjOperation& operation, const double* source, double* target,
                          unsigned int count) {
    std::copy_n(source, std::size_t{3} * count, target);
    const int error = TransformTriples(operation.mpo.get(), target, count);
    const char* text = error ? proj_context_errno_string(moSession.Get(), error) : nullptr;
    const std::string messages = moSession.TakeMessages();
    CountFailures(source, target, count, error)
        .Test(count, FormatString("'%s' fails: %s%s", operation.moName.c_str(),
                                  text ? text : "no height", messages.c_str()));
}

const ProjOperation& ProjTransform::ChooseOperation(const double* source, unsigned int count) {
    if (!mpoToDegrees)
        return moOperations.front();
    const ProjOperation& chosen = moOperations[FindCommon(source, count)];
    TestServes(chosen, source, count);
    return chosen;
}

std::size_t ProjTransform::FindCommon(const double* source, unsigned int count) {
    const AreaCensus census =
        TakeCensus(moOperations, moMapArea, source, ConvertToDegrees(source, count));
    census.moOutside.Test(count, "outside the area of use of every operation");
    std::size_t common = 0;
    while (common < moOperations.size() && census.moInside[common] < count)
        ++common;
    if (common == moOperations.size() || moOperations[common].mdfAccuracy > census.mdfFinest)
        FailAll(source, count)
            .Test(count, "no operation serves all of them at the accuracy that is to be had: " +
                             census.GetText(moOperations));
    return common;
}

std::vector<double> ProjTransform::ConvertToDegrees(const double* source, unsigned int count) {
    std::vector<double> degrees(source, source + std::size_t{3} * count);
    TransformTriples(mpoToDegrees.get(), degrees.data(), count);
    moSession.TakeMessages();
    return degrees;
}

} // namespace kelm::ogc
