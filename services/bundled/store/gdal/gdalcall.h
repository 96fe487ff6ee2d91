#pragma once

#include "services/bundled/store/gdal/warnings.h"

#include <string>
#include <utility>

namespace kelm::store {

/// A scope for calls into GDAL on this thread. While the object lives, it keeps GDAL's errors and
/// warnings, which are not printed, and GDAL cannot fetch anything from a network.
///
/// Debug messages still reach the handler of the host. Objects nest like the scopes they stand in.
class GdalCall {
  public:
    GdalCall();
    ~GdalCall();
    GdalCall(const GdalCall&) = delete;
    GdalCall& operator=(const GdalCall&) = delete;

    /// @return true if GDAL has reported an error
    bool HasFailed() const { return mbFailed; }
    /// @return the errors, as one text for a message
    const std::string& GetFailures() const { return moFailures; }
    /// @return the warnings; the object forgets them
    Warnings TakeWarnings() { return std::exchange(moWarnings, {}); }

    /// Keeps one message. Called by the error handler.
    void Add(bool failure, const char* text) noexcept;

  private:
    bool mbFailed = false;
    std::string moFailures;
    Warnings moWarnings;
};

} // namespace kelm::store
