#include "services/interpgrid3d.h"

#include "services/exception.h"
#include "services/reporting.h"

#include <cmath>
#include <cstdint>
#include <limits>
#include <vector>

namespace {

constexpr const char* kSource = "services/bundled/interpgrid3d";

/// A caller counts three values a node in 32 bits.
constexpr std::uint32_t kMostNodes = std::numeric_limits<std::uint32_t>::max() / 3;

/// Linear interpolation that gives a and b exactly at the ends, and a if both are equal.
double Interpolate(double dfA, double dfB, double dfPart) {
    return dfPart < 0.5 ? dfA + dfPart * (dfB - dfA) : dfB - (1.0 - dfPart) * (dfB - dfA);
}

/// Place of a position on an axis: between node mnLow and the next one.
struct AxisPlace {
    std::size_t mnLow;
    double mdfPart; ///< 0 at mnLow, 1 at the next node
};

/// The nodes along one axis.
struct Axis {
    double mdfLow = 0.0;
    double mdfSpacing = 1.0;
    std::size_t mnNodes = 0;

    double GetPosition(std::size_t nNode) const {
        return mdfLow + static_cast<double>(nNode) * mdfSpacing;
    }
    AxisPlace FindPlace(double dfPosition) const;
};

/// @param dfPosition not NaN
AxisPlace Axis::FindPlace(double dfPosition) const {
    const std::size_t nLast = mnNodes - 1;
    if (dfPosition <= mdfLow)
        return {0, 0.0};
    if (dfPosition >= GetPosition(nLast))
        return {nLast - 1, 1.0};
    // From here on the quotient fits the index. It may miss the cell by rounding; the positions of
    // the nodes decide, so that a node gives its own value.
    std::size_t nLow = static_cast<std::size_t>((dfPosition - mdfLow) / mdfSpacing);
    nLow = nLow < nLast ? nLow : nLast - 1;
    if (dfPosition < GetPosition(nLow))
        --nLow;
    else if (dfPosition >= GetPosition(nLow + 1))
        ++nLow;
    const double dfLow = GetPosition(nLow);
    return {nLow, (dfPosition - dfLow) / (GetPosition(nLow + 1) - dfLow)};
}

[[noreturn]] void RefuseBox(char chAxis, const std::string& reason) {
    throw kelm::DataException(FormatString("InterpGrid3D: along %c %s", chAxis, reason.c_str()),
                              kSource, __PRETTY_FUNCTION__, __LINE__);
}

/// @return the axis with the least number of nodes that reaches the high end
Axis LayoutAxis(char chAxis, double dfLow, double dfHigh, double dfSpacing) {
    if (!(dfLow <= dfHigh) || !std::isfinite(dfLow) || !std::isfinite(dfHigh))
        RefuseBox(chAxis, FormatString("the box runs from %g to %g, as it does if no vertex has a "
                                       "usable coordinate",
                                       dfLow, dfHigh));
    if (!(dfSpacing > 0.0) || !std::isfinite(dfSpacing))
        RefuseBox(chAxis, FormatString("the spacing is %g", dfSpacing));
    const double dfCells = std::ceil((dfHigh - dfLow) / dfSpacing);
    if (!(dfCells < static_cast<double>(kMostNodes)))
        RefuseBox(chAxis, FormatString("there are too many nodes: %g to %g in steps of %g", dfLow,
                                       dfHigh, dfSpacing));
    Axis oAxis{dfLow, dfSpacing, dfCells < 1.0 ? 2 : static_cast<std::size_t>(dfCells) + 1};
    if (oAxis.GetPosition(oAxis.mnNodes - 1) < dfHigh)
        ++oAxis.mnNodes;
    // Every cell needs a width, or there is nothing to divide by.
    if (!(oAxis.GetPosition(1) > dfLow) ||
        !(oAxis.GetPosition(oAxis.mnNodes - 1) > oAxis.GetPosition(oAxis.mnNodes - 2)))
        RefuseBox(chAxis, FormatString("the spacing %g is lost in the rounding of %g to %g",
                                       dfSpacing, dfLow, dfHigh));
    return oAxis;
}

} // namespace

