#pragma once

#include <cstdint>
#include <map>
#include <string>
#include <utility>

namespace kelm::store {

/// Texts of warnings, each with the number of times that it was given: drivers can warn of every
/// facet in the same words.
using Warnings = std::map<std::string, std::int64_t>;

/// Adds a warning, up to a thousand texts; the others are counted together.
void AddWarning(Warnings& oWarnings, const std::string& text, std::int64_t nTimes);

/// One call into GDAL on this thread, for the time that the object lives: what GDAL says is kept
/// here and not printed, and GDAL cannot fetch anything from a network.
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

    /// Keeps one message. Called by the handler.
    void Add(bool bFailure, const char* pszText) noexcept;

  private:
    bool mbFailed = false;
    std::string moFailures;
    Warnings moWarnings;
};

/// Hands warnings of GDAL on to the reporting. @param subject what was being read. Called behind
/// the scope of the call, which would catch them again.
void PassOn(const Warnings& oWarnings, const std::string& subject);

} // namespace kelm::store
