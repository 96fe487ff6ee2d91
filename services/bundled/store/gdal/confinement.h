#pragma once

#include <string>
#include <vector>

namespace kelm::store {

/// Settings that let GDAL read no file but the one it opens, and write none beside it. They hold on
/// this thread while the object lives, whatever the host has set.
class Confinement {
  public:
    Confinement();
    ~Confinement();
    Confinement(const Confinement&) = delete;
    Confinement& operator=(const Confinement&) = delete;

  private:
    /// What a setting was before.
    struct Saved {
        const char* mpszKey;
        bool mbSet;
        std::string moValue;
    };
    std::vector<Saved> moSaved;
};

} // namespace kelm::store
