#include "services/bundled/store/landxml/document/contents.h"

#include "services/exception.h"
#include "services/reporting.h"

namespace kelm::store::landxml {

namespace {

constexpr const char* SOURCE = "services/bundled/store/landxml/document/contents";
constexpr std::size_t MOST_NAMES = 100;

} // namespace

void Contents::AddSurface(const std::string& name, const std::string& kind) {
    if (moSurfaces.size() < MOST_NAMES)
        moSurfaces.push_back("surface " + name + " " + kind);
}

void Contents::AddElement(std::string_view name) {
    if (moElements.size() < MOST_NAMES)
        moElements.emplace(name);
}

void Contents::Test(bool usable) const {
    if (!usable)
        throw DataException(
            FormatString("The file %s cannot be opened: it is LandXML without a TIN "
                         "surface, and a surface of triangles is needed; found: %s",
                         moFile.c_str(), GetText().c_str()),
            SOURCE, __PRETTY_FUNCTION__, __LINE__);
    for (const std::string& surface : moSurfaces)
        tellus::Warning::Warn(FormatString("The file %s: the %s is left out: it is no TIN",
                                           moFile.c_str(), surface.c_str()),
                              SOURCE, __LINE__);
}

std::string Contents::GetText() const {
    std::string text;
    for (const std::string& surface : moSurfaces)
        text.append(text.empty() ? "" : ", ").append(surface);
    for (const std::string& name : moElements)
        text.append(text.empty() ? "" : ", ").append(name);
    return text.empty() ? "nothing" : text;
}

} // namespace kelm::store::landxml
