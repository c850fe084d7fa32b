#include "io/FileInputStream.h"

#include <cstring>

namespace IO {

FileInputStream::FileInputStream() {}

FileInputStream::~FileInputStream() {
    if (file) {
        kdFclose(file);
    }
}

bool FileInputStream::init(const char* path) {
    KD_ASSERT(!file);
    file = kdFopen(path, "rb");
    if (!file) {
        return false;
    }
    kdFseek(file, 0, KD_SEEK_END);
    size = kdFtell(file);
    kdFseek(file, 0, KD_SEEK_SET);
    return true;
}

long long FileInputStream::available() {
    return size - kdFtell(file);
}

int FileInputStream::read(void* buffer, int len) {
    KD_ASSERT(len >= 0);
    if (len <= 0) {
        return 0;
    }
    int count = static_cast<int>(kdFread(buffer, 1, len, file));
    if (count != len) {
        std::memset(buffer, 0, len);
        handleBadState();
    }
    return count;
}

long long FileInputStream::tell() {
    return kdFtell(file);
}

void FileInputStream::seek(long long offset, KDfileSeekOrigin origin) {
    kdFseek(file, offset, origin);
}

}  // namespace IO
