#pragma once

#include "services/bundled/store/handles/openfile.h"
#include "services/bundled/store/landxml/landxmllayer.h"

#include <istream>
#include <memory>
#include <string>
#include <vector>

namespace kelm::store::landxml {

/// An open LandXML file: each TIN surface is a layer. The file is read once, when it is opened, and
/// its points and triangles are kept.
class LandXmlFile final : public _iobuf {
  public:
    /// @param name for messages. @throw kelm::DataException, see ReadDocument
    LandXmlFile(std::istream& stream, const std::string& name);

    int GetLayerCount() const override { return static_cast<int>(moLayers.size()); }
    OpenLayer& GetLayer(int segment) override {
        return *moLayers[static_cast<std::size_t>(segment) - 1];
    }
    int FindFirst() override;

  private:
    std::string moCrs;
    std::vector<std::unique_ptr<LandXmlLayer>> moLayers;
};

/// @return the file if it is LandXML, told by its content; null if it is not, or not a regular file
/// that can be read. @param name may be null
/// @throw kelm::DataException if it is LandXML and cannot be used, see ReadDocument
std::unique_ptr<_iobuf> OpenLandXml(const char* name);

} // namespace kelm::store::landxml
