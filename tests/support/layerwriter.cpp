#include "tests/support/layerwriter.h"

#include <cpl_error.h>
#include <gdal_priv.h>
#include <ogrsf_frmts.h>

#include <cstdio>
#include <stdexcept>

namespace kelm::test {

namespace {

void Require(bool bDone, const std::string& what) {
    if (!bDone)
        throw std::runtime_error(what + ": " + CPLGetLastErrorMsg());
}

void WriteFeature(OGRLayer& oLayer, const LayerText& oText, std::size_t nFeature) {
    OGRFeature oFeature(oLayer.GetLayerDefn());
    const std::string& text = oText.moGeometries[nFeature];
    OGRGeometry* poGeometry = nullptr;
    if (!text.empty())
        Require(OGRGeometryFactory::createFromWkt(text.c_str(), nullptr, &poGeometry) ==
                    OGRERR_NONE,
                text);
    oFeature.SetGeometryDirectly(poGeometry);
    if (!oText.moIds.empty())
        oFeature.SetFID(oText.moIds[nFeature]);
    Require(oLayer.CreateFeature(&oFeature) == OGRERR_NONE, text);
}

void AddLayer(GDALDataset& oDataset, const LayerText& oText) {
    OGRSpatialReference oCrs;
    oCrs.SetAxisMappingStrategy(OAMS_TRADITIONAL_GIS_ORDER);
    const bool bCrs = !oText.moCrs.empty();
    Require(!bCrs || oCrs.SetFromUserInput(oText.moCrs.c_str()) == OGRERR_NONE, oText.moCrs);
    CPLStringList oOptions;
    for (const std::string& text : oText.moOptions)
        oOptions.AddString(text.c_str());
    OGRLayer* poLayer = oDataset.CreateLayer(oText.moName.c_str(), bCrs ? &oCrs : nullptr,
                                             oText.meType, oOptions.List());
    Require(poLayer, oText.moName);
    OGRFieldDefn oField("remark", OFTString);
    Require(poLayer->CreateField(&oField) == OGRERR_NONE, "remark");
    // One transaction where the format has such: it saves a write to disk a feature.
    const bool bTransaction = poLayer->StartTransaction() == OGRERR_NONE;
    for (std::size_t nFeature = 0; nFeature < oText.moGeometries.size(); ++nFeature)
        WriteFeature(*poLayer, oText, nFeature);
    Require(!bTransaction || poLayer->CommitTransaction() == OGRERR_NONE, oText.moName);
}

} // namespace

std::string WriteLayers(const std::string& path, const std::string& format,
                        const std::vector<LayerText>& oLayers) {
    GDALAllRegister();
    GDALDriver* poDriver = GetGDALDriverManager()->GetDriverByName(format.c_str());
    Require(poDriver, format);
    GDALDatasetUniquePtr poDataset(poDriver->Create(path.c_str(), 0, 0, 0, GDT_Unknown, nullptr));
    Require(poDataset != nullptr, path);
    for (const LayerText& oText : oLayers)
        AddLayer(*poDataset, oText);
    return path;
}

std::string WriteLayer(const std::string& path, const std::string& format,
                       const LayerText& oLayer) {
    return WriteLayers(path, format, {oLayer});
}

std::string MakeTriangle(double dfX, double dfY, double dfZ) {
    char szText[400];
    std::snprintf(szText, sizeof szText,
                  "POLYGON Z ((%.17g %.17g %.17g,%.17g %.17g %.17g,%.17g %.17g %.17g,%.17g %.17g "
                  "%.17g))",
                  dfX, dfY, dfZ, dfX + 1, dfY, dfZ + 1, dfX, dfY + 1, dfZ + 2, dfX, dfY, dfZ);
    return szText;
}

} // namespace kelm::test
