#pragma once

#include "services/vectorlayer.h"

namespace kelm::store::landxml {

/// How a face of four corners is cut.
enum class Diagonal {
    FirstToThird,
    SecondToFourth,
    None ///< the face crosses itself in plan
};

/// Chooses the diagonal of a face. It is the one from the first corner to the third. If only the
/// other one lies within the face in plan, it is the other one. A face that stands upright, with
/// all corners on one line in plan, gets the first.
Diagonal ChooseDiagonal(const ZARVertex& a, const ZARVertex& b, const ZARVertex& c,
                        const ZARVertex& d);

} // namespace kelm::store::landxml
