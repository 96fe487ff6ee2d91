#include "tin/load/cornerhash.h"

#include "services/memory/largepages.h"
#include "tin/octree2.h"

#include <algorithm>
#include <cmath>

namespace kelm::tin::load {

namespace {

using Point = CornerHash::Point;

constexpr std::uint32_t NONE = 0xFFFFFFFFU;

/// Cells are 2^-20 map units wide: wide against the tolerance, so that few corners lie next to a
/// side, and narrow against the spacing of vertices in metres and in degrees. The shift keeps the
/// sides off round coordinates.
constexpr double CELLS_PER_UNIT = 1048576.0;
constexpr double SHIFT = 0.37;

/// Coordinates from here on would leave the range of cell numbers.
constexpr double BEYOND = 4398046511104.0;

/// Reach of the search for near twins: the octree's tolerance of 1e-9, with room for rounding.
constexpr double REACH = 2e-9;

/// More different corners than this behind one hash are left to the octree.
constexpr int MOST_PROBES = 64;

struct Cell {
    std::int64_t x;
    std::int64_t y;
    std::int64_t z;
};

/// Rises with v, which is all that a search on both sides of a corner relies on.
std::int64_t GetCellNumber(double v) {
    return static_cast<std::int64_t>(v * CELLS_PER_UNIT + SHIFT);
}

Cell GetCell(const Point& p) {
    return {GetCellNumber(p.x), GetCellNumber(p.y), GetCellNumber(p.z)};
}

std::uint64_t GetHash(const Cell& cell) {
    std::uint64_t h = static_cast<std::uint64_t>(cell.x) * 0x9E3779B97F4A7C15ULL;
    h = (h ^ (h >> 32)) + static_cast<std::uint64_t>(cell.y);
    h *= 0xC2B2AE3D27D4EB4FULL;
    h = (h ^ (h >> 29)) + static_cast<std::uint64_t>(cell.z);
    h *= 0x165667B19E3779F9ULL;
    return h ^ (h >> 32);
}

bool IsInRange(const Point& p) {
    // A NaN fails.
    return std::fabs(p.x) < BEYOND && std::fabs(p.y) < BEYOND && std::fabs(p.z) < BEYOND;
}

bool IsEqual(const Point& p, const Point& q) {
    return p.x == q.x && p.y == q.y && p.z == q.z;
}

std::uint32_t GetTag(std::uint64_t hash) {
    return static_cast<std::uint32_t>(hash >> 32);
}

} // namespace

CornerHash::CornerHash(std::size_t corners) {
    // A sheet keeps a sixth of its corners and those of its rim; other layers make the table grow.
    std::size_t slots = 1024;
    while (slots < corners / 3 + corners / 100)
        slots *= 2;
    moSlots = memory::CreateLargeList(slots, Slot{NONE, 0});
    mnMask = slots - 1;
    memory::ReserveLarge(moKept, slots / 2);
}

std::size_t CornerHash::Add(const Point* corners, std::size_t count, std::uint32_t* numbers) {
    Hashes hashes;
    for (std::size_t first = 0; first < count; first += BATCH) {
        const std::size_t fetched = Fetch(&corners[first], std::min(count - first, BATCH), hashes);
        for (std::size_t i = 0; i < fetched; ++i)
            if (!Resolve(corners[first + i], hashes[i], numbers[first + i]))
                return first + i;
        if (fetched < std::min(count - first, BATCH))
            return first + fetched;
    }
    return count;
}

/// @return the corners in front of the first one beyond the range of the cells
std::size_t CornerHash::Fetch(const Point* corners, std::size_t count, Hashes& hashes) const {
    for (std::size_t i = 0; i < count; ++i) {
        if (!IsInRange(corners[i]))
            return i;
        hashes[i] = GetHash(GetCell(corners[i]));
        __builtin_prefetch(&moSlots[hashes[i] & mnMask]);
    }
    return count;
}

bool CornerHash::Resolve(const Point& corner, std::uint64_t hash, std::uint32_t& number) {
    const Find found = Search(corner, hash, number);
    if (found != Find::None)
        return found == Find::Equal;
    if (!IsAlone(corner))
        return false;
    number = static_cast<std::uint32_t>(moKept.size());
    Keep(corner, hash);
    return true;
}

/// Looks for a held point in the cell behind a hash: an equal one, or one that is too near.
CornerHash::Find CornerHash::Search(const Point& point, std::uint64_t hash,
                                    std::uint32_t& found) const {
    const std::uint32_t tag = GetTag(hash);
    std::size_t at = hash & mnMask;
    for (int probe = 0; probe < MOST_PROBES; ++probe, at = (at + 1) & mnMask) {
        const Slot& slot = moSlots[at];
        if (slot.nCorner == NONE)
            return Find::None;
        if (slot.nTag != tag)
            continue;
        const Point& held = moKept[slot.nCorner];
        if (IsEqual(held, point)) {
            found = slot.nCorner;
            return Find::Equal;
        }
        if (Octree2::IsTwin(held, point))
            return Find::Undecided;
    }
    return Find::Undecided;
}

/// Is there no held point near a new one in the cells beyond the sides of its own?
bool CornerHash::IsAlone(const Point& point) const {
    const Cell low = GetCell({point.x - REACH, point.y - REACH, point.z - REACH});
    const Cell high = GetCell({point.x + REACH, point.y + REACH, point.z + REACH});
    if (low.x == high.x && low.y == high.y && low.z == high.z)
        return true;
    for (std::int64_t x = low.x; x <= high.x; ++x)
        for (std::int64_t y = low.y; y <= high.y; ++y)
            for (std::int64_t z = low.z; z <= high.z; ++z) {
                std::uint32_t found;
                if (Search(point, GetHash({x, y, z}), found) != Find::None)
                    return false;
            }
    return true;
}

void CornerHash::Keep(const Point& corner, std::uint64_t hash) {
    if (2 * (moKept.size() + 1) > moSlots.size())
        Grow();
    Place({static_cast<std::uint32_t>(moKept.size()), GetTag(hash)}, hash);
    moKept.push_back(corner);
}

void CornerHash::Grow() {
    memory::ReserveLarge(moKept, moSlots.size());
    auto old = memory::CreateLargeList(2 * moSlots.size(), Slot{NONE, 0});
    old.swap(moSlots);
    mnMask = moSlots.size() - 1;
    for (const Slot& slot : old)
        if (slot.nCorner != NONE)
            Place(slot, GetHash(GetCell(moKept[slot.nCorner])));
}

void CornerHash::Place(const Slot& slot, std::uint64_t hash) {
    std::size_t at = hash & mnMask;
    while (moSlots[at].nCorner != NONE)
        at = (at + 1) & mnMask;
    moSlots[at] = slot;
}

} // namespace kelm::tin::load
