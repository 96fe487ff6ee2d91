#include "services/bundled/store/files/opendataset.h"

#include "services/bundled/store/gdal/confinement.h"
#include "services/bundled/store/gdal/gdalcall.h"
#include "services/exception.h"
#include "services/reporting.h"

#include <ogrsf_frmts.h>

#include <cerrno>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <utility>

namespace kelm::store {

namespace {

namespace fs = std::filesystem;

constexpr const char* SOURCE = "services/bundled/store/files/opendataset";

[[noreturn]] void ThrowUnusable(const std::string& name, const std::string& found, unsigned line) {
    throw DataException(
        FormatString("The file %s cannot be opened: expected a readable local file of "
                     "one of the formats %s; found: %s",
                     name.c_str(), GetFormatNames().c_str(), found.c_str()),
        SOURCE, __PRETTY_FUNCTION__, line);
}

/// @return true for x.gdb and x.gdb/, in any case of letters
bool IsGeodatabaseName(const fs::path& path) {
    const fs::path name = path.has_filename() ? path : path.parent_path();
    return EQUAL(name.extension().c_str(), ".gdb");
}

void TestFolder(const std::string& name, const fs::path& path) {
    if (!IsGeodatabaseName(path))
        ThrowUnusable(name, "a folder whose name does not end in .gdb", __LINE__);
}

void TestReadable(const std::string& name, const fs::path& path) {
    errno = 0;
    if (!std::ifstream(path, std::ios::binary))
        ThrowUnusable(name, std::strerror(errno), __LINE__);
}

/// @throw kelm::DataException unless the path names a file or folder that GDAL may see
void TestPath(const std::string& name, const fs::path& path) {
    std::error_code error;
    const fs::file_status status = fs::status(path, error);
    if (!fs::exists(status))
        ThrowUnusable(name, error ? error.message() : "nothing of this name", __LINE__);
    if (fs::is_directory(status))
        return TestFolder(name, path);
    if (!fs::is_regular_file(status))
        ThrowUnusable(name, "not a regular file", __LINE__);
    TestReadable(name, path);
}

/// @return the page size in bytes; 0 if the database does not tell it
int ReadPageSize(GDALDataset& handle) {
    OGRLayer* result = handle.ExecuteSQL("PRAGMA page_size", nullptr, nullptr);
    if (!result)
        return 0;
    OGRFeatureUniquePtr feature(result->GetNextFeature());
    const int size = feature ? feature->GetFieldAsInteger(0) : 0;
    feature.reset();
    handle.ReleaseResultSet(result);
    return size;
}

/// @return true, with an error as a driver would give it, if a database ends within a page
bool IsTorn(GDALDataset& handle, const Format& format, const std::string& gdalName) {
    VSIStatBufL status;
    if (!format.mbPages || VSIStatL(gdalName.c_str(), &status) != 0)
        return false;
    const int size = ReadPageSize(handle);
    if (size <= 0 || status.st_size % size == 0)
        return false;
    CPLError(CE_Failure, CPLE_FileIO, "the file ends within a page of the database");
    return true;
}

GDALDatasetUniquePtr OpenAs(const Format& format, const std::string& gdalName) {
    const char* const drivers[] = {format.mpszDriver, nullptr};
    return GDALDatasetUniquePtr(GDALDataset::Open(gdalName.c_str(),
                                                  GDAL_OF_VECTOR | GDAL_OF_READONLY, drivers,
                                                  format.moOptions.data(), nullptr));
}

/// @return the dataset, or null if no format takes the file or the file is torn
std::unique_ptr<Dataset> OpenAsAny(const std::string& gdalName, const std::string& shownName) {
    for (const Format& format : GetFormats())
        if (GDALDatasetUniquePtr handle = OpenAs(format, gdalName)) {
            if (IsTorn(*handle, format, gdalName))
                return nullptr;
            return std::make_unique<Dataset>(shownName, format, std::move(handle));
        }
    return nullptr;
}

} // namespace

std::unique_ptr<Dataset> OpenFile(const char* name) {
    if (!name || !*name)
        throw ParameterException("name", ParameterException::PT_Invalid, name ? "" : "null",
                                 "the path of a file", "The name of the file to open is empty",
                                 SOURCE, __PRETTY_FUNCTION__, __LINE__);
    std::error_code error;
    const fs::path path = fs::absolute(name, error);
    // An absolute path begins with a slash, which no connection string does; GDAL's own file
    // systems are the exception.
    if (error || STARTS_WITH(path.c_str(), "/vsi"))
        ThrowUnusable(name, "no path of the local file system", __LINE__);
    TestPath(name, path);
    return OpenDataset(path.string(), name);
}

std::unique_ptr<Dataset> OpenDataset(const std::string& gdalName, const std::string& shownName) {
    RegisterFormats();
    std::unique_ptr<Dataset> dataset;
    Warnings warnings;
    std::string failures;
    {
        GdalCall call;
        const Confinement confinement;
        dataset = OpenAsAny(gdalName, shownName);
        warnings = call.TakeWarnings();
        failures = call.GetFailures();
    }
    if (!dataset)
        ThrowUnusable(shownName, failures.empty() ? "none of them" : failures, __LINE__);
    if (!failures.empty())
        AddWarning(warnings, failures, 1);
    PassOn(warnings, "The file " + shownName);
    return dataset;
}

} // namespace kelm::store
