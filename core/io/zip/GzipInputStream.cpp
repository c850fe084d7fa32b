#include "io/zip/GzipInputStream.h"

#include <zlib.h>

#include <climits>

#include "util/Logger.h"

namespace IO {
namespace Zip {

GzipInputStream::GzipInputStream(InputStream* compressed) {
    KD_ASSERT(compressed);
    if (!compressed) {
        return;
    }
    long long left = compressed->available();
    int size = left <= 0 ? 0 : (left > INT_MAX ? INT_MAX : static_cast<int>(left));
    std::vector<unsigned char> input(size);
    if (size > 0 && compressed->read(input.data(), size) != size) {
        return;
    }
    if (inflateAll(input)) {
        inner.reset(new ByteArrayInputStream(data.data(), static_cast<int>(data.size())));
    }
}

bool GzipInputStream::inflateAll(const std::vector<unsigned char>& input) {
    z_stream zs = {};
    zs.next_in = const_cast<Bytef*>(input.data());
    zs.avail_in = static_cast<uInt>(input.size());
    // 15 window bits plus 32: the zlib or gzip header is recognised by itself.
    if (inflateInit2(&zs, 47) != Z_OK) {
        return false;
    }
    const size_t step = 2 * input.size();
    // zlib refuses a null output pointer even with no room behind it; empty input must reach
    // inflate and be reported as having nothing to inflate.
    unsigned char noRoom;
    int result = Z_OK;
    while (result == Z_OK) {
        if (zs.total_out == data.size()) {
            // The content is read through an int-sized memory stream.
            if (data.size() + step > static_cast<size_t>(INT_MAX)) {
                result = Z_MEM_ERROR;
                break;
            }
            data.resize(data.size() + step);
        }
        zs.next_out = data.empty() ? &noRoom : data.data() + zs.total_out;
        zs.avail_out = static_cast<uInt>(data.size() - zs.total_out);
        result = inflate(&zs, Z_NO_FLUSH);
    }
    bool ok = true;
    if (result == Z_STREAM_END) {
        data.resize(zs.total_out);
    } else if (result == Z_DATA_ERROR) {
        // Not compressed data: the bytes are the content as they are.
        data = input;
    } else {
        Logger::log(Logger::Error, "GzipInputStream::read error %d", result);
        data.clear();
        ok = false;
    }
    inflateEnd(&zs);
    return ok;
}

void GzipInputStream::enableExceptions() {
    InputStream::enableExceptions();
    if (inner) {
        inner->enableExceptions();
    }
}

long long GzipInputStream::available() {
    return inner ? inner->available() : 0;
}

int GzipInputStream::read(void* buffer, int length) {
    return inner ? inner->read(buffer, length) : -1;
}

long long GzipInputStream::tell() {
    return inner ? inner->tell() : -1;
}

void GzipInputStream::seek(long long offset, KDfileSeekOrigin origin) {
    if (inner) {
        inner->seek(offset, origin);
    }
}

}  // namespace Zip
}  // namespace IO
