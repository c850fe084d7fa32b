#include "io/WrappedInputStream.h"

#include <algorithm>
#include <cstring>

namespace IO {

WrappedInputStream::WrappedInputStream(boost::shared_ptr<InputStream> is, long long offset, long long size)
    : inner(is), offset(offset), size(size), innerPositionBefore(is->tell()) {
    inner->seek(offset, KD_SEEK_SET);
    KD_ASSERT(is->available() >= size);
    // The window never reaches past the inner stream, so the inner stream never sees a bad read
    // that this window's own exception setting should have decided.
    if (is->available() < size) {
        this->size = std::max(0LL, is->available());
    }
}

WrappedInputStream::~WrappedInputStream() {
    inner->seek(innerPositionBefore, KD_SEEK_SET);
}

long long WrappedInputStream::available() {
    return size - position;
}

int WrappedInputStream::read(void* buffer, int len) {
    if (len <= 0) {
        return 0;
    }
    if (len > available()) {
        // Delivers what is left; the rest of the buffer is zero.
        std::memset(buffer, 0, len);
        handleBadState();
        len = static_cast<int>(available());
    }
    // Others may move the shared inner stream between our reads (minizip inflating another
    // entry of the same archive, a second window), so it is put back in place first.
    if (inner->tell() != offset + position) {
        inner->seek(offset + position, KD_SEEK_SET);
    }
    int count = inner->read(buffer, len);
    if (count > 0) {
        position += count;
    }
    return count;
}

long long WrappedInputStream::tell() {
    return position;
}

void WrappedInputStream::seek(long long target, KDfileSeekOrigin origin) {
    switch (origin) {
        case KD_SEEK_SET:
            break;
        case KD_SEEK_CUR:
            target += position;
            break;
        case KD_SEEK_END:
            target += size;
            break;
        default:
            return;
    }
    if (target < 0) {
        target = 0;
    } else if (target > size) {
        target = size;
    }
    position = target;
    inner->seek(offset + position, KD_SEEK_SET);
}

}  // namespace IO
