#include "python/native/reading.h"

#include <services/exception.h>
#include <services/vectorlayer.h>
#include <tin/tinreader.h>
#include <tin/tinreaderfactory.h>

#include <cpl_conv.h>
#include <ogr_srs_api.h>

#include <exception>

namespace kelm::python {

namespace {

using tin::TinReader;

struct FileCloser {
    void operator()(_iobuf* file) const { ZARClose(file); }
};
using OpenFile = std::unique_ptr<_iobuf, FileCloser>;

OpenFile Open(const std::string& file) {
    try {
        return OpenFile(ZAROpen(file.c_str(), "r"));
    } catch (const kelm::Exception& failure) {
        throw FileError(GetText(failure));
    }
}

/// A failure that has another one nested in it is that of a file that cannot be opened.
bool IsNested(const std::exception& failure) {
    return dynamic_cast<const std::nested_exception*>(&failure) != nullptr;
}

std::unique_ptr<TinReader> OpenReader(const std::string& file, const ReadOptions& options) {
    try {
        return std::unique_ptr<TinReader>(tin::TinReaderFactory::CreateTinReader(
            file.c_str(), options.mnLayer, options.mdfOffset, options.mdfScale, options.meSource,
            options.moOpening));
    } catch (const kelm::Exception& failure) {
        if (IsNested(failure))
            throw FileError(GetText(failure));
        throw;
    }
}

using SpatialReference = std::unique_ptr<void, decltype(&OSRDestroySpatialReference)>;

/// @return null if the text is empty or tells no CRS
SpatialReference ReadCrs(const std::string& definition) {
    SpatialReference crs(OSRNewSpatialReference(nullptr), OSRDestroySpatialReference);
    if (definition.empty() || OSRSetFromUserInput(crs.get(), definition.c_str()) != OGRERR_NONE)
        crs.reset();
    return crs;
}

/// @return the CRS as WKT 2; none if there is none or if it cannot be told as WKT
std::optional<std::string> GetWkt(const SpatialReference& crs) {
    const char* options[] = {"FORMAT=WKT2_2019", nullptr};
    char* text = nullptr;
    std::optional<std::string> wkt;
    if (crs && OSRExportToWktEx(crs.get(), &text, options) == OGRERR_NONE)
        wkt = text;
    CPLFree(text);
    return wkt;
}

tin::BBox<double, point2_t<double>> MakeWindow(const std::array<double, 4>& sides) {
    tin::BBox<double, point2_t<double>> window;
    window.min = {sides[0], sides[1]};
    window.max = {sides[2], sides[3]};
    return window;
}

LayerFacts GetFacts(const TinReader& reader) {
    LayerFacts facts;
    const auto& box = reader.GetBBox();
    facts.mnShapes = reader.GetShapeCount();
    facts.moBox = {box.min.x, box.min.y, box.min.z, box.max.x, box.max.y, box.max.z};
    facts.moCrs = GetWkt(ReadCrs(reader.GetCRSText()));
    facts.mnLoadBytes = reader.EstimateLoadBytes();
    facts.mnSurfaceBytes = reader.EstimateObjBytes_Tin();
    return facts;
}

LayerFacts FindFacts(const std::string& file, int number) {
    ReadOptions options;
    options.mnLayer = number;
    LayerFacts facts;
    try {
        facts = GetFacts(*OpenReader(file, options));
    } catch (const kelm::Exception& failure) {
        facts.moRefusal = GetText(failure);
    }
    facts.mnNumber = number;
    return facts;
}

} // namespace

std::string GetText(const std::exception& failure) {
    std::string text = failure.what();
    try {
        std::rethrow_if_nested(failure);
    } catch (const std::exception& reason) {
        text += ": " + GetText(reason);
    }
    return text;
}

std::pair<std::unique_ptr<Surface>, std::optional<std::string>> Read(const std::string& file,
                                                                     const ReadOptions& options) {
    const std::unique_ptr<TinReader> reader = OpenReader(file, options);
    if (options.meOutput != options.meSource)
        reader->SetOutputVerticalDatum(options.meOutput);
    tin::BBox<double, point2_t<double>> window;
    if (options.moWindow)
        window = MakeWindow(*options.moWindow);
    tin::LoadOptions load;
    load.progress = options.moLoading;
    if (options.moBase)
        load.base = {(*options.moBase)[0], (*options.moBase)[1]};
    std::unique_ptr<tin::Tin> surface(reader->Load(options.moWindow ? &window : nullptr, load));
    if (!surface)
        return {nullptr, std::nullopt};
    const bool known = !options.moOpening.survey.empty();
    return {std::make_unique<Surface>(std::move(surface)),
            known ? std::nullopt : GetWkt(ReadCrs(reader->GetCRSText()))};
}

std::pair<LayerFacts, std::string> SurveyLayer(const std::string& file,
                                               const ReadOptions& options) {
    const std::unique_ptr<TinReader> reader = OpenReader(file, options);
    LayerFacts facts = GetFacts(*reader);
    facts.mnNumber = options.mnLayer;
    return {std::move(facts), reader->GetSurvey()};
}

std::optional<std::string> FlattenCrs(const std::string& wkt) {
    const SpatialReference crs = ReadCrs(wkt);
    if (crs)
        OSRDemoteTo2D(crs.get(), nullptr);
    return GetWkt(crs);
}

std::vector<int> CountShapes(const std::string& file, const ReadOptions& options,
                             const std::vector<std::array<double, 4>>& windows) {
    const std::unique_ptr<TinReader> reader = OpenReader(file, options);
    std::vector<int> counts;
    for (const std::array<double, 4>& window : windows)
        counts.push_back(reader->EstimateShapeCount(MakeWindow(window)));
    return counts;
}

std::vector<LayerFacts> ListLayers(const std::string& file) {
    const OpenFile open = Open(file);
    std::vector<LayerFacts> layers;
    const int count = ZARSegCount(open.get(), ZAR_SEGMENT_VECTOR);
    for (int number = 1; number <= count; ++number)
        layers.push_back(FindFacts(file, number));
    return layers;
}

} // namespace kelm::python
