// Hostile XML through every reader of the library and the development server: a 389 KB document
// whose root carries 40,000 attributes (TinyXML's pairwise duplicate check took 16-18 s over it)
// and a 2.2 MB one of 200,000 stray end tags before 200,000 open elements (it overflowed
// TinyXML's recursion). Each is refused or parsed; the figures are the time per document and the
// peak memory the process gains (peak_growth_MB). For scale, a benign 2.2 MB track is parsed by
// plain TinyXML and by the GPX reader, whose loader walks the text once more before parsing.
#include <benchmark/benchmark.h>
#include <tinyxml.h>

#include <algorithm>
#include <fstream>
#include <string>
#include <vector>

#include "devserver/UploadDecoder.h"
#include "location/simulator/GpxReader.h"
#include "statistics/wifipool/UploadConstants.h"
#include "util/Logger.h"
#include "util/XmlUtils.h"

namespace {

const std::size_t kUploadLimit = 1 << 20;

std::string repeat(const std::string& text, int times) {
    std::string all;
    all.reserve(text.size() * times);
    for (int i = 0; i < times; ++i) {
        all += text;
    }
    return all;
}

std::string manyAttributes(const std::string& root) {
    std::string text = "<?xml version=\"1.0\" encoding=\"UTF-8\"?><" + root;
    for (int i = 0; i < 40000; ++i) {
        text += " a" + std::to_string(i) + "=\"\"";
    }
    return text + "><trk><trkseg><trkpt lat=\"1\" lon=\"2\"/></trkseg></trk></" + root + ">";
}

std::string deepNesting() {
    return repeat("</x>", 200000) + repeat("<a>", 200000);
}

std::string benignTrack() {
    const std::string point =
        "<trkpt lat=\"48.1251234\" lon=\"11.5012345\"><ele>520.25</ele>"
        "<time>2026-01-01T00:00:01.000Z</time><extensions><mapcore:speed>3.25</mapcore:speed>"
        "</extensions></trkpt>\n";
    return "<?xml version=\"1.0\" encoding=\"UTF-8\"?><gpx version=\"1.1\"><trk><trkseg>" +
           repeat(point, 2200000 / static_cast<int>(point.size())) + "</trkseg></trk></gpx>";
}

long statusKb(const char* field) {
    std::ifstream status("/proc/self/status");
    std::string line;
    const std::string prefix = field;
    while (std::getline(status, line)) {
        if (line.compare(0, prefix.size(), prefix) == 0) {
            return std::stol(line.substr(prefix.size()));
        }
    }
    return 0;
}

// Peak resident growth during one run (Linux: the peak restarts from the current size).
class MemoryProbe {
public:
    MemoryProbe() {
        std::ofstream("/proc/self/clear_refs") << "5";
        start = statusKb("VmRSS:");
    }
    double growthMb() const { return static_cast<double>(statusKb("VmHWM:") - start) / 1024.0; }

private:
    long start;
};

bool throughXmlUtils(const std::string& text) {
    TiXmlDocument doc;
    return Util::XmlUtils::load(std::vector<unsigned char>(text.begin(), text.end()), false, doc);
}

bool throughGpxReader(const std::string& text) {
    std::vector<Simulator::GpxPoint> points;
    std::string error;
    return Simulator::GpxReader::parse(std::vector<unsigned char>(text.begin(), text.end()), points, error);
}

bool throughUploadDecoder(const std::string& text) {
    std::string part = text;
    DevServer::UploadDecoder::unscramble(part);
    DevServer::UploadRecord record;
    DevServer::UploadDecoder(kUploadLimit)
        .decode(std::string("multipart/form-data; boundary=") + Statistics::kUploadBoundary, &part, false,
                record);
    return record.accepted;
}

bool throughPlainTinyXml(const std::string& text) {
    TiXmlDocument doc;
    doc.Parse(text.c_str(), nullptr, TIXML_ENCODING_UTF8);
    return !doc.Error();
}

void run(benchmark::State& state, bool (*reader)(const std::string&), const std::string& text) {
    double worstGrowth = 0;
    bool parsed = false;
    for (auto _ : state) {
        MemoryProbe probe;
        parsed = reader(text);
        worstGrowth = std::max(worstGrowth, probe.growthMb());
    }
    state.counters["parsed"] = parsed ? 1 : 0;
    state.counters["peak_growth_MB"] = worstGrowth;
    state.SetBytesProcessed(static_cast<int64_t>(state.iterations() * text.size()));
}

void BM_AttributesXmlUtils(benchmark::State& state) {
    run(state, throughXmlUtils, manyAttributes("startup"));
}
void BM_AttributesGpxReader(benchmark::State& state) {
    run(state, throughGpxReader, manyAttributes("gpx"));
}
void BM_AttributesUploadDecoder(benchmark::State& state) {
    run(state, throughUploadDecoder, manyAttributes("wifipool"));
}
void BM_NestingXmlUtils(benchmark::State& state) {
    run(state, throughXmlUtils, deepNesting());
}
void BM_NestingGpxReader(benchmark::State& state) {
    run(state, throughGpxReader, deepNesting());
}
void BM_NestingUploadDecoder(benchmark::State& state) {
    run(state, throughUploadDecoder, deepNesting());
}
void BM_BenignTrackPlainTinyXml(benchmark::State& state) {
    run(state, throughPlainTinyXml, benignTrack());
}
void BM_BenignTrackGpxReader(benchmark::State& state) {
    run(state, throughGpxReader, benignTrack());
}

BENCHMARK(BM_AttributesXmlUtils)->Unit(benchmark::kMillisecond);
BENCHMARK(BM_AttributesGpxReader)->Unit(benchmark::kMillisecond);
BENCHMARK(BM_AttributesUploadDecoder)->Unit(benchmark::kMillisecond);
BENCHMARK(BM_NestingXmlUtils)->Unit(benchmark::kMillisecond);
BENCHMARK(BM_NestingGpxReader)->Unit(benchmark::kMillisecond);
BENCHMARK(BM_NestingUploadDecoder)->Unit(benchmark::kMillisecond);
BENCHMARK(BM_BenignTrackPlainTinyXml)->Unit(benchmark::kMillisecond);
BENCHMARK(BM_BenignTrackGpxReader)->Unit(benchmark::kMillisecond);

}  // namespace

int main(int argc, char** argv) {
    // Each refusal is logged at error level; a million lines would drown the figures.
    Logger::level = -1;
    benchmark::Initialize(&argc, argv);
    benchmark::RunSpecifiedBenchmarks();
    benchmark::Shutdown();
    return 0;
}
