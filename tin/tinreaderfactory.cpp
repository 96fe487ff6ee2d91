#include "tin/tinreaderfactory.h"

#include "services/exception.h"
#include "services/reporting.h"
#include "services/vectorlayer.h"
#include "tin/load/shapecount.h"
#include "tin/tinreader.h"

#include <cmath>
#include <exception>
#include <memory>

namespace kelm::tin {

namespace {

struct FileCloser {
    void operator()(_iobuf* file) const { ZARClose(file); }
};
using OpenFile = std::unique_ptr<_iobuf, FileCloser>;

#define THROW_DATA_EXCEPTION(text)                                                                 \
    throw DataException(text, "tin/tinreaderfactory", __PRETTY_FUNCTION__, __LINE__)

/// The message is the same whatever went wrong; the exception of the store is nested in it. To be
/// called where that exception is being handled.
[[noreturn]] void ThrowUnsupported(const char* pszFilename) {
    std::throw_with_nested(
        DataException(FormatString("The format of file %s is not supported by ZAR", pszFilename),
                      "tin/tinreaderfactory", __PRETTY_FUNCTION__, __LINE__));
}

_iobuf* Open(const char* pszFilename) {
    try {
        return ZAROpen(pszFilename, "r");
    } catch (const std::exception& reason) {
        tellus::Report::AddInfo(reason.what());
        ThrowUnsupported(pszFilename);
    } catch (...) {
        ThrowUnsupported(pszFilename);
    }
}

/// A height of such a factor would be none, and no later step could tell.
void TestFinite(const char* parameter, double value) {
    if (!std::isfinite(value))
        throw ParameterException(parameter, ParameterException::PT_Invalid,
                                 FormatString("%g", value), "a finite number",
                                 FormatString("The elevation factor's %s must be a finite number, "
                                              "but is %g",
                                              parameter, value),
                                 "tin/tinreaderfactory", __PRETTY_FUNCTION__, __LINE__);
}

/// Hands the survey to the store, if there is one. @return the number of the layer
int ChooseLayer(_iobuf& file, int nLayer, const std::string& survey) {
    if (survey.empty())
        return nLayer < 1 ? ZARSegNext(&file, ZAR_SEGMENT_VECTOR, 0) : nLayer;
    if (ZARSetSurvey == nullptr)
        THROW_DATA_EXCEPTION("These services take no surveys");
    const int surveyed = ZARSetSurvey(&file, survey);
    if (nLayer >= 1 && nLayer != surveyed)
        THROW_DATA_EXCEPTION(
            FormatString("The survey is one of layer %d, not of layer %d", surveyed, nLayer));
    return surveyed;
}

/// Lets the store tell a progress function how far it is.
class ToldProgress {
  public:
    ToldProgress(_iobuf& file, const Progress& progress) : mrFile(file), moProgress(progress) {
        if (ZARSetProgress != nullptr)
            ZARSetProgress(&file, &ToldProgress::Tell, &moProgress);
    }
    ToldProgress(const ToldProgress&) = delete;
    ToldProgress& operator=(const ToldProgress&) = delete;
    ~ToldProgress() {
        if (ZARSetProgress != nullptr)
            ZARSetProgress(&mrFile, nullptr, nullptr);
    }

  private:
    static void Tell(double done, void* data) {
        static_cast<const Progress*>(data)->Report(done, "surveying the layer");
    }

    _iobuf& mrFile;
    Progress moProgress;
};

ZARLayer_t* GetLayer(_iobuf& file, int number, const Progress& progress) {
    const ToldProgress told(file, progress);
    return ZARGetLayer(&file, number);
}

} // namespace

TinReader* TinReaderFactory::CreateTinReader(const char* pszFilename, const int nLayer,
                                             const double dfOffset, const double dfScale,
                                             const ogc::cs::DatumType eSourceDatum) {
    return CreateTinReader(pszFilename, nLayer, dfOffset, dfScale, eSourceDatum, {});
}

TinReader* TinReaderFactory::CreateTinReader(const char* pszFilename, const int nLayer,
                                             const double dfOffset, const double dfScale,
                                             const ogc::cs::DatumType eSourceDatum,
                                             const OpenOptions& oOptions) {
    if (pszFilename == nullptr)
        THROW_DATA_EXCEPTION("The name of the file must be non-null");
    OpenFile file(Open(pszFilename));
    if (ZARSegCount(file.get(), ZAR_SEGMENT_VECTOR) < 1)
        THROW_DATA_EXCEPTION(FormatString("This file %s contains no vector layer", pszFilename));
    const int layerNumber = ChooseLayer(*file, nLayer, oOptions.survey);
    ZARLayer_t* layer = GetLayer(*file, layerNumber, oOptions.progress);
    if (layer == nullptr)
        THROW_DATA_EXCEPTION(
            FormatString("ZARGetLayer failed on the provided vector layer %d in the input file %s.",
                         layerNumber, pszFilename));
    const int type = ZARGetLayerType(layer, 0);
    if (type != 2 && type != 4)
        THROW_DATA_EXCEPTION(FormatString(
            "The provided vector layer %d in the input file %s must be defined by polygons.",
            layerNumber, pszFilename));
    if (load::GetShapeCount(*layer) <= 0)
        THROW_DATA_EXCEPTION(
            FormatString("The provided vector layer %d in the input file %s is empty.", layerNumber,
                         pszFilename));
    TestFinite("dfOffset", dfOffset);
    TestFinite("dfScale", dfScale);
    auto reader = std::make_unique<TinReader>(layer, dfOffset, dfScale, eSourceDatum);
    // The reader closes the file by way of its layer.
    static_cast<void>(file.release());
    return reader.release();
}

} // namespace kelm::tin
