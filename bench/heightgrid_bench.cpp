#include "bench/suite.h"
#include "tin/heightgrid.h"

#include <cstring>
#include <limits>
#include <optional>

namespace kelm::bench {

namespace {

using tin::HeightGrid;

constexpr float NOT_A_NUMBER = std::numeric_limits<float>::quiet_NaN();

/// A terrain's positions in map coordinates, with what answers them.
struct Ready {
    std::shared_ptr<const Positions> poPositions;
    std::vector<point2_t<double>> oMap;
    std::shared_ptr<const tin::Tin> poSurface;
    std::shared_ptr<const tin::AabbTree> poTree;
    std::shared_ptr<const HeightGrid> poGrid;
};

std::shared_ptr<const Ready> Prepare(const std::string& sTerrain, const std::string& sOrder) {
    return Recall<Ready>("heightgrid/" + sTerrain + "/" + sOrder, [&] {
        auto ready = std::make_shared<Ready>();
        ready->poSurface = GetSurface(sTerrain);
        ready->poPositions = GetPositions(sTerrain, sOrder);
        double x;
        double y;
        ready->poSurface->GetXYBase(x, y);
        for (const point2_t<float>& p : *ready->poPositions)
            ready->oMap.push_back({static_cast<double>(p.x) + x, static_cast<double>(p.y) + y});
        ready->poTree = Recall<tin::AabbTree>(
            sTerrain, [&] { return std::make_shared<tin::AabbTree>(ready->poSurface.get()); });
        ready->poGrid = Recall<HeightGrid>(
            sTerrain, [&] { return std::make_shared<HeightGrid>(*ready->poSurface); });
        return ready;
    });
}

using Answer = void (*)(const Ready&, std::vector<float>&);

void AnswerSingly(const Ready& oReady, std::vector<float>& rHeights) {
    for (std::size_t i = 0; i < rHeights.size(); ++i) {
        float h;
        const point2_t<float>& p = (*oReady.poPositions)[i];
        rHeights[i] = oReady.poGrid->GetHeight(p.x, p.y, h) ? h : NOT_A_NUMBER;
    }
}

void AnswerSinglyByTree(const Ready& oReady, std::vector<float>& rHeights) {
    for (std::size_t i = 0; i < rHeights.size(); ++i) {
        float h;
        const point2_t<float>& p = (*oReady.poPositions)[i];
        rHeights[i] =
            oReady.poSurface->GetHeight(p.x, p.y, h, oReady.poTree.get()) ? h : NOT_A_NUMBER;
    }
}

template <int THREADS>
void AnswerBatch(const Ready& oReady, std::vector<float>& rHeights) {
    oReady.poGrid->GetHeights(oReady.oMap.data(), oReady.oMap.size(), rHeights.data(), THREADS);
}

void AnswerClosed(const Ready& oReady, std::vector<float>& rHeights) {
    oReady.poGrid->GetHeights(oReady.oMap.data(), oReady.oMap.size(), rHeights.data(), 1,
                              tin::ER_Closed);
}

void AnswerBatchByTree(const Ready& oReady, std::vector<float>& rHeights) {
    oReady.poSurface->GetHeights(oReady.oMap.data(), oReady.oMap.size(), rHeights.data(),
                                 oReady.poTree.get(), 1);
}

void Run(benchmark::State& rState, const std::string& sTerrain, const std::string& sOrder,
         Answer answer) {
    const auto ready = Prepare(sTerrain, sOrder);
    std::vector<float> heights(ready->oMap.size());
    for (auto _ : rState)
        answer(*ready, heights);
    rState.SetItemsProcessed(static_cast<std::int64_t>(heights.size()) * rState.iterations());
}

/// The same bits by index, tree and batch, at the positions in map coordinates.
void RunBatch(benchmark::State& rState, const std::string& sTerrain, const std::string& sOrder) {
    Run(rState, sTerrain, sOrder, AnswerBatch<1>);
    const auto ready = Prepare(sTerrain, sOrder);
    std::vector<float> heights(ready->oMap.size());
    std::vector<float> wanted(ready->oMap.size());
    AnswerBatch<1>(*ready, heights);
    AnswerBatchByTree(*ready, wanted);
    if (std::memcmp(heights.data(), wanted.data(), 4 * heights.size()) != 0)
        rState.SkipWithError("HeightGrid and tree disagree");
}

#ifdef KELM_BENCH_EMBREE
void RunEmbree(benchmark::State& rState, const std::string& sTerrain, const std::string& sOrder,
               Batching eBatching) {
    const auto positions = GetPositions(sTerrain, sOrder);
    const auto index = GetIndex<Embree>(sTerrain);
    std::vector<float> heights(positions->size());
    for (auto _ : rState)
        index->GetHeights(eBatching, *positions, heights);
    rState.SetItemsProcessed(static_cast<std::int64_t>(heights.size()) * rState.iterations());
}
#endif

void BuildGrid(benchmark::State& rState, const std::string& sTerrain, int nThreads) {
    const auto surface = GetSurface(sTerrain);
    std::optional<HeightGrid> grid;
    tin::BuildOptions options;
    options.threads = nThreads;
    for (auto _ : rState) {
        grid.emplace(*surface, options);
        rState.PauseTiming();
        rState.counters["held"] = static_cast<double>(grid->GetObjBytes());
        rState.counters["triangles"] = surface->GetTriangleCount();
        grid.reset();
        rState.ResumeTiming();
    }
    rState.SetItemsProcessed(surface->GetTriangleCount() * rState.iterations());
}

/// The position in the middle of the surface's box.
void FindHeight(benchmark::State& rState, const std::string& sTerrain) {
    const auto surface = GetSurface(sTerrain);
    const HeightGrid grid(*surface);
    const auto& box = surface->GetBBox();
    const float x = box.min.x / 2 + box.max.x / 2;
    const float y = box.min.y / 2 + box.max.y / 2;
    for (auto _ : rState) {
        float h;
        benchmark::DoNotOptimize(grid.GetHeight(x, y, h));
    }
    rState.SetItemsProcessed(rState.iterations());
}

void AddAnswers(const std::string& sTerrain, const std::string& sOrder) {
    const auto add = [&](const char* who, Answer answer) {
        Add({"heights/" + sOrder, sTerrain, who},
            [=](benchmark::State& state) { Run(state, sTerrain, sOrder, answer); });
    };
    Add({"heights/" + sOrder, sTerrain, "ours"},
        [=](benchmark::State& state) { RunBatch(state, sTerrain, sOrder); });
    add("closed rule", AnswerClosed);
    add("single calls", AnswerSingly);
    add("tree, batch", AnswerBatchByTree);
    add("tree, single calls", AnswerSinglyByTree);
#ifdef KELM_BENCH_EMBREE
    const auto addEmbree = [&](const char* who, Batching batching) {
        Add({"heights/" + sOrder, sTerrain, who},
            [=](benchmark::State& state) { RunEmbree(state, sTerrain, sOrder, batching); });
    };
    addEmbree("Embree, stream", Batching::Stream);
    addEmbree("Embree, packet", Batching::Packet);
#endif
}

/// Rows whose name starts with "threads" are measured on two cores, by the clock on the wall.
void AddThreads(const std::string& sTerrain) {
    for (const int threads : {1, 2}) {
        const char* who = threads == 1 ? "ours" : "two threads";
        const auto answer = threads == 1 ? AnswerBatch<1> : AnswerBatch<2>;
        Add({"threads/heights", sTerrain, who},
            [=](benchmark::State& state) { Run(state, sTerrain, "random", answer); })
            ->MeasureProcessCPUTime()
            ->UseRealTime();
        Add({"threads/build", sTerrain, who},
            [=](benchmark::State& state) { BuildGrid(state, sTerrain, threads); })
            ->MeasureProcessCPUTime()
            ->UseRealTime();
    }
}

} // namespace

void AddHeightGrid(const Plan& oPlan) {
    for (const std::string& terrain : oPlan.GetTerrains())
        for (const char* order : {"scanline", "random"})
            AddAnswers(terrain, order);
    for (const std::string& terrain : oPlan.GetTerrains())
        Add({"build", terrain, "HeightGrid"}, [=](benchmark::State& state) {
            BuildGrid(state, terrain, 1);
        })->Iterations(GetRepeats(terrain));
    for (const std::string kind : {"same", "crowded", "vertical", "tower", "slivers", "far"}) {
        const std::string terrain = (oPlan.bQuick ? "100k-" : "1M-") + kind;
        Add({"degenerate", kind, "HeightGrid, build"},
            [=](benchmark::State& state) { BuildGrid(state, terrain, 1); });
        Add({"degenerate", kind, "HeightGrid, a height"},
            [=](benchmark::State& state) { FindHeight(state, terrain); });
    }
    for (const std::string& size : oPlan.GetSizes())
        AddThreads(size);
}

} // namespace kelm::bench
