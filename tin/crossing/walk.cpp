#include "tin/crossing/walk.h"

#include "tin/crossing/reach.h"
#include "tin/index/prefetch.h"

#include <cassert>

namespace kelm::tin::crossing {

namespace {

/// Asks for all of an item. Inlined in each case, since a compiler may leave out the call of a
/// function that does nothing else.
template <typename T>
#ifdef __GNUC__
__attribute__((always_inline))
#endif
inline void
PrefetchAll(const T& item) {
    for (std::size_t at = 0; at < sizeof item; at += 64)
        index::Prefetch(reinterpret_cast<const char*>(&item) + at);
}

unsigned FindLowestBit(unsigned bits) {
#ifdef __GNUC__
    return static_cast<unsigned>(__builtin_ctz(bits));
#else
    unsigned k = 0;
    while ((bits >> k & 1) == 0)
        ++k;
    return k;
#endif
}

/// Calls visit(k) for each bit k that is set.
template <typename Visit>
void ForEachBit(unsigned bits, const Visit& visit) {
    for (; bits != 0; bits &= bits - 1)
        visit(FindLowestBit(bits));
}

} // namespace

void Walk::Start(const Index& index, const point3_t<float>& a, const point3_t<float>& b) {
    const Reach reach(index, a, b);
    mpoIndex = &index;
    moA = a;
    moB = b;
    if (index.isCrowded)
        moPlan.Set(a, b);
    else
        moSlabs.Set(reach, a, b);
    moBox = BoxProbe(a, b);
    mbBounded = reach.isBounded;
    moFilter = Filter(a, b, reach.isFilterable);
    moHighest = {};
    mnPending = 0;
    moGroups = {};
    moBlocks = {};
    for (const unsigned root : index.roots)
        Push(root);
    for (const StaleTriangle& stale : index.stale) {
        point3_t<float> corners[] = {stale.corners[0], stale.corners[1], stale.corners[2]};
        Triangle triangle;
        triangle.SetVertices(corners, corners + 1, corners + 2);
        triangle.GetBBox() = stale.box;
        TestTriangle(triangle, stale.id);
    }
}

/// Blocks wait until no node can be tested, and nodes of blocks until no upper node can: so the
/// memory of all that wait is fetched at the same time.
void Walk::Step() {
    if (CanTestUpperNode())
        while (CanTestUpperNode())
            TestUpperNode(mpoIndex->upperNodes[manPending[--mnPending] - mpoIndex->groups]);
    else if (CanTestGroup())
        while (CanTestGroup())
            TestGroup(moGroups.Take());
    else
        while (!moBlocks.IsEmpty())
            TestBlock(moBlocks.Take());
}

void Walk::TestUpperNode(const UpperNode& node) {
    ForEachBit(Test(node.boxes), [&](unsigned k) { Push(node.children[k]); });
}

void Walk::TestGroup(unsigned group) {
    ForEachBit(Test(mpoIndex->nodes[group]), [&](unsigned k) {
        const unsigned block = group * WIDTH + k;
        moBlocks.Add(block);
        PrefetchAll(mpoIndex->blocks[block]);
    });
}

void Walk::Push(unsigned node) {
    if (node < mpoIndex->groups) {
        moGroups.Add(node);
        PrefetchAll(mpoIndex->nodes[node]);
    } else {
        assert(mnPending < MOST_PENDING);
        manPending[mnPending++] = node;
        PrefetchAll(mpoIndex->upperNodes[node - mpoIndex->groups]);
    }
}

unsigned Walk::Test(const Node& node) const {
    if (!mbBounded)
        return moBox.Test(node);
    return mpoIndex->isCrowded ? moPlan.Test(node) : moSlabs.Test(node);
}

void Walk::TestBlock(unsigned number) {
    const Block& block = mpoIndex->blocks[number];
    ForEachBit(moFilter.Test(block), [&](unsigned lane) {
        TestLane(block, lane, mpoIndex->ids[std::size_t{number} * WIDTH + lane]);
    });
}

void Walk::TestLane(const Block& block, unsigned lane, const unsigned& id) {
    point3_t<float> corners[3];
    for (unsigned i = 0; i < 3; ++i)
        corners[i] = {block.corners[i][0][lane], block.corners[i][1][lane],
                      block.corners[i][2][lane]};
    Triangle triangle;
    triangle.SetVertices(corners, corners + 1, corners + 2);
    TestTriangle(triangle, id);
}

/// A crossing needs both halves of the rule. The one that tells the height comes first, since most
/// crossings are lower than one that is known.
void Walk::TestTriangle(const Triangle& triangle, const unsigned& id) {
    float height;
    if (triangle.GetLineIntersectHeight(moA, moB, height) == IR_Inside &&
        moHighest.IsReplacedBy(height, [&] { return id; }) &&
        triangle.IsIntersectedLine(moA.x, moA.y, moB.x, moB.y))
        moHighest.Set(height, id);
}

} // namespace kelm::tin::crossing
