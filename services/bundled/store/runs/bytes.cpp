#include "services/bundled/store/runs/bytes.h"

namespace kelm::store {

void ByteWriter::Put(const std::vector<bool>& bits) {
    Put(static_cast<std::uint64_t>(bits.size()));
    for (std::size_t i = 0; i < bits.size(); i += 8) {
        unsigned byte = 0;
        for (std::size_t k = 0; k < 8 && i + k < bits.size(); ++k)
            byte |= static_cast<unsigned>(bits[i + k]) << k;
        Put(static_cast<unsigned char>(byte));
    }
}

bool ByteReader::Has(std::size_t count) {
    mbFailed = mbFailed || moBytes.size() - mnNext < count;
    return !mbFailed;
}

std::size_t ByteReader::GetCount(std::size_t bytes) {
    const auto count = Get<std::uint64_t>();
    mbFailed = mbFailed || count > (moBytes.size() - mnNext) / bytes;
    return mbFailed ? 0 : static_cast<std::size_t>(count);
}

std::string_view ByteReader::GetText() {
    const std::size_t size = GetCount(1);
    mnNext += size;
    return moBytes.substr(mnNext - size, size);
}

std::vector<bool> ByteReader::GetBits() {
    const auto count = Get<std::uint64_t>();
    mbFailed = mbFailed || count / 8 > moBytes.size() - mnNext;
    std::vector<bool> bits(mbFailed ? 0 : static_cast<std::size_t>(count));
    unsigned byte = 0;
    for (std::size_t i = 0; i < bits.size(); ++i, byte >>= 1U) {
        if (i % 8 == 0)
            byte = Get<unsigned char>();
        bits[i] = (byte & 1U) != 0;
    }
    return bits;
}

std::uint64_t ComputeChecksum(std::string_view bytes) {
    constexpr std::uint64_t PRIME = 0x100000001b3U;
    std::uint64_t sum = 0xcbf29ce484222325U;
    std::size_t next = 0;
    for (std::uint64_t word = 0; next + sizeof word <= bytes.size(); next += sizeof word) {
        std::memcpy(&word, bytes.data() + next, sizeof word);
        sum = (sum ^ word) * PRIME;
    }
    for (; next < bytes.size(); ++next)
        sum = (sum ^ static_cast<unsigned char>(bytes[next])) * PRIME;
    return sum;
}

} // namespace kelm::store
