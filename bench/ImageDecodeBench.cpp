// Decoding a large PNG and a large JPEG through Image against the simplest
// decode loop of libpng and libjpeg themselves on the same bytes, in the same
// run. The rates are pixels per second; the ratio ours / raw is printed at the
// end (1.0 means no cost of our own). On a loaded machine the ratios are
// steadier with --benchmark_repetitions=15
// --benchmark_enable_random_interleaving=true.
#include <benchmark/benchmark.h>
#include <png.h>

#include <boost/shared_ptr.hpp>
#include <cstdio>
#include <cstring>
#include <vector>
// clang-format off
#include <jpeglib.h>
// clang-format on

#include "RateReporter.h"
#include "image/Image.h"
#include "io/ByteArrayInputStream.h"

namespace {

typedef std::vector<unsigned char> Bytes;

const unsigned kWidth = 2048;
const unsigned kHeight = 2048;

// A map-like picture: smooth areas, hard edges and some noise, so that both
// codecs work about as hard as on real tiles.
Bytes picture() {
    Bytes rgb(static_cast<size_t>(kWidth) * kHeight * 3);
    unsigned state = 7;
    for (unsigned y = 0; y < kHeight; ++y) {
        for (unsigned x = 0; x < kWidth; ++x) {
            state = state * 1103515245u + 12345u;
            unsigned char* p = &rgb[(static_cast<size_t>(y) * kWidth + x) * 3];
            const bool road = (x / 64 + y / 96) % 5 == 0;
            p[0] = road ? 250 : static_cast<unsigned char>(200 + (x >> 5) % 40);
            p[1] = road ? 240 : static_cast<unsigned char>(220 - (y >> 6) % 30);
            p[2] = static_cast<unsigned char>(180 + ((state >> 16) & 7));
        }
    }
    return rgb;
}

void appendBytes(png_structp png, png_bytep data, png_size_t length) {
    Bytes* out = static_cast<Bytes*>(png_get_io_ptr(png));
    out->insert(out->end(), data, data + length);
}

const Bytes& pngFile() {
    static Bytes file;
    if (file.empty()) {
        const Bytes rgb = picture();
        png_structp png = png_create_write_struct(PNG_LIBPNG_VER_STRING, nullptr, nullptr, nullptr);
        png_infop info = png_create_info_struct(png);
        png_set_write_fn(png, &file, appendBytes, nullptr);
        png_set_IHDR(png, info, kWidth, kHeight, 8, PNG_COLOR_TYPE_RGB, PNG_INTERLACE_NONE,
                     PNG_COMPRESSION_TYPE_DEFAULT, PNG_FILTER_TYPE_DEFAULT);
        png_write_info(png, info);
        for (unsigned y = 0; y < kHeight; ++y) {
            png_write_row(png, &rgb[static_cast<size_t>(y) * kWidth * 3]);
        }
        png_write_end(png, nullptr);
        png_destroy_write_struct(&png, &info);
    }
    return file;
}

const Bytes& jpegFile() {
    static Bytes file;
    if (file.empty()) {
        const Bytes rgb = picture();
        jpeg_compress_struct cinfo;
        jpeg_error_mgr errors;
        cinfo.err = jpeg_std_error(&errors);
        jpeg_create_compress(&cinfo);
        unsigned char* buffer = nullptr;
        unsigned long size = 0;
        jpeg_mem_dest(&cinfo, &buffer, &size);
        cinfo.image_width = kWidth;
        cinfo.image_height = kHeight;
        cinfo.input_components = 3;
        cinfo.in_color_space = JCS_RGB;
        jpeg_set_defaults(&cinfo);
        jpeg_set_quality(&cinfo, 85, TRUE);
        jpeg_start_compress(&cinfo, TRUE);
        while (cinfo.next_scanline < cinfo.image_height) {
            JSAMPROW row =
                const_cast<unsigned char*>(&rgb[static_cast<size_t>(cinfo.next_scanline) * kWidth * 3]);
            jpeg_write_scanlines(&cinfo, &row, 1);
        }
        jpeg_finish_compress(&cinfo);
        file.assign(buffer, buffer + size);
        jpeg_destroy_compress(&cinfo);
        std::free(buffer);
    }
    return file;
}

void decodeThroughImage(benchmark::State& state, const Bytes& file, Image::ImageFormat format) {
    for (auto _ : state) {
        IO::ByteArrayInputStream in(file.data(), static_cast<int>(file.size()));
        boost::shared_ptr<Image> image = Image::createImage(&in, format);
        if (!image) {
            state.SkipWithError("decoding failed");
            return;
        }
        benchmark::DoNotOptimize(image->getData());
    }
    state.SetItemsProcessed(state.iterations() * kWidth * kHeight);
}

void BM_PngImage(benchmark::State& state) {
    decodeThroughImage(state, pngFile(), Image::PNG);
}
BENCHMARK(BM_PngImage)->Unit(benchmark::kMillisecond);

struct MemoryReader {
    const unsigned char* data;
    size_t left;
};

void readFromMemory(png_structp png, png_bytep out, png_size_t length) {
    MemoryReader* reader = static_cast<MemoryReader*>(png_get_io_ptr(png));
    if (length > reader->left) {
        png_error(png, "end of data");
    }
    std::memcpy(out, reader->data, length);
    reader->data += length;
    reader->left -= length;
}

void BM_PngRaw(benchmark::State& state) {
    const Bytes& file = pngFile();
    for (auto _ : state) {
        MemoryReader reader = {file.data(), file.size()};
        png_structp png = png_create_read_struct(PNG_LIBPNG_VER_STRING, nullptr, nullptr, nullptr);
        png_infop info = png_create_info_struct(png);
        png_set_read_fn(png, &reader, readFromMemory);
        png_read_info(png, info);
        const size_t stride = png_get_rowbytes(png, info);
        unsigned char* pixels = new unsigned char[stride * png_get_image_height(png, info)];
        for (unsigned y = 0; y < png_get_image_height(png, info); ++y) {
            png_read_row(png, pixels + y * stride, nullptr);
        }
        benchmark::DoNotOptimize(pixels);
        delete[] pixels;
        png_destroy_read_struct(&png, &info, nullptr);
    }
    state.SetItemsProcessed(state.iterations() * kWidth * kHeight);
}
BENCHMARK(BM_PngRaw)->Unit(benchmark::kMillisecond);

void BM_JpegImage(benchmark::State& state) {
    decodeThroughImage(state, jpegFile(), Image::JPEG);
}
BENCHMARK(BM_JpegImage)->Unit(benchmark::kMillisecond);

void BM_JpegRaw(benchmark::State& state) {
    const Bytes& file = jpegFile();
    for (auto _ : state) {
        jpeg_decompress_struct cinfo;
        jpeg_error_mgr errors;
        cinfo.err = jpeg_std_error(&errors);
        jpeg_create_decompress(&cinfo);
        jpeg_mem_src(&cinfo, file.data(), file.size());
        jpeg_read_header(&cinfo, TRUE);
        jpeg_start_decompress(&cinfo);
        const size_t stride = static_cast<size_t>(cinfo.output_width) * cinfo.output_components;
        unsigned char* pixels = new unsigned char[stride * cinfo.output_height];
        while (cinfo.output_scanline < cinfo.output_height) {
            JSAMPROW row = pixels + cinfo.output_scanline * stride;
            jpeg_read_scanlines(&cinfo, &row, 1);
        }
        jpeg_finish_decompress(&cinfo);
        jpeg_destroy_decompress(&cinfo);
        benchmark::DoNotOptimize(pixels);
        delete[] pixels;
    }
    state.SetItemsProcessed(state.iterations() * kWidth * kHeight);
}
BENCHMARK(BM_JpegRaw)->Unit(benchmark::kMillisecond);

}  // namespace

int main(int argc, char** argv) {
    pngFile();
    jpegFile();
    benchmark::Initialize(&argc, argv);
    RateReporter reporter;
    benchmark::RunSpecifiedBenchmarks(&reporter);
    const char* pairs[][2] = {{"BM_PngImage", "BM_PngRaw"}, {"BM_JpegImage", "BM_JpegRaw"}};
    for (const auto& pair : pairs) {
        const double ours = reporter.rate(pair[0]);
        const double raw = reporter.rate(pair[1]);
        if (ours > 0 && raw > 0) {
            std::printf("%-14s vs %-12s rate ratio %.3f (%.1f vs %.1f Mpixel/s)\n", pair[0], pair[1],
                        ours / raw, ours / 1e6, raw / 1e6);
        }
    }
    benchmark::Shutdown();
    return 0;
}
