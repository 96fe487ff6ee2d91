#include "tin/crossing/walk.h"

#include "tin/crossing/reach.h"
#include "tin/index/prefetch.h"

#include <cassert>

namespace kelm::tin::crossing {

namespace {

template <typename T>
void PrefetchAll(const T& item) {
    for (std::size_t at = 0; at < sizeof item; at += 64)
        index::Prefetch(reinterpret_cast<const char*>(&item) + at);
}

/// Calls visit(k) for each bit k that is set.
template <typename Visit>
void ForEachBit(unsigned bits, const Visit& visit) {
    for (unsigned k = 0; bits != 0; ++k, bits >>= 1)
        if ((bits & 1) != 0)
            visit(k);
}

} // namespace

void Walk::Start(const Index& index, const point3_t<float>& a, const point3_t<float>& b) {
    const Reach reach(index, a, b);
    mpoIndex = &index;
    moA = a;
    moB = b;
    moSlabs = SlabProbe(reach, a, b);
    moBox = BoxProbe(a, b);
    mbBounded = reach.isBounded;
    moFilter = Filter(a, b, reach.isFilterable);
    moHighest = {};
    mnPending = 0;
    for (const unsigned root : index.roots)
        Push(root);
    for (const StaleTriangle& stale : index.stale) {
        point3_t<float> corners[] = {stale.corners[0], stale.corners[1], stale.corners[2]};
        Triangle triangle;
        triangle.SetVertices(corners, corners + 1, corners + 2);
        triangle.GetBBox() = stale.box;
        TestTriangle(triangle, &stale.id);
    }
}

void Walk::Step() {
    const unsigned item = manPending[--mnPending];
    if ((item & IS_BLOCK) != 0)
        return TestBlock(item ^ IS_BLOCK);
    if (item < mpoIndex->groups)
        return ForEachBit(Test(mpoIndex->nodes[item]),
                          [&](unsigned k) { Push((item * WIDTH + k) | IS_BLOCK); });
    const UpperNode& node = mpoIndex->upperNodes[item - mpoIndex->groups];
    ForEachBit(Test(node.boxes), [&](unsigned k) { Push(node.children[k]); });
}

void Walk::Push(unsigned item) {
    assert(mnPending < MOST_PENDING);
    manPending[mnPending++] = item;
    if ((item & IS_BLOCK) != 0)
        PrefetchAll(mpoIndex->blocks[item ^ IS_BLOCK]);
    else if (item < mpoIndex->groups)
        PrefetchAll(mpoIndex->nodes[item]);
    else
        PrefetchAll(mpoIndex->upperNodes[item - mpoIndex->groups]);
}

unsigned Walk::Test(const Node& node) const {
    return mbBounded ? moSlabs.Test(node) : moBox.Test(node);
}

void Walk::TestBlock(unsigned block) {
    const Block& from = mpoIndex->blocks[block];
    ForEachBit(moFilter.Test(from), [&](unsigned k) {
        point3_t<float> corners[3];
        for (unsigned i = 0; i < 3; ++i)
            corners[i] = {from.corners[3 * i][k], from.corners[3 * i + 1][k],
                          from.corners[3 * i + 2][k]};
        Triangle triangle;
        triangle.SetVertices(corners, corners + 1, corners + 2);
        TestTriangle(triangle, &mpoIndex->ids[std::size_t{block} * WIDTH + k]);
    });
}

/// A crossing needs both halves of the rule. The one that tells the height comes first, since most
/// crossings are lower than one that is known.
void Walk::TestTriangle(const Triangle& triangle, const unsigned* id) {
    float height;
    if (triangle.GetLineIntersectHeight(moA, moB, height) == IR_Inside &&
        moHighest.IsReplacedBy(height, [=] { return *id; }) &&
        triangle.IsIntersectedLine(moA.x, moA.y, moB.x, moB.y))
        moHighest.Set(height, *id);
}

} // namespace kelm::tin::crossing
