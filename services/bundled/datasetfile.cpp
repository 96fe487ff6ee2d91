#include "services/bundled/datasetfile.h"

#include "services/bundled/formats.h"
#include "services/bundled/gdalcall.h"
#include "services/bundled/storelayer.h"
#include "services/exception.h"
#include "services/reporting.h"

#include <cerrno>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <utility>

namespace kelm::store {

namespace {

namespace fs = std::filesystem;

constexpr const char* kpszSource = "services/bundled/datasetfile";

[[noreturn]] void ThrowUnusable(const std::string& name, const std::string& found, unsigned nLine) {
    throw DataException(
        FormatString("The file %s cannot be opened: expected a readable local file of "
                     "one of the formats %s; found: %s",
                     name.c_str(), GetFormatNames().c_str(), found.c_str()),
        kpszSource, __PRETTY_FUNCTION__, nLine);
}

/// @return true for x.gdb and x.gdb/, in any case of letters
bool IsGeodatabaseName(const fs::path& oPath) {
    const fs::path oName = oPath.has_filename() ? oPath : oPath.parent_path();
    return EQUAL(oName.extension().c_str(), ".gdb");
}

/// @throw kelm::DataException unless the path names a file or folder that GDAL may see
void TestPath(const std::string& name, const fs::path& oPath) {
    std::error_code oError;
    const fs::file_status oStatus = fs::status(oPath, oError);
    if (!fs::exists(oStatus))
        ThrowUnusable(name, oError ? oError.message() : "nothing of this name", __LINE__);
    if (fs::is_directory(oStatus)) {
        if (!IsGeodatabaseName(oPath))
            ThrowUnusable(name, "a folder whose name does not end in .gdb", __LINE__);
        return;
    }
    if (!fs::is_regular_file(oStatus))
        ThrowUnusable(name, "not a regular file", __LINE__);
    errno = 0;
    if (!std::ifstream(oPath, std::ios::binary))
        ThrowUnusable(name, std::strerror(errno), __LINE__);
}

GDALDatasetUniquePtr OpenAs(const Format& oFormat, const std::string& gdalName) {
    const char* apszDrivers[] = {oFormat.mpszDriver, nullptr};
    return GDALDatasetUniquePtr(GDALDataset::Open(gdalName.c_str(),
                                                  GDAL_OF_VECTOR | GDAL_OF_READONLY, apszDrivers,
                                                  oFormat.moOptions.data(), nullptr));
}

std::unique_ptr<_iobuf> OpenAsAny(const std::string& gdalName, const std::string& shownName) {
    for (const Format& oFormat : GetFormats())
        if (GDALDatasetUniquePtr poDataset = OpenAs(oFormat, gdalName))
            return std::make_unique<_iobuf>(shownName, oFormat, std::move(poDataset));
    return nullptr;
}

int GetPageSize(GDALDataset& oDataset) {
    OGRLayer* poResult = oDataset.ExecuteSQL("PRAGMA page_size", nullptr, nullptr);
    if (!poResult)
        return 0;
    OGRFeatureUniquePtr poFeature(poResult->GetNextFeature());
    const int nPage = poFeature ? poFeature->GetFieldAsInteger(0) : 0;
    poFeature.reset();
    oDataset.ReleaseResultSet(poResult);
    return nPage;
}

/// @return true, with an error as a driver would give it, if a database ends within a page
bool IsTorn(const _iobuf& oFile, const std::string& gdalName) {
    VSIStatBufL oStatus;
    if (!oFile.moFormat.mbPages || VSIStatL(gdalName.c_str(), &oStatus) != 0)
        return false;
    const int nPage = GetPageSize(*oFile.mpoDataset);
    if (nPage <= 0 || oStatus.st_size % nPage == 0)
        return false;
    CPLError(CE_Failure, CPLE_FileIO, "the file ends within a page of the database");
    return true;
}

/// Tables without a geometry are no vector layers, nor are those that a driver keeps for itself.
void FindSegments(_iobuf& oFile) {
    GDALDataset& oDataset = *oFile.mpoDataset;
    for (int nLayer = 0; nLayer < oDataset.GetLayerCount(); ++nLayer) {
        OGRLayer* poLayer = oDataset.GetLayer(nLayer);
        if (poLayer && !oDataset.IsLayerPrivate(nLayer) && poLayer->GetGeomType() != wkbNone)
            oFile.moSegments.push_back(poLayer);
    }
    oFile.moLayers.resize(oFile.moSegments.size());
}

} // namespace

std::unique_ptr<_iobuf> OpenFile(const char* pszName) {
    if (!pszName || !*pszName)
        throw ParameterException("name", ParameterException::PT_Invalid, pszName ? "" : "null",
                                 "the path of a file", "The name of the file to open is empty",
                                 kpszSource, __PRETTY_FUNCTION__, __LINE__);
    const std::string name = pszName;
    std::error_code oError;
    const fs::path oPath = fs::absolute(name, oError);
    // An absolute path begins with a slash, which no connection string does; GDAL's own file
    // systems are the exception.
    if (oError || STARTS_WITH(oPath.c_str(), "/vsi"))
        ThrowUnusable(name, "no path of the local file system", __LINE__);
    TestPath(name, oPath);
    return OpenDataset(oPath.string(), name);
}

std::unique_ptr<_iobuf> OpenDataset(const std::string& gdalName, const std::string& shownName) {
    RegisterFormats();
    std::unique_ptr<_iobuf> poFile;
    Warnings oWarnings;
    std::string failures;
    {
        GdalCall oCall;
        const Confinement oConfinement;
        poFile = OpenAsAny(gdalName, shownName);
        if (poFile && IsTorn(*poFile, gdalName))
            poFile.reset();
        if (poFile)
            FindSegments(*poFile);
        oWarnings = oCall.TakeWarnings();
        failures = oCall.GetFailures();
    }
    if (!poFile)
        ThrowUnusable(shownName, failures.empty() ? "none of them" : failures, __LINE__);
    if (!failures.empty())
        AddWarning(oWarnings, failures, 1);
    PassOn(oWarnings, "The file " + shownName);
    return poFile;
}

} // namespace kelm::store

_iobuf::_iobuf(std::string name, const kelm::store::Format& oFormat, GDALDatasetUniquePtr poDataset)
    : moName(std::move(name)), moFormat(oFormat), mpoDataset(std::move(poDataset)) {}

_iobuf::~_iobuf() = default;
