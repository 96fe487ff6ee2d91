#pragma once

#include "services/servicesexport.h"

#include <memory>

/// A 3-D grid of values with interpolation between its nodes.
///
/// All nodes lie in the box; the outer ones lie on its faces. An axis of no width has one node.
/// Positions vary fastest in x, then in y, then in z.
///
/// In z the nodes are no farther apart than the given spacing. In x and y the number of cells is
/// what the spacing asks for, but at least 128 and at most 256: the unit of the map is not known,
/// and where it is the degree one spacing would span the whole box; and a node costs its user a
/// transform. Toward the ends of x and y the outermost cell is halved six times.
///
/// The values in mind are heights of a geoid model, which is linear between its own nodes on each
/// axis, with a kink at each. So on x and y a line through the two nodes on either side of a cell
/// is drawn on into the cell. If the two lines meet there, on one side of the chord, they replace
/// it (subcell resolution: Harten, Journal of Computational Physics 83, 1989). That restores a
/// function of one kink in three cells exactly. Elsewhere, in the outermost cells and in z, the
/// value is linear. x is interpolated first, then y, then z. A position outside the box is first
/// moved to its nearest face. Coordinates, spacings and values have the units that the caller gives
/// them.
///
/// One thread sets a grid up; then any number may read it.
class KELM_SERVICES_EXPORT InterpGrid3D {
  public:
    InterpGrid3D();
    ~InterpGrid3D();
    InterpGrid3D(const InterpGrid3D&) = delete;
    InterpGrid3D& operator=(const InterpGrid3D&) = delete;

    /// Sets the number of values at each node; called first
    /// @throw kelm::ParameterException unless it is 1
    void SetDimension(unsigned int nDimension);

    /// Defines the nodes over a box and gives every node the value 0.
    /// @throw kelm::DataException if a bound or spacing is not finite, if a high end lies below its
    /// low end (as it does for the range of no heights at all), if a spacing is not above 0, or if
    /// the three coordinates of all nodes cannot be counted in 32 bits; std::bad_alloc. After a
    /// throw the former nodes are kept
    void LayoutGrid(double xMin, double yMin, double zMin, double xMax, double yMax, double zMax,
                    double xSpacing, double ySpacing, double zSpacing);

    /// @return the number of nodes
    unsigned int GetNumGridPoints() const;

    /// Writes a triple x, y, z for each node. @param out room for 3 GetNumGridPoints() values
    void GetGridPositions(double* out) const;

    /// @return one writable value for each node, in the order of the positions; owned by the grid,
    /// good until the next LayoutGrid
    double* GetArray() const;

    /// Interpolates at a position; at a node the value is the node's own. Does not throw.
    /// @param out one value; NaN for a NaN coordinate or a grid without nodes
    void GetVal(double x, double y, double z, double* out) const;

  private:
    struct Grid;
    std::unique_ptr<Grid> mpoGrid;
};
