// Requests per second over keep-alive loopback connections to a cpp-httplib
// server started here: our HttpConnection (engine thread, callbacks posted to
// the starting thread) against plain libcurl with one reused easy handle
// fetching the same URLs in the same run. Both receive the whole body.
#include <KD/kd.h>
#include <benchmark/benchmark.h>
#include <curl/curl.h>
#include <httplib.h>

#include <boost/make_shared.hpp>
#include <chrono>
#include <string>
#include <thread>
#include <vector>

#include "network/HttpConnection.h"
#include "network/HttpEngine.h"
#include "network/HttpRequest.h"

namespace {

const int kRequestsPerIteration = 200;
const int kDistinctUrls = 50;

class LoopbackServer {
public:
    LoopbackServer() {
        server.set_tcp_nodelay(true);
        server.set_keep_alive_max_count(1000000);
        server.Get(R"(/item/(\d+))", [](const httplib::Request& request, httplib::Response& response) {
            response.set_content("item " + request.matches[1].str() + std::string(200, '.'), "text/plain");
        });
        port = server.bind_to_any_port("127.0.0.1");
        thread = std::thread([this] { server.listen_after_bind(); });
        while (!server.is_running()) {
            std::this_thread::yield();
        }
        for (int i = 0; i < kDistinctUrls; ++i) {
            urls.push_back("http://127.0.0.1:" + std::to_string(port) + "/item/" + std::to_string(i));
        }
    }
    ~LoopbackServer() {
        server.stop();
        thread.join();
    }

    std::vector<std::string> urls;

private:
    httplib::Server server;
    int port = 0;
    std::thread thread;
};

LoopbackServer& loopback() {
    static LoopbackServer instance;
    return instance;
}

size_t appendBody(char* data, size_t size, size_t count, void* target) {
    static_cast<std::string*>(target)->append(data, size * count);
    return size * count;
}

// The plain path: one easy handle, reused, so its connection stays open.
class PlainFetcher {
public:
    explicit PlainFetcher(const std::vector<std::string>& urls) : urls(urls), handle(curl_easy_init()) {
        curl_easy_setopt(handle, CURLOPT_NOSIGNAL, 1L);
        curl_easy_setopt(handle, CURLOPT_WRITEFUNCTION, &appendBody);
        curl_easy_setopt(handle, CURLOPT_WRITEDATA, &body);
    }
    ~PlainFetcher() { curl_easy_cleanup(handle); }

    bool run(int requests) {
        for (int i = 0; i < requests; ++i) {
            body.clear();
            curl_easy_setopt(handle, CURLOPT_URL, urls[next++ % urls.size()].c_str());
            if (curl_easy_perform(handle) != CURLE_OK) {
                return false;
            }
            bytes += body.size();
        }
        return true;
    }

    std::size_t bytes = 0;

private:
    const std::vector<std::string>& urls;
    CURL* handle;
    std::string body;
    std::size_t next = 0;
};

void BM_PlainCurlReusedHandle(benchmark::State& state) {
    PlainFetcher plain(loopback().urls);
    for (auto _ : state) {
        if (!plain.run(kRequestsPerIteration)) {
            state.SkipWithError("request failed");
            break;
        }
    }
    benchmark::DoNotOptimize(plain.bytes);
    state.SetItemsProcessed(state.iterations() * kRequestsPerIteration);
}
BENCHMARK(BM_PlainCurlReusedHandle)->UseRealTime()->Unit(benchmark::kMillisecond);

// Runs connections with at most `inFlight` open at once, refilling from the
// finished callback, on the benchmark's thread.
class Fetcher {
public:
    Fetcher(const std::vector<std::string>& urls, int inFlight) : urls(urls), inFlight(inFlight) {}

    bool run(int requests) {
        started = 0;
        finished = 0;
        failed = false;
        remaining = requests;
        while (started < inFlight && started < remaining) {
            startNext();
        }
        while (finished < remaining) {
            kdWaitEvent(static_cast<KDust>(-1));
        }
        return !failed;
    }

