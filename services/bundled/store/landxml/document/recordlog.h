#pragma once

#include <cstdint>
#include <string>
#include <utility>

namespace kelm::store::landxml {

/// Warns of the damaged records of a surface. The first hundred are named; the others are counted.
class RecordLog {
  public:
    /// @param subject the surface, for the texts
    explicit RecordLog(std::string subject) : moSubject(std::move(subject)) {}

    /// Warns of a record. @param kind what it is, "face" @param number its number
    /// @param line of the file @param fault why it is left out
    void Add(const char* kind, std::int64_t number, std::uint64_t line, const std::string& fault);
    /// Tells how many records Add has not named.
    void Finish();

    const std::string& GetSubject() const { return moSubject; }

  private:
    std::string moSubject;
    std::int64_t mnRecords = 0;
};

} // namespace kelm::store::landxml
