#pragma once

#include "bench/peers.h"
#include "bench/terrain.h"
#include "bench/workload.h"

#include <benchmark/benchmark.h>

#include <string>
#include <utility>
#include <vector>

namespace kelm::bench {

/// What a run covers.
struct Plan {
    bool bQuick = false;           ///< terrains up to 100k triangles and the smaller files only
    std::string sDataFolder = "."; ///< where the files of the loads are made

    std::vector<std::string> GetSizes() const {
        if (bQuick)
            return {"10k", "100k"};
        return {"10k", "100k", "1M", "4M"};
    }
    /// All sizes, two of them in random order too, and the real terrain.
    std::vector<std::string> GetTerrains() const {
        std::vector<std::string> terrains = GetSizes();
        terrains.push_back("100k-shuffled");
        if (!bQuick)
            terrains.push_back("1M-shuffled");
        terrains.push_back("jacksboro");
        return terrains;
    }
};

// One function a subject, each of which registers its benchmarks, the competitors in turn.
void AddBuild(const Plan& oPlan);
void AddCrossing(const Plan& oPlan);
void AddDegenerate(const Plan& oPlan);
void AddHeight(const Plan& oPlan);
void AddHeightGrid(const Plan& oPlan);
void AddLine(const Plan& oPlan);
void AddScan(const Plan& oPlan);
void AddWeld(const Plan& oPlan);
void AddRing(const Plan& oPlan);
void AddRaster(const Plan& oPlan);
void AddLoad(const Plan& oPlan);
void AddWindow(const Plan& oPlan);

/// Registers a benchmark under the parts of its name: subject, workload and size, competitor. The
/// time is processor time of the whole process.
template <typename Body>
benchmark::internal::Benchmark* Add(const std::vector<std::string>& oName, const Body& body) {
    std::string name;
    for (const std::string& part : oName)
        name += (name.empty() ? "" : "/") + part;
    return benchmark::RegisterBenchmark(name.c_str(), body)->Iterations(1)->MeasureProcessCPUTime();
}

/// Passes over a terrain that make about a million triangles a round, so that small ones are
/// averaged.
inline std::int64_t GetRepeats(const std::string& sTerrain) {
    if (sTerrain.find('M') != std::string::npos)
        return 1;
    return sTerrain.rfind("100k", 0) == 0 ? 5 : 30;
}

/// Notes how many answers differ from ours.
inline void ReportDifference(benchmark::State& rState, const Difference& oDifference) {
    rState.counters["differ"] = static_cast<double>(oDifference.GetSum());
    rState.counters["differ_found"] = static_cast<double>(oDifference.nFound);
    rState.counters["differ_most"] = static_cast<double>(oDifference.fMost);
}

/// The index of a peer over a terrain, the one asked for last kept in memory.
template <typename Peer>
std::shared_ptr<const Index<Peer>> GetIndex(const std::string& sTerrain) {
    struct Built {
        std::shared_ptr<const typename Index<Peer>::Input> poInput;
        Index<Peer> oIndex;
    };
    const auto built = Recall<Built>(sTerrain, [&] {
        const auto input = Index<Peer>::Prepare(GetTerrain(sTerrain));
        return std::shared_ptr<const Built>(new Built{input, Index<Peer>(*input)});
    });
    return {built, &built->oIndex};
}

} // namespace kelm::bench
