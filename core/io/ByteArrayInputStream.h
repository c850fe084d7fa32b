#pragma once

#include "io/InputStream.h"

namespace IO {

// Reads bytes it borrows: the caller keeps them alive for the stream's life.
// Not thread-safe: one thread uses a stream at a time.
class ByteArrayInputStream : public InputStream {
public:
    ByteArrayInputStream(const void* data, int size);

    long long available() override;
    // A request for more than is left zero-fills the buffer, reports a bad state and returns 0
    // without moving.
    int read(void* buffer, int length) override;
    long long tell() override;
    // Positions outside the data are clamped to its ends, so reads never leave the buffer.
    void seek(long long offset, KDfileSeekOrigin origin) override;

private:
    const unsigned char* data;
    int size;
    int position = 0;
};

}  // namespace IO
