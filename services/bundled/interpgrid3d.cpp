#include "services/interpgrid3d.h"

#include "services/exception.h"
#include "services/reporting.h"

#include <algorithm>
#include <cmath>
#include <cstddef>
#include <cstdint>
#include <limits>
#include <vector>

namespace {

constexpr const char* SOURCE = "services/bundled/interpgrid3d";

/// A caller counts the three coordinates of all nodes in 32 bits.
constexpr std::uint32_t MOST_NODES = std::numeric_limits<std::uint32_t>::max() / 3;

/// Over ten degrees, three cells are then less than 15 arc minutes wide, the cell of EGM96.
constexpr double LEAST_MAP_CELLS = 128.0;
constexpr double MOST_MAP_CELLS = 256.0;

/// A kink in the outermost cell cannot be restored: there is no node beyond. EGM96's greatest, 6 m
/// in 15 arc minutes, costs less than 1 mm if the cell is this often halved, and a degree has 128
/// cells.
constexpr int HALVINGS = 6;

/// @return the value on the chord from a to b; exactly a and b at its ends, and a if both are equal
double FollowChord(double a, double b, double part) {
    return part < 0.5 ? a + part * (b - a) : b - (1.0 - part) * (b - a);
}

/// Place of a position on an axis.
struct AxisPlace {
    std::size_t mnLow;      ///< the node at or below it; of the last cell, its lower node
    double mdfPart;         ///< 0 at mnLow, 1 at the next node
    double mdfBefore = 0.0; ///< width of the cell divided by that of the one before it; 0 if none
    double mdfBehind = 0.0; ///< the same for the cell behind it
};

/// @param values the values of an axis around a place: values(0) at mnLow, values(1) at the next
/// node. Asks for values(-1) and values(2) only if there are cells on both sides
template <typename Values>
double Interpolate(const AxisPlace& place, const Values& values) {
    const double a = values(0);
    const double b = values(1);
    const double chord = FollowChord(a, b, place.mdfPart);
    if (place.mdfBefore == 0.0 || place.mdfBehind == 0.0)
        return chord;
    // How far the line from either side misses the node at the cell's other end.
    const double before = a + (a - values(-1)) * place.mdfBefore - b;
    const double behind = b + (b - values(2)) * place.mdfBehind - a;
    if (before > 0.0 && behind > 0.0)
        return chord + std::min(before * place.mdfPart, behind * (1.0 - place.mdfPart));
    if (before < 0.0 && behind < 0.0)
        return chord + std::max(before * place.mdfPart, behind * (1.0 - place.mdfPart));
    return chord;
}

/// The nodes along one axis, in rising order.
struct Axis {
    std::vector<double> moNodes;

