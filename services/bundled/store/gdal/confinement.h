#pragma once

#include <cpl_string.h>

namespace kelm::store {

/// Settings of GDAL that hold on this thread while the object lives, whatever the host has set.
/// GDAL then reads no file but the one it opens, writes none beside it, and takes coordinates,
/// rings and CRSs of a file the same way everywhere. The host's own settings of the thread come
/// back with the end of the object.
class Confinement {
  public:
    /// @param rings how the rings of a polygon are sorted into outer and inner ones: a value of
    /// GDAL's OGR_ORGANIZE_POLYGONS, or "" for the driver's own way
    explicit Confinement(const char* rings);
    ~Confinement();
    Confinement(const Confinement&) = delete;
    Confinement& operator=(const Confinement&) = delete;

  private:
    CPLStringList moHost;
};

} // namespace kelm::store
