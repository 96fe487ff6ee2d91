#include "services/interpgrid3d.h"

#include "services/exception.h"
#include "services/reporting.h"

#include <cmath>
#include <cstdint>
#include <limits>
#include <vector>

namespace {

constexpr const char* SOURCE = "services/bundled/interpgrid3d";

/// A caller counts the three coordinates of all nodes in 32 bits.
constexpr std::uint32_t MOST_NODES = std::numeric_limits<std::uint32_t>::max() / 3;

/// Linear interpolation that gives a and b exactly at the ends, and a if both are equal.
double Interpolate(double a, double b, double part) {
    return part < 0.5 ? a + part * (b - a) : b - (1.0 - part) * (b - a);
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

    double GetPosition(std::size_t node) const {
        return mdfLow + static_cast<double>(node) * mdfSpacing;
    }
    double GetEnd() const { return GetPosition(mnNodes - 1); }
    /// @param position not NaN
    AxisPlace FindPlace(double position) const;
    /// @param position above the first node and below the last
    std::size_t FindCell(double position) const;
};

AxisPlace Axis::FindPlace(double position) const {
    if (position <= mdfLow)
        return {0, 0.0};
    if (position >= GetEnd())
        return {mnNodes - 2, 1.0};
    const std::size_t cell = FindCell(position);
    const double low = GetPosition(cell);
    return {cell, (position - low) / (GetPosition(cell + 1) - low)};
}

std::size_t Axis::FindCell(double position) const {
    // The quotient fits the index, but may miss the cell by rounding. The positions of the nodes
    // decide, so that a node gives its own value.
    const std::size_t last = mnNodes - 1;
    const auto guess = static_cast<std::size_t>((position - mdfLow) / mdfSpacing);
    const std::size_t cell = guess < last ? guess : last - 1;
    if (position < GetPosition(cell))
        return cell - 1;
    return position >= GetPosition(cell + 1) ? cell + 1 : cell;
}

[[noreturn]] void RefuseBox(char axis, const std::string& reason) {
    throw kelm::DataException(FormatString("InterpGrid3D: along %c %s", axis, reason.c_str()),
                              SOURCE, __PRETTY_FUNCTION__, __LINE__);
}

void TestBox(char axis, double low, double high, double spacing) {
    if (!(low <= high) || !std::isfinite(low) || !std::isfinite(high))
        RefuseBox(axis, FormatString("the box runs from %g to %g, as it does if no vertex has a "
                                     "usable coordinate",
                                     low, high));
    if (!(spacing > 0.0) || !std::isfinite(spacing))
        RefuseBox(axis, FormatString("the spacing is %g", spacing));
}

/// Every cell needs a width, or there is nothing to divide by.
bool HasWidths(const Axis& axis) {
    return axis.GetPosition(1) > axis.mdfLow && axis.GetEnd() > axis.GetPosition(axis.mnNodes - 2);
}

/// @return the axis with the least number of nodes that reaches the high end
Axis LayoutAxis(char name, double low, double high, double spacing) {
    TestBox(name, low, high, spacing);
    const double cells = std::ceil((high - low) / spacing);
    if (!(cells < static_cast<double>(MOST_NODES)))
        RefuseBox(name, FormatString("there are too many nodes: %g to %g in steps of %g", low, high,
                                     spacing));
    Axis axis{low, spacing, cells < 1.0 ? 2 : static_cast<std::size_t>(cells) + 1};
    if (axis.GetEnd() < high)
        ++axis.mnNodes;
    if (!HasWidths(axis))
        RefuseBox(name, FormatString("the spacing %g is lost in the rounding of %g to %g", spacing,
                                     low, high));
    return axis;
}

/// @return the product. @throw kelm::DataException if it is above MOST_NODES
std::size_t CountNodes(std::size_t x, std::size_t y, std::size_t z) {
    if (x > MOST_NODES / y || x * y > MOST_NODES / z)
        throw kelm::DataException(
            FormatString("InterpGrid3D: the box needs %zu x %zu x %zu nodes; the most is %u", x, y,
                         z, MOST_NODES),
            SOURCE, __PRETTY_FUNCTION__, __LINE__);
    return x * y * z;
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
            "InterpGrid3D holds one value a node", SOURCE, __PRETTY_FUNCTION__, __LINE__);
}

void InterpGrid3D::LayoutGrid(double xMin, double yMin, double zMin, double xMax, double yMax,
                              double zMax, double xSpacing, double ySpacing, double zSpacing) {
    Grid grid{LayoutAxis('x', xMin, xMax, xSpacing),
              LayoutAxis('y', yMin, yMax, ySpacing),
              LayoutAxis('z', zMin, zMax, zSpacing),
              {}};
    grid.moValues.assign(CountNodes(grid.moX.mnNodes, grid.moY.mnNodes, grid.moZ.mnNodes), 0.0);
    *mpoGrid = std::move(grid);
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
    const Grid& grid = *mpoGrid;
    if (grid.moValues.empty() || std::isnan(x) || std::isnan(y) || std::isnan(z)) {
        *out = std::numeric_limits<double>::quiet_NaN();
        return;
    }
    const AxisPlace alongX = grid.moX.FindPlace(x);
    const AxisPlace alongY = grid.moY.FindPlace(y);
    const AxisPlace alongZ = grid.moZ.FindPlace(z);
    const std::size_t row = grid.moX.mnNodes;
    const std::size_t layer = row * grid.moY.mnNodes;
    const double* const low =
        &grid.moValues[alongZ.mnLow * layer + alongY.mnLow * row + alongX.mnLow];
    const auto InRow = [&](const double* p) { return Interpolate(p[0], p[1], alongX.mdfPart); };
    const auto InLayer = [&](const double* p) {
        return Interpolate(InRow(p), InRow(p + row), alongY.mdfPart);
    };
    *out = Interpolate(InLayer(low), InLayer(low + layer), alongZ.mdfPart);
}
