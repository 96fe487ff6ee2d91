#include "tin/rings/earcutter.h"

#include <algorithm>
#include <cmath>

namespace kelm::tin::rings {

namespace {

/// No product of such coordinates overflows.
bool TestBounded(const Point& p) {
    return std::fabs(p.x) <= 0x1p400 && std::fabs(p.y) <= 0x1p400;
}

} // namespace

EarCutter::EarCutter(const Point* points, unsigned count, bool isForward)
    : mbForward(isForward), mnPoints(count), mnLeft(count), moCandidates(count) {
    moCorners.reserve(count);
    for (unsigned i = 0; i < count; ++i)
        moCorners.push_back(
            {points[GetPoint(i)], i == 0 ? count - 1 : i - 1, i + 1 == count ? 0 : i + 1});
    if (std::all_of(points, points + count, TestBounded)) {
        moTree.emplace(count);
        BuildTree(0);
    }
}

bool EarCutter::Cut(std::vector<Triangle_Id>& oTriangles) {
    unsigned tip = 0;
    while (mnLeft > 2) {
        tip = moCandidates.FindAround(tip);
        if (tip == NONE)
            return false;
        if (!TestEar(tip))
            continue;
        const unsigned next = moCorners[tip].next;
        oTriangles.push_back({GetPoint(moCorners[tip].previous), GetPoint(tip), GetPoint(next)});
        Remove(tip);
        tip = moCorners[next].next; // the cursor steps over the corner behind the ear
    }
    return true;
}

EarTriangle EarCutter::GetTriangle(unsigned tip) const {
    const Corner& corner = moCorners[tip];
    return {moCorners[corner.previous].at, corner.at, moCorners[corner.next].at};
}

/// A corner that is no ear is no candidate from then on.
bool EarCutter::TestEar(unsigned tip) {
    StopWaiting(tip);
    moCandidates.Remove(tip);
    if (!GetTriangle(tip).TestConvex())
        return false;
    const unsigned blocker = FindBlocker(tip);
    if (blocker != NONE)
        Wait(tip, blocker);
    return blocker == NONE;
}

unsigned EarCutter::FindBlocker(unsigned tip) const {
    const Corner& corner = moCorners[tip];
    const EarTriangle triangle = GetTriangle(tip);
    if (moTree)
        return moTree->FindInside(triangle, {corner.previous, tip, corner.next});
    unsigned at = moCorners[corner.next].next;
    while (at != corner.previous && !triangle.TestInside(moCorners[at].at.x, moCorners[at].at.y))
        at = moCorners[at].next;
    return at != corner.previous ? at : NONE;
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
    --mnLeft;
    if (!moTree)
        return;
    moTree->Remove(tip);
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
    moTree->Build(std::move(items));
}

} // namespace kelm::tin::rings
