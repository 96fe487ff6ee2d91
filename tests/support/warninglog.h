#pragma once

#include <cpl_error.h>

#include <string>
#include <vector>

namespace kelm::test {

/// Keeps the warnings that this thread gives while the object lives, in place of printing them.
class WarningLog {
  public:
    WarningLog() { CPLPushErrorHandlerEx(Keep, this); }
    ~WarningLog() { CPLPopErrorHandler(); }
    WarningLog(const WarningLog&) = delete;
    WarningLog& operator=(const WarningLog&) = delete;

    const std::vector<std::string>& GetTexts() const { return moTexts; }

    /// @return the number of warnings that hold this text
    int Count(const std::string& part) const {
        int nCount = 0;
        for (const std::string& text : moTexts)
            nCount += text.find(part) != std::string::npos;
        return nCount;
    }

  private:
    static void CPL_STDCALL Keep(CPLErr eClass, CPLErrorNum, const char* pszText) {
        if (eClass != CE_Debug)
            static_cast<WarningLog*>(CPLGetErrorHandlerUserData())->moTexts.emplace_back(pszText);
    }

    std::vector<std::string> moTexts;
};

} // namespace kelm::test