struct InterpGrid3D::Grid {
    Axis moX;
    Axis moY;
    Axis moZ;
    std::vector<double> moValues;
};

InterpGrid3D::InterpGrid3D() : mpoGrid(std::make_unique<Grid>()) {}
InterpGrid3D::~InterpGrid3D() = default;

void InterpGrid3D::SetDimension(unsigned int nDimension) {
    if (nDimension != 1)
        throw kelm::ParameterException(
            "nDimension", kelm::ParameterException::PT_Invalid, FormatString("%u", nDimension), "1",
            "InterpGrid3D holds one value a node", kSource, __PRETTY_FUNCTION__, __LINE__);
}

void InterpGrid3D::LayoutGrid(double xMin, double yMin, double zMin, double xMax, double yMax,
                              double zMax, double xSpacing, double ySpacing, double zSpacing) {
    Grid oGrid{LayoutAxis('x', xMin, xMax, xSpacing),
               LayoutAxis('y', yMin, yMax, ySpacing),
               LayoutAxis('z', zMin, zMax, zSpacing),
               {}};
    const std::size_t nX = oGrid.moX.mnNodes;
    const std::size_t nY = oGrid.moY.mnNodes;
    const std::size_t nZ = oGrid.moZ.mnNodes;
    if (nX > kMostNodes / nY || nX * nY > kMostNodes / nZ)
        throw kelm::DataException(
            FormatString("InterpGrid3D: the box needs %zu x %zu x %zu nodes; the most is %u", nX,
                         nY, nZ, kMostNodes),
            kSource, __PRETTY_FUNCTION__, __LINE__);
    oGrid.moValues.assign(nX * nY * nZ, 0.0);
    *mpoGrid = std::move(oGrid);
}

unsigned int InterpGrid3D::GetNumGridPoints() const {
    return static_cast<unsigned int>(mpoGrid->moValues.size());
}

void InterpGrid3D::GetGridPositions(double* out) const {
    for (std::size_t k = 0; k < mpoGrid->moZ.mnNodes; ++k)
        for (std::size_t j = 0; j < mpoGrid->moY.mnNodes; ++j)
            for (std::size_t i = 0; i < mpoGrid->moX.mnNodes; ++i) {
                *out++ = mpoGrid->moX.GetPosition(i);
                *out++ = mpoGrid->moY.GetPosition(j);
                *out++ = mpoGrid->moZ.GetPosition(k);
            }
}

double* InterpGrid3D::GetArray() const {
    return mpoGrid->moValues.data();
}

void InterpGrid3D::GetVal(double x, double y, double z, double* out) const {
    const Grid& oGrid = *mpoGrid;
    if (oGrid.moValues.empty() || std::isnan(x) || std::isnan(y) || std::isnan(z)) {
        *out = std::numeric_limits<double>::quiet_NaN();
        return;
    }
    const AxisPlace oX = oGrid.moX.FindPlace(x);
    const AxisPlace oY = oGrid.moY.FindPlace(y);
    const AxisPlace oZ = oGrid.moZ.FindPlace(z);
    const std::size_t nRow = oGrid.moX.mnNodes;
    const std::size_t nLayer = nRow * oGrid.moY.mnNodes;
    const double* const pLow = &oGrid.moValues[oZ.mnLow * nLayer + oY.mnLow * nRow + oX.mnLow];
    const auto AlongX = [&oX](const double* p) { return Interpolate(p[0], p[1], oX.mdfPart); };
    const auto AlongY = [&](const double* p) {
        return Interpolate(AlongX(p), AlongX(p + nRow), oY.mdfPart);
    };
    *out = Interpolate(AlongY(pLow), AlongY(pLow + nLayer), oZ.mdfPart);
}
