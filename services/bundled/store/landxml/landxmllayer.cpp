#include "services/bundled/store/landxml/landxmllayer.h"

#include "services/exception.h"
#include "services/reporting.h"

#include <utility>

namespace kelm::store::landxml {

namespace {

constexpr const char* SOURCE = "services/bundled/store/landxml/landxmllayer";

} // namespace

LandXmlLayer::LandXmlLayer(_iobuf& file, Surface surface, const std::string& crs)
    : moFile(file), moSurface(std::move(surface)), moCrs(crs) {
    shapeCount = moSurface.GetCount();
    shapeCountValid = 1;
}

int LandXmlLayer::GetFirst() {
    return GetIdAt(0);
}

int LandXmlLayer::GetBehind(int id) {
    Seek(id);
    return GetIdAt(mnIndex + 1);
}

ZARShape& LandXmlLayer::GetShape(int id) {
    Seek(id);
    moSurface.CopyRing(mnIndex, moRing);
    moShape = {moRing, 4};
    return moShape;
}

/// @return the id, or -1 behind the last triangle
int LandXmlLayer::GetIdAt(int index) const {
    return index < moSurface.GetCount() ? moSurface.GetId(index) : -1;
}

/// A walk asks for the same id, or for the one behind it.
void LandXmlLayer::Seek(int id) {
    for (const int index : {mnIndex, mnIndex + 1})
        if (id >= 0 && GetIdAt(index) == id) {
            mnIndex = index;
            return;
        }
    const int found = moSurface.FindIndex(id);
    if (found < 0)
        throw DataException(
            FormatString("The %s has no shape %d", moSurface.GetSubject().c_str(), id), SOURCE,
            __PRETTY_FUNCTION__, __LINE__);
    mnIndex = found;
}

} // namespace kelm::store::landxml
