#pragma once

#include "services/bundled/store/gdal/confinement.h"
#include "services/bundled/store/gdal/warnings.h"

#include <cpl_error.h>

#include <string>
#include <utility>

namespace kelm::store {

/// A scope for calls into GDAL on this thread. While the object lives, it keeps GDAL's errors and
/// warnings, which are not printed, GDAL cannot fetch anything from a network, and the settings of
/// Confinement hold.
///
/// At its end the host has its handler, its callback, its settings and GDAL's last error back as
/// they were. Debug messages still reach the handler of the host. Objects nest like the scopes they
/// stand in. One costs some microseconds, so calls for features share one by the batch.
class GdalCall {
  public:
    /// @param rings see Confinement
    explicit GdalCall(const char* rings = "");
    ~GdalCall();
    GdalCall(const GdalCall&) = delete;
    GdalCall& operator=(const GdalCall&) = delete;

    /// @return true if GDAL has reported an error
    bool HasFailed() const { return mbFailed; }
    /// @return the errors, as one text for a message
    const std::string& GetFailures() const { return moFailures; }
    /// @return the errors as one text, which is empty only if there is none; the object forgets
    /// them
    std::string TakeFailures();
    /// @return the warnings; the object forgets them
    Warnings TakeWarnings() { return std::exchange(moWarnings, {}); }

    /// Keeps one message. Called by the error handler.
    void Add(bool failure, const char* text) noexcept;

  private:
    CPLErrorStateBackuper moState;
    Confinement moConfinement;
    bool mbFailed = false;
    std::string moFailures;
    Warnings moWarnings;
};

} // namespace kelm::store
