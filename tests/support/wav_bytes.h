// Bytes of numbers and of WAV files, put together one by one, and bytes of no meaning.
#pragma once

#include <cstdint>
#include <string>
#include <string_view>

inline std::string leBytes(std::uint64_t value, int count) {
    std::string bytes;
    for (int i = 0; i < count; ++i) bytes.push_back(static_cast<char>(value >> 8 * i & 255));
    return bytes;
}

inline std::uint64_t leNumber(std::string_view bytes, std::size_t at, int count) {
    std::uint64_t value = 0;
    while (count-- > 0)
        value = value << 8 | static_cast<unsigned char>(bytes.at(at + static_cast<std::size_t>(count)));
    return value;
}

inline std::string wavChunk(std::string_view id, std::string_view contents) {
    std::string chunk = std::string(id) + leBytes(contents.size(), 4) + std::string(contents);
    if (contents.size() % 2) chunk.push_back(0);
    return chunk;
}

// The 16 bytes of a plain format.
inline std::string wavFormat(unsigned tag, unsigned channels, unsigned rate, unsigned bits) {
    const unsigned align = channels * ((bits + 7) / 8);
    return leBytes(tag, 2) + leBytes(channels, 2) + leBytes(rate, 4) + leBytes(rate * align, 4) +
           leBytes(align, 2) + leBytes(bits, 2);
}

// The 40 bytes of an extensible format with that sub-format.
inline std::string wavExtensible(unsigned subFormat, unsigned channels, unsigned rate, unsigned bits,
                                 unsigned mask) {
    return wavFormat(0xFFFE, channels, rate, bits) + leBytes(22, 2) + leBytes(bits, 2) + leBytes(mask, 4) +
           leBytes(subFormat, 2) + std::string("\0\0\0\0\x10\0\x80\0\0\xAA\0\x38\x9B\x71", 14);
}

inline std::string riff(std::string_view chunks, std::string_view id = "RIFF") {
    return std::string(id) + leBytes(chunks.size() + 4, 4) + "WAVE" + std::string(chunks);
}

// Bytes that differ from place to place and from seed to seed.
inline void fillBytes(unsigned char* to, std::size_t count, unsigned seed) {
    std::uint32_t value = seed * 2654435761u + 1;
    for (std::size_t i = 0; i < count; ++i) {
        value = value * 1664525u + 1013904223u;
        to[i] = static_cast<unsigned char>(value >> 24);
    }
}
inline std::string patternBytes(std::size_t count, unsigned seed = 1) {
    std::string bytes(count, 0);
    fillBytes(reinterpret_cast<unsigned char*>(bytes.data()), count, seed);
    return bytes;
}
