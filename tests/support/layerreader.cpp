#include "tests/support/layerreader.h"

#include "services/exception.h"

#include <gtest/gtest.h>

namespace kelm::test {

FilePtr OpenFile(const std::string& path) {
    return FilePtr(ZAROpen(path.c_str(), "r"), ZARClose);
}

Ring ReadShape(ZARLayer_t* poLayer, int nId) {
    try {
        const ZARShape& oShape = *ZARGetShapeRef(poLayer, nId);
        Ring oRing;
        for (int n = 0; n < oShape.vertexCount; ++n)
            oRing.push_back({oShape.vertices[n].x, oShape.vertices[n].y, oShape.vertices[n].z});
        return oRing;
    } catch (const kelm::DataException&) {
        return {};
    }
}

LayerContents ReadLayer(_iobuf* poFile, int nSegment) {
    LayerContents oContents;
    ZARLayer_t* poLayer = ZARGetLayer(poFile, nSegment);
    EXPECT_NE(poLayer, nullptr);
    EXPECT_NE(poLayer->shapeCountValid, 0);
    EXPECT_EQ(ZARLayer2fp(poLayer), poFile);
    oContents.mnType = ZARGetLayerType(poLayer, 0);
    oContents.mnCount = poLayer->shapeCount;
    ZARGetExtents(poLayer, &oContents.moLow, &oContents.moHigh);
    ProjInfo_t oInfo;
    ZARGetProjectionInfo(poLayer, &oInfo);
    oContents.moCrs = oInfo.definition;
    for (int nId = ZARGetNext(poLayer, -1); nId != -1; nId = ZARGetNext(poLayer, nId)) {
        oContents.moIds.push_back(nId);
        oContents.moRings.push_back(ReadShape(poLayer, nId));
    }
    EXPECT_EQ(static_cast<int>(oContents.moIds.size()), oContents.mnCount);
    return oContents;
}

LayerContents ReadLayer(const std::string& path) {
    const FilePtr poFile = OpenFile(path);
    return ReadLayer(poFile.get());
}

std::vector<std::size_t> CountVertices(const LayerContents& oContents) {
    std::vector<std::size_t> oCounts;
    for (const Ring& oRing : oContents.moRings)
        oCounts.push_back(oRing.size());
    return oCounts;
}

} // namespace kelm::test
