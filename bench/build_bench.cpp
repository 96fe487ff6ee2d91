#include "bench/child.h"
#include "bench/suite.h"

#include <optional>

#include <malloc.h>
#include <omp.h>

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

/// A tree on as many threads as the runtime is told to take, by the clock on the wall.
void BuildTree(benchmark::State& rState, const std::string& sTerrain, int nThreads) {
    const int before = omp_get_max_threads();
    omp_set_num_threads(nThreads);
    Build<Ours>(rState, sTerrain);
    omp_set_num_threads(before);
}

/// Bytes that a build takes at its peak and keeps, by a process of its own.
void WeighBuild(benchmark::State& rState, const std::string& sPeer, const std::string& sTerrain) {
    for (auto _ : rState) {
        const Figures figures = RunChild({"build", sPeer, sTerrain});
        rState.counters["peak"] = figures.at("peak");
        rState.counters["held"] = figures.at("held");
        rState.counters["triangles"] = figures.at("triangles");
    }
}

} // namespace

Figures MeasureBuild(const std::string& sPeer, const std::string& sTerrain) {
    Figures figures;
    ForEachPeer([&](auto tag) {
        using Peer = typename decltype(tag)::Type;
        if (sPeer != Index<Peer>::GetName())
            return;
        const auto terrain = GetTerrain(sTerrain);
        const auto input = Index<Peer>::Prepare(terrain);
        malloc_trim(0);
        ResetPeak();
        const double base = GetResident();
        const Index<Peer> index(*input);
        figures["held"] = GetResident() - base;
        figures["peak"] = GetPeak() - base;
        figures["triangles"] = static_cast<double>(terrain->oTriangles.size());
    });
    return figures;
}

void AddBuild(const Plan& oPlan) {
    const auto forEachBuild = [](const auto& call) {
        ForEachPeer([&](auto tag) {
            if constexpr (!std::is_same_v<typename decltype(tag)::Type, EmbreeHits>)
                call(tag);
        });
    };
    for (const std::string& terrain : oPlan.GetTerrains())
        forEachBuild([&](auto tag) {
            using Peer = typename decltype(tag)::Type;
            Add({"build", terrain, Index<Peer>::GetName()}, [=](benchmark::State& state) {
                Build<Peer>(state, terrain);
            })->Iterations(GetRepeats(terrain));
        });
    // Inputs that could make a build quadratic.
    for (const char* ending : {"-same", "-crowded"})
        for (const std::string& size : oPlan.GetSizes())
            Add({"build", size + ending, Index<Ours>::GetName()},
                [=](benchmark::State& state) { Build<Ours>(state, size + ending); });
    for (const std::string& size : oPlan.GetSizes())
        for (const int threads : {1, 2})
            Add({"threads/build of an AabbTree", size, threads == 1 ? "ours" : "two threads"},
                [=](benchmark::State& state) { BuildTree(state, size, threads); })
                ->MeasureProcessCPUTime()
                ->UseRealTime();
    const std::string terrain = oPlan.bQuick ? "100k" : "1M";
    forEachBuild([&](auto tag) {
        const std::string peer = Index<typename decltype(tag)::Type>::GetName();
        Add({"memory", terrain, peer},
            [=](benchmark::State& state) { WeighBuild(state, peer, terrain); });
    });
}

} // namespace kelm::bench
