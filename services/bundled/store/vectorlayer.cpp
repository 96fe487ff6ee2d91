// The vector layer store. GDAL reads the formats that files/formats.h lists, and shapeids.h tells
// how their shapes are numbered; landxml/ reads LandXML. A null layer is refused with a
// kelm::ParameterException.
//
// Segments are the layers that have a geometry, numbered from 1 as they stand in the file. Whoever
// names none (ZARSegNext behind 0) gets the first that holds polygons, since that is what surfaces
// are made of; behind another number comes the next one, whatever it holds.

#include "services/vectorlayer.h"

#include "services/bundled/reportingrepeats.h"
#include "services/bundled/store/files/foreignfile.h"
#include "services/bundled/store/files/opendataset.h"
#include "services/bundled/store/gdal/gdalcall.h"
#include "services/bundled/store/landxml/landxmlfile.h"
#include "services/bundled/store/storefile.h"
#include "services/exception.h"

#include <cstring>
#include <memory>

using kelm::store::OpenLayer;

namespace {

constexpr const char* SOURCE = "services/bundled/store/vectorlayer";

/// Every layer that is handed out is an OpenLayer.
OpenLayer& Get(ZARLayer_t* layer) {
    if (layer == nullptr)
        throw kelm::ParameterException("layer", kelm::ParameterException::PT_Invalid, "null", "",
                                       "A layer of an open file is needed", SOURCE,
                                       __PRETTY_FUNCTION__, __LINE__);
    return *static_cast<OpenLayer*>(layer);
}

int CountSegments(const _iobuf* file, int type) {
    return file != nullptr && type == ZAR_SEGMENT_VECTOR ? file->GetLayerCount() : 0;
}

/// Tells LandXML by its content. All else is GDAL's.
std::unique_ptr<_iobuf> Open(const char* name) {
    if (std::unique_ptr<_iobuf> file = kelm::store::landxml::OpenLandXml(name))
        return file;
    try {
        return std::make_unique<kelm::store::StoreFile>(kelm::store::OpenFile(name));
    } catch (const kelm::DataException&) {
        kelm::store::RefuseForeignFile(name);
        throw;
    }
}

} // namespace

_iobuf* ZAROpen(const char* name, const char* mode) {
    if (!mode || std::strcmp(mode, "r") != 0)
        throw kelm::ParameterException("mode", kelm::ParameterException::PT_Invalid,
                                       mode ? mode : "null", "r",
                                       "The vector layer store opens files for reading only",
                                       SOURCE, __PRETTY_FUNCTION__, __LINE__);
    return Open(name).release();
}

void ZARClose(_iobuf* file) {
    {
        const kelm::store::GdalCall call;
        delete file;
    }
    kelm::tellus::TellLeftOut();
}

int ZARSegCount(_iobuf* file, int type) {
    return CountSegments(file, type);
}

int ZARSegNext(_iobuf* file, int type, int after) {
    const int count = CountSegments(file, type);
    if (after <= 0)
        return count > 0 ? file->FindFirst() : 0;
    return after < count ? after + 1 : 0;
}

ZARLayer_t* ZARGetLayer(_iobuf* file, int segment) {
    if (file == nullptr)
        return nullptr;
    if (segment < 1 || segment > file->GetLayerCount()) {
        file->WarnOfNumber(segment);
        return nullptr;
    }
    return &file->GetLayer(segment);
}

int ZARGetLayerType(ZARLayer_t* layer, int) {
    return Get(layer).GetType();
}

int ZARGetProjectionInfo(ZARLayer_t* layer, ProjInfo_t* info) {
    info->definition = Get(layer).GetCrsText();
    return 0;
}

int ZARGetExtents(ZARLayer_t* layer, ZARVertex* low, ZARVertex* high) {
    *low = Get(layer).GetLow();
    *high = Get(layer).GetHigh();
    return 0;
}

void ZARSetWindow(ZARLayer_t* layer, const ZARVertex* low, const ZARVertex* high) {
    Get(layer).SetWindow(low, high);
}

int ZARCountShapes(ZARLayer_t* layer, const ZARVertex* low, const ZARVertex* high) {
    return Get(layer).CountShapes(*low, *high);
}

void ZARSetProgress(_iobuf* file, ZARProgress progress, void* data) {
    file->SetProgress({progress, data});
}

std::string ZARGetSurvey(ZARLayer_t* layer) {
    return Get(layer).GetSurvey();
}

int ZARSetSurvey(_iobuf* file, const std::string& survey) {
    return file->TakeSurvey(survey);
}

int ZARGetNext(ZARLayer_t* layer, int id) {
    return id == -1 ? Get(layer).GetFirst() : Get(layer).GetBehind(id);
}

ZARShape* ZARGetShapeRef(ZARLayer_t* layer, int id) {
    return &Get(layer).GetShape(id);
}

_iobuf* ZARLayer2fp(ZARLayer_t* layer) {
    return &Get(layer).GetFile();
}
