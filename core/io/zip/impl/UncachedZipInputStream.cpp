#include "io/zip/impl/UncachedZipInputStream.h"

#include "io/zip/ZipFile.h"

namespace IO {
namespace Zip {

UncachedZipInputStream::UncachedZipInputStream(boost::shared_ptr<ZipFile> file, const ZipEntry& entry)
    : file(file), entry(entry) {
    ++file->openStreams;
}

UncachedZipInputStream::~UncachedZipInputStream() {
    KD_ASSERT(unzCloseCurrentFile(file->file) == (0));
    --file->openStreams;
}

long long UncachedZipInputStream::available() {
    return entry.uncompressedSize - position;
}

int UncachedZipInputStream::read(void* buffer, int len) {
    KD_ASSERT(len >= 0);
    if (len <= 0) {
        return 0;
    }
    int count = unzReadCurrentFile(file->file, buffer, static_cast<unsigned>(len));
    if (count > 0) {
        position += count;
    }
    if (count < len) {
        handleBadState();
    }
    return count;
}

long long UncachedZipInputStream::tell() {
    return position;
}

void UncachedZipInputStream::seek(long long, KDfileSeekOrigin) {
    KD_ASSERT(false && "Unsupported");
}

}  // namespace Zip
}  // namespace IO
