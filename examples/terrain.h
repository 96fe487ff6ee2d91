#pragma once

#include "progressbar.h"

#include <tin/tin.h>
#include <tin/tinreader.h>
#include <tin/tinreaderfactory.h>

#include <CLI/CLI.hpp>
#include <ogrsf_frmts.h>

#include <memory>
#include <stdexcept>
#include <string>

/// A layer of a file, as the command line names it.
struct Layer {
    std::string file;
    int number = 0; ///< from 1 on; below 1 for the first layer
};

inline void AddLayerOptions(CLI::App& app, Layer& layer) {
    app.add_option("file", layer.file, "File with a layer of polygons")
        ->required()
        ->check(CLI::ExistingPath);
    app.add_option("--layer", layer.number, "Number of the layer from 1 on; else the first");
}

/// How heights of a layer are meant.
struct HeightOptions {
    kelm::ogc::cs::DatumType source = kelm::ogc::cs::VD_Other;
    double offset = 0.0; ///< a stored height h counts as (h + offset) * scale
    double scale = 1.0;
};

/// Opens a layer, with a bar if it takes long.
inline std::unique_ptr<kelm::tin::TinReader> OpenTerrain(const Layer& layer,
                                                         const HeightOptions& heights = {}) {
    ProgressBar bar;
    kelm::tin::OpenOptions options;
    options.progress = bar.Get();
    return std::unique_ptr<kelm::tin::TinReader>(kelm::tin::TinReaderFactory::CreateTinReader(
        layer.file.c_str(), layer.number, heights.offset, heights.scale, heights.source, options));
}

/// Loads what meets a window, or all without one, with a bar if it takes long.
inline std::unique_ptr<kelm::tin::Tin>
LoadTerrain(kelm::tin::TinReader& reader,
            const kelm::tin::BBox<double, point2_t<double>>* window = nullptr) {
    ProgressBar bar;
    kelm::tin::LoadOptions options;
    options.progress = bar.Get();
    std::unique_ptr<kelm::tin::Tin> terrain(reader.Load(window, options));
    if (!terrain)
        throw std::runtime_error("no polygon of the layer or the window gave a triangle");
    return terrain;
}

/// Loads the whole layer, with heights as they are stored.
inline std::unique_ptr<kelm::tin::Tin> LoadTerrain(const Layer& layer) {
    return LoadTerrain(*OpenTerrain(layer));
}

/// Reads the CRS of a layer by GDAL. The CRS of a reader can only compute: it cannot be printed or
/// written to a file. @return an empty CRS if the layer has none
inline OGRSpatialReference ReadCrs(const Layer& layer) {
    GDALAllRegister();
    const GDALDatasetUniquePtr file(GDALDataset::Open(layer.file.c_str(), GDAL_OF_VECTOR));
    int rest = layer.number;
    if (file)
        for (OGRLayer* each : file->GetLayers())
            if (each->GetGeomType() != wkbNone && --rest < 1)
                return each->GetSpatialRef() ? *each->GetSpatialRef() : OGRSpatialReference();
    return OGRSpatialReference();
}
