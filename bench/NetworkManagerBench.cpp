// The network manager against the bare HTTP engine on keep-alive loopback
// connections to a cpp-httplib server started here, in the same run:
// (a) requests per second with eight in flight, the two paths alternating in
//     small batches so both see the same machine load; the ratio is the
//     figure to read (target: the manager at most 10 % slower);
// (b) 10,000 tasks submitted at once and admitted through the connection
//     slots: time and heap per queued task, against creating and draining the
//     same number of bare connections eight at a time.
#include <KD/kd.h>
#include <benchmark/benchmark.h>
#include <httplib.h>
#include <malloc.h>

#include <boost/make_shared.hpp>
#include <chrono>
#include <cstdio>
#include <string>
#include <thread>
#include <vector>

#include "network/HttpConnection.h"
#include "network/HttpEngine.h"
#include "network/HttpRequest.h"
#include "network/NetworkManager.h"
#include "network/NetworkTask.h"
#include "network/NetworkTaskBasicRetryPolicy.h"

namespace {

const int kInFlight = 8;
const int kBatch = 40;
const int kQueuedTasks = 10000;

class LoopbackServer {
public:
    LoopbackServer() {
        server.set_tcp_nodelay(true);
        server.set_keep_alive_max_count(1000000);
        server.Get("/item", [](const httplib::Request&, httplib::Response& response) {
            response.set_content(std::string(200, '.'), "text/plain");
        });
        port = server.bind_to_any_port("127.0.0.1");
        thread = std::thread([this] { server.listen_after_bind(); });
        while (!server.is_running()) {
            std::this_thread::yield();
        }
        url = "http://127.0.0.1:" + std::to_string(port) + "/item";
    }
    ~LoopbackServer() {
        server.stop();
        thread.join();
    }

    std::string url;

private:
    httplib::Server server;
    int port = 0;
    std::thread thread;
};

LoopbackServer& loopback() {
    static LoopbackServer instance;
    return instance;
}

std::size_t heapInUse() {
    struct mallinfo2 info = mallinfo2();
    return info.uordblks + info.hblkhd;
}

// Counts finishes and keeps up to `inFlight` requests open by starting the
// next one from each finish. Derived classes say how a request starts.
class Driver {
public:
    explicit Driver(int inFlight) : inFlight(inFlight) {}
    virtual ~Driver() {}

    bool run(int requests) {
        started = 0;
        finished = 0;
        failed = false;
        remaining = requests;
        while (started < inFlight && started < remaining) {
            startNext();
        }
        waitAll();
        return !failed;
    }
    void waitAll() {
        while (finished < remaining) {
            kdWaitEvent(static_cast<KDust>(-1));
        }
    }
    void onDone(bool ok) {
        failed = failed || !ok;
        ++finished;
        if (started < remaining && inFlight > 0) {
            startNext();
        }
    }

    std::size_t bytes = 0;
    int started = 0;
    int finished = 0;
    int remaining = 0;
    bool failed = false;

protected:
    virtual void startNext() = 0;
    const int inFlight;
};

class EngineDriver : public Driver {
public:
    explicit EngineDriver(int inFlight) : Driver(inFlight) {}

    boost::shared_ptr<Network::HttpConnection> make() {
        boost::shared_ptr<Network::HttpRequest> request =
            Network::HttpRequest::create(loopback().url.c_str(), "GET", 30000, false);
        boost::shared_ptr<Network::HttpConnection> connection = boost::make_shared<Network::HttpConnection>(
            request, boost::weak_ptr<Network::NetworkSpeedCollector>(), started);
        connection->setOnBodyDataReceivedCallback(
            Network::HttpConnection::OnBodyDataReceivedCallback::make<EngineDriver, &EngineDriver::onBody>(
                this),
            true);
        connection->setOnFinishedCallback(
            Network::HttpConnection::OnFinishedCallback::make<EngineDriver, &EngineDriver::onFinished>(this));
        return connection;
    }
    void startNext() override {
        boost::shared_ptr<Network::HttpConnection> connection = make();
        connection->start();
        open.push_back(connection);
        ++started;
    }

    std::vector<boost::shared_ptr<Network::HttpConnection> > open;

private:
    void onBody(boost::shared_ptr<Network::HttpConnection>, boost::shared_ptr<Network::DataChunk> chunk) {
        bytes += chunk->size();
    }
    void onFinished(boost::shared_ptr<Network::HttpConnection> connection, int code) {
        for (std::size_t i = 0; i < open.size(); ++i) {
            if (open[i] == connection) {
                open[i] = open.back();
                open.pop_back();
                break;
            }
        }
        onDone(code == 0);
    }
};

class BenchTask : public Network::NetworkTask {
public:
    BenchTask(Driver* driver, int priority) : driver(driver), priority(priority) {}

    bool isReadyToPerform() const override { return true; }
    int getPriority() const override { return priority; }
    boost::shared_ptr<Network::HttpRequest> issueRequest() const override {
        return Network::HttpRequest::create(loopback().url.c_str(), "GET", 30000, false);
    }
    bool needToGatherStatistics() const override { return false; }
    void onBytesReceived(const std::vector<unsigned char>& received) override {
        driver->bytes += received.size();
    }
    void onFinished(int code) override { driver->onDone(code == 200); }

private:
    Driver* driver;
    int priority;
};

// Priority 3 runs up to the manager's maximum of eight at once.
class ManagerDriver : public Driver {
public:
    explicit ManagerDriver(int inFlight, int priority = 3) : Driver(inFlight), priority(priority) {}

