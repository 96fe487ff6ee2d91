#pragma once

#include "services/rings/cutting/steplimit.h"
#include "services/rings/meeting.h"

namespace kelm::rings {

/// Do two edges of a chain meet that are nearly parallel, yet not exactly, nearly on one line, and
/// do not follow each other? It finds all such pairs that EdgeTree may pass over, unless it ends
/// early at the limit.
/// @param points as EdgeTree takes them @throw std::bad_alloc
bool TestAlignedMeet(const Point* points, unsigned edges, StepLimit& rLimit);

} // namespace kelm::rings
