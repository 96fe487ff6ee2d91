#include "services/bundled/store/landxml/landxmlfile.h"

#include "services/bundled/store/landxml/documentcrs.h"
#include "services/bundled/store/landxml/xml/xmlreader.h"

#include <filesystem>
#include <fstream>
#include <utility>

namespace kelm::store::landxml {

LandXmlFile::LandXmlFile(std::istream& stream, const std::string& name) {
    Document document = ReadDocument(stream, name);
    moCrs = CreateCrsText(document, name);
    for (Surface& surface : document.moSurfaces)
        moLayers.push_back(std::make_unique<LandXmlLayer>(*this, std::move(surface), moCrs));
}

std::unique_ptr<_iobuf> OpenLandXml(const char* name) {
    std::error_code error;
    // A pipe would be waited for.
    if (name == nullptr || !std::filesystem::is_regular_file(name, error))
        return nullptr;
    std::ifstream stream(name, std::ios::binary);
    if (!stream || ReadRootName(stream) != "LandXML")
        return nullptr;
    stream.clear();
    stream.seekg(0);
    return std::make_unique<LandXmlFile>(stream, name);
}

} // namespace kelm::store::landxml
