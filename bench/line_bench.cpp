#include "bench/suite.h"

#include <algorithm>

namespace kelm::bench {

namespace {

/// Greatest distance of heights that count as equal, in metres. A crossing at a sharp angle moves
/// along the segment by much more than its triangle is uncertain.
constexpr float TOLERANCE = 0.01F;

template <typename Peer>
void AnswerAll(const Index<Peer>& oIndex, const Segments& oSegments, std::vector<float>& rAnswers) {
    for (std::size_t i = 0; i < oSegments.size(); ++i) {
        float h;
        const Segment& segment = oSegments[i];
        rAnswers[i] = oIndex.GetLineIntersectHeight(segment.a, segment.b, h) ? h : NO_HEIGHT;
    }
}

std::shared_ptr<const std::vector<float>> GetOurAnswers(const std::string& sTerrain,
                                                        unsigned nPercent) {
    return Recall<std::vector<float>>("line/" + sTerrain + "/" + std::to_string(nPercent), [&] {
        const auto segments = GetSegments(sTerrain, nPercent);
        auto answers = std::make_shared<std::vector<float>>(segments->size());
        AnswerAll(*GetIndex<Ours>(sTerrain), *segments, *answers);
        return answers;
    });
}

/// Our answers must be those of a scan of all triangles, to the bit; tried on some segments.
bool IsSameAsScan(const tin::Tin& oSurface, const Segments& oSegments,
                  const std::vector<float>& oAnswers) {
    const std::size_t tries =
        std::clamp<std::size_t>(10000000 / oSurface.GetTriangleCount(), 5, 100);
    for (std::size_t i = 0; i < oSegments.size(); i += oSegments.size() / tries) {
        float h;
        const Segment& segment = oSegments[i];
        const bool isFound = oSurface.GetLineIntersectHeight(segment.a, segment.b, h, nullptr);
        if (oAnswers[i] != (isFound ? h : NO_HEIGHT))
            return false;
    }
    return true;
}

template <typename Peer>
void FindCrossings(benchmark::State& rState, const std::string& sTerrain, unsigned nPercent) {
    const auto segments = GetSegments(sTerrain, nPercent);
    const auto index = GetIndex<Peer>(sTerrain);
    std::vector<float> answers(segments->size());
    for (auto _ : rState)
        AnswerAll(*index, *segments, answers);
    rState.SetItemsProcessed(static_cast<std::int64_t>(segments->size()) * rState.iterations());
    rState.counters["crossings"] = static_cast<double>(std::count_if(
        answers.begin(), answers.end(), [](float height) { return height > NO_HEIGHT; }));
    ReportDifference(rState, Compare(answers, *GetOurAnswers(sTerrain, nPercent), TOLERANCE));
    if constexpr (std::is_same_v<Peer, Ours>)
        if (!IsSameAsScan(*GetSurface(sTerrain), *segments, answers))
            rState.SkipWithError("tree and scan disagree");
}

} // namespace

void AddLine(const Plan& oPlan) {
    for (const std::string& terrain : oPlan.GetTerrains())
        for (const unsigned percent : {2U, 50U})
            ForEachPeer([&](auto tag) {
                using Peer = typename decltype(tag)::Type;
                Add({"line", std::to_string(percent) + "%", terrain, Index<Peer>::GetName()},
                    [=](benchmark::State& state) { FindCrossings<Peer>(state, terrain, percent); });
            });
}

} // namespace kelm::bench
