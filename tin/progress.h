#pragma once

#include "services/exception.h"
#include "tin/tinexport.h"

#include <string>

namespace kelm::tin {

/// Tells a host how far a long operation is, in the convention of GDAL (`GDALProgressFunc`), so
/// that a host can pass a function of GDAL's.
/// @param done share of the work that is done, from 0 to 1; never falls within one operation
/// @param message what is being done, or null @param data what the host has set
/// @return 0 to stop the operation
using ProgressFunction = int (*)(double done, const char* message, void* data);

/// A progress function and its data. A plain value; a null function is never called.
///
/// The function is called on the thread that started the operation, some hundred times at most. It
/// may throw: its exception passes through the operation, which then behaves as if stopped.
struct KELM_TIN_EXPORT Progress {
    ProgressFunction function = nullptr;
    void* data = nullptr;

    /// Calls the function. @throw CancelledException if it asks to stop; what the function throws
    void Report(double done, const char* message) const;
};

/// A progress function has stopped an operation. The operation has released what it made, and the
/// objects that it was asked of are as they were.
class KELM_TIN_EXPORT CancelledException : public Exception {
  public:
    using Exception::Exception;
    CancelledException(const CancelledException&) = default;
    CancelledException& operator=(const CancelledException&) = default;
    ~CancelledException() override;
};

} // namespace kelm::tin
