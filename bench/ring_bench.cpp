#include "bench/random.h"
#include "bench/rings.h"
#include "bench/suite.h"
#include "services/vectorlayer.h"
#include "tin/triangulate.h"

#include <cmath>

namespace kelm::bench {

template <>
struct RingCutter<OurRings>::State {
    std::vector<std::vector<ZARVertex>> oRings; ///< closed, as a file gives them
    std::vector<Triangle_Id> oTriangles;
    std::size_t nLast = 0;
};

template <>
const char* RingCutter<OurRings>::GetName() {
    return "ours";
}

template <>
RingCutter<OurRings>::RingCutter(const std::vector<Ring>& oRings) : mpoState(new State) {
    for (const Ring& ring : oRings) {
        auto& vertices = mpoState->oRings.emplace_back();
        for (const point2_t<double>& p : ring)
            vertices.push_back({p.x, p.y, 0.0});
        vertices.push_back(vertices.front());
    }
}

template <>
RingCutter<OurRings>::~RingCutter() = default;

template <>
std::size_t RingCutter<OurRings>::Cut(std::size_t nRing) {
    std::vector<ZARVertex>& vertices = mpoState->oRings[nRing];
    const ZARShape shape{vertices.data(), static_cast<int>(vertices.size())};
    mpoState->nLast = nRing;
    mpoState->oTriangles.clear();
    const tin::Polygon<double> polygon(&shape, PO_Undefined);
    if (Triangulate(polygon, mpoState->oTriangles) != 0)
        return 0;
    return mpoState->oTriangles.size();
}

template <>
double RingCutter<OurRings>::GetCutArea() const {
    const std::vector<ZARVertex>& v = mpoState->oRings[mpoState->nLast];
    double area = 0.0;
    for (const Triangle_Id& t : mpoState->oTriangles)
        area += ((v[t.id1].x - v[t.id0].x) * (v[t.id2].y - v[t.id0].y) -
                 (v[t.id2].x - v[t.id0].x) * (v[t.id1].y - v[t.id0].y)) /
                2.0;
    return area;
}

namespace {

constexpr double CENTER_X = 500000.0;
constexpr double CENTER_Y = 4649776.0;

/// Corners all around a centre, 20 to 50 m away from it.
Ring MakeStar(unsigned corners, Random& rRandom) {
    Ring ring;
    for (unsigned i = 0; i < corners; ++i) {
        const double turn = 6.283185307179586 * i / corners;
        const double radius = 20.0 + rRandom.Below(30000) / 1000.0;
        ring.push_back({CENTER_X + radius * std::cos(turn), CENTER_Y + radius * std::sin(turn)});
    }
    return ring;
}

/// A band 5 m high that goes up and down by up to 20 m at each step of 10 m. An odd corner makes a
/// tip at its end.
Ring MakeWiggle(unsigned corners, Random& rRandom) {
    const unsigned half = corners / 2;
    Ring ring;
    for (unsigned i = 0; i < half; ++i) {
        const double swing = rRandom.Below(20000) / 1000.0;
        ring.push_back({CENTER_X + 10.0 * i, CENTER_Y + (i % 2 == 0 ? swing : -swing)});
    }
    if (corners % 2 != 0)
        ring.push_back({ring.back().x + 5.0, ring.back().y + 2.5});
    for (unsigned i = half; i-- > 0;)
        ring.push_back({ring[i].x, ring[i].y + 5.0});
    return ring;
}

constexpr unsigned LARGE = 100000;

/// Corners far apart on a circle of 10 km.
Ring MakeCircle(unsigned corners) {
    Ring ring;
    for (unsigned i = 0; i < corners; ++i) {
        const double turn = 6.283185307179586 * i / corners;
        ring.push_back({CENTER_X + 10000.0 * std::cos(turn), CENTER_Y + 10000.0 * std::sin(turn)});
    }
    return ring;
}

/// Teeth beside each other on one side of a band, up to so high, turned so that no edge runs along
/// an axis.
Ring MakeTeeth(unsigned corners, double height, Random& rRandom) {
    Ring ring{{-1.0, -10.0}, {1.0 * corners, -10.0}};
    for (unsigned i = corners - 2; i-- > 0;)
        ring.push_back({1.0 * i, i % 2 == 0 ? 0.0 : height * (1 + rRandom.Below(1000)) / 1000.0});
    for (point2_t<double>& p : ring)
        p = {CENTER_X + 0.8 * p.x - 0.6 * p.y, CENTER_Y + 0.6 * p.x + 0.8 * p.y};
    return ring;
}

/// A path 20 m wide that turns 40 times around a centre, there and back.
Ring MakeSpiral(unsigned corners) {
    const unsigned half = corners / 2;
    Ring ring;
    const auto add = [&](unsigned i, double beside) {
        const double turn = 251.3 * i / half;
        const double radius = 100.0 + 10.0 * turn + beside;
        ring.push_back({CENTER_X + radius * std::cos(turn), CENTER_Y + radius * std::sin(turn)});
    };
    for (unsigned i = 0; i < half; ++i)
        add(i, 20.0);
    for (unsigned i = half; i-- > 0;)
        add(i, 0.0);
    return ring;
}

/// A square whose sides are broken in the middle, again and again, until it has enough corners.
Ring MakeCoast(unsigned corners, Random& rRandom) {
    Ring ring{{0.0, 0.0}, {1e5, 0.0}, {1e5, 1e5}, {0.0, 1e5}};
    while (ring.size() < corners) {
        Ring finer;
        for (std::size_t i = 0; i < ring.size(); ++i) {
            const auto [x, y] = ring[i];
            const auto [nextX, nextY] = ring[(i + 1) % ring.size()];
            const double out = (rRandom.Below(32000) - 16000.0) / 100000.0;
            finer.push_back({x, y});
            finer.push_back(
                {(x + nextX) / 2.0 + (nextY - y) * out, (y + nextY) / 2.0 - (nextX - x) * out});
        }
        ring.swap(finer);
    }
    return ring;
}

Ring MakeLarge(const std::string& sShape, Random& rRandom) {
    if (sShape == "circle")
        return MakeCircle(LARGE);
    if (sShape == "star")
        return MakeStar(LARGE, rRandom);
    if (sShape == "spiral")
        return MakeSpiral(LARGE);
    if (sShape == "coast")
        return MakeCoast(LARGE, rRandom);
    return MakeTeeth(LARGE, sShape == "comb" ? 1000.0 : 1.0, rRandom);
}

std::shared_ptr<const std::vector<Ring>> GetLargeRing(const std::string& sShape) {
    return Recall<std::vector<Ring>>("large" + sShape, [&] {
        Random random(11);
        return std::make_shared<std::vector<Ring>>(1, MakeLarge(sShape, random));
    });
}

std::shared_ptr<const std::vector<Ring>> GetRings(const std::string& sShape, unsigned corners) {
    return Recall<std::vector<Ring>>(sShape + std::to_string(corners), [&] {
        Random random(11);
        auto rings = std::make_shared<std::vector<Ring>>(corners < 10 ? 2000 : 10000 / corners);
        for (Ring& ring : *rings)
            ring = sShape == "star" ? MakeStar(corners, random) : MakeWiggle(corners, random);
        return rings;
    });
}

double GetArea(const Ring& oRing) {
    const auto [x0, y0] = oRing[0];
    double area = 0.0;
    for (std::size_t i = 1; i + 1 < oRing.size(); ++i)
        area += ((oRing[i].x - x0) * (oRing[i + 1].y - y0) -
                 (oRing[i + 1].x - x0) * (oRing[i].y - y0)) /
                2.0;
    return area;
}

/// @return number of rings of which two triangles less than corners do not fill the area
template <typename Peer>
std::size_t CountFailures(RingCutter<Peer>& rCutter, const std::vector<Ring>& oRings) {
    std::size_t failures = 0;
    for (std::size_t i = 0; i < oRings.size(); ++i) {
        const bool isComplete = rCutter.Cut(i) + 2 == oRings[i].size();
        const double area = GetArea(oRings[i]);
        if (!isComplete || std::fabs(rCutter.GetCutArea() - area) > 1e-6 * area)
            ++failures;
    }
    return failures;
}

template <typename Peer>
void CutRings(benchmark::State& rState, const std::shared_ptr<const std::vector<Ring>>& rings) {
    RingCutter<Peer> cutter(*rings);
    for (auto _ : rState)
        for (std::size_t i = 0; i < rings->size(); ++i)
            benchmark::DoNotOptimize(cutter.Cut(i));
    rState.SetItemsProcessed(static_cast<std::int64_t>(rings->size()) * rState.iterations());
    const std::size_t failures = CountFailures(cutter, *rings);
    rState.counters["differ"] = static_cast<double>(failures);
    if (std::is_same_v<Peer, OurRings> && failures != 0)
        rState.SkipWithError("a ring was not cut, or not into its area");
}

template <typename Peer>
void AddCutter(const std::string& sShape, unsigned corners) {
    Add({"ring", sShape, std::to_string(corners), RingCutter<Peer>::GetName()},
        [=](benchmark::State& state) { CutRings<Peer>(state, GetRings(sShape, corners)); })
        ->Iterations(3);
}

template <typename Peer>
void AddLargeCutter(const std::string& sShape) {
    Add({"ring", "large", sShape, RingCutter<Peer>::GetName()}, [=](benchmark::State& state) {
        CutRings<Peer>(state, GetLargeRing(sShape));
    })->Iterations(1);
}

} // namespace

void AddRing(const Plan&) {
    for (const std::string shape : {"star", "wiggly"})
        for (const unsigned corners : {4U, 5U, 10U, 50U, 500U}) {
            AddCutter<OurRings>(shape, corners);
#ifdef KELM_BENCH_GEOS
            AddCutter<GeosRings>(shape, corners);
#endif
#ifdef KELM_BENCH_CGAL
            AddCutter<CgalRings>(shape, corners);
#endif
        }
    for (const std::string shape : {"circle", "star", "comb", "sawtooth", "spiral", "coast"}) {
        AddLargeCutter<OurRings>(shape);
#ifdef KELM_BENCH_CGAL
        AddLargeCutter<CgalRings>(shape);
#endif
    }
}

} // namespace kelm::bench
