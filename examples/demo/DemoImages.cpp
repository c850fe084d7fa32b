#include "DemoImages.h"

#include <png.h>

#include <boost/make_shared.hpp>
#include <cmath>
#include <cstdio>
#include <cstdlib>
#include <vector>
// clang-format off
#include <jpeglib.h>
// clang-format on

#include "io/FileOutputStream.h"
#include "io/resource/PackageBuilder.h"

namespace demo {

namespace {

typedef std::vector<unsigned char> Bytes;

void appendBytes(png_structp png, png_bytep data, png_size_t length) {
    Bytes* out = static_cast<Bytes*>(png_get_io_ptr(png));
    out->insert(out->end(), data, data + length);
}

Bytes markerPixels(unsigned width, unsigned height) {
    Bytes rgba(static_cast<size_t>(width) * height * 4);
    for (unsigned y = 0; y < height; ++y) {
        for (unsigned x = 0; x < width; ++x) {
            const float dx = (x + 0.5f - width / 2.0f) / (height / 2.0f);
            const float dy = (y + 0.5f - height / 2.0f) / (height / 2.0f);
            const float ring = 1.0f - std::fabs(std::sqrt(dx * dx + dy * dy) - 0.7f) * 4.0f;
            unsigned char* p = &rgba[(static_cast<size_t>(y) * width + x) * 4];
            p[0] = 255;
            p[1] = static_cast<unsigned char>(120 + 100 * dx * dx);
            p[2] = 30;
            p[3] = static_cast<unsigned char>(ring > 0 ? 255 * ring : 0);
        }
    }
    return rgba;
}

}  // namespace

bool packMarkerPng(const std::string& packagePath) {
    const unsigned width = 100;
    const unsigned height = 60;
    const Bytes rgba = markerPixels(width, height);
    Bytes file;
    png_structp png = png_create_write_struct(PNG_LIBPNG_VER_STRING, nullptr, nullptr, nullptr);
    png_infop info = png != nullptr ? png_create_info_struct(png) : nullptr;
    bool encoded = info != nullptr && setjmp(png_jmpbuf(png)) == 0;
    if (encoded) {
        png_set_write_fn(png, &file, appendBytes, nullptr);
        png_set_IHDR(png, info, width, height, 8, PNG_COLOR_TYPE_RGBA, PNG_INTERLACE_NONE,
                     PNG_COMPRESSION_TYPE_DEFAULT, PNG_FILTER_TYPE_DEFAULT);
        png_write_info(png, info);
        for (unsigned y = 0; y < height; ++y) {
            png_write_row(png, &rgba[static_cast<size_t>(y) * width * 4]);
        }
        png_write_end(png, nullptr);
    }
    png_destroy_write_struct(&png, &info);
    boost::shared_ptr<IO::FileOutputStream> out = boost::make_shared<IO::FileOutputStream>();
    if (!encoded || !out->init(packagePath.c_str())) {
        return false;
    }
    IO::Resource::PackageBuilder builder(out, 4096);
    return builder.addResource("marker.png", file.data(), file.size(), false);
}

bool writePhotoJpeg(const char* path) {
    const unsigned side = 64;
    Bytes rgb(side * side * 3);
    for (unsigned y = 0; y < side; ++y) {
        for (unsigned x = 0; x < side; ++x) {
            unsigned char* p = &rgb[(y * side + x) * 3];
            p[0] = static_cast<unsigned char>(40 + x * 3);
            p[1] = static_cast<unsigned char>(80 + y * 2);
            p[2] = static_cast<unsigned char>(220 - x - y);
        }
    }
    jpeg_compress_struct cinfo;
    jpeg_error_mgr errors;
    cinfo.err = jpeg_std_error(&errors);
    jpeg_create_compress(&cinfo);
    unsigned char* buffer = nullptr;
    unsigned long size = 0;
    jpeg_mem_dest(&cinfo, &buffer, &size);
    cinfo.image_width = side;
    cinfo.image_height = side;
    cinfo.input_components = 3;
    cinfo.in_color_space = JCS_RGB;
    jpeg_set_defaults(&cinfo);
    jpeg_start_compress(&cinfo, TRUE);
    while (cinfo.next_scanline < cinfo.image_height) {
        JSAMPROW row = &rgb[cinfo.next_scanline * side * 3];
        jpeg_write_scanlines(&cinfo, &row, 1);
    }
    jpeg_finish_compress(&cinfo);
    jpeg_destroy_compress(&cinfo);
    IO::FileOutputStream out;
    const bool written =
        out.init(path) && out.write(buffer, static_cast<int>(size)) == static_cast<int>(size);
    std::free(buffer);
    return written;
}

}  // namespace demo
