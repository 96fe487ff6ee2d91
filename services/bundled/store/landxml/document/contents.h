#pragma once

#include <set>
#include <string>
#include <string_view>
#include <vector>

namespace kelm::store::landxml {

/// What a document holds besides TIN surfaces, for messages.
class Contents {
  public:
    /// @param file name for messages, outlives the object
    explicit Contents(const std::string& file) : moFile(file) {}

    /// Takes note of a surface that cannot be read. @param kind "of type grid"
    void AddSurface(const std::string& name, const std::string& kind);
    /// Takes note of an element of the root that holds no surfaces.
    void AddElement(std::string_view name);
    /// Warns of the surfaces that cannot be read. @param usable true if there are others
    /// @throw kelm::DataException if there are none, telling what was found
    void Test(bool usable) const;

  private:
    std::string GetText() const;

    const std::string& moFile;
    std::vector<std::string> moSurfaces;
    std::set<std::string, std::less<>> moElements;
};

} // namespace kelm::store::landxml
