#pragma once

#include <cpl_error.h>

#include <string>
#include <vector>

namespace kelm::python {

/// Takes the warnings that the libraries below tell on this thread, from construction to Take, in
/// place of whatever handler the process has: Python's own filters decide what becomes of them.
/// Notes and failures pass by; a failure comes as an exception as well.
class Messages {
  public:
    Messages() { CPLPushErrorHandlerEx(&Messages::Add, this); }
    Messages(const Messages&) = delete;
    Messages& operator=(const Messages&) = delete;
    ~Messages() { CPLPopErrorHandler(); }

    std::vector<std::string> Take() { return std::move(moTexts); }

  private:
    static void CPL_STDCALL Add(CPLErr kind, CPLErrorNum, const char* text) {
        if (kind == CE_Warning)
            static_cast<Messages*>(CPLGetErrorHandlerUserData())->moTexts.emplace_back(text);
    }

    std::vector<std::string> moTexts;
};

} // namespace kelm::python
