#pragma once

#include <cpl_vsi.h>

#include <memory>
#include <string>

namespace kelm::store {

struct VsiFileCloser {
    void operator()(VSILFILE* file) const { static_cast<void>(VSIFCloseL(file)); }
};

/// A file by GDAL's own access to files, which knows files in memory too.
using VsiFile = std::unique_ptr<VSILFILE, VsiFileCloser>;

/// @return the file, open for reading, or null
inline VsiFile OpenVsiFile(const std::string& name) {
    return VsiFile(VSIFOpenL(name.c_str(), "rb"));
}

} // namespace kelm::store
