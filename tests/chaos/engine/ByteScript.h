#pragma once

#include <cstddef>
#include <cstdint>
#include <vector>

// The scenario's source of choices: reads opcodes and arguments from a byte
// string. Past its end every read gives 0, so any input, even an empty one,
// is a complete scenario. A fixed seed expands into bytes for the suite's
// runs; the fuzzer hands its inputs over as they are.
class ByteScript {
public:
    ByteScript(const std::uint8_t* data, std::size_t size) : data(data), size(size), position(0) {}

    // size bytes from a seed, the same on every platform and compiler.
    static std::vector<std::uint8_t> expandSeed(std::uint64_t seed, std::size_t size);

    bool exhausted() const { return position >= size; }
    std::uint8_t nextByte();
    // A value in [0, count); 0 when count is 0.
    int pick(int count);
    // True in about one of `oneIn` reads.
    bool chance(int oneIn) { return pick(oneIn) == 0; }

private:
    const std::uint8_t* data;
    std::size_t size;
    std::size_t position;
};
