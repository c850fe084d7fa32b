// A server on 127.0.0.1 that streams a 600 MB answer to a connection that
// wants the body whole. The figure is the peak memory the process gains
// (peak_growth_MB) against the bound it must stay within: the connection's
// body limit plus 16 MiB (bound_MB). The transfer ends with the body-too-large
// failure once the limit is passed, and the server stops when we leave.
#include <KD/kd.h>
#include <benchmark/benchmark.h>
#include <httplib.h>

#include <boost/make_shared.hpp>
#include <string>
#include <thread>

#include "PeakMemory.h"
#include "network/HttpConnection.h"
#include "network/HttpEngine.h"
#include "network/HttpFinishCodes.h"
#include "network/HttpRequest.h"

namespace {

const std::size_t kAnswerSize = 600u * 1000 * 1000;
const std::size_t kPieceSize = 64 * 1024;

class EndlessServer {
public:
    EndlessServer() : piece(kPieceSize, 'b') {
        server.Get("/answer", [this](const httplib::Request&, httplib::Response& response) {
            response.set_chunked_content_provider("application/octet-stream",
                                                  [this](std::size_t offset, httplib::DataSink& sink) {
                                                      if (offset >= kAnswerSize) {
                                                          sink.done();
                                                          return true;
                                                      }
                                                      return sink.write(piece.data(), piece.size());
                                                  });
        });
        port = server.bind_to_any_port("127.0.0.1");
        thread = std::thread([this] { server.listen_after_bind(); });
        while (!server.is_running()) {
            std::this_thread::yield();
        }
        url = "http://127.0.0.1:" + std::to_string(port) + "/answer";
    }
    ~EndlessServer() {
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

class WholeBodyCaller {
public:
    int run(const std::string& url) {
        finished = false;
        boost::shared_ptr<Network::HttpConnection> connection = boost::make_shared<Network::HttpConnection>(
            Network::HttpRequest::create(url.c_str(), "GET", 30000, false),
            boost::weak_ptr<Network::NetworkSpeedCollector>(), 0);
        connection->setOnBodyDataReceivedCallback(
            Network::HttpConnection::OnBodyDataReceivedCallback::make<WholeBodyCaller,
                                                                      &WholeBodyCaller::onBody>(this),
            true);
        connection->setOnFinishedCallback(
            Network::HttpConnection::OnFinishedCallback::make<WholeBodyCaller, &WholeBodyCaller::onFinished>(
                this));
        connection->start();
        while (!finished) {
            kdWaitEvent(static_cast<KDust>(-1));
        }
        return code;
    }

private:
    void onBody(boost::shared_ptr<Network::HttpConnection>, boost::shared_ptr<Network::DataChunk>) {}
    void onFinished(boost::shared_ptr<Network::HttpConnection>, int finishCode) {
        code = finishCode;
        finished = true;
    }

    bool finished = false;
    int code = 1;
};

void BM_StreamedAnswerInWholeBodyMode(benchmark::State& state) {
    EndlessServer server;
    Network::HttpEngine engine;
    WholeBodyCaller caller;
    double worstGrowth = 0;
    for (auto _ : state) {
        PeakMemoryProbe probe;
        const int code = caller.run(server.url);
        worstGrowth = std::max(worstGrowth, probe.growthMb());
        if (code != Network::HTTP_BODY_TOO_LARGE_ERROR_CODE) {
            state.SkipWithError("the answer was not cut off at the body limit");
            break;
        }
    }
    const double limitMb = static_cast<double>(Network::HttpConnection::kDefaultMaxWholeBodySize) / (1 << 20);
    state.counters["peak_growth_MB"] = worstGrowth;
    state.counters["bound_MB"] = limitMb + 16;
}
BENCHMARK(BM_StreamedAnswerInWholeBodyMode)->UseRealTime()->Unit(benchmark::kMillisecond)->Iterations(1);

}  // namespace

BENCHMARK_MAIN();
