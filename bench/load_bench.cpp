#include "bench/child.h"
#include "bench/suite.h"
#include "bench/terrainfile.h"
#include "services/vectorlayer.h"
#include "tin/tinreader.h"
#include "tin/tinreaderfactory.h"

#include <cmath>

#include <ogrsf_frmts.h>

namespace kelm::bench {

namespace {

/// Sum of all ordinates of a triangle's corners, to tell whether two loads found the same.
double AddCorner(double x, double y, double z) {
    return x + y + z;
}

/// The time of reading all shapes through the store, as each load but the first does.
double MeasureReading(const std::string& sFile) {
    const std::unique_ptr<_iobuf, decltype(&ZARClose)> file(ZAROpen(sFile.c_str(), "r"), ZARClose);
    ZARLayer_t* layer = ZARGetLayer(file.get(), 1);
    double start = 0.0;
    for (int walk = 0; walk < 2; ++walk) { // the first one takes what opening has read
        start = GetProcessorTime();
        for (int id = ZARGetNext(layer, -1); id != -1; id = ZARGetNext(layer, id))
            benchmark::DoNotOptimize(ZARGetShapeRef(layer, id));
    }
    return GetProcessorTime() - start;
}

Figures LoadOurs(const std::string& sFile) {
    Figures figures;
    const double start = GetProcessorTime();
    const std::unique_ptr<tin::TinReader> reader(tin::TinReaderFactory::CreateTinReader(
        sFile.c_str(), 0, 0.0, 1.0, ogc::cs::DatumType::VD_Orthometric));
    const double opened = GetProcessorTime();
    const std::unique_ptr<tin::Tin> surface(reader->Load(nullptr));
    const double loaded = GetProcessorTime();
    figures["peak"] = GetPeak();
    figures["open"] = opened - start;
    figures["load"] = loaded - opened;
    figures["both"] = loaded - start;
    const std::unique_ptr<tin::Tin> again(reader->Load(nullptr));
    figures["again"] = GetProcessorTime() - loaded;
    figures["reading"] = MeasureReading(sFile);
    figures["triangles"] = surface->GetTriangleCount();
    double dx;
    double dy;
    surface->GetXYBase(dx, dy);
    for (unsigned i = 0; i < surface->GetTriangleCount(); ++i)
        for (int k = 0; k < 3; ++k) {
            const point3_t<float>& v = *surface->GetTriangle(i)->GetVertex(k);
            figures["corners"] +=
                AddCorner(dx + static_cast<double>(v.x), dy + static_cast<double>(v.y),
                          static_cast<double>(v.z));
        }
    return figures;
}

/// Reads each corner of each polygon and keeps nothing.
Figures LoopOverOgr(const std::string& sFile) {
    Figures figures;
    const double start = GetProcessorTime();
    const GDALDatasetUniquePtr file(GDALDataset::Open(sFile.c_str(), GDAL_OF_VECTOR));
    OGRLayer& layer = Need(Need(file.get(), sFile).GetLayer(0), "layer");
    const double opened = GetProcessorTime();
    double sum = 0.0;
    double count = 0.0;
    for (const auto& feature : layer) {
        const OGRLinearRing& ring = *feature->GetGeometryRef()->toPolygon()->getExteriorRing();
        for (int i = 0; i + 1 < ring.getNumPoints(); ++i)
            sum += AddCorner(ring.getX(i), ring.getY(i), ring.getZ(i));
        count += 1.0;
    }
    figures["peak"] = GetPeak();
    figures["open"] = opened - start;
    figures["load"] = figures["both"] = figures["again"] = figures["reading"] =
        GetProcessorTime() - opened;
    figures["triangles"] = count;
    figures["corners"] = sum;
    return figures;
}

bool IsTerrain(const Figures& oFigures, const Terrain& oTerrain) {
    double sum = 0.0;
    const auto corners = GetCorners(oTerrain);
    for (const auto& corner : corners)
        sum += AddCorner(corner.x, corner.y, corner.z);
    const double count = static_cast<double>(corners.size());
    return 3.0 * oFigures.at("triangles") == count &&
           std::fabs(oFigures.at("corners") - sum) < 0.001 * count;
}

/// The time is that of opening and the first load. Beside it stand those of its parts, of a second
/// load, and of what a second load spends on reading.
void Load(benchmark::State& rState, const Plan& oPlan, const std::string& sTerrain,
          const FileFormat& format, const std::string& sWho) {
    const std::string file = GetTerrainFile(oPlan.sDataFolder, sTerrain, format);
    const auto terrain = GetTerrain(sTerrain);
    for (auto _ : rState) {
        const Figures figures = RunChild({"load", sWho, file});
        rState.SetIterationTime(figures.at("both"));
        for (const char* name : {"open", "load", "again", "reading"})
            rState.counters[name] = figures.at(name);
        rState.counters["peak"] = figures.at("peak");
        if (!IsTerrain(figures, *terrain))
            rState.SkipWithError("the file was not read as it was written");
    }
    rState.SetItemsProcessed(static_cast<std::int64_t>(terrain->oTriangles.size()) *
                             rState.iterations());
}

} // namespace

Figures MeasureLoad(const std::string& sWho, const std::string& sFile) {
    const double base = GetResident();
    Figures figures = sWho == "ours" ? LoadOurs(sFile) : LoopOverOgr(sFile);
    figures["peak"] -= base;
    return figures;
}

void AddLoad(const Plan& oPlan) {
    std::vector<std::string> terrains{"200k"};
    if (!oPlan.bQuick)
        terrains.push_back("1M");
    for (const std::string& terrain : terrains)
        for (const FileFormat& format : FILE_FORMATS)
            for (const std::string who : {"ours", "bare OGR loop"})
                Add({"load", format.pszDriver, terrain, who}, [=](benchmark::State& state) {
                    Load(state, oPlan, terrain, format, who);
                })->UseManualTime();
}

} // namespace kelm::bench
