#include "services/bundled/projtransform.h"

#include "services/exception.h"
#include "services/reporting.h"

#include <algorithm>
#include <cmath>
#include <limits>

namespace kelm::ogc {

namespace {

constexpr const char* kSource = "services/bundled/projtransform";
constexpr std::size_t kStride = 3 * sizeof(double);

/// More than the radius of the earth in any unit. A greater height stands for a missing one, and
/// would drown the others where heights are interpolated.
constexpr double kGreatestHeight = 1e8;

bool TestFinite(const double* pTriple) {
    return std::isfinite(pTriple[0]) && std::isfinite(pTriple[1]) && std::isfinite(pTriple[2]);
}

bool TestUsable(const double* pTriple) {
    return TestFinite(pTriple) && std::abs(pTriple[2]) <= kGreatestHeight;
}

/// Counts points that failed and keeps the first of them.
struct FailureCount {
    std::size_t mnFailed = 0;
    double mdfX = 0.0;
    double mdfY = 0.0;
    double mdfZ = 0.0;

    void Add(const double* pTriple) {
        if (mnFailed++ == 0) {
            mdfX = pTriple[0];
            mdfY = pTriple[1];
            mdfZ = pTriple[2];
        }
    }
    /// @throw kelm::DataException if any point failed
    void Check(unsigned int nCount, const std::string& reason) const {
        if (mnFailed > 0)
            throw DataException(
                FormatString("%zu of %u points cannot be converted, the first at x %.17g, y %.17g, "
                             "z %.17g: %s",
                             mnFailed, nCount, mdfX, mdfY, mdfZ, reason.c_str()),
                kSource, __PRETTY_FUNCTION__, __LINE__);
    }
};

/// Transforms triples in place. @return PROJ's error number; 0 if it met no error
int TransformTriples(PJ* po, double* pTriples, std::size_t nPoints) {
    // An unknown time; 0 would be the year 0 to an operation whose parameters drift.
    double dfTime = HUGE_VAL;
    proj_errno_reset(po);
    const std::size_t nDone =
        proj_trans_generic(po, PJ_FWD, pTriples, kStride, nPoints, pTriples + 1, kStride, nPoints,
                           pTriples + 2, kStride, nPoints, &dfTime, 0, 1);
    return nDone == nPoints ? proj_errno(po) : PROJ_ERR_OTHER;
}

/// How the points of a call lie to the areas of the operations.
struct AreaCensus {
    std::vector<std::size_t> moInside; ///< a number of points for each operation
    double mdfFinest = std::numeric_limits<double>::infinity(); ///< best accuracy at any point
    FailureCount moOutside;                                     ///< points that no area holds
};

/// @param operations the most accurate first
AreaCensus TakeCensus(const std::vector<ProjOperation>& operations, const AreaOfUse& oMapArea,
                      const double* source, const std::vector<double>& degrees) {
    AreaCensus oCensus;
    oCensus.moInside.assign(operations.size(), 0);
    for (std::size_t i = 0; i < degrees.size(); i += 3) {
        bool bHeld = false;
        for (std::size_t j = 0; j < operations.size(); ++j) {
            // Where there is no choice, the CRS's own area will do: ETRS89 reaches the Canaries.
            if (!operations[j].moArea.TestPoint(degrees[i], degrees[i + 1]) &&
                !(operations.size() == 1 && oMapArea.TestPoint(degrees[i], degrees[i + 1])))
                continue;
            if (!bHeld)
                oCensus.mdfFinest = std::min(oCensus.mdfFinest, operations[j].mdfAccuracy);
            bHeld = true;
            ++oCensus.moInside[j];
        }
        if (!bHeld)
            oCensus.moOutside.Add(source + i);
    }
    return oCensus;
}

/// @return for how many points each operation serves
std::string GetCensusText(const std::vector<ProjOperation>& operations, const AreaCensus& oCensus) {
    std::string text;
    for (std::size_t i = 0; i < operations.size(); ++i)
        if (oCensus.moInside[i] > 0)
            text +=
                FormatString("%s'%s' (%s, %s) holds %zu", text.empty() ? "" : "; ",
                             operations[i].moName.c_str(), operations[i].GetAccuracyText().c_str(),
                             operations[i].moAreaName.c_str(), oCensus.moInside[i]);
    return text;
}

} // namespace

bool IdentityTransform::TransformPoints(const double* source, double* target, unsigned int nCount) {
    std::copy_n(source, std::size_t{3} * nCount, target);
    return true;
}

bool RefusingTransform::TransformPoints(const double*, double*, unsigned int nCount) {
    if (nCount > 0)
        throw DataException("Heights of a local coordinate reference system cannot be brought to "
                            "another vertical datum",
                            kSource, __PRETTY_FUNCTION__, __LINE__);
    return true;
}

ProjTransform::ProjTransform(const ProjCRS& oSource, const ProjCRS& oTarget)
    : moOperations(ListOperations(moSession, oSource, oTarget)) {
    for (const ProjOperation& oOperation : moOperations)
        tellus::Report::AddInfo(
            FormatString("Heights in %s: '%s', %s; grids: %s%s%s", oOperation.moAreaName.c_str(),
                         oOperation.moName.c_str(), oOperation.GetAccuracyText().c_str(),
                         oOperation.moGrids.empty() ? "none" : oOperation.moGrids.c_str(),
                         oOperation.TestUsable() ? "" : "; not usable without ",
                         oOperation.moMissingGrids.c_str()));
    moMapArea = moOperations.front().moArea;
    if (moMapArea.TestWorld())
        return;
    const PjPtr poMap = moSession.CreateFromWkt(oSource.GetMap().GetText().moDefinition);
    mpoToDegrees = CreateToDegrees(moSession, poMap.get());
    const char* pszName = nullptr;
    ReadArea(moSession, poMap.get(), moMapArea, pszName);
}

bool ProjTransform::TransformPoints(const double* source, double* target, unsigned int nCount) {
    FailureCount oFailed;
    for (std::size_t i = 0; i < nCount; ++i)
        if (!TestUsable(source + 3 * i))
            oFailed.Add(source + 3 * i);
    oFailed.Check(nCount, "a coordinate is not finite, or the height is none on the earth");
    if (nCount == 0)
        return true;
    const ProjOperation& oOperation = ChooseOperation(source, nCount);
    std::copy_n(source, std::size_t{3} * nCount, target);
    const int nError = TransformTriples(oOperation.mpo.get(), target, nCount);
    for (std::size_t i = 0; i < nCount; ++i)
        if (!TestFinite(target + 3 * i))
            oFailed.Add(source + 3 * i);
    // An error that no point shows is still an error.
    if (nError != 0 && oFailed.mnFailed == 0)
        oFailed = FailureCount{nCount, source[0], source[1], source[2]};
    const char* pszError = nError ? proj_context_errno_string(moSession.Get(), nError) : nullptr;
    const std::string messages = moSession.TakeMessages();
    oFailed.Check(nCount, FormatString("'%s' fails: %s%s", oOperation.moName.c_str(),
                                       pszError ? pszError : "no height", messages.c_str()));
    return true;
}

const ProjOperation& ProjTransform::ChooseOperation(const double* source, unsigned int nCount) {
    if (!mpoToDegrees)
        return moOperations.front();
    std::vector<double> degrees(source, source + std::size_t{3} * nCount);
    TransformTriples(mpoToDegrees.get(), degrees.data(), nCount);
    moSession.TakeMessages();
    const AreaCensus oCensus = TakeCensus(moOperations, moMapArea, source, degrees);
    oCensus.moOutside.Check(nCount, "outside the area of use of every operation");
    std::size_t i = 0;
    while (i < moOperations.size() && oCensus.moInside[i] < nCount)
        ++i;
    FailureCount oAll{nCount, source[0], source[1], source[2]};
    if (i == moOperations.size() || moOperations[i].mdfAccuracy > oCensus.mdfFinest)
        oAll.Check(nCount, "no operation serves all of them at the accuracy that is to be had: " +
                               GetCensusText(moOperations, oCensus));
    if (!moOperations[i].TestUsable())
        oAll.Check(nCount, FormatString("'%s' (%s) needs %s, which is not installed",
                                        moOperations[i].moName.c_str(),
                                        moOperations[i].GetAccuracyText().c_str(),
                                        moOperations[i].moMissingGrids.c_str()));
    if (moOperations.size() > 1)
        tellus::Report::AddInfo(
            FormatString("%u heights by '%s'", nCount, moOperations[i].moName.c_str()));
    return moOperations[i];
}

} // namespace kelm::ogc
