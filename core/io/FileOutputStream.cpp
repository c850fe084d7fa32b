#include "io/FileOutputStream.h"

#include <KD/kdext.h>

#include <string>

namespace IO {

FileOutputStream::FileOutputStream() {}

FileOutputStream::~FileOutputStream() {
    if (file) {
        kdFclose(file);
    }
}

bool FileOutputStream::init(const char* path) {
    KD_ASSERT(!file);
    std::string fullPath(path);
    std::string::size_type lastSlash = fullPath.rfind('/');
    if (lastSlash != std::string::npos) {
        kdMkdirAllZVR(fullPath.substr(0, lastSlash + 1).c_str());
    }
    file = kdFopen(path, "wb");
    return file != nullptr;
}

int FileOutputStream::write(const void* data, int length) {
    if (length <= 0) {
        KD_ASSERT(length >= 0);
        return 0;
    }
    return static_cast<int>(kdFwrite(data, 1, length, file));
}

}  // namespace IO
