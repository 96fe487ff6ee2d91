#include "services/bundled/store/features/geometrybytes.h"

#include <cstdint>
#include <cstring>

namespace kelm::store {

namespace {

// The header: "GP", the version, the flags, and the number of the CRS.
constexpr std::size_t HEADER = 8;
constexpr std::size_t FLAGS = 3;
constexpr unsigned NOT_PLAIN = 0xF0; ///< an empty geometry, an extended type, reserved bits

// Well-known binary: the byte order, the type, the number of rings, the number of points.
constexpr std::size_t PREFIX = 13;
constexpr unsigned char LITTLE_ENDIAN_ORDER = 1;
constexpr std::uint32_t POLYGON = 3;
constexpr std::uint32_t POLYGON_Z = 1003;
constexpr std::uint32_t POLYGON_25D = 0x80000003U;

constexpr bool IS_LITTLE_ENDIAN = __BYTE_ORDER__ == __ORDER_LITTLE_ENDIAN__;

template <typename T>
T Get(const unsigned char* bytes) {
    T value;
    std::memcpy(&value, bytes, sizeof value);
    return value;
}

/// @return bytes of the envelope behind the header
std::size_t GetEnvelopeSize(unsigned flags) {
    constexpr std::array<std::size_t, 8> SIZES{0, 32, 48, 48, 64, 0, 0, 0};
    return SIZES[(flags >> 1U) & 7U];
}

bool IsPlainHeader(const unsigned char* bytes, std::size_t size) {
    if (size < HEADER || std::memcmp(bytes, "GP", 3) != 0) // with the version, 0
        return false;
    constexpr unsigned ENVELOPES = 5; // codes beyond are invalid
    return (bytes[FLAGS] & NOT_PLAIN) == 0 && ((bytes[FLAGS] >> 1U) & 7U) < ENVELOPES;
}

bool IsRingOfFour(const unsigned char* wkb) {
    return wkb[0] == LITTLE_ENDIAN_ORDER && Get<std::uint32_t>(wkb + 5) == 1 &&
           Get<std::uint32_t>(wkb + 9) == 4;
}

} // namespace

bool ReadTriangleBytes(const unsigned char* bytes, std::size_t size,
                       std::array<ZARVertex, 4>& vertices, bool& flat) {
    if (!IS_LITTLE_ENDIAN || !IsPlainHeader(bytes, size))
        return false;
    const std::size_t start = HEADER + GetEnvelopeSize(bytes[FLAGS]);
    if (size < start + PREFIX || !IsRingOfFour(bytes + start))
        return false;
    const auto type = Get<std::uint32_t>(bytes + start + 1);
    flat = type == POLYGON;
    if (!flat && type != POLYGON_Z && type != POLYGON_25D)
        return false;
    const std::size_t stride = flat ? 2 * sizeof(double) : 3 * sizeof(double);
    if (size != start + PREFIX + vertices.size() * stride)
        return false;
    const unsigned char* point = bytes + start + PREFIX;
    for (ZARVertex& vertex : vertices) {
        vertex = {};
        std::memcpy(&vertex, point, stride);
        point += stride;
    }
    return true;
}

} // namespace kelm::store
