#include "io/zip/GzipOutputStream.h"

#include <KD/kd.h>
#include <zlib.h>

namespace IO {
namespace Zip {

namespace {

const int kChunkSize = 4096;

}  // namespace

GzipOutputStream::GzipOutputStream(OutputStream* out) : buffer(new ByteArrayOutputStream()), out(out) {}

GzipOutputStream::~GzipOutputStream() {
    z_stream zs = {};
    // Default level, deflate, 15 window bits plus 16 for the gzip wrapper, memory level 8,
    // default strategy.
    if (deflateInit2(&zs, Z_DEFAULT_COMPRESSION, Z_DEFLATED, 31, 8, Z_DEFAULT_STRATEGY) != Z_OK) {
        KD_ASSERT(false);
        return;
    }
    const std::vector<unsigned char>& input = buffer->getData();
    zs.next_in = const_cast<Bytef*>(input.data());
    zs.avail_in = static_cast<uInt>(input.size());
    unsigned char chunk[kChunkSize];
    zs.next_out = chunk;
    zs.avail_out = kChunkSize;
    int result = Z_OK;
    while (result == Z_OK) {
        result = deflate(&zs, zs.avail_in > 0 ? Z_NO_FLUSH : Z_FINISH);
        if (zs.avail_out == 0) {
            out->write(chunk, kChunkSize);
            zs.next_out = chunk;
            zs.avail_out = kChunkSize;
        }
    }
    KD_ASSERT(result == Z_STREAM_END);
    deflateEnd(&zs);
    if (zs.avail_out < static_cast<uInt>(kChunkSize)) {
        out->write(chunk, kChunkSize - static_cast<int>(zs.avail_out));
    }
}

int GzipOutputStream::write(const void* data, int length) {
    return buffer->write(data, length);
}

}  // namespace Zip
}  // namespace IO
