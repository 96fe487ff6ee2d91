#include "services/bundled/store/landxml/document/pointtable.h"

#include <algorithm>
#include <tuple>

namespace kelm::store::landxml {

namespace {

bool IsSame(const ZARVertex& a, const ZARVertex& b) {
    return a.x == b.x && a.y == b.y && a.z == b.z;
}

} // namespace

void PointTable::Add(std::uint32_t number, const ZARVertex& position) {
    mbRising = mbRising && (moEntries.empty() || moEntries.back().mnNumber < number);
    moEntries.push_back({number, static_cast<std::uint32_t>(moPositions.size())});
    moPositions.push_back(position);
}

void PointTable::Sort() {
    if (mbRising)
        return;
    std::sort(moEntries.begin(), moEntries.end(), [](const Entry& a, const Entry& b) {
        return std::tie(a.mnNumber, a.mnIndex) < std::tie(b.mnNumber, b.mnIndex);
    });
    JoinEqual();
}

/// Leaves one entry for each number.
void PointTable::JoinEqual() {
    auto kept = moEntries.begin();
    for (auto next = kept + 1; next != moEntries.end(); ++next)
        if (next->mnNumber != kept->mnNumber)
            *++kept = *next;
        else if (kept->mnIndex != AMBIGUOUS &&
                 !IsSame(moPositions[next->mnIndex], moPositions[kept->mnIndex]))
            kept->mnIndex = AMBIGUOUS;
    moEntries.erase(kept + 1, moEntries.end());
}

std::uint32_t PointTable::Find(std::uint32_t number) const {
    if (moEntries.empty() || number < moEntries.front().mnNumber)
        return UNKNOWN;
    // Where numbers are dense, as they mostly are, no search is needed.
    const std::size_t guess = number - moEntries.front().mnNumber;
    if (guess < moEntries.size() && moEntries[guess].mnNumber == number)
        return moEntries[guess].mnIndex;
    const auto found = std::lower_bound(
        moEntries.begin(), moEntries.end(), number,
        [](const Entry& entry, std::uint32_t wanted) { return entry.mnNumber < wanted; });
    return found == moEntries.end() || found->mnNumber != number ? UNKNOWN : found->mnIndex;
}

} // namespace kelm::store::landxml
