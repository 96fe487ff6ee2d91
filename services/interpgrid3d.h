#pragma once

#include "services/servicesexport.h"

#include <memory>

/// A regular 3-D grid of values with interpolation between its nodes.
///
/// On each axis the nodes stand at low, low + spacing, low + 2 spacing and so on, up to the first
/// that reaches the high end of the box; there are at least two. Positions vary fastest in x, then
/// in y, then in z.
///
/// Between nodes the value is the trilinear interpolation: linear on each axis in turn, x first
/// (Press et al., Numerical Recipes, 1986, section 3.6, extended to three axes). A position outside
/// the grid is first moved to the nearest outer plane of nodes. Coordinates, spacings and values
/// have the units that the caller gives them.
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
    /// low end (as it does for the range of no heights at all), if a spacing is not above 0 or is
    /// lost in the rounding of the bounds, or if the three coordinates of all nodes cannot be
    /// counted in 32 bits; std::bad_alloc. After a throw the former nodes are kept
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
