#include "services/bundled/store/landxml/documentcrs.h"

#include "services/bundled/store/gdal/crstext.h"
#include "services/bundled/store/gdal/gdalcall.h"
#include "services/reporting.h"

#include <cpl_conv.h>
#include <ogr_spatialref.h>

#include <algorithm>
#include <cmath>
#include <cstdlib>
#include <memory>

namespace kelm::store::landxml {

namespace {

/// EGM96 height.
constexpr int DEFAULT_VERTICAL_CODE = 5773;

struct Unit {
    const char* mpszName; ///< as LandXML writes it
    const char* mpszWkt;  ///< as EPSG writes it
    double mdfMetres;
};
constexpr Unit UNITS[] = {
    {"meter", "metre", 1.0},
    {"millimeter", "millimetre", 0.001},
    {"centimeter", "centimetre", 0.01},
    {"kilometer", "kilometre", 1000.0},
    {"foot", "foot", 0.3048},
    {"USSurveyFoot", "US survey foot", 1200.0 / 3937.0},
    {"inch", "inch", 0.0254},
    {"mile", "Statute mile", 1609.344},
};

const Unit* FindUnit(const std::string& name) {
    for (const Unit& unit : UNITS)
        if (EQUAL(name.c_str(), unit.mpszName) || EQUAL(name.c_str(), unit.mpszWkt))
            return &unit;
    return nullptr;
}

bool IsSame(double metres, double otherMetres) {
    // The two kinds of feet differ by 2e-6.
    return std::abs(metres / otherMetres - 1.0) < 1e-9;
}

/// What a CRS is looked for by its name.
constexpr OSRCRSType MAP_TYPES[] = {OSR_CRS_TYPE_PROJECTED, OSR_CRS_TYPE_GEOGRAPHIC_2D,
                                    OSR_CRS_TYPE_COMPOUND};
constexpr OSRCRSType VERTICAL_TYPES[] = {OSR_CRS_TYPE_VERTICAL};

/// @return the number that EPSG gives a CRS of exactly this name, in any case of letters; else 0
template <std::size_t N>
int FindCode(const std::string& name, const OSRCRSType (&types)[N]) {
    if (name.empty())
        return 0; // the list has thousands of entries
    int count = 0;
    const std::unique_ptr<OSRCRSInfo*, decltype(&OSRDestroyCRSInfoList)> list(
        OSRGetCRSInfoListFromDatabase("EPSG", nullptr, &count), OSRDestroyCRSInfoList);
    for (int n = 0; n < count; ++n) {
        const OSRCRSInfo& info = *list.get()[n];
        if (!info.bDeprecated && EQUAL(info.pszName, name.c_str()) &&
            std::find(types, types + N, info.eType) != types + N)
            return std::atoi(info.pszCode);
    }
    return 0;
}

bool ImportNumber(OGRSpatialReference& crs, int number) {
    return number > 0 && crs.importFromEPSG(number) == OGRERR_NONE;
}

bool ImportCode(OGRSpatialReference& crs, const std::string& code) {
    const int number = std::atoi(code.c_str() + (STARTS_WITH_CI(code.c_str(), "EPSG:") ? 5 : 0));
    return ImportNumber(crs, number);
}

/// Builds the CRS of one document.
class CrsBuilder {
  public:
    explicit CrsBuilder(const Document& document)
        : moRecord(document.moCrs), moUnitName(document.moLinearUnit),
          mpoUnit(FindUnit(moUnitName)) {}
    std::string Build(Warnings& warnings);

  private:
    bool FindHorizontal();
    bool FindVertical();
    void TakeApart();
    void SetHorizontalUnit();
    void SetVerticalUnit();
    std::string Join() const;
    void Warn(const std::string& text) { AddWarning(*mpoWarnings, text, 1); }

