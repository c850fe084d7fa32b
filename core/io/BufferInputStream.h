#pragma once

#include <boost/scoped_array.hpp>

#include "io/ByteArrayInputStream.h"

namespace IO {

// A memory stream that owns its array (allocated with new[]) and releases it with the stream.
// Not thread-safe: one thread uses a stream at a time.
template <typename T>
class BufferInputStream : public ByteArrayInputStream {
public:
    // Takes ownership of count elements at buffer.
    BufferInputStream(T* buffer, int count)
        : ByteArrayInputStream(buffer, count * static_cast<int>(sizeof(T))), buffer(buffer) {}

private:
    boost::scoped_array<T> buffer;
};

}  // namespace IO
