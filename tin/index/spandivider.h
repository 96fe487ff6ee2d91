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

    Span GetWhole() const {
        Span span{0, moOrder.size(), {}, {}};
        for (const unsigned id : moOrder)
            span.Add(mpoTriangles[id], CentroidOf(mpoTriangles[id]));
        return span;
    }

    const unsigned* GetOrder() const { return moOrder.data(); }
    bool IsAscending() const { return std::is_sorted(moOrder.begin(), moOrder.end()); }
    /// Takes back all divisions of an ascending order.
    void Restore() { std::sort(moOrder.begin(), moOrder.end()); }

    /// Makes room for the divisions, which need it. @throw std::bad_alloc
    void Reserve() { moRight.resize(moOrder.size()); }

    /// Divides on the axis of choice, or else on the other one, at the same centre.
    /// @return false if neither leaves a triangle on both sides
    bool Divide(const Span& span, Span& left, Span& right) {
        float center[2];
        span.sum.GetMean(span.Size(), center);
        const Axis axis = ChooseAxis(span, center);
        return DivideAt(span, axis, center, left, right) ||
               DivideAt(span, axis == AX_X ? AX_Y : AX_X, center, left, right);
    }

  private:
    Axis ChooseAxis(const Span& span, const float* center) const {
        if (!mbBestAxis)
            return LongestAxis(span.extent.GetMin(), span.extent.GetMax());
        const unsigned* order = moOrder.data();
        return BestAxis(mpoTriangles, order + span.first, order + span.last, center);
    }

    /// The left side keeps its order at the front of the stretch, the right side behind it.
    bool DivideAt(const Span& span, Axis axis, const float* center, Span& left, Span& right) {
        left = Span{span.first, span.first, {}, {}};
        right = Span{span.first, span.first, {}, {}};
        const float split = center[axis];
        for (std::size_t i = span.first; i != span.last; ++i) {
            const unsigned id = moOrder[i];
            const Triangle& triangle = mpoTriangles[id];
            const point2_t<float> centroid = CentroidOf(triangle);
            if (IsLeft(At(centroid, axis), split)) {
                left.Add(triangle, centroid);
                moOrder[left.last++] = id;
            } else {
                right.Add(triangle, centroid);
                moRight[right.last++] = id;
            }
        }
        std::copy(moRight.begin() + std::ptrdiff_t(right.first),
                  moRight.begin() + std::ptrdiff_t(right.last),
                  moOrder.begin() + std::ptrdiff_t(left.last));
        right.first = left.last;
        right.last = span.last;
        return left.Size() != 0 && right.Size() != 0;
    }

    const Triangle* mpoTriangles;
    std::vector<unsigned> moOrder;
    std::vector<unsigned> moRight; ///< right side of a division at hand, where its span stands
    bool mbBestAxis;
};

} // namespace kelm::tin::index
