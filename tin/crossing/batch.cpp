#include "tin/crossing/batch.h"

#include "tin/ray2.h"

#include <limits>

namespace kelm::tin::crossing {

namespace {

constexpr float NO_HEIGHT = std::numeric_limits<float>::quiet_NaN();

} // namespace

std::size_t Batch::Answer(std::size_t first, std::size_t last) {
    mnNext = first;
    mnLast = last;
    if (mrIndex.groups < LARGE)
        AnswerInTurn();
    else
        AnswerTogether();
    return mnFound;
}

void Batch::AnswerInTurn() {
    Turn turn;
    while (Take(turn)) {
        while (!turn.walk.IsDone())
            turn.walk.Step();
        Finish(turn);
    }
}

void Batch::AnswerTogether() {
    Turn turns[TURNS];
    for (bool anyIsTaken = true; anyIsTaken;) {
        anyIsTaken = false;
        for (Turn& rTurn : turns)
            anyIsTaken |= Go(rTurn);
    }
}

bool Batch::Go(Turn& rTurn) {
    if (!rTurn.isTaken && !Take(rTurn))
        return false;
    if (!rTurn.walk.IsDone())
        rTurn.walk.Step();
    if (rTurn.walk.IsDone())
        Finish(rTurn);
    return true;
}

/// Starts on the next segment that meets the surface's box; those before have no crossing.
bool Batch::Take(Turn& rTurn) {
    while (mnNext < mnLast) {
        const std::size_t i = mnNext++;
        const point3_t<float> a = mrIndex.frame.ToLocal(mpoSegments[2 * i]);
        const point3_t<float> b = mrIndex.frame.ToLocal(mpoSegments[2 * i + 1]);
        mpfHeights[i] = NO_HEIGHT;
        if (!IsIntersectedBBox(mrIndex.box, a, b))
            continue;
        rTurn.walk.Start(mrIndex, a, b);
        rTurn.segment = i;
        rTurn.isTaken = true;
        return true;
    }
    return false;
}

void Batch::Finish(Turn& rTurn) {
    rTurn.isTaken = false;
    if (!rTurn.walk.GetHighest().IsFound())
        return;
    mpfHeights[rTurn.segment] = rTurn.walk.GetHighest().Get();
    ++mnFound;
}

} // namespace kelm::tin::crossing
