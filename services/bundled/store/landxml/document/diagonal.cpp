#include "services/bundled/store/landxml/document/diagonal.h"

namespace kelm::store::landxml {

namespace {

/// @return 1 if a, b, c turn to the left in plan, -1 if to the right, 0 if they lie on a line
int GetTurn(const ZARVertex& a, const ZARVertex& b, const ZARVertex& c) {
    const double area = (b.x - a.x) * (c.y - a.y) - (b.y - a.y) * (c.x - a.x);
    return (area > 0.0) - (area < 0.0);
}

} // namespace

Diagonal ChooseDiagonal(const ZARVertex& a, const ZARVertex& b, const ZARVertex& c,
                        const ZARVertex& d) {
    const int sideOfB = GetTurn(a, c, b), sideOfD = GetTurn(a, c, d);
    const int sideOfA = GetTurn(b, d, a), sideOfC = GetTurn(b, d, c);
    if (sideOfB * sideOfD < 0)
        return Diagonal::FirstToThird;
    if (sideOfA * sideOfC < 0)
        return Diagonal::SecondToFourth;
    const bool upright = sideOfB == 0 && sideOfD == 0 && sideOfA == 0 && sideOfC == 0;
    return upright ? Diagonal::FirstToThird : Diagonal::None;
}

} // namespace kelm::store::landxml
