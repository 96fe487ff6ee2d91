#pragma once

#include <cpl_conv.h>
#include <cpl_error.h>
#include <fnmatch.h>
#include <gtest/gtest.h>

#include <regex>
#include <string>

namespace kelm::test {

/// What the services report on this thread while it lives, a line each, and what GDAL says itself.
/// What nobody takes is a failure.
class Transcript {
  public:
    Transcript() {
        CPLPushErrorHandlerEx(Keep, this);
        CPLSetThreadLocalConfigOption("CPL_DEBUG", "TIN");
    }
    Transcript(const Transcript&) = delete;
    ~Transcript() {
        CPLSetThreadLocalConfigOption("CPL_DEBUG", nullptr);
        CPLPopErrorHandler();
        EXPECT_EQ(moLines, "");
    }
    /// @return the lines since the last call, without the numbers of source lines
    std::string Take() {
        return std::regex_replace(std::exchange(moLines, ""), std::regex(R"(:\d+\)\n)"), ")\n");
    }

  private:
    static void CPL_STDCALL Keep(CPLErr, CPLErrorNum, const char* pszText) {
        static_cast<Transcript*>(CPLGetErrorHandlerUserData())->moLines.append(pszText) += '\n';
    }
    std::string moLines;
};

/// Compares a text with one that has a * in place of each part that is not ours.
inline testing::AssertionResult IsLike(const std::string& text, const std::string& pattern) {
    return fnmatch(pattern.c_str(), text.c_str(), FNM_NOESCAPE) == 0
               ? testing::AssertionSuccess()
               : testing::AssertionFailure() << text << "\nis not like\n"
                                             << pattern;
}

} // namespace kelm::test
