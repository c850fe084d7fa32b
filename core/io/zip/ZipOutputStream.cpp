#include "io/zip/ZipOutputStream.h"

#include <KD/kd.h>

#include <cstring>

namespace IO {
namespace Zip {

namespace {

ZipOutputStream* asZip(voidpf opaque) {
    return static_cast<ZipOutputStream*>(opaque);
}

}  // namespace

ZipOutputStream::ZipOutputStream(boost::shared_ptr<OutputStream> out) : out(out) {
    functions.zopen_file = &ZipOutputStream::openFile;
    functions.zread_file = &ZipOutputStream::readFile;
    functions.zwrite_file = &ZipOutputStream::writeFile;
    functions.ztell_file = &ZipOutputStream::tellFile;
    functions.zseek_file = &ZipOutputStream::seekFile;
    functions.zclose_file = &ZipOutputStream::closeFile;
    functions.zerror_file = &ZipOutputStream::testError;
    functions.opaque = this;
    file = zipOpen2("res", APPEND_STATUS_CREATE, nullptr, &functions);
    KD_ASSERT(file != __null);
}

ZipOutputStream::~ZipOutputStream() {
    if (file) {
        KD_ASSERT(zipClose(file, __null) == 0);
    }
}

voidpf ZCALLBACK ZipOutputStream::openFile(voidpf opaque, const char* filename, int) {
    // minizip needs a file name; the archive is always created under this one.
    KD_ASSERT(kdStrcmp(filename, "res") == 0);
    asZip(opaque)->bufferPosition = 0;
    return opaque;
}

uLong ZCALLBACK ZipOutputStream::readFile(voidpf, voidpf, void*, uLong) {
    KD_ASSERT(false);
    return static_cast<uLong>(-1);
}

uLong ZCALLBACK ZipOutputStream::writeFile(voidpf, voidpf stream, const void* data, uLong size) {
    ZipOutputStream* self = asZip(stream);
    std::vector<unsigned char>& buffer = self->buffer;
    if (self->bufferPosition + size > buffer.size()) {
        buffer.resize(self->bufferPosition + size);
    }
    if (size > 0) {
        std::memcpy(buffer.data() + self->bufferPosition, data, size);
    }
    self->bufferPosition += static_cast<unsigned int>(size);
    return size;
}

long ZCALLBACK ZipOutputStream::tellFile(voidpf, voidpf stream) {
    return asZip(stream)->bufferPosition;
}

long ZCALLBACK ZipOutputStream::seekFile(voidpf, voidpf stream, uLong offset, int origin) {
    ZipOutputStream* self = asZip(stream);
    switch (origin) {
        case ZLIB_FILEFUNC_SEEK_SET:
            self->bufferPosition = static_cast<unsigned int>(offset);
            break;
        case ZLIB_FILEFUNC_SEEK_CUR:
            self->bufferPosition += static_cast<unsigned int>(offset);
            break;
        case ZLIB_FILEFUNC_SEEK_END:
            self->bufferPosition = static_cast<unsigned int>(self->buffer.size() + offset);
            break;
        default:
            return -1;
    }
    return 0;
}

int ZCALLBACK ZipOutputStream::closeFile(voidpf, voidpf stream) {
    ZipOutputStream* self = asZip(stream);
    if (!self->buffer.empty()) {
        self->out->write(self->buffer.data(), static_cast<int>(self->buffer.size()));
    }
    return 0;
}

int ZCALLBACK ZipOutputStream::testError(voidpf, voidpf) {
    return 0;
}

void ZipOutputStream::openEntry(const char* name, bool compressed) {
    openEntry(name, compressed, std::vector<unsigned char>());
}

void ZipOutputStream::openEntry(const char* name, bool compressed,
                                const std::vector<unsigned char>& centralExtra) {
    zip_fileinfo info;
    std::memset(&info, 0, sizeof(info));
    int method = compressed ? Z_DEFLATED : 0;
    int level = compressed ? 7 : 0;
    const void* extra = centralExtra.empty() ? nullptr : centralExtra.data();
    KD_ASSERT(zipOpenNewFileInZip(file, name, &info, nullptr, 0, extra,
                                  static_cast<uInt>(centralExtra.size()), nullptr, method, level) == 0);
}

int ZipOutputStream::write(const void* data, int length) {
    if (length <= 0) {
        KD_ASSERT(length >= 0);
        return 0;
    }
    KD_ASSERT(zipWriteInFileInZip(file, data, static_cast<unsigned>(length)) == 0);
    return length;
}

void ZipOutputStream::closeEntry() {
    KD_ASSERT(zipCloseFileInZip(file) == 0);
}

}  // namespace Zip
}  // namespace IO
