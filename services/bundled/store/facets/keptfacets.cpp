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

bool HasSameBits(const ZARVertex& a, const ZARVertex& b) {
    return HasSameBits(a.x, b.x) && HasSameBits(a.y, b.y) && HasSameBits(a.z, b.z);
}

bool IsTriangle(const std::vector<ZARVertex>& vertices) {
    return vertices.size() == 4 && HasSameBits(vertices.front(), vertices.back());
}

} // namespace

/// @return the number of those that follow the head
std::size_t KeptFacets::CountVertices(const Head& head) {
    if (head.mnKind >= RING)
        return static_cast<std::size_t>(head.mnKind - RING);
    std::size_t count = 0;
    if (head.mnKind >= TRIANGLE)
        for (unsigned places = static_cast<unsigned>(head.mnKind), k = 0; k < 3; ++k)
            count += (places >> (2 * k) & ELSEWHERE) == ELSEWHERE;
    return count;
}

void KeptFacets::Add(std::int64_t feature, std::size_t number, FacetFault fault,
                     const std::vector<ZARVertex>& vertices) {
    constexpr std::size_t MOST = std::numeric_limits<std::int32_t>::max() - RING;
    if (mbDropped)
        return;
    if (number > MOST || vertices.size() > MOST)
        return Drop();
    Head head{feature, static_cast<std::int32_t>(number), static_cast<std::int32_t>(fault)};
    if (fault == FacetFault::None && IsTriangle(vertices))
        return AddTriangle(head, vertices);
    if (fault == FacetFault::None)
        head.mnKind = RING + static_cast<std::int32_t>(vertices.size());
    Append(head, vertices.data());
}

void KeptFacets::AddTriangle(Head head, const std::vector<ZARVertex>& vertices) {
    Corners elsewhere;
    std::size_t count = 0;
    unsigned places = 0;
    for (unsigned k = 0; k < 3; ++k) {
        const unsigned place = FindPlace(vertices[k]);
        places |= place << (2 * k);
        if (place == ELSEWHERE)
            elsewhere.at(count++) = vertices[k];
    }
    head.mnKind = TRIANGLE + static_cast<std::int32_t>(places);
    std::copy_n(vertices.begin(), 3, maTriangle.begin());
    Append(head, elsewhere.data());
}

/// @return the place of a corner in the triangle in front
unsigned KeptFacets::FindPlace(const ZARVertex& corner) const {
    unsigned place = 0;
    while (place < ELSEWHERE && !HasSameBits(maTriangle[place], corner))
        ++place;
    return place;
}

/// Makes the present triangle of the one in front.
void KeptFacets::TakeTriangle() {
    const Corners front = maTriangle;
    const unsigned char* next = mpVertices;
    for (unsigned k = 0; k < 3; ++k) {
        const unsigned place = static_cast<unsigned>(moHead.mnKind) >> (2 * k) & ELSEWHERE;
        if (place < ELSEWHERE) {
            maTriangle[k] = front[place];
            continue;
        }
        std::memcpy(&maTriangle[k], next, sizeof maTriangle[k]);
        next += sizeof maTriangle[k];
    }
}

void KeptFacets::Append(const Head& head, const ZARVertex* vertices) {
    const std::size_t bytes = CountVertices(head) * sizeof(ZARVertex);
    unsigned char* const room = GetRoom(sizeof head + bytes);
    if (room == nullptr)
        return Drop();
    std::memcpy(room, &head, sizeof head);
    if (bytes > 0)
        std::memcpy(room + sizeof head, vertices, bytes);
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
    maTriangle = {};
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
    mnNext += sizeof moHead + CountVertices(moHead) * sizeof(ZARVertex);
    if (moHead.mnKind >= TRIANGLE && moHead.mnKind < RING)
        TakeTriangle();
    ++mnShapes;
    return true;
}

FacetFault KeptFacets::Read(std::vector<ZARVertex>& vertices) const {
    if (moHead.mnKind < TRIANGLE)
        return static_cast<FacetFault>(moHead.mnKind);
    if (moHead.mnKind < RING) {
        vertices.assign(maTriangle.begin(), maTriangle.end());
        vertices.push_back(maTriangle.front());
        return FacetFault::None;
    }
    vertices.resize(CountVertices(moHead));
    std::memcpy(vertices.data(), mpVertices, vertices.size() * sizeof(ZARVertex));
    return FacetFault::None;
}

} // namespace kelm::store
