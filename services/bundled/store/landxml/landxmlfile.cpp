#include "services/bundled/store/landxml/landxmlfile.h"

#include "services/bundled/store/landxml/documentcrs.h"
#include "services/bundled/store/landxml/xml/xmlreader.h"

#include <algorithm>
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

int LandXmlFile::FindFirst() {
    const auto found = std::find_if(moLayers.begin(), moLayers.end(),
                                    [](const auto& layer) { return layer->GetType() == 2; });
    return found == moLayers.end() ? 1 : static_cast<int>(found - moLayers.begin()) + 1;
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
