#include "bench/suite.h"
#include "tin/crossingtree.h"

#include <optional>

namespace kelm::bench {

namespace {

void BuildTree(benchmark::State& rState, const std::string& sTerrain) {
    const auto surface = GetSurface(sTerrain);
    for (auto _ : rState) {
        std::optional<tin::AabbTree> tree(surface.get());
        rState.PauseTiming();
        tree.reset();
        rState.ResumeTiming();
    }
}

void ReleaseTree(benchmark::State& rState, const std::string& sTerrain) {
    const auto surface = GetSurface(sTerrain);
    std::optional<tin::AabbTree> tree(surface.get());
    for (auto _ : rState)
        tree.reset();
}

/// The position in the middle of the surface's box.
void FindHeight(benchmark::State& rState, const std::string& sTerrain) {
    const auto surface = GetSurface(sTerrain);
    const tin::AabbTree tree(surface.get());
    const auto& box = surface->GetBBox();
    const float x = box.min.x / 2 + box.max.x / 2;
    const float y = box.min.y / 2 + box.max.y / 2;
    for (auto _ : rState) {
        float h;
        benchmark::DoNotOptimize(surface->GetHeight(x, y, h, &tree));
    }
}

/// A diagonal of the surface's box.
void FindCrossing(benchmark::State& rState, const std::string& sTerrain) {
    const auto surface = GetSurface(sTerrain);
    const tin::AabbTree tree(surface.get());
    const auto& box = surface->GetBBox();
    for (auto _ : rState) {
        float h;
        benchmark::DoNotOptimize(surface->GetLineIntersectHeight(box.min, box.max, h, &tree));
    }
}

void BuildCrossingTree(benchmark::State& rState, const std::string& sTerrain) {
    const auto surface = GetSurface(sTerrain);
    std::optional<tin::CrossingTree> tree;
    for (auto _ : rState) {
        tree.emplace(*surface);
        rState.PauseTiming();
        tree.reset();
        rState.ResumeTiming();
    }
}

/// The same diagonal by a crossing tree.
void FindCrossingByCrossingTree(benchmark::State& rState, const std::string& sTerrain) {
    const auto surface = GetSurface(sTerrain);
    const tin::CrossingTree tree(*surface);
    const auto& box = surface->GetBBox();
    for (auto _ : rState) {
        float h;
        benchmark::DoNotOptimize(tree.GetLineIntersectHeight(box.min, box.max, h));
    }
}

} // namespace

void AddDegenerate(const Plan& oPlan) {
    using Step = void (*)(benchmark::State&, const std::string&);
    constexpr std::pair<const char*, Step> STEPS[] = {
        {"build", BuildTree},
        {"a height", FindHeight},
        {"a crossing", FindCrossing},
        {"release", ReleaseTree},
        {"build, crossing tree", BuildCrossingTree},
        {"a crossing, crossing tree", FindCrossingByCrossingTree}};
    for (const std::string kind : {"same", "crowded", "vertical", "tower", "slivers", "far"})
        for (const auto& [name, step] : STEPS) {
            const std::string terrain = (oPlan.bQuick ? "100k-" : "1M-") + kind;
            Add({"degenerate", kind, name}, [step = step, terrain](benchmark::State& state) {
                step(state, terrain);
                state.SetItemsProcessed(state.iterations());
            });
        }
}

} // namespace kelm::bench
