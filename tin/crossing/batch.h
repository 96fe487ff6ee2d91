#pragma once

#include "tin/crossing/walk.h"

#include <cstddef>

namespace kelm::tin::crossing {

/// Answers an array of segments on one thread. Some walks take turns, each while the memory of the
/// others is fetched.
class Batch {
  public:
    /// @param segments,heights as in CrossingTree::GetLineIntersectHeights
    Batch(const Index& index, const point3_t<double>* segments, float* heights)
        : mrIndex(index), mpoSegments(segments), mpfHeights(heights) {}

    /// Answers the segments first .. last-1. @return how many have a crossing
    std::size_t Answer(std::size_t first, std::size_t last);

  private:
    static constexpr unsigned TURNS = 6;
    /// Nodes of blocks from which on walks take turns. Where all is in the cache anyway they would
    /// only get in the way of each other.
    static constexpr unsigned LARGE = 512;

    struct Turn {
        Walk walk;
        std::size_t segment = 0;
        bool isTaken = false;
    };

    /// Answers one segment after the other.
    void AnswerInTurn();
    void AnswerTogether();
    /// Goes a step on. @return false if there is nothing left to do
    bool Go(Turn& rTurn);
    bool Take(Turn& rTurn);
    void Finish(Turn& rTurn);

    const Index& mrIndex;
    const point3_t<double>* mpoSegments;
    float* mpfHeights;
    std::size_t mnNext = 0;
    std::size_t mnLast = 0;
    std::size_t mnFound = 0;
};

} // namespace kelm::tin::crossing