    std::size_t GetCount() const { return moNodes.size(); }
    /// Adds a node unless rounding has merged it with the one before.
    void Add(double position);
    /// @return the distance between a node and the one before it
    double GetWidth(std::size_t node) const { return moNodes[node] - moNodes[node - 1]; }
    /// @param position not NaN
    AxisPlace FindPlace(double position) const;
};

void Axis::Add(double position) {
    if (moNodes.empty() || position > moNodes.back())
        moNodes.push_back(position);
}

AxisPlace Axis::FindPlace(double position) const {
    if (moNodes.size() == 1 || position <= moNodes.front())
        return {0, 0.0};
    if (position >= moNodes.back())
        return {moNodes.size() - 2, 1.0};
    const auto above = std::upper_bound(moNodes.begin(), moNodes.end(), position);
    const auto node = static_cast<std::size_t>(above - moNodes.begin());
    const double width = GetWidth(node);
    const bool inner = node > 1 && node + 1 < moNodes.size();
    return {node - 1, (position - moNodes[node - 1]) / width,
            inner ? width / GetWidth(node - 1) : 0.0, inner ? width / GetWidth(node + 1) : 0.0};
}

[[noreturn]] void RefuseBox(char axis, const std::string& reason) {
    throw kelm::DataException(FormatString("InterpGrid3D: along %c %s", axis, reason.c_str()),
                              SOURCE, __PRETTY_FUNCTION__, __LINE__);
}

void TestBox(char axis, double low, double high, double spacing) {
    if (!(low <= high) || !std::isfinite(high - low))
        RefuseBox(axis, FormatString("the box runs from %g to %g, as it does if no vertex has a "
                                     "usable coordinate",
                                     low, high));
    if (!(spacing > 0.0) || !std::isfinite(spacing))
        RefuseBox(axis, FormatString("the spacing is %g", spacing));
}

/// @return an axis of equal cells. @param halvings of the first cell and of the last
Axis DivideAxis(double low, double high, std::size_t cells, int halvings) {
    const double width = (high - low) / static_cast<double>(cells);
    Axis axis;
    const auto add = [&](double position) { axis.Add(std::min(position, high)); };
    add(low);
    for (int i = halvings; i > 0; --i)
        add(low + std::ldexp(width, -i));
    for (std::size_t i = 1; i < cells; ++i)
        add(low + static_cast<double>(i) * width);
    for (int i = 1; i <= halvings; ++i)
        add(high - std::ldexp(width, -i));
    add(high);
    return axis;
}

Axis LayoutMapAxis(char name, double low, double high, double spacing) {
    TestBox(name, low, high, spacing);
    const double cells =
        std::clamp(std::ceil((high - low) / spacing), LEAST_MAP_CELLS, MOST_MAP_CELLS);
    return DivideAxis(low, high, static_cast<std::size_t>(cells), HALVINGS);
}

Axis LayoutHeightAxis(double low, double high, double spacing) {
    TestBox('z', low, high, spacing);
    const double cells = std::ceil((high - low) / spacing);
    if (!(cells < static_cast<double>(MOST_NODES)))
        RefuseBox('z', FormatString("there are too many nodes: %g to %g in steps of %g", low, high,
                                    spacing));
    return DivideAxis(low, high, std::max<std::size_t>(1, static_cast<std::size_t>(cells)), 0);
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
    Grid grid{LayoutMapAxis('x', xMin, xMax, xSpacing),
              LayoutMapAxis('y', yMin, yMax, ySpacing),
              LayoutHeightAxis(zMin, zMax, zSpacing),
              {}};
    grid.moValues.assign(CountNodes(grid.moX.GetCount(), grid.moY.GetCount(), grid.moZ.GetCount()),
                         0.0);
    *mpoGrid = std::move(grid);
}

unsigned int InterpGrid3D::GetNumGridPoints() const {
    return static_cast<unsigned int>(mpoGrid->moValues.size());
}

void InterpGrid3D::GetGridPositions(double* out) const {
    for (const double z : mpoGrid->moZ.moNodes)
        for (const double y : mpoGrid->moY.moNodes)
            for (const double x : mpoGrid->moX.moNodes) {
                *out++ = x;
                *out++ = y;
                *out++ = z;
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
    const auto row = static_cast<std::ptrdiff_t>(grid.moX.GetCount());
    const auto layer = row * static_cast<std::ptrdiff_t>(grid.moY.GetCount());
    // An axis of one node has no next one; its place is at the node.
    const std::ptrdiff_t right = grid.moX.GetCount() > 1 ? 1 : 0;
    const std::ptrdiff_t up = grid.moY.GetCount() > 1 ? row : 0;
    const double* const low = &grid.moValues[alongX.mnLow] +
                              row * static_cast<std::ptrdiff_t>(alongY.mnLow) +
                              layer * static_cast<std::ptrdiff_t>(alongZ.mnLow);
    const auto InRow = [&](const double* p) {
        return Interpolate(alongX, [&](int i) { return p[i * right]; });
    };
    const auto InLayer = [&](const double* p) {
        return Interpolate(alongY, [&](int i) { return InRow(p + i * up); });
    };
    const double below = InLayer(low);
    *out =
        grid.moZ.GetCount() == 1 ? below : FollowChord(below, InLayer(low + layer), alongZ.mdfPart);
}
