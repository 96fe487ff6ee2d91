#include "services/bundled/store/landxml/document/document.h"

#include "services/bundled/store/landxml/document/contents.h"
#include "services/bundled/store/landxml/document/surfacebuilder.h"
#include "services/bundled/store/landxml/xml/xmlreader.h"
#include "services/exception.h"
#include "services/reporting.h"

#include <optional>

namespace kelm::store::landxml {

namespace {

constexpr const char* SOURCE = "services/bundled/store/landxml/document/document";

/// Longer than any three numbers and the white space around them.
constexpr std::size_t LONGEST_TEXT = 4096;

/// The elements that are looked into. All others are skipped with all that is in them.
enum class Place {
    Document,
    LandXml,
    Units,
    UnitSystem,
    Crs,
    Surfaces,
    Surface,
    Definition,
    Points,
    Point,
    Faces,
    Face
};

constexpr struct {
    Place meParent;
    std::string_view moName;
    Place mePlace;
} PLACES[] = {
    {Place::Points, "P", Place::Point},
    {Place::Faces, "F", Place::Face},
    {Place::Document, "LandXML", Place::LandXml},
    {Place::LandXml, "Units", Place::Units},
    {Place::Units, "Metric", Place::UnitSystem},
    {Place::Units, "Imperial", Place::UnitSystem},
    {Place::LandXml, "CoordinateSystem", Place::Crs},
    {Place::LandXml, "Surfaces", Place::Surfaces},
    {Place::Surfaces, "Surface", Place::Surface},
    {Place::Surface, "Definition", Place::Definition},
    {Place::Definition, "Pnts", Place::Points},
    {Place::Definition, "Faces", Place::Faces},
};

/// Follows the elements of a document down to the records of its TIN surfaces.
class DocumentReader final : public XmlHandler {
  public:
    explicit DocumentReader(const std::string& file) : moFile(file), moContents(file) {}
    Document Read(std::istream& stream);

    void Start(std::string_view name, const Attributes& attributes) override;
    void End() override;
    void AddText(std::string_view piece) override;

  private:
    Place GetPlace() const { return moPlaces.empty() ? Place::Document : moPlaces.back(); }
    bool Enter(Place place, const Attributes& attributes);
    bool EnterDefinition(const Attributes& attributes);
    void EnterRecord(const char* attribute);
    void EnterCrs(const Attributes& attributes);
    void Leave(Place place);
    [[noreturn]] void Throw(const std::string& fault) const;

    const std::string& moFile;
    Contents moContents;
    XmlReader moReader{*this};
    Document moDocument;
    std::vector<Place> moPlaces; ///< of the open elements, the innermost last
    std::uint64_t mnSkipped = 0; ///< open elements that are not looked into

    std::string moSurface;
    bool mbDefined = false; ///< the surface has a definition
    std::optional<SurfaceBuilder> moBuilder;
    std::string moText; ///< of the record
    std::optional<std::string> moAttribute;
    std::uint64_t mnLine = 0;
};

Document DocumentReader::Read(std::istream& stream) {
    const std::string fault = moReader.Read(stream);
    if (!fault.empty())
        Throw(fault);
    moContents.Test(!moDocument.moSurfaces.empty());
    return std::move(moDocument);
}

void DocumentReader::Start(std::string_view name, const Attributes& attributes) {
    if (mnSkipped == 0)
        for (const auto& row : PLACES)
            if (row.meParent == GetPlace() && row.moName == name &&
                Enter(row.mePlace, attributes)) {
                moPlaces.push_back(row.mePlace);
                return;
            }
    if (mnSkipped == 0 && GetPlace() == Place::LandXml)
        moContents.AddElement(name);
    ++mnSkipped;
}

void DocumentReader::End() {
    if (mnSkipped > 0) {
        --mnSkipped;
        return;
    }
    const Place place = GetPlace();
    moPlaces.pop_back();
    Leave(place);
}

/// White space between elements is no business of anybody.
void DocumentReader::AddText(std::string_view piece) {
    const Place place = GetPlace();
    if (mnSkipped > 0 || (place != Place::Point && place != Place::Face))
        return;
    if (moText.size() + piece.size() <= LONGEST_TEXT)
        moText.append(piece);
    else
        moText = "too long";
}

/// @return false if the element is to be skipped
bool DocumentReader::Enter(Place place, const Attributes& attributes) {
    if (place == Place::Point)
        EnterRecord(attributes.Find("id"));
    else if (place == Place::Face)
        EnterRecord(attributes.Find("i"));
    else if (place == Place::UnitSystem)
        moDocument.moLinearUnit = attributes.Get("linearUnit");
    else if (place == Place::Crs)
        EnterCrs(attributes);
    else if (place == Place::Surface) {
        moSurface = attributes.Get("name");
        mbDefined = false;
    } else if (place == Place::Definition)
        return EnterDefinition(attributes);
    return true;
}

/// A definition that does not say its type is one of triangles.
bool DocumentReader::EnterDefinition(const Attributes& attributes) {
    mbDefined = true;
    const std::string type = attributes.Get("surfType");
    if (!type.empty() && type != "TIN" && type != "tin") {
        moContents.AddSurface(moSurface, "of type " + type);
        return false;
    }
    moBuilder.emplace("surface " + moSurface + " of file " + moFile);
    return true;
}

void DocumentReader::EnterRecord(const char* attribute) {
    moText.clear();
    moAttribute.reset();
    if (attribute != nullptr)
        moAttribute = attribute;
    mnLine = moReader.GetLine();
}

/// The first one counts.
void DocumentReader::EnterCrs(const Attributes& attributes) {
    CrsRecord& crs = moDocument.moCrs;
    if (!crs.moCode.empty() || !crs.moWkt.empty() || !crs.moName.empty())
        return;
    crs.moCode = attributes.Get("epsgCode");
    crs.moWkt = attributes.Get("ogcWktCode");
    for (const char* key : {"horizontalCoordinateSystemName", "name"})
        if (crs.moName.empty())
            crs.moName = attributes.Get(key);
    for (const char* key : {"verticalCoordinateSystemName", "verticalDatum"})
        if (crs.moVertical.empty())
            crs.moVertical = attributes.Get(key);
}

void DocumentReader::Leave(Place place) {
    if (place == Place::Point)
        moBuilder->AddPoint(moAttribute ? moAttribute->c_str() : nullptr, moText, mnLine);
    else if (place == Place::Face)
        moBuilder->AddFace(moText, moAttribute == "1", mnLine);
    else if (place == Place::Definition) {
        moDocument.moSurfaces.push_back(moBuilder->Finish());
        moBuilder.reset();
    } else if (place == Place::Surface && !mbDefined)
        moContents.AddSurface(moSurface, "without a definition");
}

void DocumentReader::Throw(const std::string& fault) const {
    throw DataException(
        FormatString("The %s cannot be read: %s",
                     moBuilder ? moBuilder->GetSubject().c_str() : ("file " + moFile).c_str(),
                     fault.c_str()),
        SOURCE, __PRETTY_FUNCTION__, __LINE__);
}

} // namespace

Document ReadDocument(std::istream& stream, const std::string& file) {
    return DocumentReader(file).Read(stream);
}

} // namespace kelm::store::landxml
