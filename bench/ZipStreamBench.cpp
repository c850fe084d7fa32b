// Our zip and gzip streams against the raw dependencies doing the same work in
// the same run: GzipInputStream against a plain zlib inflate of the same
// bytes, and a ZipFile entry stream against plain minizip reading the same
// entry of the same archive file (fopen-based file functions). The ratio of
// each pair is printed at the end.
#include <KD/kd.h>
#include <benchmark/benchmark.h>
#include <minizip/unzip.h>
#include <pal/Simulation.h>
#include <stdlib.h>
#include <zlib.h>

#include <boost/make_shared.hpp>
#include <cstdio>
#include <filesystem>
#include <map>
#include <string>
#include <vector>

#include "io/ByteArrayInputStream.h"
#include "io/ByteArrayOutputStream.h"
#include "io/FileInputStream.h"
#include "io/FileOutputStream.h"
#include "io/zip/GzipInputStream.h"
#include "io/zip/GzipOutputStream.h"
#include "io/zip/ZipFile.h"
#include "io/zip/ZipOutputStream.h"

namespace {

typedef std::vector<unsigned char> Bytes;

const size_t kContentSize = 1 << 20;
const int kEntries = 50;
const char* const kArchive = "/bench.zip";

// Map-tile-like content: repetitive but not trivial, about 4:1 under deflate.
Bytes content(size_t size) {
    Bytes bytes(size);
    unsigned int state = 12345;
    for (size_t i = 0; i < size; ++i) {
        state = state * 1103515245u + 12345u;
        bytes[i] = static_cast<unsigned char>("abcdefgh"[(state >> 16) % 8] + ((i / 64) % 4));
    }
    return bytes;
}

const Bytes& plain() {
    static const Bytes bytes = content(kContentSize);
    return bytes;
}

const Bytes& gzipped() {
    static Bytes bytes;
    if (bytes.empty()) {
        IO::ByteArrayOutputStream out;
        {
            IO::Zip::GzipOutputStream gzip(&out);
            gzip.write(plain().data(), static_cast<int>(plain().size()));
        }
        bytes = out.getData();
    }
    return bytes;
}

// An archive of small entries plus the measured ones, in the platform's file root.
std::string archiveHostPath() {
    static std::string path;
    if (path.empty()) {
        boost::shared_ptr<IO::FileOutputStream> file = boost::make_shared<IO::FileOutputStream>();
        file->init(kArchive);
        {
            IO::Zip::ZipOutputStream zip(file);
            Bytes small = content(2000);
            for (int i = 0; i < kEntries; ++i) {
                zip.openEntry(("tiles/" + std::to_string(i) + ".bin").c_str(), true);
                zip.write(small.data(), static_cast<int>(small.size()));
                zip.closeEntry();
            }
            zip.openEntry("deflated.bin", true);
            zip.write(plain().data(), static_cast<int>(plain().size()));
            zip.closeEntry();
            zip.openEntry("stored.bin", false);
            zip.write(plain().data(), static_cast<int>(plain().size()));
            zip.closeEntry();
        }
        path = pal::hostPath(kArchive);
    }
    return path;
}

void BM_GzipInputStream(benchmark::State& state) {
    const Bytes& input = gzipped();
    Bytes out(plain().size());
    for (auto _ : state) {
        IO::ByteArrayInputStream in(input.data(), static_cast<int>(input.size()));
        IO::Zip::GzipInputStream gzip(&in);
        int count = gzip.read(out.data(), static_cast<int>(gzip.available()));
        benchmark::DoNotOptimize(count);
    }
    state.SetBytesProcessed(state.iterations() * plain().size());
}

void BM_ZlibInflate(benchmark::State& state) {
    const Bytes& input = gzipped();
    Bytes out(plain().size());
    for (auto _ : state) {
        z_stream zs = {};
        inflateInit2(&zs, 47);
        zs.next_in = const_cast<Bytef*>(input.data());
        zs.avail_in = static_cast<uInt>(input.size());
        zs.next_out = out.data();
        zs.avail_out = static_cast<uInt>(out.size());
        int result = inflate(&zs, Z_FINISH);
        inflateEnd(&zs);
        benchmark::DoNotOptimize(result);
    }
    state.SetBytesProcessed(state.iterations() * plain().size());
}

// Our entry streams over an archive opened once, as resource reading does.
void readOurEntry(benchmark::State& state, const char* name, bool cached) {
    boost::shared_ptr<IO::FileInputStream> file = boost::make_shared<IO::FileInputStream>();
    file->init(kArchive);
    boost::shared_ptr<IO::Zip::ZipFile> zip = boost::make_shared<IO::Zip::ZipFile>();
    zip->init(file, nullptr);
    const IO::Zip::ZipEntry* entry = zip->findEntry(name);
    Bytes out(plain().size());
    for (auto _ : state) {
        boost::shared_ptr<IO::InputStream> stream = zip->getInputStream(*entry, cached);
        int total = 0;
        while (stream->available() > 0) {
            int chunk = stream->available() < 65536 ? static_cast<int>(stream->available()) : 65536;
            total += stream->read(out.data() + total, chunk);
        }
        benchmark::DoNotOptimize(total);
    }
    state.SetBytesProcessed(state.iterations() * plain().size());
}

void readMinizipEntry(benchmark::State& state, const char* name) {
    unzFile zip = unzOpen64(archiveHostPath().c_str());
    Bytes out(plain().size());
    for (auto _ : state) {
        unzLocateFile(zip, name, 1);
        unzOpenCurrentFile(zip);
        int total = 0;
        int count;
        while ((count = unzReadCurrentFile(zip, out.data() + total, 65536)) > 0) {
            total += count;
        }
        unzCloseCurrentFile(zip);
        benchmark::DoNotOptimize(total);
    }
    unzClose(zip);
    state.SetBytesProcessed(state.iterations() * plain().size());
}

void BM_ZipEntryCached(benchmark::State& state) {
    readOurEntry(state, "deflated.bin", true);
}
void BM_ZipEntryUncached(benchmark::State& state) {
    readOurEntry(state, "deflated.bin", false);
}
void BM_MinizipEntry(benchmark::State& state) {
    readMinizipEntry(state, "deflated.bin");
}
void BM_ZipEntryStored(benchmark::State& state) {
    readOurEntry(state, "stored.bin", true);
}
void BM_MinizipEntryStored(benchmark::State& state) {
    readMinizipEntry(state, "stored.bin");
}

// Opening the archive: our index reads every entry's header; minizip only the directory.
void BM_ZipFileOpenAndIndex(benchmark::State& state) {
    for (auto _ : state) {
        boost::shared_ptr<IO::FileInputStream> file = boost::make_shared<IO::FileInputStream>();
        file->init(kArchive);
        boost::shared_ptr<IO::Zip::ZipFile> zip = boost::make_shared<IO::Zip::ZipFile>();
        benchmark::DoNotOptimize(zip->init(file, nullptr));
    }
}

void BM_MinizipOpenAndList(benchmark::State& state) {
    for (auto _ : state) {
        unzFile zip = unzOpen64(archiveHostPath().c_str());
        char name[256];
        unz_file_info64 info;
        for (int result = unzGoToFirstFile(zip); result == UNZ_OK; result = unzGoToNextFile(zip)) {
            unzGetCurrentFileInfo64(zip, &info, name, sizeof(name), nullptr, 0, nullptr, 0);
        }
        unzClose(zip);
    }
}

BENCHMARK(BM_GzipInputStream)->Unit(benchmark::kMillisecond);
BENCHMARK(BM_ZlibInflate)->Unit(benchmark::kMillisecond);
BENCHMARK(BM_ZipEntryCached)->Unit(benchmark::kMillisecond);
BENCHMARK(BM_ZipEntryUncached)->Unit(benchmark::kMillisecond);
BENCHMARK(BM_MinizipEntry)->Unit(benchmark::kMillisecond);
BENCHMARK(BM_ZipEntryStored)->Unit(benchmark::kMillisecond);
BENCHMARK(BM_MinizipEntryStored)->Unit(benchmark::kMillisecond);
BENCHMARK(BM_ZipFileOpenAndIndex)->Unit(benchmark::kMicrosecond);
BENCHMARK(BM_MinizipOpenAndList)->Unit(benchmark::kMicrosecond);

// Keeps each benchmark's real time per iteration for the ratios printed at the end.
class TimeReporter : public benchmark::ConsoleReporter {
public:
    void ReportRuns(const std::vector<Run>& runs) override {
        for (const Run& run : runs) {
            if (run.iterations > 0) {
                seconds[run.benchmark_name()] =
                    run.real_accumulated_time / static_cast<double>(run.iterations);
            }
        }
        ConsoleReporter::ReportRuns(runs);
    }
    std::map<std::string, double> seconds;
};

void printRatio(TimeReporter& reporter, const char* ours, const char* raw) {
    double a = reporter.seconds[ours];
    double b = reporter.seconds[raw];
    if (a > 0 && b > 0) {
        std::printf("%-24s %10.3f ms  vs %-22s %10.3f ms  ratio %.2f\n", ours, a * 1e3, raw, b * 1e3, a / b);
    }
}

}  // namespace

int main(int argc, char** argv) {
    std::string root = (std::filesystem::temp_directory_path() / "mapcore-bench-XXXXXX").string();
    if (mkdtemp(&root[0]) == nullptr) {
        return 1;
    }
    pal::setFileRoot(root);
    archiveHostPath();
    gzipped();

    benchmark::Initialize(&argc, argv);
    TimeReporter reporter;
    benchmark::RunSpecifiedBenchmarks(&reporter);
    printRatio(reporter, "BM_GzipInputStream", "BM_ZlibInflate");
    printRatio(reporter, "BM_ZipEntryCached", "BM_MinizipEntry");
    printRatio(reporter, "BM_ZipEntryUncached", "BM_MinizipEntry");
    printRatio(reporter, "BM_ZipEntryStored", "BM_MinizipEntryStored");
    printRatio(reporter, "BM_ZipFileOpenAndIndex", "BM_MinizipOpenAndList");
    benchmark::Shutdown();
    std::error_code ignored;
    std::filesystem::remove_all(root, ignored);
    return 0;
}
