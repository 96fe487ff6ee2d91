#pragma once

#include "services/reporting.h"

#include <cpl_conv.h>
#include <cpl_error.h>
#include <cpl_http.h>
#include <cpl_string.h>
#include <gtest/gtest.h>
#include <ogr_srs_api.h>
#include <omp.h>
#include <proj.h>

#include <cfenv>
#include <clocale>
#include <filesystem>
#include <set>
#include <string>

namespace kelm::test {

/// Answers for a host whatever GDAL would fetch.
inline CPLHTTPResult* AnswerFetch(const char*, CSLConstList, GDALProgressFunc, void*,
                                  CPLHTTPFetchWriteFunc, void*, void*) {
    auto* const poResult = static_cast<CPLHTTPResult*>(CPLCalloc(1, sizeof(CPLHTTPResult)));
    poResult->pszErrBuf = CPLStrdup("the host's answer");
    return poResult;
}

/// @return what the host has set for this thread and process, and which of it is in force
inline std::string DescribeHost() {
    const CPLErrorStateBackuper oError;
    std::string text = FormatString("handler of %p\n", CPLGetErrorHandlerUserData());
    for (char** papszOptions : {CPLGetThreadLocalConfigOptions(), CPLGetConfigOptions()}) {
        const CPLStringList oOptions(papszOptions);
        for (int n = 0; n < oOptions.size(); ++n)
            text.append(oOptions[n]) += '\n';
        text += "and\n";
    }
    const CPLStringList oFolders(OSRGetPROJSearchPaths());
    for (int n = 0; n < oFolders.size(); ++n)
        text.append(oFolders[n]) += '\n';
    CPLHTTPResult* const poResult = CPLHTTPFetch("http://127.0.0.1:9", nullptr);
    text += FormatString("%s, network %d\n", poResult->pszErrBuf,
                         proj_context_is_network_enabled(nullptr));
    CPLHTTPDestroyResult(poResult);
    omp_sched_t eSchedule;
    int nChunk;
    omp_get_schedule(&eSchedule, &nChunk);
    return text + FormatString("%s, rounding %d, threads %d %d %d %d %d, in %s\n",
                               setlocale(LC_ALL, nullptr), fegetround(), omp_get_max_threads(),
                               omp_get_dynamic(), omp_get_max_active_levels(), int(eSchedule),
                               nChunk, std::filesystem::current_path().c_str());
}

/// @return the files that the process holds open, but those that PROJ and GDAL keep for good
inline std::multiset<std::string> FindOpenFiles() {
    std::multiset<std::string> files;
    for (const auto& oEntry : std::filesystem::directory_iterator("/proc/self/fd")) {
        std::error_code oNone;
        const std::string path = std::filesystem::read_symlink(oEntry, oNone);
        if (path.find("proj.db") == std::string::npos && path.find("/proc/") != 0)
            files.insert(path);
    }
    return files;
}

/// A call of the library. At its end, however it ends, the host has back what it had.
struct HostCall {
    HostCall() { CPLErrorSetState(CE_Failure, 42, "the host's own"); }
    HostCall(const HostCall&) = delete;
    ~HostCall() {
        EXPECT_EQ(CPLGetLastErrorType(), CE_Failure);
        EXPECT_EQ(CPLGetLastErrorNo(), 42);
        EXPECT_STREQ(CPLGetLastErrorMsg(), "the host's own");
        EXPECT_EQ(DescribeHost(), moBefore);
    }
    std::string moBefore = DescribeHost();
};

} // namespace kelm::test
