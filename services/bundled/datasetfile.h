#pragma once

#include <gdal_priv.h>

#include <memory>
#include <string>
#include <vector>

namespace kelm::store {
class FeatureReader;
struct Format;
class StoreLayer;
} // namespace kelm::store

/// An open file: GDAL's dataset and the layers that were taken from it.
struct _iobuf {
    _iobuf(std::string name, const kelm::store::Format& oFormat, GDALDatasetUniquePtr poDataset);
    ~_iobuf();
    _iobuf(const _iobuf&) = delete;
    _iobuf& operator=(const _iobuf&) = delete;

    std::string moName; ///< as the caller gave it, for messages
    const kelm::store::Format& moFormat;
    GDALDatasetUniquePtr mpoDataset;
    /// GDAL's layers that have a geometry, in its order: the segments 1, 2 and so on.
    std::vector<OGRLayer*> moSegments;
    /// The layer of each segment; null until it is taken. They end before the dataset does.
    std::vector<std::unique_ptr<kelm::store::StoreLayer>> moLayers;
    /// The reader that read last, so that GDAL's reading position is its own. Null: none.
    const kelm::store::FeatureReader* mpoReading = nullptr;
};

namespace kelm::store {

/// Opens a file of the file system. @param pszName path of a regular file, or of a folder *.gdb;
/// anything else that GDAL would accept as a name, such as inline text, is refused unseen
/// @throw kelm::DataException that tells the name and what was expected
std::unique_ptr<_iobuf> OpenFile(const char* pszName);

/// Opens whatever GDAL understands by a name, as far as one of the formats takes it: below the test
/// for a regular file, so that a program which tests the store can open bytes in memory. Not
/// exported. @param shownName name for messages @throw kelm::DataException
std::unique_ptr<_iobuf> OpenDataset(const std::string& gdalName, const std::string& shownName);

} // namespace kelm::store
