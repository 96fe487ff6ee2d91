#pragma once

namespace kelm::tin {

/// Whether rounding may lose a position on an edge.
///
/// The weights that place a position in a triangle are `float`. So a position on the edge between
/// two triangles, or next to it, can lie outside both.
enum EdgeRule : int {
    ER_Float = 0, ///< the weights decide alone
    /// Where they give no height, a triangle that holds the position by exact arithmetic on the
    /// stored coordinates does: with the height of its plane there, computed in `double`, kept
    /// within the heights of its vertices and narrowed once; the greatest of those. Any other
    /// height is that of ER_Float. A triangle with a coordinate that is not finite, or without area
    /// in plan, holds nothing by exact arithmetic.
    ER_Closed = 1
};

} // namespace kelm::tin
