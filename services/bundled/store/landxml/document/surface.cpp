#include "services/bundled/store/landxml/document/surface.h"

#include <algorithm>
#include <utility>

namespace kelm::store::landxml {

namespace {

bool IsSecondHalf(const Facet& facet) {
    return facet.mnKey % 2 == 1;
}

} // namespace

Surface::Surface(std::string subject, std::vector<ZARVertex> points, std::vector<Facet> facets)
    : moSubject(std::move(subject)), moPoints(std::move(points)), moFacets(std::move(facets)) {
    if (std::any_of(moFacets.begin(), moFacets.end(), IsSecondHalf))
        mnFactor = 10;
    MeasureExtents();
}

int Surface::GetId(int index) const {
    const std::uint32_t key = moFacets[static_cast<std::size_t>(index)].mnKey;
    return static_cast<int>(key / 2) * mnFactor + static_cast<int>(key % 2);
}

int Surface::FindIndex(int id) const {
    if (id < 0 || id % mnFactor > 1)
        return -1;
    const auto key =
        static_cast<std::uint32_t>(id / mnFactor) * 2 + static_cast<std::uint32_t>(id % mnFactor);
    const auto found = std::lower_bound(
        moFacets.begin(), moFacets.end(), key,
        [](const Facet& facet, std::uint32_t wanted) { return facet.mnKey < wanted; });
    return found == moFacets.end() || found->mnKey != key
               ? -1
               : static_cast<int>(found - moFacets.begin());
}

void Surface::CopyRing(int index, ZARVertex (&ring)[4]) const {
    const Facet& facet = moFacets[static_cast<std::size_t>(index)];
    for (std::size_t corner = 0; corner < 4; ++corner)
        ring[corner] = moPoints[facet.mnCorners[corner % 3]];
}

void Surface::MeasureExtents() {
    if (moFacets.empty())
        return;
    moLow = moHigh = moPoints[moFacets.front().mnCorners[0]];
    for (const Facet& facet : moFacets)
        for (const std::uint32_t corner : facet.mnCorners) {
            const ZARVertex& point = moPoints[corner];
            moLow = {std::min(moLow.x, point.x), std::min(moLow.y, point.y),
                     std::min(moLow.z, point.z)};
            moHigh = {std::max(moHigh.x, point.x), std::max(moHigh.y, point.y),
                      std::max(moHigh.z, point.z)};
        }
}

} // namespace kelm::store::landxml
