#pragma once

#include "tin/crossing/filter.h"
#include "tin/crossing/layout.h"
#include "tin/crossing/probe.h"
#include "tin/triangle.h"

#include <limits>

namespace kelm::tin::crossing {

/// The highest crossing so far. A scan meets the triangles in their order, so that of +0 and -0 the
/// one of the first triangle stands.
class Highest {
  public:
    /// Would a crossing of this height replace the one so far? @param getId of its triangle
    template <typename GetId>
    bool IsReplacedBy(float height, const GetId& getId) const {
        return height > mfHeight || (height == 0.0F && mfHeight == 0.0F && getId() < mnId);
    }
    void Set(float height, unsigned id) {
        mfHeight = height;
        mnId = id;
    }
    /// @return the lowest finite `float` while there is none
    float Get() const { return mfHeight; }
    bool IsFound() const { return mfHeight > LOWEST; }

  private:
    static constexpr float LOWEST = -std::numeric_limits<float>::max();
    float mfHeight = LOWEST;
    unsigned mnId = 0;
};

/// A few numbers that wait their turn.
class Queue {
  public:
    bool IsEmpty() const { return mnFirst == mnLast; }
    /// Is there room for all children of a node?
    bool HasRoom() const { return mnLast - mnFirst <= SIZE - WIDTH; }
    void Add(unsigned number) { manNumbers[mnLast++ % SIZE] = number; }
    unsigned Take() { return manNumbers[mnFirst++ % SIZE]; }

  private:
    static constexpr unsigned SIZE = 2 * WIDTH;
    unsigned manNumbers[SIZE];
    unsigned mnFirst = 0;
    unsigned mnLast = 0;
};

/// The search for the highest crossing of one segment, in steps of some nodes or some blocks, so
/// that several can take turns while memory is fetched.
class Walk {
  public:
    Walk() = default;

    /// @param a,b ends of the segment, surface-local; it meets the box of the surface
    void Start(const Index& index, const point3_t<float>& a, const point3_t<float>& b);
    bool IsDone() const { return mnPending == 0 && moGroups.IsEmpty() && moBlocks.IsEmpty(); }
    void Step();
    const Highest& GetHighest() const { return moHighest; }

  private:
    /// Below a node, no child has more than 27/64 of its groups: the largest part was divided seven
    /// times, and no part is above 3/4 of the one that was divided. So a tree has few levels.
    static constexpr unsigned MOST_LEVELS = 24;
    static constexpr unsigned MOST_PENDING = 2 + (WIDTH - 1) * MOST_LEVELS;

    void Push(unsigned node);
    unsigned Test(const Node& node) const;
    bool CanTestUpperNode() const { return mnPending != 0 && moGroups.HasRoom(); }
    bool CanTestGroup() const { return !moGroups.IsEmpty() && moBlocks.HasRoom(); }
    void TestUpperNode(const UpperNode& node);
    void TestGroup(unsigned group);
    void TestBlock(unsigned number);
    void TestLane(const Block& block, unsigned lane, const unsigned& id);
    /// @param id read only where it decides
    void TestTriangle(const Triangle& triangle, const unsigned& id);

    const Index* mpoIndex = nullptr;
    point3_t<float> moA;
    point3_t<float> moB;
    SlabProbe moSlabs;
    PlanProbe moPlan;
    BoxProbe moBox;
    bool mbBounded = false;
    Filter moFilter;
    Highest moHighest;
    Queue moGroups; ///< nodes of blocks whose memory is being fetched
    Queue moBlocks; ///< blocks whose memory is being fetched
    unsigned mnPending = 0;
    unsigned manPending[MOST_PENDING];
};

} // namespace kelm::tin::crossing
