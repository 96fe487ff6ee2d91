#include "digest.h"

#include "services/reporting.h"

#include <cstdarg>
#include <cstdio>
#include <mutex>

// Surfaces from arrays and their index ask the services for no more than this.

static void Record(const std::string& line) {
    static std::mutex mutex;
    const std::lock_guard<std::mutex> lock(mutex);
    if (Recording::poTranscript != nullptr)
        *Recording::poTranscript += line + '\n';
}

std::string FormatString(const char* pszFormat, ...) {
    char buffer[512];
    va_list args;
    va_start(args, pszFormat);
    std::vsnprintf(buffer, sizeof buffer, pszFormat, args);
    va_end(args);
    return buffer;
}

namespace kelm::tellus {

void Warning::Warn(const std::string& text, const char* sourcePath, unsigned) {
    Record(text + " (" + sourcePath + ")");
}
void Report::AddInfo(const std::string& text) {
    Record("TIN: " + text);
}

} // namespace kelm::tellus
