#include "services/rings/cutting/earcutter.h"

#include <algorithm>
#include <utility>

namespace kelm::rings {

EarCutter::EarCutter(const std::vector<Point>& points, StepLimit limit)
    : mnLeft(static_cast<unsigned>(points.size())),
      mbIndexed(!limit.IsReached() && std::all_of(points.begin(), points.end(), TestBounded)),
      moCandidates(mnLeft), moTree(mnLeft), moLimit(limit) {
    moCorners.reserve(mnLeft);
    for (unsigned i = 0; i < mnLeft; ++i)
        moCorners.push_back({points[i], (i == 0 ? mnLeft : i) - 1, i + 1 == mnLeft ? 0 : i + 1});
    if (mbIndexed)
        BuildTree(0);
}

EarTriangle EarCutter::GetTriangle(unsigned tip) const {
    const Corner& corner = moCorners[tip];
    return {moCorners[corner.previous].at, corner.at, moCorners[corner.next].at};
}

/// A corner that is no ear is no candidate from then on.
bool EarCutter::TestEar(unsigned tip) {
    StopWaiting(tip);
    moCandidates.Remove(tip);
    const EarTriangle triangle = GetTriangle(tip);
    if (!triangle.TestConvex())
        return false;
    const CornerTree::Three own{moCorners[tip].previous, tip, moCorners[tip].next};
    const unsigned blocker = moTree.FindInside(triangle, own, moLimit);
    if (blocker != NONE)
        Wait(tip, blocker);
    return blocker == NONE;
}

void EarCutter::Wait(unsigned tip, unsigned blocker) {
    const unsigned behind = moCorners[blocker].waiting;
    moCorners[blocker].waiting = tip;
    moCorners[tip].blocker = blocker;
    moCorners[tip].before = NONE;
    moCorners[tip].behind = behind;
    if (behind != NONE)
        moCorners[behind].before = tip;
}

void EarCutter::StopWaiting(unsigned tip) {
    const Corner corner = moCorners[tip];
    if (corner.blocker == NONE)
        return;
    (corner.before != NONE ? moCorners[corner.before].behind : moCorners[corner.blocker].waiting) =
        corner.behind;
    if (corner.behind != NONE)
        moCorners[corner.behind].before = corner.before;
    moCorners[tip].blocker = NONE;
}

void EarCutter::Remove(unsigned tip) {
    const unsigned previous = moCorners[tip].previous;
    const unsigned next = moCorners[tip].next;
    moCorners[previous].next = next;
    moCorners[next].previous = previous;
    moCandidates.Add(previous);
    moCandidates.Add(next);
    Release(tip);
    moCorners[tip].next = NONE;
    moTree.Remove(tip);
    --mnLeft;
    if (mnLeft < mnIndexed / 2)
        BuildTree(next);
}

/// Makes those candidates that waited for a corner that goes.
void EarCutter::Release(unsigned blocker) {
    while (moCorners[blocker].waiting != NONE) {
        const unsigned tip = moCorners[blocker].waiting;
        StopWaiting(tip);
        moCandidates.Add(tip);
    }
}

/// Builds the tree over the corners that are left, so that its boxes are no larger than they need.
void EarCutter::BuildTree(unsigned first) {
    mnIndexed = mnLeft;
    std::vector<CornerTree::Item> items;
    items.reserve(mnLeft);
    unsigned at = first;
    for (unsigned i = 0; i < mnLeft; ++i, at = moCorners[at].next)
        items.push_back({moCorners[at].at, at});
    moTree.Build(std::move(items));
}

} // namespace kelm::rings
