#pragma once

#include <boost/shared_ptr.hpp>
#include <vector>

#include "io/InputStream.h"
#include "util/callback.h"

namespace IO {
namespace Resource {

// Reads a resource split into blocks of blockSize bytes (the last holds the rest) as one
// stream. A block is opened, through openBlock, only when first read and kept open afterwards.
// Not thread-safe: one thread uses the stream.
class BlockInputStream : public InputStream {
public:
    typedef callback<boost::shared_ptr<InputStream> (*)(unsigned int)> BlockOpener;

    BlockInputStream(BlockOpener openBlock, unsigned int totalSize, unsigned int blockSize);

    long long available() override;
    // Crosses block boundaries. Asking for more than is left is a caller error: only what is
    // left is delivered, and no block past the last is touched.
    int read(void* buffer, int length) override;
    long long tell() override;
    // Opens nothing; positions outside the resource are clamped to its ends.
    void seek(long long offset, KDfileSeekOrigin origin) override;

private:
    // Reads from the block that holds position, opening it when needed; 0 when it fails.
    int readFromBlock(unsigned char* buffer, unsigned int length);

    std::vector<boost::shared_ptr<InputStream> > blocks;
    unsigned int position = 0;
    BlockOpener openBlock;
    unsigned int totalSize;
    unsigned int blockSize;
};

}  // namespace Resource
}  // namespace IO
