// The typed readers of InputStream on every kind of stream the library reads settings and
// packages through. Byte 0: bit 0 exceptions on, bits 1-2 the stream (memory, file, window of a
// memory stream, window of a file); byte 1: the number n of operations (at most 64); the next n
// bytes the operations; the rest the stream's data.
#include <boost/shared_ptr.hpp>
#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

#include "FuzzSupport.h"
#include "io/ByteArrayInputStream.h"
#include "io/Exception.h"
#include "io/FileInputStream.h"
#include "io/WrappedInputStream.h"

namespace {

boost::shared_ptr<IO::InputStream> openFile(const unsigned char* data, size_t size) {
    fuzz::check(fuzz::writePlatformFile("/tmp/readers.bin", data, size), "the stream file is written");
    boost::shared_ptr<IO::FileInputStream> file(new IO::FileInputStream());
    fuzz::check(file->init("/tmp/readers.bin"), "the stream file opens");
    return file;
}

boost::shared_ptr<IO::InputStream> makeStream(int kind, const std::vector<unsigned char>& data) {
    boost::shared_ptr<IO::InputStream> base =
        kind & 1 ? openFile(data.data(), data.size())
                 : boost::shared_ptr<IO::InputStream>(
                       new IO::ByteArrayInputStream(data.data(), static_cast<int>(data.size())));
    if ((kind & 2) == 0) {
        return base;
    }
    const long long size = static_cast<long long>(data.size());
    return boost::shared_ptr<IO::InputStream>(new IO::WrappedInputStream(base, size / 4, size / 2));
}

void apply(IO::InputStream& stream, unsigned char operation) {
    std::string text;
    char buffer[64];
    switch (operation % 16) {
        case 0:
            stream.readBool();
            break;
        case 1:
            stream.readUByte();
            break;
        case 2:
            stream.readByte();
            break;
        case 3:
            stream.readShort();
            break;
        case 4:
            stream.readInt();
            break;
        case 5:
            stream.readLongLong();
            break;
        case 6:
            stream.readULongLong();
            break;
        case 7:
            stream.readFloat();
            break;
        case 8:
            stream.readString(text);
            break;
        case 9:
            stream.readNString(text);
            break;
        case 10:
            stream.readZString(text);
            break;
        case 11:
            stream.readCRLFString(text);
            break;
        case 12:
            stream.read(buffer, operation / 16 * 4);
            break;
        case 13:
            stream.seek(operation / 16, KD_SEEK_SET);
            break;
        case 14:
            stream.seek(static_cast<int>(operation / 16) - 8, KD_SEEK_CUR);
            break;
        default:
            stream.seek(-static_cast<int>(operation / 16), KD_SEEK_END);
            break;
    }
    // A file stream may be sought past its end, as the platform's files may; never before it.
    fuzz::check(stream.tell() >= 0, "the position never goes before the data");
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    fuzz::bootPlatform();
    if (size < 2) {
        return 0;
    }
    const bool exceptions = (data[0] & 1) != 0;
    const int kind = (data[0] >> 1) & 3;
    const size_t count = data[1] % 65 < size - 2 ? data[1] % 65 : size - 2;
    const std::vector<unsigned char> operations(data + 2, data + 2 + count);
    const std::vector<unsigned char> content(data + 2 + count, data + size);

    boost::shared_ptr<IO::InputStream> stream = makeStream(kind, content);
    if (exceptions) {
        stream->enableExceptions();
    }
    for (unsigned char operation : operations) {
        try {
            apply(*stream, operation);
        } catch (const IO::Exception&) {
        }
    }
    return 0;
}
