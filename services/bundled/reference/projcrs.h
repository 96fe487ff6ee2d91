#pragma once

#include "services/crs.h"

#include <memory>
#include <string>

namespace kelm::ogc {

/// What is known of a layer's CRS, as PROJJSON.
struct CRSText {
    std::string moName;        ///< for messages
    std::string moDefinition;  ///< two axes; of a local CRS the whole CRS, or empty
    std::string moVertical;    ///< the vertical CRS that the layer names, or empty
    std::string moEllipsoidal; ///< the layer's own CRS if it has ellipsoidal heights, or empty
    bool mbLocal = true;
};

/// A CRS that PROJ can read: a map CRS of two axes, or a compound of three that holds a map CRS. It
/// is kept as text, so that no two objects share anything.
class ProjCRS final : public cs::ICRS {
  public:
    /// A map CRS.
    explicit ProjCRS(CRSText text);
    /// A compound. @param definition the compound as PROJJSON; ignored for a local CRS
    ProjCRS(const ProjCRS& map, cs::DatumType datum, std::string definition);
    ProjCRS(const ProjCRS&) = delete;
    ProjCRS& operator=(const ProjCRS&) = delete;

    int GetDimension() const override;
    /// @return the object itself if it is a map CRS, else its part; both know the layer's vertical
    /// CRS
    cs::ICRS* GetHorizontalCRS() const override;

    const CRSText& GetText() const { return moText; }
    /// @return the map CRS: this object or its part
    const ProjCRS& GetMap() const { return mpoMap ? *mpoMap : *this; }
    /// @return the vertical datum of a compound; VD_Other of a map CRS
    cs::DatumType GetDatum() const { return meDatum; }
    /// @return true if coordinates need no operation between the two
    bool IsSame(const ProjCRS& other) const;

  private:
    CRSText moText;
    cs::DatumType meDatum = cs::VD_Other;
    std::unique_ptr<ProjCRS> mpoMap;
};

} // namespace kelm::ogc
