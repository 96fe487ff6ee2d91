#include "bench/suite.h"

#include <algorithm>

namespace kelm::bench {

namespace {

/// Greatest distance of heights that count as equal, in metres: heights are `float` up to 1,200 m.
constexpr float TOLERANCE = 0.002F;

template <typename Peer>
void AnswerAll(const Index<Peer>& oIndex, const Positions& oPositions,
               std::vector<float>& rAnswers) {
    for (std::size_t i = 0; i < oPositions.size(); ++i) {
        float h;
        rAnswers[i] = oIndex.GetHeight(oPositions[i].x, oPositions[i].y, h) ? h : NO_HEIGHT;
    }
}

std::shared_ptr<const std::vector<float>> GetOurAnswers(const std::string& sTerrain,
                                                        const std::string& sOrder) {
    return Recall<std::vector<float>>("height/" + sTerrain + "/" + sOrder, [&] {
        const auto positions = GetPositions(sTerrain, sOrder);
        auto answers = std::make_shared<std::vector<float>>(positions->size());
        AnswerAll(*GetIndex<Ours>(sTerrain), *positions, *answers);
        return answers;
    });
}

/// Our answers must be those of a scan of all triangles, to the bit; tried on some positions.
bool IsSameAsScan(const tin::Tin& oSurface, const Positions& oPositions,
                  const std::vector<float>& oAnswers) {
    const std::size_t tries =
        std::clamp<std::size_t>(50000000 / oSurface.GetTriangleCount(), 20, 500);
    for (std::size_t i = 0; i < oPositions.size(); i += oPositions.size() / tries) {
        float h;
        const bool isFound = oSurface.GetHeight(oPositions[i].x, oPositions[i].y, h, nullptr);
        if (oAnswers[i] != (isFound ? h : NO_HEIGHT))
            return false;
    }
    return true;
}

template <typename Peer>
void GetHeights(benchmark::State& rState, const std::string& sTerrain, const std::string& sOrder) {
    const auto positions = GetPositions(sTerrain, sOrder);
    const auto index = GetIndex<Peer>(sTerrain);
    std::vector<float> answers(positions->size());
    for (auto _ : rState)
        AnswerAll(*index, *positions, answers);
    rState.SetItemsProcessed(static_cast<std::int64_t>(positions->size()) * rState.iterations());
    ReportDifference(rState, Compare(answers, *GetOurAnswers(sTerrain, sOrder), TOLERANCE));
    if constexpr (std::is_same_v<Peer, Ours>)
        if (!IsSameAsScan(*GetSurface(sTerrain), *positions, answers))
            rState.SkipWithError("tree and scan disagree");
}

} // namespace

void AddHeight(const Plan& oPlan) {
    const auto addAll = [](const std::string& sOrder, const std::string& sTerrain) {
        ForEachPeer([&](auto tag) {
            using Peer = typename decltype(tag)::Type;
            Add({"height", sOrder, sTerrain, Index<Peer>::GetName()},
                [=](benchmark::State& state) { GetHeights<Peer>(state, sTerrain, sOrder); });
        });
    };
    for (const std::string& terrain : oPlan.GetTerrains())
        for (const char* order : {"scanline", "random"})
            addAll(order, terrain);
    for (const std::string& size : oPlan.GetSizes())
        addAll("fine", size);
}

} // namespace kelm::bench
