#include "ByteScript.h"

std::vector<std::uint8_t> ByteScript::expandSeed(std::uint64_t seed, std::size_t size) {
    // SplitMix64: small, fully specified and good enough to spread a seed.
    std::vector<std::uint8_t> bytes;
    bytes.reserve(size);
    std::uint64_t state = seed;
    while (bytes.size() < size) {
        state += 0x9E3779B97F4A7C15ull;
        std::uint64_t value = state;
        value = (value ^ (value >> 30)) * 0xBF58476D1CE4E5B9ull;
        value = (value ^ (value >> 27)) * 0x94D049BB133111EBull;
        value ^= value >> 31;
        for (int i = 0; i < 8 && bytes.size() < size; ++i) {
            bytes.push_back(static_cast<std::uint8_t>(value >> (8 * i)));
        }
    }
    return bytes;
}

std::uint8_t ByteScript::nextByte() {
    if (position >= size) {
        return 0;
    }
    return data[position++];
}

int ByteScript::pick(int count) {
    if (count <= 0) {
        return 0;
    }
    return nextByte() % count;
}
