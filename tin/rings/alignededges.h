#pragma once

#include "tin/rings/meeting.h"

namespace kelm::tin::rings {

/// Do two edges of a chain meet that are nearly parallel, yet not exactly, nearly on one line, and
/// do not follow each other? It finds all such pairs that EdgeTree may pass over.
/// @param points as EdgeTree takes them @throw std::bad_alloc
bool TestAlignedMeet(const Point* points, unsigned edges);

} // namespace kelm::tin::rings
