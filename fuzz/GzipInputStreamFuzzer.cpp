// Compressed data (zlib, gzip or neither) through GzipInputStream. Byte 0 turns exceptions on
// (bit 0); bytes 1-4 choose the sizes of the first reads and the seeks between them; the rest is
// the compressed data.
#include <cstddef>
#include <cstdint>
#include <vector>

#include "FuzzSupport.h"
#include "io/ByteArrayInputStream.h"
#include "io/Exception.h"
#include "io/zip/GzipInputStream.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    fuzz::bootPlatform();
    const size_t kHeader = 5;
    if (size < kHeader) {
        return 0;
    }
    const bool exceptions = (data[0] & 1) != 0;
    const std::vector<unsigned char> pieces(data + 1, data + kHeader);
    const std::vector<unsigned char> compressed(data + kHeader, data + size);

    IO::ByteArrayInputStream source(compressed.data(), static_cast<int>(compressed.size()));
    IO::Zip::GzipInputStream stream(&source);
    if (exceptions) {
        stream.enableExceptions();
    }
    std::vector<unsigned char> buffer(256);
    try {
        for (unsigned char piece : pieces) {
            const int length = piece % 200;
            if (stream.read(buffer.data(), length) < 0) {
                break;
            }
            stream.seek(-(piece % 7), KD_SEEK_CUR);
        }
        stream.seek(0, KD_SEEK_SET);
        while (stream.available() > 0) {
            const long long left = stream.available();
            const int length = left < 256 ? static_cast<int>(left) : 256;
            fuzz::check(stream.read(buffer.data(), length) == length, "available() bytes can be read");
        }
    } catch (const IO::Exception&) {
    }
    return 0;
}
