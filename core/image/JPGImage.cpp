#include "image/JPGImage.h"

#include <KD/kd.h>

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
    long long available = source->in->available();
    int count =
        available >= kSourceBufferSize ? kSourceBufferSize : static_cast<int>(available > 0 ? available : 0);
    if (count == 0) {
        if (source->startOfFile) {
            ERREXIT(cinfo, JERR_INPUT_EMPTY);
        }
        // The data ended early: an end-of-image marker lets the library finish
        // with what it has.
        WARNMS(cinfo, JWRN_JPEG_EOF);
        source->buffer[0] = 0xFF;
        source->buffer[1] = JPEG_EOI;
        count = 2;
    } else {
        source->in->read(source->buffer, count);
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

    // Set only on the path without a jump back.
    volatile bool decoded = false;
    if (setjmp(errors.jump) == 0) {
        jpeg_create_decompress(&cinfo);
        cinfo.src = &source.base;
        decoded = decode(&cinfo);
    }
    jpeg_destroy_decompress(&cinfo);
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
    if (cinfo->jpeg_color_space == JCS_CMYK || cinfo->jpeg_color_space == JCS_YCCK) {
        Logger::log(Logger::Error, "JPEG: CMYK images are not supported");
        return false;
    }
    // Checked before the library allocates anything for the image.
    if (cinfo->image_width > kMaxSide || cinfo->image_height > kMaxSide) {
        Logger::log(Logger::Error, "JPEG: %ux%u is larger than %ux%u", cinfo->image_width,
                    cinfo->image_height, kMaxSide, kMaxSide);
        return false;
    }
    jpeg_start_decompress(cinfo);
    const unsigned components = cinfo->output_components;
    if ((components != 1 && components != 3) ||
        !allocate(cinfo->output_width, cinfo->output_height, components * 8, 0, 0)) {
        return false;
    }
    return true;
}
