#include "tin/heightgrid.h"

#include "tin/heightgrid/batch/positionblock.h"
#include "tin/parallel/parallelbatch.h"
#include "tin/rules/frame.h"
#include "tin/tin.h"

#include <algorithm>
#include <atomic>
#include <limits>
#include <utility>

namespace kelm::tin {

namespace {

using heightgrid::Cells;
using heightgrid::PositionBlock;

constexpr float NOT_A_NUMBER = std::numeric_limits<float>::quiet_NaN();
/// Positions that are worth a thread.
constexpr std::size_t SMALLEST = 10000;

/// A box that holds no position.
BBox<float, point2_t<float>> MakeNowhere() {
    BBox<float, point2_t<float>> box;
    box.min = {NOT_A_NUMBER, NOT_A_NUMBER};
    return box;
}

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

std::size_t HeightGrid::FindBlock(const point2_t<double>* positions, std::size_t count,
                                  float* heights, EdgeRule eRule) const {
    constexpr std::size_t LENGTH = PositionBlock::LENGTH;
    if (mpoCells == nullptr) {
        std::fill(heights, heights + count, NOT_A_NUMBER);
        return 0;
    }
    const heightgrid::Ground ground{mdfXBase, mdfYBase, moBBox, mpoCells->GetFrame()};
    PositionBlock blocks[] = {PositionBlock(ground), PositionBlock(ground)};
    const auto take = [&](std::size_t block) {
        const std::size_t first = std::min(block * LENGTH, count);
        blocks[block % 2].Take(positions + first, std::min(LENGTH, count - first));
    };
    take(0);
    std::size_t found = 0;
    for (std::size_t i = 0; i * LENGTH < count; ++i) {
        take(i + 1);
        found += blocks[i % 2].Find(*mpoCells, blocks[(i + 1) % 2], heights + i * LENGTH, eRule);
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
