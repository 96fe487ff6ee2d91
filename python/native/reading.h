#pragma once

#include "python/native/surface.h"

#include <services/crs.h>
#include <tin/openoptions.h>

#include <optional>
#include <string>
#include <vector>

namespace kelm::python {

/// A file or a layer of it cannot be opened. Becomes an OSError.
class FileError : public std::runtime_error {
  public:
    using std::runtime_error::runtime_error;
};

/// What one layer of a file is, before a load.
struct LayerFacts {
    int mnNumber = 0;      ///< from 1 on, as Read takes it
    std::string moRefusal; ///< why no surface can be read from it; empty if one can
    int mnShapes = 0;
    std::array<double, 6> moBox{}; ///< xmin, ymin, zmin, xmax, ymax, zmax; heights as stored
    std::optional<std::string> moCrs;
    std::size_t mnLoadBytes = 0;
    std::size_t mnSurfaceBytes = 0;
};

/// How a layer is read.
struct ReadOptions {
    int mnLayer = 0; ///< 0 for the first with polygons
    ogc::cs::DatumType meSource = ogc::cs::VD_Other;
    ogc::cs::DatumType meOutput = ogc::cs::VD_Other;
    std::optional<std::array<double, 4>> moWindow;
    std::optional<std::array<double, 2>> moBase;
    double mdfOffset = 0.0;
    double mdfScale = 1.0;
    tin::OpenOptions moOpening;
    tin::Progress moLoading;
};

/// @return the surface, or null if no polygon gave a triangle; and the CRS of the layer as WKT,
/// unless a survey was given, whose facts have it: WKT takes milliseconds, as much as a small
/// window
/// @throw FileError; kelm::Exception
std::pair<std::unique_ptr<Surface>, std::optional<std::string>> Read(const std::string& file,
                                                                     const ReadOptions& options);

/// Surveys one layer; only the first fields of the options count.
/// @return its facts, and the survey as bytes @throw FileError; kelm::Exception
std::pair<LayerFacts, std::string> SurveyLayer(const std::string& file, const ReadOptions& options);

/// @return the horizontal part of a CRS, both as WKT
std::optional<std::string> FlattenCrs(const std::string& wkt);

/// Counts without a walk; of the options, layer and survey count.
/// @return for each window a bound on the number of shapes that meet it @throw as Read
std::vector<int> CountShapes(const std::string& file, const ReadOptions& options,
                             const std::vector<std::array<double, 4>>& windows);

/// @throw FileError; kelm::Exception
std::vector<LayerFacts> ListLayers(const std::string& file);

/// @return the text of a failure, and behind it that of the one that it came from
std::string GetText(const std::exception& failure);

} // namespace kelm::python
