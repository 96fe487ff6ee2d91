#pragma once

#include <stdlib.h>

#include <filesystem>
#include <fstream>
#include <stdexcept>
#include <string>

namespace kelm::test {

/// A folder that is removed with all that is in it when the object ends.
class TemporaryFolder {
  public:
    TemporaryFolder() {
        if (!mkdtemp(moPath.data()))
            throw std::runtime_error("cannot make a folder like " + moPath);
    }
    ~TemporaryFolder() {
        std::error_code oError;
        std::filesystem::remove_all(moPath, oError);
    }
    TemporaryFolder(TemporaryFolder&&) = delete;

    std::string GetPath(const std::string& name) const { return moPath + '/' + name; }
    /// Writes a file of this content. @return its path
    std::string WriteFile(const std::string& name, const std::string& content) const {
        std::ofstream(GetPath(name), std::ios::binary) << content;
        return GetPath(name);
    }

  private:
    std::string moPath = std::filesystem::temp_directory_path() / "kelm-tin-XXXXXX";
};

} // namespace kelm::test
