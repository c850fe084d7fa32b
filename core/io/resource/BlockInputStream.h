#pragma once

#include <boost/shared_ptr.hpp>

#include "io/InputStream.h"
#include "util/callback.h"

namespace IO {
namespace Resource {

// Reads a resource split into blocks of blockSize bytes (the last holds the rest) as one
// stream. A block is opened, through openBlock, only when read, and only the block last read
// stays open. Not thread-safe: one thread uses the stream.
class BlockInputStream : public InputStream {
public:
    typedef callback<boost::shared_ptr<InputStream> (*)(unsigned int)> BlockOpener;

    BlockInputStream(BlockOpener openBlock, unsigned int totalSize, unsigned int blockSize);

    long long available() override;
    // Crosses block boundaries. Asking for more than is left, or a block that cannot be read, is
    // a bad state (an exception once exceptions are enabled): what could be read is delivered,
    // the rest of the buffer is zero, and no block past the last is touched.
    int read(void* buffer, int length) override;
    long long tell() override;
    // Opens nothing; positions outside the resource are clamped to its ends.
    void seek(long long offset, KDfileSeekOrigin origin) override;

private:
    // Reads from the block that holds position, opening it when needed; 0 when it fails.
    int readFromBlock(unsigned char* buffer, unsigned int length);

    boost::shared_ptr<InputStream> current;
    unsigned int currentIndex = 0;
    unsigned int position = 0;
    BlockOpener openBlock;
    unsigned int totalSize;
    unsigned int blockSize;
};

}  // namespace Resource
}  // namespace IO