    const CrsRecord& moRecord;
    const std::string& moUnitName;
    const Unit* mpoUnit; ///< null if the document names none that is known
    Warnings* mpoWarnings = nullptr;
    OGRSpatialReference moHorizontal;
    OGRSpatialReference moVertical; ///< empty: none
};

std::string CrsBuilder::Build(Warnings& warnings) {
    mpoWarnings = &warnings;
    if (!FindHorizontal())
        return {};
    if (!mpoUnit) {
        Warn(FormatString("its linear unit '%s' is not known, so its CRS '%s' is not used",
                          moUnitName.c_str(), moHorizontal.GetName()));
        return {};
    }
    TakeApart();
    if (!moHorizontal.IsProjected() && !moHorizontal.IsGeographic())
        return ExportCrs(moHorizontal);
    if (moVertical.IsEmpty() && !FindVertical() && !IsSame(mpoUnit->mdfMetres, 1.0))
        static_cast<void>(moVertical.importFromEPSG(DEFAULT_VERTICAL_CODE));
    SetHorizontalUnit();
    SetVerticalUnit();
    return Join();
}

bool CrsBuilder::FindHorizontal() {
    const CrsRecord& record = moRecord;
    if (ImportCode(moHorizontal, record.moCode) ||
        (!record.moWkt.empty() &&
         moHorizontal.importFromWkt(record.moWkt.c_str()) == OGRERR_NONE) ||
        ImportNumber(moHorizontal, FindCode(record.moName, MAP_TYPES)))
        return true;
    if (!record.moCode.empty() || !record.moWkt.empty() || !record.moName.empty())
        Warn(FormatString("its CRS is not known and not used (epsgCode '%s', name '%s')",
                          record.moCode.c_str(), record.moName.c_str()));
    return false;
}

/// Splits a compound CRS.
void CrsBuilder::TakeApart() {
    const OGR_SRSNode* node = moHorizontal.GetAttrNode("COMPD_CS|VERT_CS");
    if (!moHorizontal.IsCompound() || !node)
        return;
    char* raw = nullptr;
    node->exportToWkt(&raw);
    const std::unique_ptr<char, decltype(&CPLFree)> text(raw, CPLFree);
    static_cast<void>(moVertical.importFromWkt(raw));
    static_cast<void>(moHorizontal.StripVertical());
}

/// Files mostly name a datum, after which EPSG names its heights.
bool CrsBuilder::FindVertical() {
    const std::string& name = moRecord.moVertical;
    if (name.empty())
        return false;
    for (const std::string& tried : {name, name + " height"})
        if (ImportNumber(moVertical, FindCode(tried, VERTICAL_TYPES)))
            return true;
    Warn(FormatString("its vertical datum '%s' is not known and not used", name.c_str()));
    return false;
}

void CrsBuilder::SetHorizontalUnit() {
    const char* name = nullptr;
    if (!moHorizontal.IsProjected() ||
        IsSame(moHorizontal.GetLinearUnits(&name), mpoUnit->mdfMetres))
        return;
    Warn(FormatString("its CRS '%s' has the unit %s and its coordinates the unit %s; they are read "
                      "in %s",
                      moHorizontal.GetName(), name, mpoUnit->mpszName, mpoUnit->mpszName));
    static_cast<void>(
        moHorizontal.SetLinearUnitsAndUpdateParameters(mpoUnit->mpszWkt, mpoUnit->mdfMetres));
}

void CrsBuilder::SetVerticalUnit() {
    if (moVertical.IsEmpty() ||
        IsSame(moVertical.GetTargetLinearUnits("VERT_CS"), mpoUnit->mdfMetres))
        return;
    const char* datum = moVertical.GetAttrValue("VERT_CS|VERT_DATUM");
    const std::string text =
        FormatString("VERTCRS[\"%s (%s)\",VDATUM[\"%s\"],CS[vertical,1],"
                     "AXIS[\"gravity-related height (H)\",up],LENGTHUNIT[\"%s\",%.17g]]",
                     moVertical.GetName(), mpoUnit->mpszWkt, datum ? datum : "unknown",
                     mpoUnit->mpszWkt, mpoUnit->mdfMetres);
    moVertical.Clear();
    static_cast<void>(moVertical.importFromWkt(text.c_str()));
}

std::string CrsBuilder::Join() const {
    if (moVertical.IsEmpty())
        return ExportCrs(moHorizontal);
    OGRSpatialReference compound;
    const std::string name = std::string(moHorizontal.GetName()) + " + " + moVertical.GetName();
    static_cast<void>(compound.SetCompoundCS(name.c_str(), &moHorizontal, &moVertical));
    return ExportCrs(compound);
}

} // namespace

std::string CreateCrsText(const Document& document, const std::string& file) {
    Warnings warnings;
    std::string text;
    {
        // What GDAL says of texts that are no CRS is told in our words.
        const GdalCall call;
        text = CrsBuilder(document).Build(warnings);
    }
    PassOn(warnings, "The file " + file);
    return text;
}

} // namespace kelm::store::landxml
