#pragma once

#include "services/servicesexport.h"

#include <memory>

/// A 3-D grid of values with interpolation between its nodes.
///
/// All nodes lie in the box; the outer ones lie on its faces. An axis of no width has one node.
/// Positions vary fastest in x, then in y, then in z.
///
/// In z the nodes are no farther apart than the given spacing. In x and y the number of cells is
/// what the spacing asks for, but at least 128 and at most 256. At least 128, because in degrees
/// one spacing can span the whole box. At most 256, because each node costs its user a transform.
/// Then the outermost cell at each end of x and y is halved six times, which adds twelve nodes to
/// the axis.
///
/// The values in mind are heights of a geoid model, which is linear between its own nodes on each
/// axis, with a kink at each. So on x and y two lines are drawn into each cell: one through the
/// last two nodes before it, one through the next two nodes behind it, each with the cell's own
/// end. If the two lines meet in the cell, on one side of the straight line between its ends, they
/// replace that line (subcell resolution: Harten, Journal of Computational Physics 83, 1989). That
/// restores a function of one kink in three cells exactly. Elsewhere, in the outermost cells and in
/// z, the value is linear. x is interpolated first, then y, then z. A position outside the box is
/// first moved to its nearest face. Coordinates, spacings and values have the units that the caller
/// gives them.
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
