#include "image/JPGImage.h"

#include <KD/kd.h>

#include <algorithm>
#include <csetjmp>
#include <cstdio>
#include <cstring>
// clang-format off
#include <jpeglib.h>
#include <jerror.h>
// clang-format on

#include "io/InputStream.h"
#include "util/Logger.h"

namespace {

const int kSourceBufferSize = 4096;
const int kMessageSize = 200;

struct ErrorManager {
    jpeg_error_mgr base;
    std::jmp_buf jump;
};

void outputMessage(j_common_ptr cinfo) {
    char message[kMessageSize];
    cinfo->err->format_message(cinfo, message);
    Logger::log(Logger::Error, "%s", message);
}

void errorExit(j_common_ptr cinfo) {
    cinfo->err->output_message(cinfo);
    std::longjmp(reinterpret_cast<ErrorManager*>(cinfo->err)->jump, 1);
}

// A libjpeg source reading an IO::InputStream through a buffer of its own.
struct zavrin_jpeg_source_mgr {
    jpeg_source_mgr base;
    IO::InputStream* in;
    bool startOfFile;
    JOCTET buffer[kSourceBufferSize];
};

zavrin_jpeg_source_mgr* sourceOf(j_decompress_ptr cinfo) {
    return reinterpret_cast<zavrin_jpeg_source_mgr*>(cinfo->src);
}

void initSource(j_decompress_ptr cinfo) {
    sourceOf(cinfo)->startOfFile = true;
}

boolean fillInputBuffer(j_decompress_ptr cinfo) {
    zavrin_jpeg_source_mgr* source = sourceOf(cinfo);
    const long long available = source->in->available();
    int count =
        available >= kSourceBufferSize ? kSourceBufferSize : static_cast<int>(available > 0 ? available : 0);
    // A stream may claim more than it delivers (a damaged zip entry): only what was read counts.
    if (count > 0) {
        count = source->in->read(source->buffer, count);
    }
    if (count <= 0) {
        if (source->startOfFile) {
            ERREXIT(cinfo, JERR_INPUT_EMPTY);
        }
        // The data ended early: an end-of-image marker lets the library finish
        // with what it has.
        WARNMS(cinfo, JWRN_JPEG_EOF);
        source->buffer[0] = 0xFF;
        source->buffer[1] = JPEG_EOI;
        count = 2;
    }
    source->base.next_input_byte = source->buffer;
    source->base.bytes_in_buffer = count;
    source->startOfFile = false;
    return TRUE;
}

void skipInputData(j_decompress_ptr cinfo, long count) {
    if (count <= 0) {
        return;
    }
    jpeg_source_mgr* source = cinfo->src;
    while (count > static_cast<long>(source->bytes_in_buffer)) {
        count -= static_cast<long>(source->bytes_in_buffer);
        fillInputBuffer(cinfo);
    }
    source->next_input_byte += count;
    source->bytes_in_buffer -= count;
}

void termSource(j_decompress_ptr) {}

// Destroys the decompressor however init ends: by a return, a jump back from
// the library or an exception.
class DecompressorRelease {
public:
    explicit DecompressorRelease(j_decompress_ptr cinfo) : cinfo(cinfo) {}
    ~DecompressorRelease() { jpeg_destroy_decompress(cinfo); }

private:
    DecompressorRelease(const DecompressorRelease&) = delete;
    DecompressorRelease& operator=(const DecompressorRelease&) = delete;

