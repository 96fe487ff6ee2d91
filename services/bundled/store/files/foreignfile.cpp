#include "services/bundled/store/files/foreignfile.h"

#include "services/exception.h"
#include "services/reporting.h"

#include <algorithm>
#include <filesystem>
#include <fstream>
#include <string>

namespace kelm::store {

namespace {

namespace fs = std::filesystem;

constexpr const char* SOURCE = "services/bundled/store/files/foreignfile";

[[noreturn]] void Refuse(const char* name, const char* format, const char* advice) {
    throw DataException(FormatString("The file %s cannot be opened: it is %s, which is not read. "
                                     "To convert it, %s",
                                     name, format, advice),
                        SOURCE, __PRETTY_FUNCTION__, __LINE__);
}

/// @return true for the folder of an Esri TIN, and for a file in it
bool IsEsriTin(const fs::path& path) {
    std::error_code error;
    const fs::path folder = fs::is_directory(path, error) ? path : path.parent_path();
    return fs::exists(folder / "tnxy.adf", error) && fs::exists(folder / "tnz.adf", error) &&
           (fs::is_directory(path, error) || path.extension() == ".adf");
}

/// Writers put the type in front of everything else.
bool IsCityJson(const fs::path& path) {
    constexpr std::size_t LOOKED_AT = 4096;
    std::error_code error;
    if (!fs::is_regular_file(path, error))
        return false;
    std::string text(LOOKED_AT, '\0');
    std::ifstream stream(path, std::ios::binary);
    stream.read(text.data(), LOOKED_AT);
    text.resize(static_cast<std::size_t>(stream.gcount()));
    text.erase(std::remove_if(text.begin(), text.end(),
                              [](char letter) {
                                  return letter == ' ' || letter == '\n' || letter == '\r' ||
                                         letter == '\t';
                              }),
               text.end());
    return text.find(R"("type":"CityJSON)") != std::string::npos;
}

} // namespace

void RefuseForeignFile(const char* name) {
    if (name == nullptr)
        return;
    if (IsEsriTin(name))
        Refuse(name, "an Esri TIN",
               "load it in QGIS as a mesh layer, export the faces of the mesh as polygons and save "
               "them as a GeoPackage");
    if (IsCityJson(name))
        Refuse(name, "CityJSON", "write it as CityGML with 'citygml-tools from-cityjson'");
}

} // namespace kelm::store
