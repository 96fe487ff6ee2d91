#include "bench/suite.h"
#include "tin/crossingtree.h"

#include <algorithm>
#include <cmath>
#include <optional>

namespace kelm::bench {

namespace {

/// The segments in both forms that competitors take.
struct Questions {
    std::vector<point3_t<float>> oLocal;
    std::vector<point3_t<double>> oMap;
};

std::shared_ptr<const Questions> GetQuestions(const std::string& sTerrain, unsigned nPercent) {
    return Recall<Questions>(sTerrain + std::to_string(nPercent), [&] {
        const auto segments = GetSegments(sTerrain, nPercent);
        const auto surface = GetSurface(sTerrain);
        double x;
        double y;
        surface->GetXYBase(x, y);
        auto questions = std::make_shared<Questions>();
        for (const Segment& segment : *segments)
            for (const point3_t<float>& p : {segment.a, segment.b}) {
                questions->oLocal.push_back(p);
                questions->oMap.push_back({static_cast<double>(p.x) + x,
                                           static_cast<double>(p.y) + y, static_cast<double>(p.z)});
            }
        return questions;
    });
}

using Answers = std::vector<float>;

std::shared_ptr<const tin::CrossingTree> GetCrossingTree(const std::string& sTerrain) {
    return Recall<tin::CrossingTree>(
        sTerrain, [&] { return std::make_shared<tin::CrossingTree>(*GetSurface(sTerrain)); });
}

std::shared_ptr<const tin::AabbTree> GetTree(const std::string& sTerrain) {
    return Recall<tin::AabbTree>(
        sTerrain, [&] { return std::make_shared<tin::AabbTree>(GetSurface(sTerrain).get()); });
}

template <typename Ask>
void AskEach(const Questions& oQuestions, Answers& rAnswers, const Ask& ask) {
    for (std::size_t i = 0; i < rAnswers.size(); ++i) {
        float h;
        const bool isFound = ask(oQuestions.oLocal[2 * i], oQuestions.oLocal[2 * i + 1], h);
        rAnswers[i] = isFound ? h : std::nanf("");
    }
}

/// A way to answer all segments over a terrain.
using Way = void (*)(const std::string& sTerrain, const Questions& oQuestions, Answers& rAnswers,
                     benchmark::State& rState);

void AskTin(const std::string& sTerrain, const Questions& oQuestions, Answers& rAnswers,
            benchmark::State& rState) {
    const auto surface = GetSurface(sTerrain);
    const auto tree = GetTree(sTerrain);
    for (auto _ : rState)
        AskEach(oQuestions, rAnswers, [&](const auto& a, const auto& b, float& h) {
            return surface->GetLineIntersectHeight(a, b, h, tree.get());
        });
}

void AskCrossingTree(const std::string& sTerrain, const Questions& oQuestions, Answers& rAnswers,
                     benchmark::State& rState) {
    const auto index = GetCrossingTree(sTerrain);
    for (auto _ : rState)
        AskEach(oQuestions, rAnswers, [&](const auto& a, const auto& b, float& h) {
            return index->GetLineIntersectHeight(a, b, h);
        });
}

template <int THREADS>
void AskBatch(const std::string& sTerrain, const Questions& oQuestions, Answers& rAnswers,
              benchmark::State& rState) {
    const auto index = GetCrossingTree(sTerrain);
    for (auto _ : rState)
        index->GetLineIntersectHeights(oQuestions.oMap.data(), rAnswers.size(), rAnswers.data(),
                                       THREADS);
}

#ifdef KELM_BENCH_EMBREE
template <Batching eBatching>
void AskEmbree(const std::string& sTerrain, const Questions& oQuestions, Answers& rAnswers,
               benchmark::State& rState) {
    const auto index = GetIndex<EmbreeHits>(sTerrain);
    for (auto _ : rState)
        AnswerSegments(*index, eBatching, oQuestions.oLocal.data(), rAnswers.size(),
                       rAnswers.data());
}
#endif

constexpr std::pair<const char*, Way> WAYS[] = {
    {"ours", AskCrossingTree},
    {"ours, batch", AskBatch<1>},
    {"Tin with its tree", AskTin},
#ifdef KELM_BENCH_EMBREE
    {"Embree, all hits", AskEmbree<Batching::Single>},
    {"Embree, all hits, packets", AskEmbree<Batching::Packet>},
    {"Embree, all hits, stream", AskEmbree<Batching::Stream>},
#endif
};

/// Our answers by the tree of the surface, to which all others are compared.
std::shared_ptr<const Answers> GetAnswers(const std::string& sTerrain, unsigned nPercent) {
    return Recall<Answers>(sTerrain + std::to_string(nPercent), [&] {
        const auto questions = GetQuestions(sTerrain, nPercent);
        const auto surface = GetSurface(sTerrain);
        const auto tree = GetTree(sTerrain);
        auto answers = std::make_shared<Answers>(questions->oLocal.size() / 2);
        AskEach(*questions, *answers, [&](const auto& a, const auto& b, float& h) {
            return surface->GetLineIntersectHeight(a, b, h, tree.get());
        });
        return answers;
    });
}

void Cross(benchmark::State& rState, const std::string& sTerrain, unsigned nPercent, Way way) {
    const auto questions = GetQuestions(sTerrain, nPercent);
    Answers answers(questions->oLocal.size() / 2);
    const auto wanted = GetAnswers(sTerrain, nPercent);
    way(sTerrain, *questions, answers, rState);
    rState.SetItemsProcessed(static_cast<std::int64_t>(answers.size()) * rState.iterations());
    std::size_t differ = 0;
    for (std::size_t i = 0; i < answers.size(); ++i)
        differ += std::isnan(answers[i]) != std::isnan((*wanted)[i]) ||
                  std::fabs(answers[i] - (*wanted)[i]) > 0.0F;
    rState.counters["differ"] = static_cast<double>(differ);
}

void Build(benchmark::State& rState, const std::string& sTerrain, int nThreads) {
    const auto surface = GetSurface(sTerrain);
    std::optional<tin::CrossingTree> tree;
    tin::BuildOptions options;
    options.threads = nThreads;
    for (auto _ : rState) {
        tree.emplace(*surface, options);
        rState.PauseTiming();
        rState.counters["bytes"] =
            static_cast<double>(tree->GetObjBytes()) / surface->GetTriangleCount();
        tree.reset();
        rState.ResumeTiming();
    }
    rState.SetItemsProcessed(std::int64_t{surface->GetTriangleCount()} * rState.iterations());
}

} // namespace

void AddCrossing(const Plan& oPlan) {
    for (const std::string& terrain : oPlan.GetTerrains())
        for (const unsigned percent : {2U, 50U})
            for (const auto& [name, way] : WAYS)
                Add({"crossing", std::to_string(percent) + "%", terrain, name},
                    [way = way, terrain, percent](benchmark::State& state) {
                        Cross(state, terrain, percent, way);
                    });
    for (const std::string& terrain : oPlan.GetTerrains())
        Add({"build", terrain, "crossing tree"},
            [terrain](benchmark::State& state) { Build(state, terrain, 1); });
    for (const std::string& size : oPlan.GetSizes())
        for (const int threads : {1, 2}) {
            const char* who = threads == 1 ? "ours" : "two threads";
            Add({"threads/build of a crossing tree", size, who},
                [=](benchmark::State& state) { Build(state, size, threads); })
                ->MeasureProcessCPUTime()
                ->UseRealTime();
            Add({"threads/crossings", size, who},
                [=](benchmark::State& state) {
                    Cross(state, size, 2, threads == 1 ? AskBatch<1> : AskBatch<2>);
                })
                ->MeasureProcessCPUTime()
                ->UseRealTime();
        }
}

} // namespace kelm::bench