    j_decompress_ptr cinfo;
};

// What the library may allocate for one image besides the pixels we hold: its
// row buffers, and for progressive or multi-scan files the coefficients of the
// whole image, which a header of a hundred bytes can declare by the hundred
// megabytes. Real files of that kind carry data in proportion. No allowed
// image needs more than the coefficients of 8192 x 8192 pixels in three full
// components, 384 MiB.
long libraryMemoryLimit(IO::InputStream* in) {
    const long long base = 16LL << 20;
    const long long perInputByte = 64;
    const long long most = base + (384LL << 20);
    const long long inputBytes = std::max(0LL, std::min(in->available(), most / perInputByte));
    return static_cast<long>(std::min(base + perInputByte * inputBytes, most));
}

bool isSupportedColourLayout(j_decompress_ptr cinfo) {
    if (cinfo->num_components == 1) {
        return cinfo->jpeg_color_space == JCS_GRAYSCALE;
    }
    return cinfo->num_components == 3 &&
           (cinfo->jpeg_color_space == JCS_YCbCr || cinfo->jpeg_color_space == JCS_RGB);
}

}  // namespace

bool JPGImage::init(IO::InputStream* in) {
    jpeg_decompress_struct cinfo;
    ErrorManager errors;
    zavrin_jpeg_source_mgr source;
    // Zeroed, so that destroying is safe whatever step jumped back.
    std::memset(&cinfo, 0, sizeof(cinfo));
    cinfo.err = jpeg_std_error(&errors.base);
    errors.base.error_exit = errorExit;
    errors.base.output_message = outputMessage;
    source.base.init_source = initSource;
    source.base.fill_input_buffer = fillInputBuffer;
    source.base.skip_input_data = skipInputData;
    source.base.resync_to_restart = jpeg_resync_to_restart;
    source.base.term_source = termSource;
    source.base.bytes_in_buffer = 0;
    source.base.next_input_byte = nullptr;
    source.in = in;
    source.startOfFile = true;

    const long memoryLimit = libraryMemoryLimit(in);
    DecompressorRelease release(&cinfo);
    // Set only on the path without a jump back.
    volatile bool decoded = false;
    if (setjmp(errors.jump) == 0) {
        jpeg_create_decompress(&cinfo);
        cinfo.src = &source.base;
        // Beyond it the library refuses to buffer the image (it has no backing store) instead of
        // allocating.
        cinfo.mem->max_memory_to_use = memoryLimit;
        decoded = decode(&cinfo);
    }
    if (errors.base.msg_code == JERR_NO_BACKING_STORE) {
        Logger::log(Logger::Error, "JPEG: buffering the image would take more than %ld bytes", memoryLimit);
    }
    if (!decoded) {
        reset();
    }
    return decoded;
}

bool JPGImage::decode(j_decompress_ptr cinfo) {
    jpeg_read_header(cinfo, TRUE);
    if (!prepareLayout(cinfo)) {
        return false;
    }
    // Rows are decoded straight into place: the output height is the height
    // allocated for, so they stay in data.
    unsigned char* out = data.get();
    while (cinfo->output_scanline < cinfo->output_height) {
        JSAMPROW row = out + static_cast<size_t>(cinfo->output_scanline) * stride;
        if (jpeg_read_scanlines(cinfo, &row, 1) != 1) {
            return false;
        }
    }
    jpeg_finish_decompress(cinfo);
    return true;
}

bool JPGImage::prepareLayout(j_decompress_ptr cinfo) {
    // Every refusal comes before jpeg_start_decompress, which allocates the library's buffers for
    // each component, so that refusing a file costs nothing.
    if (cinfo->jpeg_color_space == JCS_CMYK || cinfo->jpeg_color_space == JCS_YCCK) {
        Logger::log(Logger::Error, "JPEG: CMYK images are not supported");
        return false;
    }
    if (!isSupportedColourLayout(cinfo)) {
        Logger::log(Logger::Error, "JPEG: %d components in colour space %d are not supported",
                    cinfo->num_components, static_cast<int>(cinfo->jpeg_color_space));
        return false;
    }
    if (cinfo->image_width > kMaxSide || cinfo->image_height > kMaxSide) {
        Logger::log(Logger::Error, "JPEG: %ux%u is larger than %ux%u", cinfo->image_width,
                    cinfo->image_height, kMaxSide, kMaxSide);
        return false;
    }
    jpeg_start_decompress(cinfo);
    return allocate(cinfo->output_width, cinfo->output_height, cinfo->output_components * 8, 0, 0);
}
