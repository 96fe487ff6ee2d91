#include "services/vectorlayer.h"

#include "services/bundled/datasetfile.h"
#include "services/bundled/formats.h"
#include "services/bundled/gdalcall.h"
#include "services/bundled/layercrs.h"
#include "services/bundled/storelayer.h"
#include "services/exception.h"

#include <cstring>

using kelm::store::StoreLayer;

namespace {

/// Every layer that is handed out is a StoreLayer.
StoreLayer& Get(ZARLayer_t* layer) {
    if (layer == nullptr)
        throw kelm::ParameterException("layer", kelm::ParameterException::PT_Invalid, "null", "",
                                       "A layer of an open file is needed",
                                       "services/bundled/vectorlayer", __PRETTY_FUNCTION__,
                                       __LINE__);
    return *static_cast<StoreLayer*>(layer);
}

int CountSegments(const _iobuf* poFile, int nType) {
    return poFile != nullptr && nType == ZAR_SEGMENT_VECTOR
               ? static_cast<int>(poFile->moSegments.size())
               : 0;
}

} // namespace

_iobuf* ZAROpen(const char* name, const char* mode) {
    if (!mode || std::strcmp(mode, "r") != 0)
        throw kelm::ParameterException(
            "mode", kelm::ParameterException::PT_Invalid, mode ? mode : "null", "r",
            "The vector layer store opens files for reading only", "services/bundled/vectorlayer",
            __PRETTY_FUNCTION__, __LINE__);
    return kelm::store::OpenFile(name).release();
}

void ZARClose(_iobuf* file) {
    const kelm::store::GdalCall oCall;
    delete file;
}

int ZARSegCount(_iobuf* file, int type) {
    return CountSegments(file, type);
}

int ZARSegNext(_iobuf* file, int type, int after) {
    if (after < 0)
        after = 0;
    return after < CountSegments(file, type) ? after + 1 : 0;
}

ZARLayer_t* ZARGetLayer(_iobuf* file, int segment) {
    if (segment < 1 || segment > CountSegments(file, ZAR_SEGMENT_VECTOR))
        return nullptr;
    const auto nIndex = static_cast<std::size_t>(segment) - 1;
    auto& poLayer = file->moLayers[nIndex];
    if (!poLayer) {
        const kelm::store::Confinement oConfinement;
        poLayer = std::make_unique<StoreLayer>(*file, *file->moSegments[nIndex]);
    }
    return poLayer.get();
}

int ZARGetLayerType(ZARLayer_t* layer, int) {
    return Get(layer).GetSurvey().mnType;
}

int ZARGetProjectionInfo(ZARLayer_t* layer, ProjInfo_t* info) {
    info->definition = Get(layer).GetCrsText();
    return 0;
}

int ZARGetExtents(ZARLayer_t* layer, ZARVertex* low, ZARVertex* high) {
    *low = Get(layer).GetSurvey().moLow;
    *high = Get(layer).GetSurvey().moHigh;
    return 0;
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
