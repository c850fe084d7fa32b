// JPEG files of about 150 bytes that declare 8192 x 8192 pixels and carry no
// data. The figure is the peak memory a decode gains (peak_growth_MB) against
// the bound it must stay within: the size of the decoded image plus 16 MiB
// (bound_MB). Progressive headers would make libjpeg buffer the coefficients
// of the whole image first; a baseline header decodes to a gray image of the
// declared size.
#include <benchmark/benchmark.h>

#include <boost/shared_ptr.hpp>
#include <vector>

#include "PeakMemory.h"
#include "image/Image.h"
#include "io/ByteArrayInputStream.h"

namespace {

typedef std::vector<unsigned char> Bytes;

const unsigned kSide = 8192;

// Both sides, the sampling factors of each component (h << 4 | v), one
// quantisation table, one Huffman table of each kind, a scan without data
// (the first component's DC coefficients when progressive, every component
// otherwise) and the end marker.
Bytes headerOnlyJpeg(const Bytes& sampling, bool progressive) {
    Bytes out = {0xFF, 0xD8};
    auto segment = [&out](unsigned char marker, const Bytes& body) {
        const size_t length = body.size() + 2;
        out.insert(out.end(), {0xFF, marker, static_cast<unsigned char>(length >> 8),
                               static_cast<unsigned char>(length & 0xFF)});
        out.insert(out.end(), body.begin(), body.end());
    };
    Bytes quantisation(65, 1);
    quantisation[0] = 0;
    segment(0xDB, quantisation);
    const unsigned char high = static_cast<unsigned char>(kSide >> 8);
    const unsigned char low = static_cast<unsigned char>(kSide & 0xFF);
    Bytes frame = {8, high, low, high, low, static_cast<unsigned char>(sampling.size())};
    for (size_t i = 0; i < sampling.size(); ++i) {
        frame.insert(frame.end(), {static_cast<unsigned char>(i + 1), sampling[i], 0});
    }
    segment(progressive ? 0xC2 : 0xC0, frame);
    for (unsigned char tableClass : {0x00, 0x10}) {
        Bytes huffman(18, 0);
        huffman[0] = tableClass;
        huffman[1] = 1;
        segment(0xC4, huffman);
    }
    const size_t inScan = progressive ? 1 : sampling.size();
    Bytes scan = {static_cast<unsigned char>(inScan)};
    for (size_t i = 0; i < inScan; ++i) {
        scan.insert(scan.end(), {static_cast<unsigned char>(i + 1), 0x00});
    }
    scan.insert(scan.end(), {0, static_cast<unsigned char>(progressive ? 0 : 63), 0});
    segment(0xDA, scan);
    out.insert(out.end(), {0xFF, 0xD9});
    return out;
}

void decodeHeaderOnly(benchmark::State& state, const Bytes& sampling, bool progressive) {
    const Bytes file = headerOnlyJpeg(sampling, progressive);
    const unsigned components = sampling.size() == 1 ? 1 : 3;
    double worstGrowth = 0;
    for (auto _ : state) {
        PeakMemoryProbe probe;
        {
            IO::ByteArrayInputStream in(file.data(), static_cast<int>(file.size()));
            boost::shared_ptr<Image> image = Image::createImage(&in, Image::JPEG);
            benchmark::DoNotOptimize(image.get());
        }
        worstGrowth = std::max(worstGrowth, probe.growthMb());
    }
    const double imageMb = static_cast<double>(kSide) * kSide * components / (1 << 20);
    state.counters["file_bytes"] = static_cast<double>(file.size());
    state.counters["peak_growth_MB"] = worstGrowth;
    state.counters["bound_MB"] = imageMb + 16;
}

void BM_ProgressiveHeader420(benchmark::State& state) {
    decodeHeaderOnly(state, {0x22, 0x11, 0x11}, true);
}
BENCHMARK(BM_ProgressiveHeader420)->Unit(benchmark::kMillisecond)->Iterations(1);

void BM_ProgressiveHeader444(benchmark::State& state) {
    decodeHeaderOnly(state, {0x11, 0x11, 0x11}, true);
}
BENCHMARK(BM_ProgressiveHeader444)->Unit(benchmark::kMillisecond)->Iterations(1);

void BM_BaselineHeader420(benchmark::State& state) {
    decodeHeaderOnly(state, {0x22, 0x11, 0x11}, false);
}
BENCHMARK(BM_BaselineHeader420)->Unit(benchmark::kMillisecond)->Iterations(1);

}  // namespace

BENCHMARK_MAIN();
