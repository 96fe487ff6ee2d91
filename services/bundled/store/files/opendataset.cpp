#include "services/bundled/store/files/opendataset.h"

#include "services/bundled/store/files/drawing.h"
#include "services/bundled/store/files/shapefileparts.h"
#include "services/bundled/store/gdal/gdalcall.h"
#include "services/exception.h"
#include "services/reporting.h"

#include <cpl_string.h>
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

/// @return what is wrong if a database ends within a page; else empty
std::string FindPageFault(GDALDataset& handle, const std::string& gdalName) {
    VSIStatBufL status;
    if (VSIStatL(gdalName.c_str(), &status) != 0)
        return {};
    const int size = ReadPageSize(handle);
    return size <= 0 || status.st_size % size == 0 ? ""
                                                   : "the file ends within a page of the database";
}

/// @return what is wrong with a file that a driver is about to open; else empty
std::string FindFaultBefore(const Format& format, const std::string& gdalName) {
    const char* const drivers[] = {format.mpszDriver, nullptr};
    if (!EQUAL(format.mpszDriver, "DXF") ||
        !GDALIdentifyDriverEx(gdalName.c_str(), GDAL_OF_VECTOR, drivers, nullptr))
        return {};
    return FindDrawingFault(gdalName);
}

/// @return what is wrong with a file that a driver has opened; else empty
std::string FindFaultBehind(const Format& format, GDALDataset& handle,
                            const std::string& gdalName) {
    if (format.Has(FT_Pages))
        return FindPageFault(handle, gdalName);
    if (!EQUAL(format.mpszDriver, "ESRI Shapefile"))
        return {};
    if (HasUnreadCrs(handle))
        CPLError(CE_Warning, CPLE_AppDefined,
                 "the .prj cannot be read, so the file counts as one without a CRS");
    return FindShapefileFault(handle);
}

/// @return true if rows may stand in a log beside the database
bool HasLog(const std::string& gdalName) {
    VSIStatBufL status;
    return VSIStatL((gdalName + "-wal").c_str(), &status) == 0 && status.st_size > 0;
}

GDALDatasetUniquePtr OpenAs(const Format& format, const std::string& gdalName) {
    const char* const drivers[] = {format.mpszDriver, nullptr};
    CPLStringList options(CSLDuplicate(const_cast<char**>(format.moOptions.data())), TRUE);
    // Where SQLite cannot share the log, GDAL would open the database without it.
    if (format.Has(FT_Pages) && HasLog(gdalName))
        options.SetNameValue("IMMUTABLE", "NO");
    return GDALDatasetUniquePtr(GDALDataset::Open(
        gdalName.c_str(), GDAL_OF_VECTOR | GDAL_OF_READONLY, drivers, options.List(), nullptr));
}

/// @param fault what is wrong with the file, if a test finds it. @return the dataset, or null if no
/// format takes the file or there is a fault
std::unique_ptr<Dataset> OpenAsAny(const std::string& gdalName, const std::string& shownName,
                                   std::string& fault) {
    for (const Format& format : GetFormats()) {
        fault = FindFaultBefore(format, gdalName);
        if (!fault.empty())
            return nullptr;
        GDALDatasetUniquePtr handle = OpenAs(format, gdalName);
        if (!handle)
            continue;
        fault = FindFaultBehind(format, *handle, gdalName);
        if (!fault.empty())
            return nullptr;
        return std::make_unique<Dataset>(shownName, format, std::move(handle));
    }
    return nullptr;
}

/// @return the formats that this GDAL does not read, for a message; empty if it reads them all
std::string GetMissingNames() {
    std::string names;
    for (const Format& format : GetFormats())
        if (GetGDALDriverManager()->GetDriverByName(format.mpszDriver) == nullptr)
            names.append(names.empty() ? "" : ", ").append(format.mpszName);
    return names.empty() ? names : " (this GDAL has no driver for " + names + ")";
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
    std::string fault;
    {
        GdalCall call;
        dataset = OpenAsAny(gdalName, shownName, fault);
        warnings = call.TakeWarnings();
        failures = call.TakeFailures();
    }
    if (!dataset && !fault.empty())
        ThrowUnusable(shownName, fault, __LINE__);
    if (!dataset)
        ThrowUnusable(shownName, failures.empty() ? "none of them" + GetMissingNames() : failures,
                      __LINE__);
    if (!failures.empty())
        AddWarning(warnings, failures, 1);
    PassOn(warnings, "The file " + shownName);
    return dataset;
}

} // namespace kelm::store
