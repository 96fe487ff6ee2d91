#pragma once

#include "tests/support/hoststate.h"
#include "tests/support/transcript.h"

namespace kelm::test {

/// Adds what the bundled services report on this thread while it lives, and what GDAL says itself.
/// At its end the host has back what it had, and no file is open that was not.
struct GdalTranscript : Transcript {
    GdalTranscript() {
        CPLPushErrorHandlerEx(Keep, this);
        CPLHTTPPushFetchCallback(Fetch, nullptr);
        CPLSetThreadLocalConfigOption("CPL_DEBUG", "TIN");
        CPLSetThreadLocalConfigOption("GML_PARSER", "XERCES"); // which the store must not use
        moHost = DescribeHost();
    }
    ~GdalTranscript() {
        EXPECT_EQ(DescribeHost(), moHost);
        EXPECT_EQ(ListOpenFiles(), moFiles);
        for (const char* pszOption : {"CPL_DEBUG", "GML_PARSER"})
            CPLSetThreadLocalConfigOption(pszOption, nullptr);
        CPLHTTPPopFetchCallback();
        CPLPopErrorHandler();
    }
    template <typename Work>
    bool Refuses(const Work& work) {
        const HostCall oCall;
        return Transcript::Refuses(work);
    }
    static void CPL_STDCALL Keep(CPLErr, CPLErrorNum, const char* pszText) {
        static_cast<Transcript*>(CPLGetErrorHandlerUserData())->moLines.append(pszText) += '\n';
    }
    static CPLHTTPResult* Fetch(const char*, CSLConstList, GDALProgressFunc, void*,
                                CPLHTTPFetchWriteFunc, void*, void*) {
        auto* const poResult = static_cast<CPLHTTPResult*>(CPLCalloc(1, sizeof(CPLHTTPResult)));
        poResult->pszErrBuf = CPLStrdup("the host's own");
        return poResult;
    }
    const std::string moFiles = ListOpenFiles();
    std::string moHost;
};

} // namespace kelm::test
