#pragma once

#include "tests/support/transcript.h"

#include <cpl_conv.h>
#include <cpl_error.h>

namespace kelm::test {

/// Adds what the bundled services report on this thread while it lives, and what GDAL says itself.
struct GdalTranscript : Transcript {
    GdalTranscript() {
        CPLPushErrorHandlerEx(Keep, this);
        CPLSetThreadLocalConfigOption("CPL_DEBUG", "TIN");
    }
    ~GdalTranscript() {
        CPLSetThreadLocalConfigOption("CPL_DEBUG", nullptr);
        CPLPopErrorHandler();
    }
    static void CPL_STDCALL Keep(CPLErr, CPLErrorNum, const char* pszText) {
        static_cast<Transcript*>(CPLGetErrorHandlerUserData())->moLines.append(pszText) += '\n';
    }
};

} // namespace kelm::test
