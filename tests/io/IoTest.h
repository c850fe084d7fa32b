#pragma once

#include <boost/shared_ptr.hpp>
#include <string>
#include <vector>

#include "io/InputStream.h"
#include "support/PalTest.h"

// PalTest plus the byte helpers the stream tests share.
class IoTest : public PalTest {
protected:
    typedef std::vector<unsigned char> Bytes;

    // Claims every assertion recorded so far; returns how many there were.
    int claimAssertions();

    // size bytes that differ from block to block, so a misplaced block shows.
    static Bytes pattern(size_t size, unsigned int seed = 1);
    static Bytes bytesOf(const std::string& text) { return Bytes(text.begin(), text.end()); }
    static Bytes slice(const Bytes& data, size_t at, size_t length) {
        return Bytes(data.begin() + at, data.begin() + at + length);
    }

    // Reads until the stream delivers nothing more.
    static Bytes readAll(IO::InputStream& stream);

    // Writes a platform file through the library's file stream.
    static void writeFile(const std::string& path, const Bytes& data);
};
