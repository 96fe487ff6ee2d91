#include "services/bundled/gdalcall.h"

#include "services/reporting.h"

#include <cpl_conv.h>
#include <cpl_error.h>
#include <cpl_http.h>

namespace kelm::store {

namespace {

/// Errors are joined up to this length: a damaged file can cause one a record.
constexpr std::size_t knLongest = 500;
constexpr std::size_t knMostTexts = 1000;

void CPL_STDCALL Keep(CPLErr eClass, CPLErrorNum, const char* pszText) {
    static_cast<GdalCall*>(CPLGetErrorHandlerUserData())->Add(eClass >= CE_Failure, pszText);
}

CPLHTTPResult* Refuse(const char*, CSLConstList, GDALProgressFunc, void*, CPLHTTPFetchWriteFunc,
                      void*, void*) {
    // GDAL frees the record and its text with its own functions.
    auto* psResult = static_cast<CPLHTTPResult*>(CPLCalloc(1, sizeof(CPLHTTPResult)));
    psResult->nStatus = 1;
    psResult->pszErrBuf = CPLStrdup("the file asks for a resource of a network");
    CPLError(CE_Failure, CPLE_NotSupported, "%s", psResult->pszErrBuf);
    return psResult;
}

} // namespace

void AddWarning(Warnings& oWarnings, const std::string& text, std::int64_t nTimes) {
    if (oWarnings.size() < knMostTexts || oWarnings.count(text) > 0)
        oWarnings[text] += nTimes;
    else
        oWarnings["further warnings"] += nTimes;
}

GdalCall::GdalCall() {
    CPLPushErrorHandlerEx(Keep, this);
    CPLSetCurrentErrorHandlerCatchDebug(FALSE);
    CPLHTTPPushFetchCallback(Refuse, nullptr);
}

GdalCall::~GdalCall() {
    CPLHTTPPopFetchCallback();
    CPLPopErrorHandler();
}

void GdalCall::Add(bool bFailure, const char* pszText) noexcept {
    mbFailed = mbFailed || bFailure;
    try {
        if (!bFailure)
            AddWarning(moWarnings, pszText, 1);
        else if (moFailures.size() < knLongest)
            moFailures.append(moFailures.empty() ? "" : "; ").append(pszText);
    } catch (...) {
        // The frames below are GDAL's and not made for exceptions. That it failed is noted.
    }
}

void PassOn(const Warnings& oWarnings, const std::string& subject) {
    for (const auto& [text, nTimes] : oWarnings) {
        const std::string times =
            nTimes > 1 ? FormatString(" (%lld times)", static_cast<long long>(nTimes)) : "";
        tellus::Warning::Warn(
            FormatString("%s: %s%s", subject.c_str(), text.c_str(), times.c_str()),
            "services/bundled/gdalcall", __LINE__);
    }
}

} // namespace kelm::store