    void submit() {
        Network::NetworkManager::getInstance()->submit(
            boost::make_shared<BenchTask>(this, priority),
            boost::make_shared<Network::NetworkTaskBasicRetryPolicy>(1000, 1, false));
        ++started;
    }
    void startNext() override { submit(); }

private:
    int priority;
};

void BM_Engine8InFlight(benchmark::State& state) {
    Network::HttpEngine engine;
    EngineDriver driver(kInFlight);
    for (auto _ : state) {
        if (!driver.run(kBatch)) {
            state.SkipWithError("request failed");
            break;
        }
    }
    state.SetItemsProcessed(state.iterations() * kBatch);
}
BENCHMARK(BM_Engine8InFlight)->UseRealTime()->Unit(benchmark::kMillisecond);

void BM_Manager8InFlight(benchmark::State& state) {
    Network::NetworkManager::getInstance();
    ManagerDriver driver(kInFlight);
    for (auto _ : state) {
        if (!driver.run(kBatch)) {
            state.SkipWithError("request failed");
            break;
        }
    }
    state.SetItemsProcessed(state.iterations() * kBatch);
}
BENCHMARK(BM_Manager8InFlight)->UseRealTime()->Unit(benchmark::kMillisecond);

// Both paths in turn, batch by batch, so that a busy neighbour slows both
// alike; per-request cost of each and their ratio.
void BM_ManagerVersusEngineAlternating(benchmark::State& state) {
    Network::HttpEngine engine;
    Network::NetworkManager::getInstance();
    EngineDriver bare(kInFlight);
    ManagerDriver managed(kInFlight);
    std::chrono::duration<double> bareTime(0);
    std::chrono::duration<double> managedTime(0);
    for (auto _ : state) {
        auto start = std::chrono::steady_clock::now();
        bool bareOk = bare.run(kBatch);
        auto middle = std::chrono::steady_clock::now();
        bool managedOk = managed.run(kBatch);
        auto end = std::chrono::steady_clock::now();
        if (!bareOk || !managedOk) {
            state.SkipWithError("request failed");
            break;
        }
        bareTime += middle - start;
        managedTime += end - middle;
    }
    double requests = static_cast<double>(state.iterations()) * kBatch;
    state.counters["engine_us_per_request"] = bareTime.count() * 1e6 / requests;
    state.counters["manager_us_per_request"] = managedTime.count() * 1e6 / requests;
    state.counters["manager_vs_engine_time"] = managedTime.count() / bareTime.count();
}
BENCHMARK(BM_ManagerVersusEngineAlternating)->UseRealTime()->Unit(benchmark::kMillisecond)->MinTime(3.0);

// 10,000 tasks of priority 1 submitted at once: four start, the rest wait in
// the priority manager with a deadline timer each, and every finish admits
// the next. Baseline: the same number of bare connections made up front and
// drained eight at a time.
void BM_QueuedAdmission(benchmark::State& state) {
    Network::HttpEngine engine;
    Network::NetworkManager::getInstance();
    double submitSeconds = 0;
    double drainSeconds = 0;
    double queuedBytes = 0;
    double bareMakeSeconds = 0;
    double bareDrainSeconds = 0;
    double bareBytes = 0;
    for (auto _ : state) {
        ManagerDriver managed(0, 1);
        managed.remaining = kQueuedTasks;
        std::size_t heapBefore = heapInUse();
        auto start = std::chrono::steady_clock::now();
        for (int i = 0; i < kQueuedTasks; ++i) {
            managed.submit();
        }
        auto submitted = std::chrono::steady_clock::now();
        queuedBytes += static_cast<double>(heapInUse() - heapBefore) / kQueuedTasks;
        managed.waitAll();
        auto drained = std::chrono::steady_clock::now();
        submitSeconds += std::chrono::duration<double>(submitted - start).count();
        drainSeconds += std::chrono::duration<double>(drained - submitted).count();

        EngineDriver bare(kInFlight);
        heapBefore = heapInUse();
        start = std::chrono::steady_clock::now();
        std::vector<boost::shared_ptr<Network::HttpConnection> > made;
        made.reserve(kQueuedTasks);
        for (int i = 0; i < kQueuedTasks; ++i) {
            made.push_back(bare.make());
        }
        submitted = std::chrono::steady_clock::now();
        bareBytes += static_cast<double>(heapInUse() - heapBefore) / kQueuedTasks;
        made.clear();
        bare.run(kQueuedTasks);
        drained = std::chrono::steady_clock::now();
        bareMakeSeconds += std::chrono::duration<double>(submitted - start).count();
        bareDrainSeconds += std::chrono::duration<double>(drained - submitted).count();
        if (managed.failed || bare.failed) {
            state.SkipWithError("request failed");
            break;
        }
    }
    double runs = static_cast<double>(state.iterations());
    state.counters["submit_us_per_task"] = submitSeconds * 1e6 / runs / kQueuedTasks;
    state.counters["heap_bytes_per_queued_task"] = queuedBytes / runs;
    state.counters["drain_us_per_task"] = drainSeconds * 1e6 / runs / kQueuedTasks;
    state.counters["bare_make_us_per_connection"] = bareMakeSeconds * 1e6 / runs / kQueuedTasks;
    state.counters["bare_heap_bytes_per_connection"] = bareBytes / runs;
    state.counters["bare_drain_us_per_request"] = bareDrainSeconds * 1e6 / runs / kQueuedTasks;
}
BENCHMARK(BM_QueuedAdmission)->UseRealTime()->Unit(benchmark::kMillisecond)->Iterations(2);

}  // namespace

BENCHMARK_MAIN();
