#include "services/bundled/store/facets/keptfacets.h"

#include <algorithm>
#include <cmath>
#include <cstring>
#include <limits>
#include <new>

namespace kelm::store {

namespace {

constexpr std::size_t BLOCK_BYTES = 2 * memory::LARGE_PAGE;

/// False for a NaN, which is kept as it is.
bool HasSameBits(double a, double b) {
    return a == b && std::signbit(a) == std::signbit(b);
}

bool IsTriangle(const std::vector<ZARVertex>& vertices) {
    if (vertices.size() != 4)
        return false;
    const ZARVertex& first = vertices.front();
    const ZARVertex& last = vertices.back();
    return HasSameBits(first.x, last.x) && HasSameBits(first.y, last.y) &&
           HasSameBits(first.z, last.z);
}

} // namespace

std::size_t KeptFacets::CountBytes(const Head& head) {
    return sizeof(Head) +
           sizeof(ZARVertex) * static_cast<std::size_t>(std::max(head.mnVertices, 0));
}

void KeptFacets::Add(std::int64_t feature, std::size_t number, FacetFault fault,
                     const std::vector<ZARVertex>& vertices) {
    constexpr std::size_t MOST = std::numeric_limits<std::int32_t>::max();
    if (mbDropped)
        return;
    if (number > MOST || vertices.size() > MOST)
        return Drop();
    Head head{feature, static_cast<std::int32_t>(number), -static_cast<std::int32_t>(fault)};
    if (fault == FacetFault::None)
        head.mnVertices =
            IsTriangle(vertices) ? TRIANGLE : static_cast<std::int32_t>(vertices.size());
    Append(head, vertices.data());
}

void KeptFacets::Append(const Head& head, const ZARVertex* vertices) {
    const std::size_t bytes = CountBytes(head);
    unsigned char* const room = GetRoom(bytes);
    if (room == nullptr)
        return Drop();
    std::memcpy(room, &head, sizeof head);
    if (bytes > sizeof head)
        std::memcpy(room + sizeof head, vertices, bytes - sizeof head);
}

/// @return null if there is none. A layer that is not kept is read again, so that is no failure
unsigned char* KeptFacets::GetRoom(std::size_t bytes) try {
    if (moBlocks.empty() || moBlocks.back().mnSize - moBlocks.back().mnUsed < bytes) {
        const std::size_t size = (bytes / BLOCK_BYTES + 1) * BLOCK_BYTES;
        if (size > mnMostBytes - mnBytes)
            return nullptr;
        moBlocks.push_back({memory::CreateLargeBlock(size), size, 0});
        mnBytes += size;
    }
    Block& block = moBlocks.back();
    block.mnUsed += bytes;
    return &block.mpBytes[block.mnUsed - bytes];
} catch (const std::bad_alloc&) {
    return nullptr;
}

void KeptFacets::Drop() {
    mbDropped = true;
    moBlocks.clear();
}

void KeptFacets::Restart() {
    mnNext = 0;
    mnShapes = 0;
}

bool KeptFacets::Advance() {
    if (!moBlocks.empty() && mnNext == moBlocks.front().mnUsed) {
        moBlocks.pop_front();
        ++mnGone;
        mnNext = 0;
    }
    if (moBlocks.empty()) {
        Drop();
        return false;
    }
    const unsigned char* const facet = &moBlocks.front().mpBytes[mnNext];
    std::memcpy(&moHead, facet, sizeof moHead);
    mpVertices = facet + sizeof moHead;
    mnNext += CountBytes(moHead);
    ++mnShapes;
    return true;
}

FacetFault KeptFacets::Read(std::vector<ZARVertex>& vertices) const {
    if (moHead.mnVertices < 0)
        return static_cast<FacetFault>(-moHead.mnVertices);
    const auto count = static_cast<std::size_t>(moHead.mnVertices);
    vertices.resize(std::max<std::size_t>(count, TRIANGLE + 1));
    std::memcpy(vertices.data(), mpVertices, count * sizeof(ZARVertex));
    if (moHead.mnVertices == TRIANGLE)
        vertices.back() = vertices.front();
    return FacetFault::None;
}

} // namespace kelm::store