    std::size_t bytes = 0;

private:
    void startNext() {
        boost::shared_ptr<Network::HttpRequest> request =
            Network::HttpRequest::create(urls[started % urls.size()].c_str(), "GET", 30000, false);
        boost::shared_ptr<Network::HttpConnection> connection = boost::make_shared<Network::HttpConnection>(
            request, boost::weak_ptr<Network::NetworkSpeedCollector>(), started);
        connection->setOnBodyDataReceivedCallback(
            Network::HttpConnection::OnBodyDataReceivedCallback::make<Fetcher, &Fetcher::onBody>(this), true);
        connection->setOnFinishedCallback(
            Network::HttpConnection::OnFinishedCallback::make<Fetcher, &Fetcher::onFinished>(this));
        connection->start();
        open.push_back(connection);
        ++started;
    }
    void onBody(boost::shared_ptr<Network::HttpConnection>, boost::shared_ptr<Network::DataChunk> chunk) {
        bytes += chunk->size();
    }
    void onFinished(boost::shared_ptr<Network::HttpConnection> connection, int code) {
        failed = failed || code != 0;
        ++finished;
        for (std::size_t i = 0; i < open.size(); ++i) {
            if (open[i] == connection) {
                open.erase(open.begin() + i);
                break;
            }
        }
        if (started < remaining) {
            startNext();
        }
    }

    const std::vector<std::string>& urls;
    const int inFlight;
    int started = 0;
    int finished = 0;
    int remaining = 0;
    bool failed = false;
    std::vector<boost::shared_ptr<Network::HttpConnection> > open;
};

void BM_HttpConnection(benchmark::State& state) {
    Network::HttpEngine engine;
    Fetcher fetcher(loopback().urls, static_cast<int>(state.range(0)));
    for (auto _ : state) {
        if (!fetcher.run(kRequestsPerIteration)) {
            state.SkipWithError("request failed");
            break;
        }
    }
    benchmark::DoNotOptimize(fetcher.bytes);
    state.SetItemsProcessed(state.iterations() * kRequestsPerIteration);
}
// One at a time is the like-for-like comparison with the plain handle: each
// request then crosses to the engine thread and back, two thread switches
// the plain handle does not make. Four and eight in flight (eight is the
// network manager's connection limit) show the engine multiplexing.
BENCHMARK(BM_HttpConnection)
    ->ArgName("inFlight")
    ->Arg(1)
    ->Arg(4)
    ->Arg(8)
    ->UseRealTime()
    ->Unit(benchmark::kMillisecond);

// Both paths one request at a time, alternating in small batches so that both
// see the same load on a shared machine; the ratio is the figure to read.
void BM_EngineVersusPlainAlternating(benchmark::State& state) {
    const int batch = 20;
    Network::HttpEngine engine;
    PlainFetcher plain(loopback().urls);
    Fetcher fetcher(loopback().urls, 1);
    std::chrono::duration<double> plainTime(0);
    std::chrono::duration<double> engineTime(0);
    for (auto _ : state) {
        auto start = std::chrono::steady_clock::now();
        bool plainOk = plain.run(batch);
        auto middle = std::chrono::steady_clock::now();
        bool engineOk = fetcher.run(batch);
        auto end = std::chrono::steady_clock::now();
        if (!plainOk || !engineOk) {
            state.SkipWithError("request failed");
            break;
        }
        plainTime += middle - start;
        engineTime += end - middle;
    }
    double requests = static_cast<double>(state.iterations()) * batch;
    double plainRate = requests / plainTime.count();
    double engineRate = requests / engineTime.count();
    state.counters["plain_per_s"] = plainRate;
    state.counters["engine_per_s"] = engineRate;
    state.counters["engine_vs_plain"] = engineRate / plainRate;
}
BENCHMARK(BM_EngineVersusPlainAlternating)->UseRealTime()->Unit(benchmark::kMillisecond)->MinTime(3.0);

}  // namespace

BENCHMARK_MAIN();
