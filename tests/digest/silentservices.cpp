#include "services/reporting.h"

#include <cstdarg>
#include <cstdio>

// Surfaces from arrays and their index ask the services for no more than this.

std::string FormatString(const char* pszFormat, ...) {
    char buffer[512];
    va_list args;
    va_start(args, pszFormat);
    std::vsnprintf(buffer, sizeof buffer, pszFormat, args);
    va_end(args);
    return buffer;
}

namespace kelm::tellus {

void Warning::Warn(const std::string&, const char*, unsigned) {}
void Report::AddInfo(const std::string&) {}

} // namespace kelm::tellus
