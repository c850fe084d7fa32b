#pragma once

#include <cstddef>
#include <vector>

namespace IO {

class InputStream;

// Reads what a stream has left into memory, growing the buffer with what actually arrives: a
// length the stream merely claims (a zip header, a split package's parts) never sizes an
// allocation. Any thread, on a stream it owns.
class BoundedReader {
public:
    enum Result { Complete, TooLong };

    // Appends everything the stream delivers to out. TooLong as soon as more than limit bytes
    // arrive; out then holds limit + 1 bytes and the stream is left part-read.
    static Result readAll(InputStream& stream, std::size_t limit, std::vector<char>& out);
    // Reads exactly length bytes into out; false (out cleared) when the stream ends first.
    static bool readExactly(InputStream& stream, std::size_t length, std::vector<char>& out);
};

}  // namespace IO
