#include "io/resource/BlockInputStream.h"

#include <algorithm>
#include <climits>

namespace IO {
namespace Resource {

BlockInputStream::BlockInputStream(BlockOpener openBlock, unsigned int totalSize, unsigned int blockSize)
    : openBlock(openBlock), totalSize(totalSize), blockSize(blockSize) {
    KD_ASSERT(blockSize > 0);
    if (blockSize > 0 && totalSize > 0) {
        blocks.resize((totalSize - 1) / blockSize + 1);
    }
}

long long BlockInputStream::available() {
    return static_cast<long long>(totalSize) - position;
}

int BlockInputStream::read(void* buffer, int length) {
    if (length < 1 || blocks.empty()) {
        return 0;
    }
    unsigned int remaining = static_cast<unsigned int>(std::min<long long>(length, available()));
    unsigned char* out = static_cast<unsigned char*>(buffer);
    unsigned int total = 0;
    while (total < remaining) {
        int count = readFromBlock(out + total, remaining - total);
        if (count <= 0) {
            break;
        }
        position += count;
        total += count;
    }
    return static_cast<int>(total);
}

int BlockInputStream::readFromBlock(unsigned char* buffer, unsigned int length) {
    unsigned int index = position / blockSize;
    unsigned int offset = position % blockSize;
    boost::shared_ptr<InputStream>& block = blocks[index];
    if (!block) {
        block = openBlock(index);
        if (!block) {
            return 0;
        }
    }
    block->seek(offset, KD_SEEK_SET);
    long long blockAvailable = block->available();
    KD_ASSERT(blockAvailable <= INT_MAX);
    // A block longer than the block size must not lend its extra bytes to the next block's
    // positions.
    long long n = std::min<long long>({blockAvailable, static_cast<long long>(blockSize - offset), length});
    KD_ASSERT(n > 0);
    if (n <= 0) {
        return 0;
    }
    int count = block->read(buffer, static_cast<int>(n));
    KD_ASSERT(count == n);
    return count;
}

long long BlockInputStream::tell() {
    return position;
}

void BlockInputStream::seek(long long offset, KDfileSeekOrigin origin) {
    switch (origin) {
        case KD_SEEK_SET:
            break;
        case KD_SEEK_CUR:
            offset += position;
            break;
        case KD_SEEK_END:
            offset += totalSize;
            break;
        default:
            return;
    }
    position = static_cast<unsigned int>(std::clamp<long long>(offset, 0, totalSize));
}

}  // namespace Resource
}  // namespace IO
