// A 100 MB body streamed in parts to a caller slower than the loopback link:
// our HttpConnection (parts posted from the engine thread to the caller)
// against plain libcurl whose write callback does the same slow work inline,
// in the same run. The figures are the peak memory the process gains during
// one download (peak_growth_MB) and the rate; with the engine holding the
// transfer while a bounded backlog waits, both paths grow by about the same.
#include <KD/kd.h>
#include <benchmark/benchmark.h>
#include <curl/curl.h>
#include <httplib.h>

#include <boost/make_shared.hpp>
#include <chrono>
#include <cstdint>
#include <string>
#include <thread>
#include <vector>

#include "PeakMemory.h"
#include "network/HttpConnection.h"
#include "network/HttpEngine.h"
#include "network/HttpRequest.h"

namespace {

const std::size_t kBodySize = 100 * 1024 * 1024;
const std::size_t kPieceSize = 64 * 1024;
// The caller's time per part, whatever its size: far slower than loopback.
const std::chrono::milliseconds kWorkPause(1);

class StreamServer {
public:
    StreamServer() : piece(kPieceSize, 'm') {
        server.set_tcp_nodelay(true);
        server.Get("/stream", [this](const httplib::Request&, httplib::Response& response) {
            response.set_content_provider(
                kBodySize, "application/octet-stream",
                [this](std::size_t offset, std::size_t length, httplib::DataSink& sink) {
                    std::size_t count = std::min(length, piece.size());
                    (void)offset;
                    return sink.write(piece.data(), count);
                });
        });
        port = server.bind_to_any_port("127.0.0.1");
        thread = std::thread([this] { server.listen_after_bind(); });
        while (!server.is_running()) {
            std::this_thread::yield();
        }
        url = "http://127.0.0.1:" + std::to_string(port) + "/stream";
    }
    ~StreamServer() {
        server.stop();
        thread.join();
    }

    std::string url;

private:
    std::string piece;
    httplib::Server server;
    int port = 0;
    std::thread thread;
};

StreamServer& streamServer() {
    static StreamServer instance;
    return instance;
}

// The slow caller's work on one part: a sum, and time spent elsewhere.
std::uint64_t work(const unsigned char* data, std::size_t size) {
    std::uint64_t sum = 0;
    for (std::size_t i = 0; i < size; ++i) {
        sum = sum * 31 + data[i];
    }
    std::this_thread::sleep_for(kWorkPause);
    return sum;
}

size_t slowWrite(char* data, size_t size, size_t count, void* sum) {
    *static_cast<std::uint64_t*>(sum) += work(reinterpret_cast<unsigned char*>(data), size * count);
    return size * count;
}

void BM_PlainCurlSlowCaller(benchmark::State& state) {
    const std::string url = streamServer().url;
    double worstGrowth = 0;
    std::uint64_t sum = 0;
    for (auto _ : state) {
        PeakMemoryProbe probe;
        CURL* handle = curl_easy_init();
        curl_easy_setopt(handle, CURLOPT_URL, url.c_str());
        curl_easy_setopt(handle, CURLOPT_NOSIGNAL, 1L);
        curl_easy_setopt(handle, CURLOPT_WRITEFUNCTION, &slowWrite);
        curl_easy_setopt(handle, CURLOPT_WRITEDATA, &sum);
        CURLcode result = curl_easy_perform(handle);
        curl_easy_cleanup(handle);
        worstGrowth = std::max(worstGrowth, probe.growthMb());
        if (result != CURLE_OK) {
            state.SkipWithError("download failed");
            break;
        }
    }
    benchmark::DoNotOptimize(sum);
    state.counters["peak_growth_MB"] = worstGrowth;
    state.SetBytesProcessed(static_cast<int64_t>(state.iterations() * kBodySize));
}
BENCHMARK(BM_PlainCurlSlowCaller)->UseRealTime()->Unit(benchmark::kMillisecond)->Iterations(1);

class SlowCaller {
public:
    explicit SlowCaller(const std::string& url) : url(url) {}

    bool run() {
        finished = false;
        code = 1;
        boost::shared_ptr<Network::HttpConnection> connection = boost::make_shared<Network::HttpConnection>(
            Network::HttpRequest::create(url.c_str(), "GET", 30000, false),
            boost::weak_ptr<Network::NetworkSpeedCollector>(), 0);
        connection->setOnBodyDataReceivedCallback(
            Network::HttpConnection::OnBodyDataReceivedCallback::make<SlowCaller, &SlowCaller::onBody>(this),
            false);
        connection->setOnFinishedCallback(
            Network::HttpConnection::OnFinishedCallback::make<SlowCaller, &SlowCaller::onFinished>(this));
        connection->start();
        while (!finished) {
            kdWaitEvent(static_cast<KDust>(-1));
        }
        return code == 0;
    }

    std::uint64_t sum = 0;

private:
    void onBody(boost::shared_ptr<Network::HttpConnection>, boost::shared_ptr<Network::DataChunk> chunk) {
        sum += work(chunk->data(), chunk->size());
    }
    void onFinished(boost::shared_ptr<Network::HttpConnection>, int finishCode) {
        code = finishCode;
        finished = true;
    }

    std::string url;
    bool finished = false;
    int code = 1;
};

void BM_HttpConnectionSlowCaller(benchmark::State& state) {
    Network::HttpEngine engine;
    SlowCaller caller(streamServer().url);
    double worstGrowth = 0;
    for (auto _ : state) {
        PeakMemoryProbe probe;
        bool ok = caller.run();
        worstGrowth = std::max(worstGrowth, probe.growthMb());
        if (!ok) {
            state.SkipWithError("download failed");
            break;
        }
    }
    benchmark::DoNotOptimize(caller.sum);
    state.counters["peak_growth_MB"] = worstGrowth;
    state.SetBytesProcessed(static_cast<int64_t>(state.iterations() * kBodySize));
}
BENCHMARK(BM_HttpConnectionSlowCaller)->UseRealTime()->Unit(benchmark::kMillisecond)->Iterations(1);

}  // namespace

BENCHMARK_MAIN();
