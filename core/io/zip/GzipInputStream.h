#pragma once

#include <boost/shared_ptr.hpp>
#include <vector>

#include "io/ByteArrayInputStream.h"

namespace IO {
namespace Zip {

// Inflates a whole zlib or gzip stream when constructed and then reads from memory. Input that
// is not compressed data comes through unchanged; a stream that fails to inflate is empty
// (available 0, reads -1). Not thread-safe: one thread uses the stream.
class GzipInputStream : public InputStream {
public:
    // Reads everything compressed has left; compressed is only borrowed during construction.
    explicit GzipInputStream(InputStream* compressed);

    void enableExceptions() override;
    long long available() override;
    int read(void* buffer, int length) override;
    long long tell() override;
    void seek(long long offset, KDfileSeekOrigin origin) override;

private:
    bool inflateAll(const std::vector<unsigned char>& input);

    std::vector<unsigned char> data;
    boost::shared_ptr<ByteArrayInputStream> inner;
};

}  // namespace Zip
}  // namespace IO
