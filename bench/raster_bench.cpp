#include "bench/plane.h"
#include "bench/suite.h"
#include "tin/raster.h"

#include <algorithm>
#include <cmath>
#include <stdexcept>

#include <gdal_alg.h>

namespace kelm::bench {

namespace {

constexpr int SIDE = RASTER_SIDE;
constexpr float TOLERANCE = 0.002F; ///< metres

/// Heights by row, then column; NO_HEIGHT where there is none.
using Raster = std::vector<float>;

void KeepHighest(Raster& rRaster, int col, int row, float h) {
    float& cell = rRaster[static_cast<std::size_t>(row) * SIDE + static_cast<std::size_t>(col)];
    cell = std::max(cell, h);
}

void WalkOurs(const std::string& sTerrain, Raster& rRaster) {
    const auto surface = GetSurface(sTerrain);
    std::vector<int> points;
    std::vector<float> heights;
    for (unsigned i = 0; i < surface->GetTriangleCount(); ++i) {
        points.clear();
        heights.clear();
        surface->GetTriangle(i)->GetGridPoints(SIDE, SIDE, points, heights);
        for (std::size_t k = 0; k < heights.size(); ++k)
            KeepHighest(rRaster, points[2 * k], points[2 * k + 1], heights[k]);
    }
}

/// The cells alone; their heights are asked one by one.
void WalkOursCells(const std::string& sTerrain, Raster& rRaster) {
    const auto surface = GetSurface(sTerrain);
    std::vector<int> points;
    for (unsigned i = 0; i < surface->GetTriangleCount(); ++i) {
        const tin::Triangle& triangle = *surface->GetTriangle(i);
        points.resize(2 * std::size_t{triangle.GetGridPointsNum(SIDE, SIDE)});
        const unsigned cells = triangle.GetGridPointsCR(points.data(), SIDE, SIDE);
        for (std::size_t k = 0; k < cells; ++k) {
            float h;
            const int col = points[2 * k];
            const int row = points[2 * k + 1];
            if (triangle.GetHeight(static_cast<float>(col), static_cast<float>(row), h))
                KeepHighest(rRaster, col, row, h);
        }
    }
}

/// The whole raster in one call. A cell without a height is NaN there.
void CallOurs(const std::string& sTerrain, Raster& rRaster, int nThreads, tin::EdgeRule eRule) {
    const auto terrain = GetTerrain(sTerrain);
    const tin::RasterFrame frame{
        SIDE, SIDE, {terrain->dfXBase - 0.5, 1.0, 0.0, terrain->dfYBase - 0.5, 0.0, 1.0}};
    RasterizeHeights(*GetSurface(sTerrain), frame, rRaster.data(), nThreads, eRule);
    for (float& cell : rRaster)
        cell = cell > NO_HEIGHT ? cell : NO_HEIGHT;
}

template <int THREADS>
void CallOurs(const std::string& sTerrain, Raster& rRaster) {
    CallOurs(sTerrain, rRaster, THREADS, tin::ER_Float);
}

void CallOursClosed(const std::string& sTerrain, Raster& rRaster) {
    CallOurs(sTerrain, rRaster, 1, tin::ER_Closed);
}

/// Columns of a triangle on a row, from the crossings of its edges. Empty if first > last.
struct Run {
    int nFirst;
    int nLast;
};

Run FindRun(const point3_t<double> (&corners)[3], double y) {
    double low = SIDE;
    double high = -1.0;
    for (int i = 0; i < 3; ++i) {
        const point3_t<double>& p = corners[i];
        const point3_t<double>& q = corners[(i + 1) % 3];
        if (std::min(p.y, q.y) > y || y > std::max(p.y, q.y) || p.y == q.y)
            continue;
        const double x = p.x + (q.x - p.x) * (y - p.y) / (q.y - p.y);
        low = std::min(low, x);
        high = std::max(high, x);
    }
    return {std::max(0, static_cast<int>(std::ceil(low))),
            std::min(SIDE - 1, static_cast<int>(std::floor(high)))};
}

/// Calls row(corners, y, run) for each row of each triangle.
template <typename Row>
void WalkRows(const Terrain& oTerrain, const Row& row) {
    for (const Triangle_Id& ids : oTerrain.oTriangles) {
        const point3_t<double> corners[3] = {Widen(oTerrain.oVertices[ids.id0]),
                                             Widen(oTerrain.oVertices[ids.id1]),
                                             Widen(oTerrain.oVertices[ids.id2])};
        const double low = std::min({corners[0].y, corners[1].y, corners[2].y});
        const double high = std::max({corners[0].y, corners[1].y, corners[2].y});
        const int last = std::min(SIDE - 1, static_cast<int>(std::floor(high)));
        for (int y = std::max(0, static_cast<int>(std::ceil(low))); y <= last; ++y)
            row(corners, y, FindRun(corners, y));
    }
}

/// Each cell of a run is tested and weighted by itself, by the textbook's formula.
void WalkPlainly(const std::string& sTerrain, Raster& rRaster) {
    WalkRows(*GetTerrain(sTerrain), [&](const auto& corners, int y, const Run& run) {
        const auto& [v0, v1, v2] = corners;
        for (int x = run.nFirst; x <= run.nLast; ++x) {
            const double det = (v1.y - v2.y) * (v0.x - v2.x) + (v2.x - v1.x) * (v0.y - v2.y);
            const double w0 = ((v1.y - v2.y) * (x - v2.x) + (v2.x - v1.x) * (y - v2.y)) / det;
            const double w1 = ((v2.y - v0.y) * (x - v2.x) + (v0.x - v2.x) * (y - v2.y)) / det;
            const double w2 = 1.0 - w0 - w1;
            if (w0 >= 0.0 && w1 >= 0.0 && w2 >= 0.0)
                KeepHighest(rRaster, x, y, static_cast<float>(w0 * v0.z + w1 * v1.z + w2 * v2.z));
        }
    });
}

/// Each cell of a run is taken for inside, and its height is stepped along the plane.
void WalkStepping(const std::string& sTerrain, Raster& rRaster) {
    WalkRows(*GetTerrain(sTerrain), [&](const auto& corners, int y, const Run& run) {
        const point3_t<double> normal = Cross(corners[1] - corners[0], corners[2] - corners[0]);
        const double slope = -normal.x / normal.z;
        const double start =
            corners[0].z - (normal.y * (y - corners[0].y)) / normal.z - slope * corners[0].x;
        for (int x = run.nFirst; x <= run.nLast; ++x)
            KeepHighest(rRaster, x, y, static_cast<float>(start + slope * x));
    });
}

#ifdef KELM_BENCH_EMBREE
void CastRays(const std::string& sTerrain, Raster& rRaster) {
    const auto index = GetIndex<Embree>(sTerrain);
    for (int y = 0; y < SIDE; ++y)
        for (int x = 0; x < SIDE; ++x) {
            float h;
            if (index->GetHeight(static_cast<float>(x), static_cast<float>(y), h))
                KeepHighest(rRaster, x, y, h);
        }
}
#endif

/// GDAL triangulates the vertices anew and interpolates in what it finds.
void GridByGdal(const std::string& sTerrain, Raster& rRaster) {
    const auto terrain = GetTerrain(sTerrain);
    std::vector<double> x;
    std::vector<double> y;
    std::vector<double> z;
    for (const point3_t<float>& vertex : terrain->oVertices) {
        const point3_t<double> v = Widen(vertex);
        x.push_back(v.x);
        y.push_back(v.y);
        z.push_back(v.z);
    }
    GDALGridLinearOptions options{};
    options.nSizeOfStructure = sizeof options;
    options.dfRadius = 0.0;
    options.dfNoDataValue = static_cast<double>(NO_HEIGHT);
    // The extent is that of the cells' outer edges.
    if (GDALGridCreate(GGA_Linear, &options, static_cast<GUInt32>(x.size()), x.data(), y.data(),
                       z.data(), -0.5, SIDE - 0.5, -0.5, SIDE - 0.5, SIDE, SIDE, GDT_Float32,
                       rRaster.data(), nullptr, nullptr) != CE_None)
        throw std::runtime_error("GDAL: no grid");
}

using Walk = void (*)(const std::string&, Raster&);

std::shared_ptr<const Raster> GetOurRaster(const std::string& sTerrain) {
    return Recall<Raster>("raster/" + sTerrain, [&] {
        auto raster = std::make_shared<Raster>(std::size_t{SIDE} * SIDE, NO_HEIGHT);
        WalkOurs(sTerrain, *raster);
        return raster;
    });
}

void MakeRaster(benchmark::State& rState, const std::string& sTerrain, Walk walk) {
    const auto ours = GetOurRaster(sTerrain);
    Raster raster(ours->size());
    // Not timed: what a walk works on.
    GetTerrain(sTerrain);
    GetSurface(sTerrain);
#ifdef KELM_BENCH_EMBREE
    GetIndex<Embree>(sTerrain);
#endif
    for (auto _ : rState) {
        rState.PauseTiming();
        std::fill(raster.begin(), raster.end(), NO_HEIGHT);
        rState.ResumeTiming();
        walk(sTerrain, raster);
    }
    rState.SetItemsProcessed(rState.iterations());
    ReportDifference(rState, Compare(raster, *ours, TOLERANCE));
}

} // namespace

void AddRaster(const Plan& oPlan) {
    for (const std::string& size : oPlan.GetSizes()) {
        const std::string terrain = size + "-grid";
        const auto add = [&](const char* who, Walk walk) {
            return Add({"raster", size, who},
                       [=](benchmark::State& state) { MakeRaster(state, terrain, walk); });
        };
        const std::int64_t repeats = size.find('M') == std::string::npos ? 3 : 1;
        add("ours", WalkOurs)->Iterations(repeats);
        add("ours, cells then heights", WalkOursCells)->Iterations(repeats);
        add("ours, one call", CallOurs<1>)->Iterations(repeats);
        add("ours, one call, closed", CallOursClosed)->Iterations(repeats);
        add("plain row walk", WalkPlainly)->Iterations(repeats);
        add("row walk stepping the plane", WalkStepping)->Iterations(repeats);
#ifdef KELM_BENCH_EMBREE
        add("Embree, a ray a cell", CastRays);
#endif
        if (size == "100k")
            add("GDAL linear grid", GridByGdal);
        Add({"threads/raster", size, "ours"},
            [=](benchmark::State& state) { MakeRaster(state, terrain, CallOurs<1>); })
            ->MeasureProcessCPUTime()
            ->UseRealTime();
        Add({"threads/raster", size, "two threads"},
            [=](benchmark::State& state) { MakeRaster(state, terrain, CallOurs<2>); })
            ->MeasureProcessCPUTime()
            ->UseRealTime();
    }
}

} // namespace kelm::bench
