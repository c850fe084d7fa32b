#include "io/ByteArrayInputStream.h"

#include <cstring>

namespace IO {

ByteArrayInputStream::ByteArrayInputStream(const void* data, int size)
    : data(static_cast<const unsigned char*>(data)), size(size < 0 ? 0 : size) {
    KD_ASSERT(size >= 0);
}

long long ByteArrayInputStream::available() {
    return size - position;
}

int ByteArrayInputStream::read(void* buffer, int length) {
    if (length <= 0) {
        KD_ASSERT(length >= 0);
        return 0;
    }
    if (available() < length) {
        std::memset(buffer, 0, length);
        handleBadState();
        return 0;
    }
    std::memcpy(buffer, data + position, length);
    position += length;
    return length;
}

long long ByteArrayInputStream::tell() {
    return position;
}

void ByteArrayInputStream::seek(long long offset, KDfileSeekOrigin origin) {
    long long target;
    switch (origin) {
        case KD_SEEK_SET:
            target = offset;
            break;
        case KD_SEEK_CUR:
            target = position + offset;
            break;
        case KD_SEEK_END:
            target = size + offset;
            break;
        default:
            KD_ASSERT(false);
            return;
    }
    if (target < 0) {
        target = 0;
    } else if (target > size) {
        target = size;
    }
    position = static_cast<int>(target);
}

}  // namespace IO
