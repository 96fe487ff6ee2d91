#include "services/bundled/reference/projcrs.h"

#include <utility>

namespace kelm::ogc {

ProjCRS::ProjCRS(CRSText text) : moText(std::move(text)) {}

ProjCRS::ProjCRS(const ProjCRS& map, cs::DatumType datum, std::string definition)
    : moText(map.moText), meDatum(datum), mpoMap(std::make_unique<ProjCRS>(map.moText)) {
    if (!moText.mbLocal)
        moText.moDefinition = std::move(definition);
}

int ProjCRS::GetDimension() const {
    return mpoMap ? 3 : 2;
}

cs::ICRS* ProjCRS::GetHorizontalCRS() const {
    return mpoMap ? mpoMap.get() : const_cast<ProjCRS*>(this);
}

bool ProjCRS::IsSame(const ProjCRS& other) const {
    return GetDimension() == other.GetDimension() && meDatum == other.meDatum &&
           moText.mbLocal == other.moText.mbLocal &&
           moText.moDefinition == other.moText.moDefinition;
}

} // namespace kelm::ogc
