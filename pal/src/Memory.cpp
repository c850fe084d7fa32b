// Heap and byte-block calls of the platform, on the C library.
#include <KD/kd.h>

#include <cstdlib>
#include <cstring>

void* kdMalloc(KDsize size) {
    void* block = std::malloc(size);
    if (block == nullptr && size != 0) {
        kdSetError(KD_ENOMEM);
    }
    return block;
}

void kdFree(void* ptr) {
    std::free(ptr);
}

void* kdRealloc(void* ptr, KDsize size) {
    void* block = std::realloc(ptr, size);
    if (block == nullptr && size != 0) {
        kdSetError(KD_ENOMEM);
    }
    return block;
}

void* kdMemcpy(void* buf, const void* src, KDsize len) {
    return std::memcpy(buf, src, len);
}

void* kdMemmove(void* buf, const void* src, KDsize len) {
    return std::memmove(buf, src, len);
}

void* kdMemset(void* buf, KDint byte, KDsize len) {
    return std::memset(buf, byte, len);
}

KDint kdMemcmp(const void* src1, const void* src2, KDsize len) {
    return std::memcmp(src1, src2, len);
}
