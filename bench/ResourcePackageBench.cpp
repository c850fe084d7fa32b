// Resource packages and gzip output against the raw dependencies in the same run:
// - indexing a package of 20,000 entries against minizip's own walk of its directory;
// - opening (and reading) the first and the last of those entries, which must cost the same;
// - reading a resource split into 64 KiB blocks against the same bytes as one entry;
// - GzipOutputStream against plain zlib deflate at the same level and window.
// The ratios are printed at the end.
#include <KD/kd.h>
#include <benchmark/benchmark.h>
#include <minizip/unzip.h>
#include <pal/Simulation.h>
#include <stdlib.h>
#include <zlib.h>

#include <boost/make_shared.hpp>
#include <cstdio>
#include <filesystem>
#include <string>
#include <vector>

#include "RateReporter.h"
#include "io/ByteArrayOutputStream.h"
#include "io/FileInputStream.h"
#include "io/FileOutputStream.h"
#include "io/resource/PackageBuilder.h"
#include "io/resource/ResourceFile.h"
#include "io/zip/GzipOutputStream.h"

namespace {

typedef std::vector<unsigned char> Bytes;

const int kEntries = 20000;
const char* const kPackage = "/res/bench.pak";
const size_t kLargeSize = 8 << 20;
const unsigned int kBlockSize = 64 << 10;

// Map-tile-like content: repetitive but not trivial, about 4:1 under deflate.
Bytes content(size_t size, unsigned int seed) {
    Bytes bytes(size);
    unsigned int state = seed;
    for (size_t i = 0; i < size; ++i) {
        state = state * 1103515245u + 12345u;
        bytes[i] = static_cast<unsigned char>("abcdefgh"[(state >> 16) % 8] + ((i / 64) % 4));
    }
    return bytes;
}

std::string tileName(int index) {
    char name[32];
    std::snprintf(name, sizeof(name), "tiles/%05d.bin", index);
    return name;
}

// The large resources come first, so that the last tile is the directory's last entry.
void writePackage() {
    boost::shared_ptr<IO::FileOutputStream> file = boost::make_shared<IO::FileOutputStream>();
    file->init(kPackage);
    IO::Resource::PackageBuilder builder(file, kBlockSize);
    const Bytes large = content(kLargeSize, 7);
    builder.addResource("large/split.bin", large.data(), large.size(), true);
    const Bytes tile = content(300, 3);
    for (int i = 0; i < kEntries; ++i) {
        builder.addResource(tileName(i), tile.data(), tile.size(), true);
    }
}

// The same bytes as one entry, in a package of their own (a builder never splits with block size 0).
void writeSingleEntryPackage() {
    boost::shared_ptr<IO::FileOutputStream> file = boost::make_shared<IO::FileOutputStream>();
    file->init("/res/single.pak");
    IO::Resource::PackageBuilder builder(file, 0);
    const Bytes large = content(kLargeSize, 7);
    builder.addResource("large/single.bin", large.data(), large.size(), true);
}

boost::shared_ptr<IO::InputStream> openPackage(const char* path) {
    boost::shared_ptr<IO::FileInputStream> file = boost::make_shared<IO::FileInputStream>();
    file->init(path);
    return file;
}

void BM_PackageIndex(benchmark::State& state) {
    for (auto _ : state) {
        benchmark::DoNotOptimize(IO::Resource::ResourceFile::createFileSystem(openPackage(kPackage)));
    }
    state.SetItemsProcessed(state.iterations());
}

void BM_MinizipWalk(benchmark::State& state) {
    const std::string path = pal::hostPath(kPackage);
    for (auto _ : state) {
        unzFile zip = unzOpen64(path.c_str());
        char name[256];
        unz_file_info64 info;
        for (int result = unzGoToFirstFile(zip); result == UNZ_OK; result = unzGoToNextFile(zip)) {
            unzGetCurrentFileInfo64(zip, &info, name, sizeof(name), nullptr, 0, nullptr, 0);
        }
        unzClose(zip);
    }
    state.SetItemsProcessed(state.iterations());
}

// Opens the resource as FileManager does (the package file again, then the shared index) and
// reads it whole in 64 KiB reads.
void openAndRead(benchmark::State& state, const char* package, const std::string& name) {
    boost::shared_ptr<IO::Resource::FileSystem> index =
        IO::Resource::ResourceFile::createFileSystem(openPackage(package));
    Bytes chunk(64 << 10);
    long long bytes = 0;
    for (auto _ : state) {
        boost::shared_ptr<IO::Resource::ResourceFile> resource =
            boost::make_shared<IO::Resource::ResourceFile>(openPackage(package));
        boost::shared_ptr<IO::InputStream> stream = resource->openInputStream(name, index);
        while (stream->available() > 0) {
            int length = static_cast<int>(std::min<long long>(chunk.size(), stream->available()));
            bytes += stream->read(chunk.data(), length);
        }
    }
    state.SetItemsProcessed(state.iterations());
    state.SetBytesProcessed(bytes);
}

void BM_OpenFirstEntry(benchmark::State& state) {
    openAndRead(state, kPackage, tileName(0));
}
void BM_OpenLastEntry(benchmark::State& state) {
    openAndRead(state, kPackage, tileName(kEntries - 1));
}
void BM_SplitResourceRead(benchmark::State& state) {
    openAndRead(state, kPackage, "large/split.bin");
}
void BM_SingleEntryRead(benchmark::State& state) {
    openAndRead(state, "/res/single.pak", "large/single.bin");
}

const Bytes& gzipInput() {
    static const Bytes bytes = content(1 << 20, 11);
    return bytes;
}

void BM_GzipOutputStream(benchmark::State& state) {
    for (auto _ : state) {
        IO::ByteArrayOutputStream out;
        {
            IO::Zip::GzipOutputStream gzip(&out);
            gzip.write(gzipInput().data(), static_cast<int>(gzipInput().size()));
        }
        benchmark::DoNotOptimize(out.getData().data());
    }
    state.SetItemsProcessed(state.iterations());
    state.SetBytesProcessed(state.iterations() * gzipInput().size());
}

void BM_ZlibDeflate(benchmark::State& state) {
    Bytes out;
    for (auto _ : state) {
        z_stream zs = {};
        deflateInit2(&zs, Z_DEFAULT_COMPRESSION, Z_DEFLATED, 31, 8, Z_DEFAULT_STRATEGY);
        out.resize(deflateBound(&zs, gzipInput().size()));
        zs.next_in = const_cast<Bytef*>(gzipInput().data());
        zs.avail_in = static_cast<uInt>(gzipInput().size());
        zs.next_out = out.data();
        zs.avail_out = static_cast<uInt>(out.size());
        deflate(&zs, Z_FINISH);
        deflateEnd(&zs);
        benchmark::DoNotOptimize(out.data());
    }
    state.SetItemsProcessed(state.iterations());
    state.SetBytesProcessed(state.iterations() * gzipInput().size());
}

BENCHMARK(BM_PackageIndex)->Unit(benchmark::kMillisecond);
BENCHMARK(BM_MinizipWalk)->Unit(benchmark::kMillisecond);
BENCHMARK(BM_OpenFirstEntry)->Unit(benchmark::kMicrosecond);
BENCHMARK(BM_OpenLastEntry)->Unit(benchmark::kMicrosecond);
BENCHMARK(BM_SplitResourceRead)->Unit(benchmark::kMillisecond);
BENCHMARK(BM_SingleEntryRead)->Unit(benchmark::kMillisecond);
BENCHMARK(BM_GzipOutputStream)->Unit(benchmark::kMillisecond);
BENCHMARK(BM_ZlibDeflate)->Unit(benchmark::kMillisecond);

// Time of ours over time of the baseline (items are whole operations).
void printTimeRatio(const RateReporter& reporter, const char* ours, const char* baseline,
                    const char* target) {
    double oursRate = reporter.rate(ours);
    double baselineRate = reporter.rate(baseline);
    if (oursRate > 0 && baselineRate > 0) {
        std::printf("%-22s / %-20s time ratio %.2f  (%s)\n", ours, baseline, baselineRate / oursRate, target);
    }
}

}  // namespace

int main(int argc, char** argv) {
    std::string root = (std::filesystem::temp_directory_path() / "mapcore-bench-XXXXXX").string();
    if (mkdtemp(&root[0]) == nullptr) {
        return 1;
    }
    pal::setFileRoot(root);
    writePackage();
    writeSingleEntryPackage();

    benchmark::Initialize(&argc, argv);
    RateReporter reporter;
    benchmark::RunSpecifiedBenchmarks(&reporter);
    printTimeRatio(reporter, "BM_PackageIndex", "BM_MinizipWalk", "target <= 1.25");
    printTimeRatio(reporter, "BM_OpenLastEntry", "BM_OpenFirstEntry", "target about 1");
    printTimeRatio(reporter, "BM_SplitResourceRead", "BM_SingleEntryRead", "target <= 1.25, speed >= 0.8");
    printTimeRatio(reporter, "BM_GzipOutputStream", "BM_ZlibDeflate", "target <= 1.11, speed >= 0.9");
    benchmark::Shutdown();
    std::error_code ignored;
    std::filesystem::remove_all(root, ignored);
    return 0;
}
