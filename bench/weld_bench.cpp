#include "bench/suite.h"
#include "bench/weld.h"
#include "tin/load/cornerhash.h"
#include "tin/octree2.h"
#include "tin/tinreader.h"

#include <algorithm>
#include <cmath>
#include <functional>
#include <numeric>

namespace kelm::bench {

namespace {

/// Corners of a terrain; "-twins" behind its name: one in a thousand moved by the least step there
/// is, which is within the tolerance.
std::shared_ptr<const Corners> GetCornersOf(const std::string& sName) {
    return Recall<Corners>(sName, [&] {
        const std::size_t ending = sName.find("-twins");
        auto corners = std::make_shared<Corners>(GetCorners(*GetTerrain(sName.substr(0, ending))));
        if (ending != std::string::npos)
            for (std::size_t i = 0; i < corners->size(); i += 1000)
                (*corners)[i].y = std::nextafter((*corners)[i].y, 0.0);
        return corners;
    });
}

/// The octree alone, as it decides wherever two different corners are one.
StandIns WeldByOctree(Corners& rCorners) {
    std::vector<unsigned> keys(rCorners.size());
    std::iota(keys.begin(), keys.end(), 0U);
    const tin::Octree2 tree(rCorners, keys);
    StandIns standIns(rCorners.size());
    for (unsigned i = 0; i < standIns.size(); ++i) {
        if (keys[i] == 1) {
            standIns[i] = i;
            continue;
        }
        const auto* leaf = static_cast<const tin::Octree2::Node*>(tree.FindLeaf(rCorners[i]));
        if (leaf == nullptr || !tin::Octree2::IsTwin(leaf->moPoint, rCorners[i]))
            leaf = tree.FindTwin(rCorners[i]);
        standIns[i] = leaf->mnKey;
    }
    return standIns;
}

/// The first corner of each number, which are given by first appearance.
StandIns FindFirsts(const StandIns& oNumbers) {
    StandIns firsts;
    StandIns standIns(oNumbers.size());
    for (unsigned i = 0; i < standIns.size(); ++i) {
        if (oNumbers[i] == firsts.size())
            firsts.push_back(i);
        standIns[i] = firsts[oNumbers[i]];
    }
    return standIns;
}

/// As a load does it: the octree is asked where the hash cannot tell.
StandIns WeldAsLoad(Corners& rCorners) {
    StandIns numbers(rCorners.size());
    tin::load::CornerHash hash(rCorners.size());
    const bool decided =
        hash.Add(rCorners.data(), rCorners.size(), numbers.data()) == rCorners.size();
    return decided ? numbers : WeldByOctree(rCorners);
}

using Weld = StandIns (*)(Corners&);

std::shared_ptr<const StandIns> GetExpected(const std::string& sCorners) {
    return Recall<StandIns>(sCorners, [&] {
        Corners corners = *GetCornersOf(sCorners);
        return std::make_shared<StandIns>(WeldByOctree(corners));
    });
}

std::size_t CountDifferent(const StandIns& a, const StandIns& b) {
    return std::inner_product(a.begin(), a.end(), b.begin(), std::size_t{0}, std::plus<>(),
                              std::not_equal_to<>());
}

void WeldCorners(benchmark::State& rState, const std::string& sCorners, Weld weld,
                 bool bGivesNumbers, bool bMayDiffer) {
    Corners corners = *GetCornersOf(sCorners);
    const auto expected = GetExpected(sCorners);
    StandIns standIns;
    for (auto _ : rState)
        standIns = weld(corners);
    rState.SetItemsProcessed(static_cast<std::int64_t>(corners.size()) * rState.iterations());
    const std::size_t differ =
        CountDifferent(bGivesNumbers ? FindFirsts(standIns) : standIns, *expected);
    rState.counters["differ"] = static_cast<double>(differ);
    if (!bMayDiffer && differ != 0)
        rState.SkipWithError("the load welds otherwise than the octree");
}

/// Opens the step from corners to a surface.
class Assembly : public tin::TinReader {
  public:
    using TinReader::CreateTin;
    using TinReader::TinReader;
};

/// Welding and all that follows it in a load: narrowing, renumbering, triangles with their boxes.
void AssembleSurface(benchmark::State& rState, const std::string& sCorners) {
    const auto corners = GetCornersOf(sCorners);
    ZARLayer_t* noLayer = nullptr;
    Assembly assembly(noLayer, 0.0, 1.0, ogc::cs::DatumType::VD_Orthometric);
    for (auto _ : rState) {
        rState.PauseTiming();
        Corners points = *corners;
        std::vector<Triangle_Id> ids;
        for (unsigned i = 0; i < points.size(); i += 3)
            ids.push_back({i, i + 1, i + 2});
        std::unique_ptr<tin::Tin> surface;
        rState.ResumeTiming();
        surface.reset(assembly.CreateTin(points, ids));
    }
    rState.SetItemsProcessed(static_cast<std::int64_t>(corners->size()) * rState.iterations());
}

} // namespace

void AddWeld(const Plan& oPlan) {
    std::vector<std::string> names = oPlan.GetTerrains();
    names.push_back("100k-twins");
    if (!oPlan.bQuick)
        names.push_back("1M-twins");
    for (const std::string& name : names) {
        const std::int64_t repeats = GetRepeats(name);
        const auto add = [&](const char* who, Weld weld, bool bGivesNumbers,
                             bool bMayDiffer = false) {
            Add({"weld", name, who}, [=](benchmark::State& state) {
                WeldCorners(state, name, weld, bGivesNumbers, bMayDiffer);
            })->Iterations(repeats);
        };
        add("ours", WeldAsLoad, name.find("-twins") == std::string::npos);
#ifdef KELM_BENCH_MESHOPTIMIZER
        add("meshoptimizer", WeldByMeshoptimizer, true, true);
#endif
        add("plain octree", WeldByOctree, false);
        Add({"weld", name, "ours, corners to surface"}, [=](benchmark::State& state) {
            AssembleSurface(state, name);
        })->Iterations(repeats);
    }
}

} // namespace kelm::bench
