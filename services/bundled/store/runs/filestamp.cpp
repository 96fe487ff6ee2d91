#include "services/bundled/store/runs/filestamp.h"

#include <cpl_conv.h>
#include <cpl_vsi.h>

#include <algorithm>
#include <tuple>

namespace kelm::store {

FileStamp::FileStamp(const std::vector<std::string>& files) {
    for (const std::string& file : files)
        for (const char* ending : {"", "-wal", "-journal"})
            Add(file + ending);
    std::sort(moParts.begin(), moParts.end(),
              [](const Part& a, const Part& b) { return a.moName < b.moName; });
}

/// An empty journal says as much as none.
void FileStamp::Add(const std::string& path) {
    VSIStatBufL found{};
    if (VSIStatL(path.c_str(), &found) != 0 || found.st_size == 0)
        return;
    moParts.push_back({CPLGetFilename(path.c_str()), static_cast<std::int64_t>(found.st_size),
                       found.st_mtim.tv_sec, found.st_mtim.tv_nsec});
}

bool FileStamp::operator==(const FileStamp& other) const {
    const auto tie = [](const Part& part) {
        return std::tie(part.moName, part.mnBytes, part.mnSeconds, part.mnNanoseconds);
    };
    return std::equal(moParts.begin(), moParts.end(), other.moParts.begin(), other.moParts.end(),
                      [&](const Part& a, const Part& b) { return tie(a) == tie(b); });
}

void FileStamp::Write(ByteWriter& bytes) const {
    bytes.Put(static_cast<std::uint64_t>(moParts.size()));
    for (const Part& part : moParts) {
        bytes.Put(part.moName);
        bytes.Put(part.mnBytes);
        bytes.Put(part.mnSeconds);
        bytes.Put(part.mnNanoseconds);
    }
}

void FileStamp::Read(ByteReader& bytes) {
    moParts.resize(bytes.GetCount(4 * sizeof(std::int64_t)));
    for (Part& part : moParts) {
        part.moName = bytes.GetText();
        part.mnBytes = bytes.Get<std::int64_t>();
        part.mnSeconds = bytes.Get<std::int64_t>();
        part.mnNanoseconds = bytes.Get<std::int64_t>();
    }
}

} // namespace kelm::store
