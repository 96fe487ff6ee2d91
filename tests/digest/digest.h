#pragma once

#include <cstdint>
#include <cstring>
#include <string>
#include <vector>

/// Fowler-Noll-Vo hash, variant 1a, 64 bits, over little-endian numbers.
struct Digest {
    /// @param number one, or a struct of some without gaps
    template <typename T>
    void Add(const T& number) {
        unsigned char bytes[sizeof number];
        std::memcpy(bytes, &number, sizeof number);
        for (const unsigned char byte : bytes)
            value = (value ^ byte) * 1099511628211u;
    }
    void AddAnswer(bool found, float height) {
        Add(found);
        Add(height);
        hits += found ? 1 : 0;
        ++count;
    }
    template <typename T>
    void AddList(const std::vector<T>& list) {
        for (const T& number : list)
            Add(number);
        AddAnswer(!list.empty(), static_cast<float>(list.size()));
    }
    std::uint64_t value = 14695981039346656037u;
    unsigned count = 0;
    unsigned hits = 0;
};

/// Where the services write what they are told, a line each; null: nowhere.
struct Recording {
    static inline std::string* poTranscript = nullptr;
};

/// The answers to all queries but plain heights, over sheets of their own.
Digest AskEverything();
