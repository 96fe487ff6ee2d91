#include "bench/suite.h"

#include <algorithm>
#include <cstring>

namespace kelm::bench {

namespace {

constexpr std::size_t LINE = 64; ///< bytes

/// Reads one word of each cache line of the triangles, which a scan cannot do without.
std::uint64_t TouchLines(const tin::Tin& oSurface) {
    tin::Triangle* triangles;
    unsigned count;
    oSurface.GetTriangleList(triangles, count);
    const auto* bytes = reinterpret_cast<const unsigned char*>(triangles);
    std::uint64_t sum = 0;
    for (std::size_t i = 0; i < count * sizeof(tin::Triangle); i += LINE) {
        std::uint64_t word;
        std::memcpy(&word, bytes + i, sizeof word);
        sum += word;
    }
    return sum;
}

void Touch(benchmark::State& rState, const std::string& sTerrain) {
    const auto surface = GetSurface(sTerrain);
    benchmark::DoNotOptimize(TouchLines(*surface));
    for (auto _ : rState)
        benchmark::DoNotOptimize(TouchLines(*surface));
    rState.SetItemsProcessed(rState.iterations());
}

void Scan(benchmark::State& rState, const std::string& sTerrain) {
    const auto surface = GetSurface(sTerrain);
    const auto positions = GetPositions(sTerrain, "random");
    std::size_t next = 0;
    for (auto _ : rState) {
        float h;
        const point2_t<float> p = (*positions)[next++ % positions->size()];
        benchmark::DoNotOptimize(surface->GetHeight(p.x, p.y, h, nullptr));
    }
    rState.SetItemsProcessed(rState.iterations());
}

} // namespace

void AddScan(const Plan& oPlan) {
    for (const std::string& terrain : oPlan.GetSizes()) {
        const bool isLarge = terrain.find('M') != std::string::npos;
        const std::int64_t repeats = isLarge ? 20 : 500;
        Add({"scan", terrain, "ours"}, [=](benchmark::State& state) {
            Scan(state, terrain);
        })->Iterations(repeats);
        Add({"scan", terrain, "touching each cache line"}, [=](benchmark::State& state) {
            Touch(state, terrain);
        })->Iterations(repeats);
    }
}

} // namespace kelm::bench
