#pragma once

#include <string>
#include <vector>

namespace kelm::store {

/// A file format that the store opens.
struct Format {
    const char* mpszDriver; ///< GDAL's short name of the driver
    const char* mpszName;   ///< name for a person
    /// Open options of the driver, ended by null.
    std::vector<const char*> moOptions;
    /// What the driver knows of the number of features is exact. Such drivers can end a damaged
    /// file early without an error.
    bool mbExactCount = false;
    /// A database of pages, all of one size. The engine below reads a torn last page as if zeros
    /// followed, which makes corners at the origin of geometries.
    bool mbPages = false;
};

/// The formats, in the order in which a file is offered to them. No other driver of GDAL ever sees
/// a file: many open connections, or further files that the first one names.
const std::vector<Format>& GetFormats();

/// @return the names of the formats, for a message
std::string GetFormatNames();

/// Registers GDAL's drivers, once a process and only if the host has not done it. Safe to call from
/// any thread.
void RegisterFormats();

/// Settings that keep GDAL inside the file that it opens and keep it from writing beside it. They
/// hold on this thread for the time that the object lives, whatever the host has set.
class Confinement {
  public:
    Confinement();
    ~Confinement();
    Confinement(const Confinement&) = delete;
    Confinement& operator=(const Confinement&) = delete;

  private:
    struct Saved {
        const char* mpszKey;
        bool mbSet;
        std::string moValue;
    };
    std::vector<Saved> moSaved;
};

} // namespace kelm::store
