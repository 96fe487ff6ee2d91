#pragma once

#include "services/bundled/store/handles/openlayer.h"
#include "services/bundled/store/landxml/document/surface.h"

namespace kelm::store::landxml {

/// A TIN surface of a LandXML file as a layer. Each triangle is a shape.
class LandXmlLayer final : public OpenLayer {
  public:
    /// @param file the handle that GetFile gives back, not used otherwise
    /// @param crs  the CRS as text, outlives this object
    LandXmlLayer(_iobuf& file, Surface surface, const std::string& crs);

    int GetFirst() override;
    int GetBehind(int id) override;
    ZARShape& GetShape(int id) override;
    int GetType() const override { return moSurface.GetCount() > 0 ? 2 : 1; }
    ZARVertex GetLow() const override { return moSurface.GetLow(); }
    ZARVertex GetHigh() const override { return moSurface.GetHigh(); }
    std::string GetCrsText() const override { return moCrs; }
    _iobuf& GetFile() const override { return moFile; }

  private:
    int GetIdAt(int index) const;
    void Seek(int id);

    _iobuf& moFile;
    Surface moSurface;
    const std::string& moCrs;
    int mnIndex = 0; ///< of the triangle that was asked for last
    ZARVertex moRing[4]{};
    ZARShape moShape{};
};

} // namespace kelm::store::landxml
