#pragma once

#include <cstddef>
#include <cstdint>
#include <cstring>
#include <vector>

/// What every target is: one input. A broken promise ends the process.
extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size);

namespace fuzz {

/// Ends the process at a promise that does not hold, in every build.
inline void Require(bool holds) {
    if (!holds)
        __builtin_trap();
}

/// Takes values off an input; zeros once it is used up.
class Bytes {
  public:
    Bytes(const std::uint8_t* data, std::size_t size) : mpnNext(data), mpnEnd(data + size) {}

    bool IsEmpty() const { return mpnNext == mpnEnd; }
    const std::uint8_t* GetNext() const { return mpnNext; }
    std::size_t GetSize() const { return static_cast<std::size_t>(mpnEnd - mpnNext); }

    /// @return up to n bytes that stand at `from`, taken off
    std::size_t Skip(std::size_t n, const std::uint8_t*& from) {
        from = mpnNext;
        const std::size_t taken = n < GetSize() ? n : GetSize();
        mpnNext += taken;
        return taken;
    }

    template <typename T>
    T Take() {
        T value{};
        const std::uint8_t* from = nullptr;
        const std::size_t taken = Skip(sizeof value, from);
        if (taken > 0)
            std::memcpy(&value, from, taken);
        return value;
    }

    /// @return a number from low to high, by one byte
    unsigned TakeFrom(unsigned low, unsigned high) {
        return low + Take<std::uint8_t>() % (high - low + 1);
    }

  private:
    const std::uint8_t* mpnNext;
    const std::uint8_t* mpnEnd;
};

/// Makes coordinates that share corners, edges and lines, which raw bits never would: small whole
/// numbers, earlier coordinates, earlier ones moved by a little, and now and then raw bits.
template <typename T>
class Coordinates {
  public:
    Coordinates(Bytes& rBytes, T step) : mrBytes(rBytes), mStep(step) {}

    T Take() {
        const unsigned kind = mrBytes.TakeFrom(0, 7);
        T value;
        if (kind == 0)
            value = mrBytes.Take<T>();
        else if (kind <= 2 && !moEarlier.empty())
            value = moEarlier[mrBytes.Take<std::uint8_t>() % moEarlier.size()];
        else if (kind == 3 && !moEarlier.empty())
            value = moEarlier.back() + T(mrBytes.Take<std::int8_t>()) * mStep;
        else
            value = T(mrBytes.Take<std::int8_t>());
        moEarlier.push_back(value);
        return value;
    }

  private:
    Bytes& mrBytes;
    T mStep;
    std::vector<T> moEarlier;
};

} // namespace fuzz
