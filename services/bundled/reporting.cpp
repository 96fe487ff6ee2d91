#include "services/reporting.h"
#include "services/bundled/reportingrepeats.h"

#include <cpl_error.h>

#include <cstdarg>
#include <cstdint>
#include <cstdio>
#include <map>
#include <mutex>
#include <stdexcept>
#include <utility>

namespace {

/// Ends a list of arguments that va_copy or va_start began, also when an allocation throws.
struct ArgumentEnd {
    va_list& moArguments;
    ~ArgumentEnd() { va_end(moArguments); }
};

constexpr std::int64_t MOST_GIVEN = 100;

/// The warnings of one kind since the last call of TellLeftOut.
struct Repeats {
    std::int64_t mnAllowed = MOST_GIVEN;
    std::int64_t mnCount = 0;
    std::int64_t mnLeftOut = 0;
};

using Kind = std::pair<std::string, unsigned>; // path and line of the source

std::mutex& GetMutex() {
    static std::mutex& mutex = *new std::mutex; // a host may warn when static objects are gone
    return mutex;
}

/// Guarded by the mutex.
std::map<Kind, Repeats>& GetRepeats() {
    static auto& repeats = *new std::map<Kind, Repeats>;
    return repeats;
}

bool IsPowerOfTen(std::int64_t number) {
    while (number % 10 == 0)
        number /= 10;
    return number == 1;
}

/// @return the number of the warning since the last call of TellLeftOut; 0 if it is to be left out
std::int64_t Count(const Kind& kind) {
    const std::lock_guard<std::mutex> lock(GetMutex());
    Repeats& repeats = GetRepeats()[kind];
    ++repeats.mnCount;
    if (repeats.mnCount <= repeats.mnAllowed ||
        (repeats.mnCount > MOST_GIVEN && IsPowerOfTen(repeats.mnCount)))
        return repeats.mnCount;
    ++repeats.mnLeftOut;
    return 0;
}

/// A kind that was loud has to be brief when it is met next.
std::int64_t GetAllowed(const Repeats& last) {
    if (last.mnCount == 0)
        return last.mnAllowed;
    return last.mnCount > MOST_GIVEN ? 1 : MOST_GIVEN;
}

std::map<Kind, Repeats> TakeRepeats() {
    const std::lock_guard<std::mutex> lock(GetMutex());
    std::map<Kind, Repeats> taken = GetRepeats();
    for (auto& [kind, repeats] : GetRepeats())
        repeats = {GetAllowed(repeats), 0, 0};
    return taken;
}

const char* GetNote(std::int64_t number) {
    return number == MOST_GIVEN ? " (the hundredth of its kind; more are counted)" : "";
}

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
    const std::int64_t number = Count({sourcePath, line});
    if (number == 0)
        return;
    const CPLErrorStateBackuper state; // the last error stays that of the host
    CPLError(CE_Warning, CPLE_AppDefined, "%s%s (%s:%u)", text.c_str(), GetNote(number), sourcePath,
             line);
}

void TellLeftOut() noexcept try {
    const CPLErrorStateBackuper state;
    for (const auto& [kind, repeats] : TakeRepeats())
        if (repeats.mnLeftOut > 0)
            CPLError(CE_Warning, CPLE_AppDefined,
                     "Warnings of this kind that were left out: %lld of %lld (%s:%u)",
                     static_cast<long long>(repeats.mnLeftOut),
                     static_cast<long long>(repeats.mnCount), kind.first.c_str(), kind.second);
} catch (...) {
    // Memory has run out. The warnings were counted, and nobody depends on the count.
}

void Report::AddInfo(const std::string& text) {
    CPLDebug("TIN", "%s", text.c_str());
}

} // namespace kelm::tellus
