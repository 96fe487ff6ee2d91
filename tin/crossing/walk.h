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

/// The search for the highest crossing of one segment, in steps of a node or its blocks, so that
/// several can take turns while memory is fetched.
class Walk {
  public:
    Walk() = default;

    /// @param a,b ends of the segment, surface-local; it meets the box of the surface
    void Start(const Index& index, const point3_t<float>& a, const point3_t<float>& b);
    bool IsDone() const { return mnPending == 0 && mnMet == 0; }
    void Step();
    const Highest& GetHighest() const { return moHighest; }

  private:
    /// Below a node, no child has more than 27/64 of its groups: the largest part was divided seven
    /// times, and no part is above 3/4 of the one that was divided. So a tree has few levels.
    static constexpr unsigned MOST_LEVELS = 24;
    static constexpr unsigned MOST_PENDING = 2 + (WIDTH - 1) * MOST_LEVELS;

    void Push(unsigned node);
    unsigned Test(const Node& node) const;
    void SetGroup(unsigned group);
    void TestBlock(unsigned number);
    void TestLane(const Block& block, unsigned lane, const unsigned& id);
    /// @param id read only where it decides
    void TestTriangle(const Triangle& triangle, const unsigned& id);

    const Index* mpoIndex = nullptr;
    point3_t<float> moA;
    point3_t<float> moB;
    SlabProbe moSlabs;
    BoxProbe moBox;
    bool mbBounded = false;
    Filter moFilter;
    Highest moHighest;
    unsigned mnGroup = 0; ///< the node of blocks at hand
    unsigned mnMet = 0;   ///< a bit for each of its blocks that is to be tested
    unsigned mnPending = 0;
    unsigned manPending[MOST_PENDING];
};

} // namespace kelm::tin::crossing
