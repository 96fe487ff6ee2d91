#include "services/reporting.h"

#include <cpl_error.h>

#include <cstdarg>
#include <cstdio>
#include <stdexcept>

namespace {

/// Ends a list of arguments that va_copy or va_start began, also when an allocation throws.
struct ArgumentEnd {
    va_list& moArguments;
    ~ArgumentEnd() { va_end(moArguments); }
};

} // namespace

std::string FormatString(const char* pszFormat, ...) {
    va_list arguments;
    va_start(arguments, pszFormat);
    const ArgumentEnd end{arguments};
    va_list measured;
    va_copy(measured, arguments);
    const int length = std::vsnprintf(nullptr, 0, pszFormat, measured);
    va_end(measured);
    if (length < 0)
        throw std::length_error("FormatString: the text is too long or not convertible");
    std::string text(static_cast<std::size_t>(length), '\0');
    std::vsnprintf(text.data(), text.size() + 1, pszFormat, arguments);
    return text;
}

namespace kelm::tellus {

// Both go to the handlers that a host has set for GDAL. GDAL 3.6 cuts a warning at about a million
// characters and a note at 25,000. A text may hold percent signs, so it is never the format.

void Warning::Warn(const std::string& text, const char* sourcePath, unsigned line) {
    // The last error stays that of the host.
    const CPLErrorStateBackuper state;
    CPLError(CE_Warning, CPLE_AppDefined, "%s (%s:%u)", text.c_str(), sourcePath, line);
}

void Report::AddInfo(const std::string& text) {
    CPLDebug("TIN", "%s", text.c_str());
}

} // namespace kelm::tellus
