#include "services/bundled/store/gdal/gdalcall.h"

#include "services/bundled/store/gdal/advice.h"

#include <cpl_conv.h>
#include <cpl_http.h>

namespace kelm::store {

namespace {

/// Errors are joined up to this length: a damaged file can cause one for each record.
constexpr std::size_t LONGEST_FAILURES = 500;

void CPL_STDCALL Keep(CPLErr severity, CPLErrorNum, const char* text) {
    static_cast<GdalCall*>(CPLGetErrorHandlerUserData())->Add(severity >= CE_Failure, text);
}

CPLHTTPResult* Refuse(const char*, CSLConstList, GDALProgressFunc, void*, CPLHTTPFetchWriteFunc,
                      void*, void*) {
    // GDAL frees the record and its text with its own functions.
    auto* result = static_cast<CPLHTTPResult*>(CPLCalloc(1, sizeof(CPLHTTPResult)));
    result->nStatus = 1;
    result->pszErrBuf = CPLStrdup("the file asks for a resource of a network");
    CPLError(CE_Failure, CPLE_NotSupported, "%s", result->pszErrBuf);
    return result;
}

} // namespace

GdalCall::GdalCall(const char* rings) : moConfinement(rings) {
    CPLPushErrorHandlerEx(Keep, this);
    CPLSetCurrentErrorHandlerCatchDebug(FALSE);
    CPLHTTPPushFetchCallback(Refuse, nullptr);
}

GdalCall::~GdalCall() {
    CPLHTTPPopFetchCallback();
    CPLPopErrorHandler();
}

std::string GdalCall::TakeFailures() {
    if (!std::exchange(mbFailed, false))
        return {};
    std::string failures = std::exchange(moFailures, {});
    return failures.empty() ? "an error without a text" : failures;
}

void GdalCall::Add(bool failure, const char* text) noexcept {
    mbFailed = mbFailed || failure;
    try {
        if (!failure)
            AddWarning(moWarnings, StripAdvice(text), 1);
        else if (moFailures.size() < LONGEST_FAILURES)
            moFailures.append(moFailures.empty() ? "" : "; ").append(StripAdvice(text));
    } catch (...) {
        // The callers are GDAL's functions, which an exception must not cross. mbFailed is set.
    }
}

} // namespace kelm::store
