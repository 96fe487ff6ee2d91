#include "services/bundled/store/files/shapefileparts.h"

#include "services/bundled/store/files/vsifile.h"
#include "services/reporting.h"

#include <cpl_conv.h>
#include <gdal_priv.h>
#include <ogrsf_frmts.h>

#include <algorithm>
#include <cstdint>

namespace kelm::store {

namespace {

constexpr std::uint64_t HEADER = 100;
/// In front of the content of a record: its number and its length.
constexpr std::uint64_t RECORD_HEADER = 8;

/// A part of a Shapefile, read at any place.
class Part {
  public:
    explicit Part(const std::string& name) : moFile(OpenVsiFile(name)) {
        if (moFile && VSIFSeekL(moFile.get(), 0, SEEK_END) == 0)
            mnSize = VSIFTellL(moFile.get());
    }

    std::uint64_t GetSize() const { return mnSize; }
    /// @return false if the file has no so many bytes there
    bool Read(std::uint64_t at, unsigned char* bytes, std::size_t count) const {
        return moFile && VSIFSeekL(moFile.get(), at, SEEK_SET) == 0 &&
               VSIFReadL(bytes, 1, count, moFile.get()) == count;
    }
    /// @return a number of four bytes, 0 behind the end
    std::uint32_t ReadBig(std::uint64_t at) const {
        unsigned char b[4] = {};
        return Read(at, b, 4) ? Join(b[0], b[1], b[2], b[3]) : 0;
    }
    std::uint32_t ReadLittle(std::uint64_t at) const {
        unsigned char b[4] = {};
        return Read(at, b, 4) ? Join(b[3], b[2], b[1], b[0]) : 0;
    }
    static std::uint32_t Join(unsigned a, unsigned b, unsigned c, unsigned d) {
        return a << 24U | b << 16U | c << 8U | d;
    }

  private:
    VsiFile moFile;
    std::uint64_t mnSize = 0;
};

/// Offsets and lengths are stored in words of two bytes.
std::uint64_t CountRecords(const Part& index) {
    const std::uint64_t size = std::min<std::uint64_t>(2ULL * index.ReadBig(24), index.GetSize());
    return size < HEADER ? 0 : (size - HEADER) / 8;
}

/// @return the end of the record that lies last in the file, of those that the index lists
std::uint64_t FindEnd(const Part& index, std::uint64_t records) {
    std::uint64_t end = HEADER;
    unsigned char block[8 * 1024];
    for (std::uint64_t first = 0; first < records; first += 1024) {
        const std::uint64_t count = std::min<std::uint64_t>(records - first, 1024);
        if (!index.Read(HEADER + 8 * first, block, 8 * count))
            return end;
        for (const unsigned char* b = block; b < block + 8 * count; b += 8)
            end = std::max<std::uint64_t>(end, 2ULL * Part::Join(b[0], b[1], b[2], b[3]) +
                                                   RECORD_HEADER +
                                                   2ULL * Part::Join(b[4], b[5], b[6], b[7]));
    }
    return end;
}

/// Bytes that are no record may follow: a record that was written again may have become shorter.
bool IsRecord(const Part& shapes, std::uint64_t at) {
    const std::uint64_t content = at + RECORD_HEADER;
    const std::uint64_t length = 2ULL * shapes.ReadBig(at + 4);
    const std::uint32_t type = shapes.ReadLittle(content);
    return length >= 4 && content + length <= shapes.GetSize() &&
           (type == 0 || type == shapes.ReadLittle(32));
}

std::string TestIndex(const Part& shapes, const Part& index) {
    const std::uint64_t records = CountRecords(index);
    const std::uint64_t end = FindEnd(index, records);
    if (end > shapes.GetSize())
        return FormatString("the .shp ends early: by its index it should have %llu bytes",
                            static_cast<unsigned long long>(end));
    if (IsRecord(shapes, end))
        return FormatString("the .shx lists %llu records, but the .shp goes on behind them",
                            static_cast<unsigned long long>(records));
    return {};
}

std::string TestTable(const Part& table, const Part& index) {
    const std::uint64_t records = CountRecords(index);
    const std::uint32_t rows = table.ReadLittle(4);
    if (rows >= records)
        return {};
    return FormatString("the .dbf has %u rows for the %llu records of the .shp", rows,
                        static_cast<unsigned long long>(records));
}

/// @return the first of the files with this ending, or empty
std::string FindFile(const CPLStringList& files, const char* ending) {
    for (int i = 0; i < files.size(); ++i)
        if (EQUAL(CPLGetExtension(files[i]), ending))
            return files[i];
    return {};
}

} // namespace

std::string FindShapefileFault(GDALDataset& handle) {
    const CPLStringList files(handle.GetFileList(), TRUE);
    const std::string shapes = FindFile(files, "shp");
    const std::string index = FindFile(files, "shx");
    const std::string table = FindFile(files, "dbf");
    if (shapes.empty() || index.empty())
        return {};
    const Part listed(index);
    std::string fault = TestIndex(Part(shapes), listed);
    if (fault.empty() && !table.empty())
        fault = TestTable(Part(table), listed);
    return fault;
}

bool HasUnreadCrs(GDALDataset& handle) {
    OGRLayer* const layer = handle.GetLayer(0);
    if (!layer || layer->GetSpatialRef())
        return false;
    const std::string shapes = FindFile(CPLStringList(handle.GetFileList(), TRUE), "shp");
    return OpenVsiFile(CPLResetExtension(shapes.c_str(), "prj")) != nullptr;
}

} // namespace kelm::store
