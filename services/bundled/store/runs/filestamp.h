#pragma once

#include "services/bundled/store/runs/bytes.h"

#include <cstdint>
#include <string>
#include <vector>

namespace kelm::store {

/// Name without folders, size and time of the last change of each file that an open file consists
/// of. Equal stamps mean that nobody has written to it.
class FileStamp {
  public:
    FileStamp() = default;
    /// @param files paths as GDAL understands them. The journals of a database count too
    explicit FileStamp(const std::vector<std::string>& files);

    bool operator==(const FileStamp& other) const;
    bool operator!=(const FileStamp& other) const { return !(*this == other); }

    void Write(ByteWriter& bytes) const;
    void Read(ByteReader& bytes);

  private:
    struct Part {
        std::string moName;
        std::int64_t mnBytes;
        std::int64_t mnSeconds;
        std::int64_t mnNanoseconds;
    };

    void Add(const std::string& path);

    std::vector<Part> moParts;
};

} // namespace kelm::store
