#include "tin/heightgrid.h"

#include "tin/heightgrid/cells.h"
#include "tin/parallel/parallelbatch.h"
#include "tin/rules/frame.h"
#include "tin/tin.h"

#include <algorithm>
#include <array>
#include <atomic>
#include <limits>
#include <utility>

namespace kelm::tin {

namespace {

using heightgrid::Cells;

constexpr float NOT_A_NUMBER = std::numeric_limits<float>::quiet_NaN();
/// Positions that are worth a thread.
constexpr std::size_t SMALLEST = 10000;

/// A box that holds no position.
BBox<float, point2_t<float>> MakeNowhere() {
    BBox<float, point2_t<float>> box;
    box.min = {NOT_A_NUMBER, NOT_A_NUMBER};
    return box;
}

/// A position on its way: its record has been asked for.
struct Approached {
    float x;
    float y;
    const heightgrid::Record* poRecord; ///< null outside the surface's box
};

} // namespace

HeightGrid::HeightGrid(const Tin& tin, const BuildOptions& options) {
    tin.GetXYBase(mdfXBase, mdfYBase);
    moBBox.min = {tin.GetBBox().min.x, tin.GetBBox().min.y};
    moBBox.max = {tin.GetBBox().max.x, tin.GetBBox().max.y};
    mpoCells = std::make_unique<const Cells>(tin, options);
}

HeightGrid::HeightGrid(HeightGrid&& other) noexcept : moBBox(MakeNowhere()) {
    *this = std::move(other);
}

HeightGrid& HeightGrid::operator=(HeightGrid&& other) noexcept {
    std::swap(moBBox, other.moBBox);
    std::swap(mdfXBase, other.mdfXBase);
    std::swap(mdfYBase, other.mdfYBase);
    std::swap(mpoCells, other.mpoCells);
    return *this;
}

HeightGrid::~HeightGrid() = default;

bool HeightGrid::GetHeight(const float& x, const float& y, float& height, EdgeRule eRule) const {
    if (!TestInside(moBBox, x, y))
        return false;
    const rules::Highest highest = mpoCells->Find(mpoCells->Approach(x, y), x, y, eRule);
    height = highest.Get();
    return highest.IsFound();
}

bool HeightGrid::GetHeight(const double& x, const double& y, float& height, EdgeRule eRule) const {
    const point2_t<float> local = rules::Frame(mdfXBase, mdfYBase).ToLocal(point2_t<double>{x, y});
    return GetHeight(local.x, local.y, height, eRule);
}

std::size_t HeightGrid::GetHeights(const point2_t<double>* positions, std::size_t count,
                                   float* heights, int threads, EdgeRule eRule) const {
    std::atomic<std::size_t> found{0};
    parallel::ParallelBatch(count, SMALLEST, threads, [&](std::size_t first, std::size_t last) {
        found += FindBlock(positions + first, last - first, heights + first, eRule);
    });
    return found;
}

/// Records are asked for well before they are read: a miss to memory takes longer than an answer.
std::size_t HeightGrid::FindBlock(const point2_t<double>* positions, std::size_t count,
                                  float* heights, EdgeRule eRule) const {
    constexpr std::size_t AHEAD = 24;
    const rules::Frame frame(mdfXBase, mdfYBase);
    std::array<Approached, AHEAD> approached;
    const auto approach = [&](std::size_t i) {
        const point2_t<float> p = frame.ToLocal(positions[i]);
        const bool isInside = TestInside(moBBox, p.x, p.y);
        return Approached{p.x, p.y, isInside ? &mpoCells->Approach(p.x, p.y) : nullptr};
    };
    for (std::size_t i = 0; i < std::min(AHEAD, count); ++i)
        approached[i] = approach(i);
    std::size_t found = 0;
    for (std::size_t i = 0, slot = 0; i < count; ++i, slot = slot + 1 == AHEAD ? 0 : slot + 1) {
        const Approached p = approached[slot];
        if (i + AHEAD < count)
            approached[slot] = approach(i + AHEAD);
        rules::Highest highest;
        if (p.poRecord != nullptr)
            highest = mpoCells->Find(*p.poRecord, p.x, p.y, eRule);
        heights[i] = highest.IsFound() ? highest.Get() : NOT_A_NUMBER;
        found += highest.IsFound() ? 1 : 0;
    }
    return found;
}

std::uint64_t HeightGrid::GetObjBytes() const {
    return sizeof *this + (mpoCells == nullptr ? 0 : mpoCells->GetBytes());
}

std::uint64_t HeightGrid::EstimateObjBytes(unsigned triangleCount, const BuildOptions& options) {
    constexpr unsigned USUAL = 76;
    const unsigned most = options.bytesPerTriangle;
    const unsigned each = most == 0 ? USUAL : std::min(USUAL, most);
    return sizeof(HeightGrid) + sizeof(Cells) + std::uint64_t{each} * triangleCount;
}

} // namespace kelm::tin
