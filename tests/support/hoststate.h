#pragma once

#include "services/reporting.h"

#include <cpl_conv.h>
#include <cpl_error.h>
#include <cpl_http.h>
#include <cpl_string.h>
#include <gtest/gtest.h>
#include <omp.h>
#include <proj.h>

#include <cfenv>
#include <clocale>
#include <filesystem>

namespace kelm::test {

/// @return what the host has set for this thread and process
inline std::string DescribeHost() {
    const CPLErrorStateBackuper oError;
    const std::unique_ptr<CPLHTTPResult, decltype(&CPLHTTPDestroyResult)> poResult(
        CPLHTTPFetch("http://127.0.0.1:9", nullptr), CPLHTTPDestroyResult);
    std::string text = FormatString( // curl's text ends in the time that it took
        "handler of %p, fetch: %.9s, network %d, locale %s, rounding %d, threads %d %d %d, in %s",
        CPLGetErrorHandlerUserData(), poResult->pszErrBuf, proj_context_is_network_enabled(nullptr),
        setlocale(LC_ALL, nullptr), fegetround(), omp_get_max_threads(), omp_get_dynamic(),
        omp_get_max_active_levels(), std::filesystem::current_path().c_str());
    const CPLStringList oOptions(CPLGetThreadLocalConfigOptions());
    for (int n = 0; n < oOptions.size(); ++n)
        text.append(", ").append(oOptions[n]);
    return text;
}

/// @return the files that the process holds open, but for the database that PROJ keeps
inline std::string ListOpenFiles() {
    std::string files;
    for (const auto& oEntry : std::filesystem::directory_iterator("/proc/self/fd"))
        if (const auto path = read_symlink(oEntry); path.filename() != "proj.db")
            files += path.string().find("/proc/") == 0 ? "" : path.string() + '\n';
    return files;
}

/// A call of the library: however it ends, the host has back at its end what it had.
struct HostCall {
    HostCall() { CPLErrorSetState(CE_Failure, 42, "the host's own"); }
    HostCall(const HostCall&) = delete;
    ~HostCall() {
        EXPECT_EQ(CPLGetLastErrorType(), CE_Failure);
        EXPECT_STREQ(CPLGetLastErrorMsg(), "the host's own");
        EXPECT_EQ(DescribeHost(), moBefore);
    }
    const std::string moBefore = DescribeHost();
};

} // namespace kelm::test
