#pragma once

#include "tests/support/hoststate.h"
#include "tests/support/transcript.h"

namespace kelm::test {

/// Adds what the bundled services report on this thread while it lives, and what GDAL says itself.
/// At its end the host has back what it had, and no file is open that was not.
struct GdalTranscript : Transcript {
    GdalTranscript() {
        CPLPushErrorHandlerEx(Keep, this);
        CPLHTTPPushFetchCallback(AnswerFetch, nullptr);
        CPLSetThreadLocalConfigOption("CPL_DEBUG", "TIN");
        moHost = DescribeHost();
    }
    ~GdalTranscript() {
        EXPECT_EQ(DescribeHost(), moHost);
        EXPECT_EQ(FindOpenFiles(), moFiles);
        CPLSetThreadLocalConfigOption("CPL_DEBUG", nullptr);
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

    std::multiset<std::string> moFiles = FindOpenFiles();
    std::string moHost;
};

} // namespace kelm::test
