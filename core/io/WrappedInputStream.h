#pragma once

#include <boost/shared_ptr.hpp>

#include "io/InputStream.h"

namespace IO {

// A read-only window of size bytes at offset of a shared inner stream. While it lives it owns
// the inner stream's position; when destroyed it puts that position back where it found it.
// Not thread-safe: one thread uses the window and its inner stream at a time.
class WrappedInputStream : public InputStream {
public:
    WrappedInputStream(boost::shared_ptr<InputStream> inner, long long offset, long long size);
    ~WrappedInputStream() override;

    long long available() override;
    // Never reads outside the window: asking for more than is left is a bad state (an exception
    // once exceptions are enabled) and delivers only what is left.
    int read(void* buffer, int length) override;
    long long tell() override;
    // Positions outside the window are clamped to its ends.
    void seek(long long offset, KDfileSeekOrigin origin) override;

protected:
    boost::shared_ptr<InputStream> inner;

private:
    long long offset;
    long long size;
    long long position = 0;
    long long innerPositionBefore;
};

}  // namespace IO
