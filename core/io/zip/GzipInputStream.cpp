#include "io/zip/GzipInputStream.h"

#include <zlib.h>

#include <climits>

#include "util/Logger.h"

namespace IO {
namespace Zip {

namespace {

// Deflate's densest form carries about 1032 output bytes per input byte, so a gzip trailer that
// claims more than that describes data the input does not hold.
const unsigned long long kMaxDeflateRatio = 1032;
const size_t kCountingChunk = 64 * 1024;
// Not a zlib code: the content is larger than kMaxInflatedSize.
const int kTooLarge = -100;

// A lone first byte of the gzip magic is a gzip stream cut short, not plain content.
bool hasGzipHeader(const std::vector<unsigned char>& input) {
    return !input.empty() && input[0] == 0x1f && (input.size() == 1 || input[1] == 0x8b);
}

// Deflate method, a window of at most 32 KiB and the header check of RFC 1950. A lone method byte
// is a zlib stream cut short, as a lone gzip magic byte is.
bool hasZlibHeader(const std::vector<unsigned char>& input) {
    return !input.empty() && (input[0] & 0x0f) == 8 && (input[0] >> 4) <= 7 &&
           (input.size() == 1 || ((input[0] << 8) | input[1]) % 31 == 0);
}

// Length of the UTF-8 sequence led by byte, 0 when it cannot lead one.
int utf8SequenceLength(unsigned char byte) {
    if (byte < 0x80) {
        return 1;
    }
    if (byte >= 0xc2 && byte <= 0xdf) {
        return 2;
    }
    if (byte >= 0xe0 && byte <= 0xef) {
        return 3;
    }
    return byte >= 0xf0 && byte <= 0xf4 ? 4 : 0;
}

// Printable UTF-8 with tabs and line breaks. One in every 31 pairs of characters such as "x^"
// or "80" passes the zlib header check; deflated data, damaged or not, is almost never text.
bool isPlainText(const std::vector<unsigned char>& input) {
    for (size_t at = 0; at < input.size();) {
        const unsigned char byte = input[at];
        if ((byte < 0x20 && byte != '\t' && byte != '\n' && byte != '\r') || byte == 0x7f) {
            return false;
        }
        const int length = utf8SequenceLength(byte);
        if (length == 0 || input.size() - at < static_cast<size_t>(length)) {
            return false;
        }
        for (int i = 1; i < length; ++i) {
            if ((input[at + i] & 0xc0) != 0x80) {
                return false;
            }
        }
        at += length;
    }
    return true;
}

// The content size a gzip trailer states, when it is one the input could hold.
bool gzipSizeHint(const std::vector<unsigned char>& input, size_t& size) {
    if (input.size() < 18 || !hasGzipHeader(input)) {
        return false;
    }
    const unsigned char* trailer = &input[input.size() - 4];
    unsigned long long claimed = trailer[0] | (trailer[1] << 8) | (trailer[2] << 16) |
                                 (static_cast<unsigned long long>(trailer[3]) << 24);
    if (claimed > static_cast<unsigned long long>(GzipInputStream::kMaxInflatedSize) ||
        claimed > kMaxDeflateRatio * input.size()) {
        return false;
    }
    size = static_cast<size_t>(claimed);
    return true;
}

// Inflates input into out (room bytes), or, with out null, counts the output and drops it.
// Stops at the end of the stream, at an error, when out is full, or past kMaxInflatedSize.
int inflateInto(const std::vector<unsigned char>& input, unsigned char* out, size_t room, size_t& produced) {
    produced = 0;
    z_stream zs = {};
    zs.next_in = const_cast<Bytef*>(input.data());
    zs.avail_in = static_cast<uInt>(input.size());
    // 15 window bits plus 32: the zlib or gzip header is recognised by itself.
    int result = inflateInit2(&zs, 47);
    if (result != Z_OK) {
        return result;
    }
    std::vector<unsigned char> chunk(out ? 0 : kCountingChunk);
    // zlib refuses a null output pointer even with no room behind it.
    unsigned char noRoom;
    while (result == Z_OK) {
        if (out) {
            zs.next_out = room > 0 ? out + zs.total_out : &noRoom;
            zs.avail_out = static_cast<uInt>(room - zs.total_out);
        } else {
            zs.next_out = chunk.data();
            zs.avail_out = static_cast<uInt>(chunk.size());
        }
        result = inflate(&zs, Z_NO_FLUSH);
        if (zs.total_out > static_cast<uLong>(GzipInputStream::kMaxInflatedSize)) {
            result = kTooLarge;
        } else if (out && result == Z_OK && zs.total_out == room) {
            break;
        }
    }
    produced = zs.total_out;
    inflateEnd(&zs);
    return result;
}

}  // namespace

GzipInputStream::GzipInputStream(InputStream* compressed) {
    KD_ASSERT(compressed);
    if (!compressed) {
        return;
    }
    long long left = compressed->available();
    int size = left <= 0 ? 0 : (left > INT_MAX ? INT_MAX : static_cast<int>(left));
    std::vector<unsigned char> input(size);
    if (size > 0 && compressed->read(input.data(), size) != size) {
        Logger::log(Logger::Error, "GzipInputStream: could not read the compressed input");
        return;
    }
    const bool looksCompressed = input.empty() || hasGzipHeader(input) || hasZlibHeader(input);
    const int result = looksCompressed ? inflateAll(input) : Z_STREAM_END;
    // A lone byte is a cut header, not text; more text that fails to inflate was never compressed.
    const bool textAfterAll = result != Z_STREAM_END && input.size() > 1 && isPlainText(input);
    if (!looksCompressed || textAfterAll) {
        // Not compressed data: the bytes are the content as they are.
        data.swap(input);
    } else if (result != Z_STREAM_END) {
        fail(result);
        return;
    }
    inner.reset(new ByteArrayInputStream(data.data(), static_cast<int>(data.size())));
}

int GzipInputStream::inflateAll(const std::vector<unsigned char>& input) {
    // The content is sized before it is held, so that memory peaks at the content itself, never
    // at a grown copy of it: from the gzip trailer when it is plausible, else by inflating once
    // just to count.
    size_t size = 0;
    size_t produced = 0;
    int result = Z_OK;
    if (gzipSizeHint(input, size)) {
        data.resize(size + 1);
        result = inflateInto(input, data.data(), data.size(), produced);
        if (result == Z_STREAM_END) {
            data.resize(produced);
            return result;
        }
        // A full buffer means more content than the trailer says (several members): count it.
        if (produced < data.size()) {
            return result;
        }
    }
    result = inflateInto(input, nullptr, 0, size);
    if (result != Z_STREAM_END) {
        return result;
    }
    std::vector<unsigned char>().swap(data);
    data.resize(size);
    result = inflateInto(input, data.data(), data.size(), produced);
    // A second pass that disagrees with the first is a failure, never short content.
    return produced == size ? result : Z_STREAM_ERROR;
}

void GzipInputStream::fail(int result) {
    if (result == kTooLarge) {
        Logger::log(Logger::Error, "GzipInputStream: content larger than %d bytes", kMaxInflatedSize);
    } else {
        Logger::log(Logger::Error, "GzipInputStream::read error %d", result);
    }
    std::vector<unsigned char>().swap(data);
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
    if (inner) {
        return inner->read(buffer, length);
    }
    // Damaged data has no content: reading it is a bad state where the reader asked for
    // exceptions, and an answer of -1 elsewhere (never an assertion: the data is not ours).
    if (exceptionsEnabled) {
        handleBadState();
    }
    return -1;
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
