#pragma once

#include "services/servicesexport.h"

#include <string>

/// Formats as printf does. The compiler checks the arguments against the format. Safe to call from
/// any thread. @return the text
/// @throw std::bad_alloc; std::length_error if the text is too long or cannot be converted
KELM_SERVICES_EXPORT std::string FormatString(const char* pszFormat, ...)
    __attribute__((format(printf, 1, 2)));

namespace kelm::tellus {

/// Warnings: something that a caller asked for was left out or is not as it should be.
class KELM_SERVICES_EXPORT Warning {
  public:
    /// Records a warning and returns. Safe to call from any thread.
    /// @param text       the text for a person
    /// @param sourcePath path of the source that warns, without its file extension
    /// @param line       line in that source
    static void Warn(const std::string& text, const char* sourcePath, unsigned line);
};

/// Notes on the course of the work.
class KELM_SERVICES_EXPORT Report {
  public:
    /// Records a note and returns. Safe to call from any thread.
    static void AddInfo(const std::string& text);
};

} // namespace kelm::tellus
