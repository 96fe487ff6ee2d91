#pragma once

#include "tin/index/division.h"
#include "tin/rules/extent.h"

#include <algorithm>
#include <utility>
#include <vector>

namespace kelm::tin::index {

/// A stretch of an array of indices, with what was gathered over its triangles.
struct Span {
    std::size_t first;
    std::size_t last;
    rules::Extent<float> extent;
    CentroidSum sum;

    std::size_t Size() const { return last - first; }
    void Add(const Triangle& triangle, const point2_t<float>& centroid) {
        extent.Add(triangle.GetBBox());
        sum.Add(centroid);
    }
};

/// Divides one array of indices in place.
///
/// Each division gathers what its two sides need for their own: their boxes, and the sums of their
/// centroids, each in the order of the side. Spans that do not overlap may be divided by several
/// threads at a time.
class SpanDivider {
  public:
    /// @param order the indices of the triangles, ascending
    /// @param bestAxis is the axis of a division chosen by BestAxis, or by LongestAxis?
    SpanDivider(const Triangle* triangles, std::vector<unsigned> order, bool bestAxis)
        : mpoTriangles(triangles), moOrder(std::move(order)), mbBestAxis(bestAxis) {}

    Span GetWhole() const;

    const unsigned* GetOrder() const { return moOrder.data(); }
    bool IsAscending() const { return std::is_sorted(moOrder.begin(), moOrder.end()); }
    /// Takes back all divisions of an ascending order.
    void Restore() { std::sort(moOrder.begin(), moOrder.end()); }

    /// Makes room for the divisions, which need it. @throw std::bad_alloc
    void Reserve() { moRight.resize(moOrder.size()); }

    /// Divides on the axis of choice, or else on the other one, at the same centre.
    /// @return false if neither leaves a triangle on both sides
    bool Divide(const Span& span, Span& left, Span& right);

  private:
    Axis ChooseAxis(const Span& span, const float* center) const;
    bool DivideAt(const Span& span, Axis axis, const float* center, Span& left, Span& right);

    const Triangle* mpoTriangles;
    std::vector<unsigned> moOrder;
    std::vector<unsigned> moRight; ///< right side of a division at hand, where its span stands
    bool mbBestAxis;
};

} // namespace kelm::tin::index
