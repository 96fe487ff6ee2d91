#include "services/bundled/store/handedsurvey.h"

#include "services/bundled/store/facets/cutting/planecutter.h"
#include "services/exception.h"
#include "services/reporting.h"

#include <gdal.h>

#include <utility>

namespace kelm::store {

namespace {

/// Who wrote a survey. To be changed with what Write writes, or with what becomes of a geometry.
std::string GetWriter() {
    constexpr std::uint32_t BYTE_ORDER_MARK = 0x01020304;
    ByteWriter mark;
    mark.Put(BYTE_ORDER_MARK);
    return "survey 2, GDAL " + std::string(GDALVersionInfo("RELEASE_NAME")) + ", GEOS " +
           GEOSversion() + mark.GetBytes();
}

void Write(const ZARVertex& vertex, ByteWriter& bytes) {
    bytes.Put(vertex.x);
    bytes.Put(vertex.y);
    bytes.Put(vertex.z);
}

ZARVertex ReadVertex(ByteReader& bytes) {
    ZARVertex vertex{};
    vertex.x = bytes.Get<double>();
    vertex.y = bytes.Get<double>();
    vertex.z = bytes.Get<double>();
    return vertex;
}

/// @return false if the bytes tell of no layer
bool Read(ByteReader& bytes, HandedSurvey& survey) {
    survey.moOrigin.moFile = bytes.GetText();
    survey.moOrigin.moLayer = bytes.GetText();
    survey.moOrigin.mnSegment = bytes.Get<int>();
    survey.moOrigin.moStamp.Read(bytes);
    survey.moSurvey.mnShapes = bytes.Get<int>();
    survey.moSurvey.mnType = bytes.Get<int>();
    survey.moSurvey.moLow = ReadVertex(bytes);
    survey.moSurvey.moHigh = ReadVertex(bytes);
    const bool hasIds = survey.moSurvey.moIds.Read(bytes);
    survey.moWhole = bytes.GetBits();
    const bool hasBlocks = survey.moSurvey.moBlocks.Read(bytes, survey.moWhole.size());
    return hasIds && hasBlocks && !bytes.HasFailed() && bytes.IsAtEnd();
}

} // namespace

std::string WriteSurvey(const SurveyOrigin& origin, const LayerSurvey& survey,
                        const std::vector<bool>& whole) {
    ByteWriter bytes;
    bytes.Put(origin.moFile);
    bytes.Put(origin.moLayer);
    bytes.Put(origin.mnSegment);
    origin.moStamp.Write(bytes);
    bytes.Put(survey.mnShapes);
    bytes.Put(survey.mnType);
    Write(survey.moLow, bytes);
    Write(survey.moHigh, bytes);
    survey.moIds.Write(bytes);
    bytes.Put(whole);
    survey.moBlocks.Write(bytes);

    ByteWriter framed;
    framed.Put(GetWriter());
    framed.Put(ComputeChecksum(bytes.GetBytes()));
    framed.Put(bytes.GetBytes());
    return framed.GetBytes();
}

HandedSurvey ReadSurvey(const std::string& bytes, const std::string& file) {
    ByteReader framed(bytes);
    const std::string_view writer = framed.GetText();
    const auto sum = framed.Get<std::uint64_t>();
    const std::string_view content = framed.GetText();
    if (framed.HasFailed() || !framed.IsAtEnd())
        RefuseSurvey(file, "it is damaged");
    if (writer != GetWriter())
        RefuseSurvey(file, "other versions of the libraries made it");
    if (sum != ComputeChecksum(content))
        RefuseSurvey(file, "it is damaged");
    ByteReader reader(content);
    HandedSurvey survey;
    if (!Read(reader, survey))
        RefuseSurvey(file, "it is damaged");
    return survey;
}

void RefuseSurvey(const std::string& file, const std::string& reason) {
    throw DataException(
        FormatString("The survey cannot be used for file %s: %s", file.c_str(), reason.c_str()),
        "services/bundled/store/handedsurvey", __PRETTY_FUNCTION__, __LINE__);
}

} // namespace kelm::store
