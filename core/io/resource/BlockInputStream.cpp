#include "io/resource/BlockInputStream.h"

#include <algorithm>
#include <cstring>

namespace IO {
namespace Resource {

BlockInputStream::BlockInputStream(BlockOpener openBlock, unsigned int totalSize, unsigned int blockSize)
    : openBlock(openBlock), totalSize(totalSize), blockSize(blockSize) {
    KD_ASSERT(blockSize > 0);
}

long long BlockInputStream::available() {
    return static_cast<long long>(totalSize) - position;
}

int BlockInputStream::read(void* buffer, int length) {
    if (length < 1) {
        return 0;
    }
    unsigned int wanted = static_cast<unsigned int>(std::min<long long>(length, available()));
    unsigned char* out = static_cast<unsigned char*>(buffer);
    unsigned int total = 0;
    while (total < wanted) {
        int count = readFromBlock(out + total, wanted - total);
        if (count <= 0) {
            break;
        }
        position += count;
        total += count;
    }
    if (total < static_cast<unsigned int>(length)) {
        // Past the end, or a block that cannot be read: the rest of the buffer is zero.
        std::memset(out + total, 0, length - total);
        handleBadState();
    }
    return static_cast<int>(total);
}

int BlockInputStream::readFromBlock(unsigned char* buffer, unsigned int length) {
    if (blockSize == 0) {
        return 0;
    }
    unsigned int index = position / blockSize;
    unsigned int offset = position % blockSize;
    // Only the block being read stays open: a sequential read of a large resource holds one
    // block, not every block it passed.
    if (!current || currentIndex != index) {
        current.reset();
        current = openBlock(index);
        currentIndex = index;
        if (!current) {
            return 0;
        }
    }
    current->seek(offset, KD_SEEK_SET);
    // A block longer than the block size must not lend its extra bytes to the next block's
    // positions.
    long long n =
        std::min<long long>({current->available(), static_cast<long long>(blockSize - offset), length});
    if (n <= 0) {
        return 0;
    }
    return current->read(buffer, static_cast<int>(n));
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
