#include "bench/suite.h"

#include <algorithm>
#include <optional>

namespace kelm::bench {

namespace {

template <typename Peer>
void Build(benchmark::State& rState, const std::string& sTerrain) {
    const auto terrain = GetTerrain(sTerrain);
    const auto input = Index<Peer>::Prepare(terrain);
    std::optional<Index<Peer>> index;
    for (auto _ : rState) {
        index.emplace(*input);
        rState.PauseTiming();
        index.reset();
        rState.ResumeTiming();
    }
    rState.SetItemsProcessed(static_cast<std::int64_t>(terrain->oTriangles.size()) *
                             rState.iterations());
}

/// About a million triangles a round, so that small builds are averaged.
std::int64_t GetRepeats(const std::string& sTerrain) {
    const bool isLarge = sTerrain.find('M') != std::string::npos;
    return isLarge ? 1 : sTerrain.rfind("100k", 0) == 0 ? 5 : 30;
}

} // namespace

void AddBuild(const Plan& oPlan) {
    for (const std::string& terrain : oPlan.GetTerrains())
        ForEachPeer([&](auto tag) {
            using Peer = typename decltype(tag)::Type;
            if constexpr (!std::is_same_v<Peer, EmbreeHits>)
                Add({"build", terrain, Index<Peer>::GetName()}, [=](benchmark::State& state) {
                    Build<Peer>(state, terrain);
                })->Iterations(GetRepeats(terrain));
        });
}

} // namespace kelm::bench
