#include "tin/index/spandivider.h"

namespace kelm::tin::index {

Span SpanDivider::GetWhole() const {
    Span span{0, moOrder.size(), {}, {}};
    for (const unsigned id : moOrder)
        span.Add(mpoTriangles[id], CentroidOf(mpoTriangles[id]));
    return span;
}

bool SpanDivider::Divide(const Span& span, Span& left, Span& right) {
    float center[2];
    span.sum.GetMean(span.Size(), center);
    const Axis axis = ChooseAxis(span, center);
    return DivideAt(span, axis, center, left, right) ||
           DivideAt(span, axis == AX_X ? AX_Y : AX_X, center, left, right);
}

Axis SpanDivider::ChooseAxis(const Span& span, const float* center) const {
    if (!mbBestAxis)
        return LongestAxis(span.extent.GetMin(), span.extent.GetMax());
    const unsigned* order = moOrder.data();
    return BestAxis(mpoTriangles, order + span.first, order + span.last, center);
}

/// The left side keeps its order at the front of the stretch, the right side behind it. Both are
/// gathered in variables of this function, which may stay in registers: `left` and `right` could be
/// one for all that a compiler knows.
bool SpanDivider::DivideAt(const Span& span, Axis axis, const float* center, Span& left,
                           Span& right) {
    Span low{span.first, span.first, {}, {}};
    Span high{span.first, span.first, {}, {}};
    const float split = center[axis];
    for (std::size_t i = span.first; i != span.last; ++i) {
        const unsigned id = moOrder[i];
        const Triangle& triangle = mpoTriangles[id];
        const point2_t<float> centroid = CentroidOf(triangle);
        if (IsLeft(At(centroid, axis), split)) {
            low.Add(triangle, centroid);
            moOrder[low.last++] = id;
        } else {
            high.Add(triangle, centroid);
            moRight[high.last++] = id;
        }
    }
    const unsigned* const held = moRight.data();
    std::copy(held + high.first, held + high.last, moOrder.data() + low.last);
    high.first = low.last;
    high.last = span.last;
    left = low;
    right = high;
    return left.Size() != 0 && right.Size() != 0;
}

} // namespace kelm::tin::index
