#pragma once

#include <vector>

#include "io/OutputStream.h"

namespace IO {

// Collects everything written in one contiguous, growable byte vector.
// Not thread-safe: one thread uses a stream at a time.
class ByteArrayOutputStream : public OutputStream {
public:
    ByteArrayOutputStream();
    // Starts holding size zero bytes, which later writes follow.
    explicit ByteArrayOutputStream(unsigned int size);

    int write(const void* data, int length) override;

    const std::vector<unsigned char>& getData() const { return data; }

private:
    std::vector<unsigned char> data;
};

}  // namespace IO
