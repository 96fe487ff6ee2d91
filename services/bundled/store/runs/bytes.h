#pragma once

#include <cstdint>
#include <cstring>
#include <string>
#include <string_view>
#include <type_traits>
#include <vector>

namespace kelm::store {

/// Writes plain values one behind the other, in the byte order of this machine.
class ByteWriter {
  public:
    template <typename Value>
    void Put(const Value& value) {
        static_assert(std::is_arithmetic_v<Value>);
        moBytes.append(reinterpret_cast<const char*>(&value), sizeof value);
    }
    void Put(const std::string& text) {
        Put(static_cast<std::uint64_t>(text.size()));
        moBytes += text;
    }
    void Put(const std::vector<bool>& bits);
    const std::string& GetBytes() const { return moBytes; }

  private:
    std::string moBytes;
};

/// Reads what a ByteWriter wrote. Behind the end of the bytes, and for a length that they cannot
/// hold, it gives zeros and HasFailed tells.
class ByteReader {
  public:
    /// @param bytes must outlive the reader
    explicit ByteReader(std::string_view bytes) : moBytes(bytes) {}

    template <typename Value>
    Value Get() {
        static_assert(std::is_arithmetic_v<Value>);
        Value value{};
        if (Has(sizeof value)) {
            std::memcpy(&value, moBytes.data() + mnNext, sizeof value);
            mnNext += sizeof value;
        }
        return value;
    }
    /// @return the number of items that follow. @param bytes the least that one takes
    std::size_t GetCount(std::size_t bytes);
    /// @return a text, which stands in the bytes
    std::string_view GetText();
    std::vector<bool> GetBits();

    /// @return true if more was asked for than there is
    bool HasFailed() const { return mbFailed; }
    bool IsAtEnd() const { return mnNext == moBytes.size(); }

  private:
    bool Has(std::size_t count);

    std::string_view moBytes;
    std::size_t mnNext = 0;
    bool mbFailed = false;
};

/// @return a number that any change of a byte changes (FNV-1a of 64 bits, by words of eight bytes
/// and then by bytes). It guards against accidents, not against intent
std::uint64_t ComputeChecksum(std::string_view bytes);

} // namespace kelm::store
