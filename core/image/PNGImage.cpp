#include "image/PNGImage.h"

#include <KD/kd.h>
#include <png.h>

#include <limits>

#include "io/InputStream.h"
#include "util/Logger.h"

namespace {

const int kSignatureSize = 8;
const unsigned kPaletteEntries = 256;
const unsigned kPaletteEntryBits = 24;

// libpng's own error handler would print to stderr; ours logs the reason and
// jumps back to the decoder, which then refuses the image.
void onError(png_structp png, png_const_charp message) {
    Logger::log(Logger::Info, "PNG: %s", message);
    png_longjmp(png, 1);
}

void onWarning(png_structp, png_const_charp) {}

void readFromStream(png_structp png, png_bytep buffer, png_size_t length) {
    IO::InputStream* in = static_cast<IO::InputStream*>(png_get_io_ptr(png));
    KD_ASSERT(in != nullptr);
    // A short read would be an assertion in the stream: truncated files are
    // refused here instead.
    if (in == nullptr || length > static_cast<png_size_t>(std::numeric_limits<int>::max()) ||
        in->available() < static_cast<long long>(length)) {
        png_error(png, "unexpected end of data");
    }
    in->read(buffer, static_cast<int>(length));
}

// Destroys libpng's structures however decoding ends, an exception included.
class ReadStructRelease {
public:
    explicit ReadStructRelease(png_structp png) : png(png), info(nullptr) {}
    ~ReadStructRelease() { png_destroy_read_struct(&png, info ? &info : nullptr, nullptr); }
    void setInfo(png_infop newInfo) { info = newInfo; }

private:
    ReadStructRelease(const ReadStructRelease&) = delete;
    ReadStructRelease& operator=(const ReadStructRelease&) = delete;

    png_structp png;
    png_infop info;
};

}  // namespace

bool PNGImage::init(IO::InputStream* in) {
    // Built against the libpng we link, so its version check passes.
    png_structp png = png_create_read_struct(PNG_LIBPNG_VER_STRING, nullptr, onError, onWarning);
    if (png == nullptr) {
        return false;
    }
    ReadStructRelease release(png);
    png_infop info = png_create_info_struct(png);
    if (info == nullptr) {
        return false;
    }
    release.setInfo(info);
    const bool decoded = decode(png, info, in);
    if (!decoded) {
        reset();
    }
    return decoded;
}

bool PNGImage::decode(png_structp png, png_infop info, IO::InputStream* in) {
    // Nothing with a destructor lives in this frame: libpng's errors longjmp here.
    if (setjmp(png_jmpbuf(png)) != 0) {
        return false;
    }
    png_byte signature[kSignatureSize];
    if (in->available() < kSignatureSize) {
        return false;
    }
    in->read(signature, kSignatureSize);
    if (png_sig_cmp(signature, 0, kSignatureSize) != 0) {
        Logger::log(Logger::Info, "PNG: not a PNG signature");
        return false;
    }
    png_set_read_fn(png, in, readFromStream);
    png_set_sig_bytes(png, kSignatureSize);
    png_read_info(png, info);
    // Asked before the layout is settled, so libpng assembles whole rows.
    const int passes = png_set_interlace_handling(png);
    if (!prepareLayout(png, info)) {
        return false;
    }
    unsigned char* pixels = data.get() + paletteSize * paletteBitsPerEntry / 8;
    for (int pass = 0; pass < passes; ++pass) {
        for (unsigned row = 0; row < height; ++row) {
            png_read_row(png, pixels + static_cast<size_t>(row) * stride, nullptr);
        }
    }
    return true;
}

bool PNGImage::prepareLayout(png_structp png, png_infop info) {
    png_uint_32 pngWidth = 0;
    png_uint_32 pngHeight = 0;
    int depth = 0;
    int colourType = 0;
    png_get_IHDR(png, info, &pngWidth, &pngHeight, &depth, &colourType, nullptr, nullptr, nullptr);
    // Before png_read_update_info, which allocates libpng's row buffers.
    if (pngWidth > kMaxSide || pngHeight > kMaxSide) {
        Logger::log(Logger::Info, "PNG: %ux%u is larger than %ux%u", pngWidth, pngHeight, kMaxSide, kMaxSide);
        return false;
    }
    if (depth == 16) {
        png_set_strip_16(png);
    }
    if (depth < 8) {
        // One byte per pixel: palette indices unpacked, gray scaled up.
        png_set_packing(png);
        if (colourType == PNG_COLOR_TYPE_GRAY) {
            png_set_expand_gray_1_2_4_to_8(png);
        }
    }
    if (colourType == PNG_COLOR_TYPE_GRAY_ALPHA) {
        png_set_gray_to_rgb(png);
    }
    png_read_update_info(png, info);

    unsigned bits = 0;
    switch (colourType) {
        case PNG_COLOR_TYPE_PALETTE:
        case PNG_COLOR_TYPE_GRAY:
            bits = 8;
            break;
        case PNG_COLOR_TYPE_RGB:
            bits = 24;
            break;
        case PNG_COLOR_TYPE_RGB_ALPHA:
        case PNG_COLOR_TYPE_GRAY_ALPHA:
            bits = 32;
            break;
        default:
            return false;
    }
    const bool palette = colourType == PNG_COLOR_TYPE_PALETTE;
    if (!allocate(pngWidth, pngHeight, bits, palette ? kPaletteEntries : 0,
                  palette ? kPaletteEntryBits : 0)) {
        return false;
    }
    // The rows libpng will write must be exactly ours.
    if (png_get_rowbytes(png, info) != stride) {
        return false;
    }
    if (palette) {
        copyPalette(png, info);
    }
    return true;
}

void PNGImage::copyPalette(png_structp png, png_infop info) {
    png_colorp entries = nullptr;
    int count = 0;
    png_get_PLTE(png, info, &entries, &count);
    // Entries beyond the file's own stay zero (black), so indices the
    // palette does not cover still sample a defined colour.
    unsigned char* out = data.get();
    for (int i = 0; i < count && i < static_cast<int>(kPaletteEntries); ++i) {
        out[3 * i] = entries[i].red;
        out[3 * i + 1] = entries[i].green;
        out[3 * i + 2] = entries[i].blue;
    }
}
