#pragma once

#include <boost/shared_ptr.hpp>
#include <vector>

#include "io/ByteArrayInputStream.h"

namespace IO {
namespace Zip {

// Inflates a whole zlib or gzip stream when constructed and then reads from memory. Input without
// a gzip or zlib header comes through unchanged, and so does text that only happens to begin like
// a zlib header and does not inflate; damaged, truncated or oversized compressed data
// leaves the stream empty (available 0, reads -1, or IO::Exception once exceptions are enabled),
// with the error logged. Not thread-safe: one thread uses the stream.
class GzipInputStream : public InputStream {
public:
    // The largest content inflated. What we gunzip (server answers, settings files, statistics)
    // is a few MB at most; a hostile stream that inflates further stops here instead of taking
    // the device's memory.
    static const int kMaxInflatedSize = 64 << 20;

    // Reads everything compressed has left; compressed is only borrowed during construction.
    explicit GzipInputStream(InputStream* compressed);

    void enableExceptions() override;
    long long available() override;
    int read(void* buffer, int length) override;
    long long tell() override;
    void seek(long long offset, KDfileSeekOrigin origin) override;

private:
    // Z_STREAM_END with the content in data, else the reason inflating stopped.
    int inflateAll(const std::vector<unsigned char>& input);
    // Logs why inflating stopped and drops any partial content.
    void fail(int result);

    std::vector<unsigned char> data;
    boost::shared_ptr<ByteArrayInputStream> inner;
};

}  // namespace Zip
}  // namespace IO
