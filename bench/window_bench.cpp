#include "bench/child.h"
#include "bench/suite.h"
#include "bench/terrainfile.h"
#include "tin/tinreader.h"
#include "tin/tinreaderfactory.h"

namespace kelm::bench {

namespace {

using Window = tin::BBox<double, point2_t<double>>;

/// A hundredth of the box, from its middle on.
Window GetWindow(const tin::BBox<double, point3_t<double>>& oBox) {
    Window window;
    window.min = {(oBox.min.x + oBox.max.x) / 2, (oBox.min.y + oBox.max.y) / 2};
    window.max = {window.min.x + (oBox.max.x - oBox.min.x) / 10,
                  window.min.y + (oBox.max.y - oBox.min.y) / 10};
    return window;
}

double TimeLoad(tin::TinReader& rReader, const Window* poWindow, Figures& rFigures) {
    const double start = GetProcessorTime();
    const std::unique_ptr<tin::Tin> surface(rReader.Load(poWindow));
    const double time = GetProcessorTime() - start;
    rFigures["triangles"] = surface->GetTriangleCount();
    return time;
}

void LoadWindow(benchmark::State& rState, const Plan& oPlan, const std::string& sTerrain,
                const FileFormat& format, const std::string& sWhat) {
    const std::string file = GetTerrainFile(oPlan.sDataFolder, sTerrain, format);
    for (auto _ : rState) {
        const Figures figures =
            RunChild({"window", sWhat == "whole layer" ? "whole" : "part", file});
        rState.SetIterationTime(figures.at("load"));
        rState.counters["loaded"] = figures.at("triangles");
    }
    rState.SetItemsProcessed(rState.iterations());
}

} // namespace

Figures MeasureWindow(const std::string& sWhat, const std::string& sFile) {
    const auto open = [&](const std::string& sSurvey) {
        return std::unique_ptr<tin::TinReader>(tin::TinReaderFactory::CreateTinReader(
            sFile.c_str(), 0, 0.0, 1.0, ogc::cs::DatumType::VD_Orthometric, {sSurvey, {}}));
    };
    // With a survey nothing is kept from opening: both loads read the file.
    const auto reader = open(open({})->GetSurvey());
    const Window window = GetWindow(reader->GetBBox());
    Figures figures;
    figures["load"] = TimeLoad(*reader, sWhat == "part" ? &window : nullptr, figures);
    return figures;
}

void AddWindow(const Plan& oPlan) {
    for (const FileFormat& format : FILE_FORMATS)
        for (const char* what : {"window of 1 %", "whole layer"})
            Add({"window", format.pszDriver, oPlan.bQuick ? "200k" : "2M", what},
                [=](benchmark::State& state) {
                    LoadWindow(state, oPlan, oPlan.bQuick ? "200k" : "2M", format, what);
                })
                ->UseManualTime();
}

} // namespace kelm::bench
