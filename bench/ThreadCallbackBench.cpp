// Cross-thread calls from a worker to a pumping owner thread: our
// Util::ThreadCallback over the platform layer's event queue, against a bare
// std::mutex + std::condition_variable queue of std::function handing the
// same payload to a waiting owner. Both allocate one shared context per call.
#include <KD/kd.h>
#include <benchmark/benchmark.h>

#include <boost/make_shared.hpp>
#include <condition_variable>
#include <cstdio>
#include <deque>
#include <functional>
#include <mutex>
#include <string>
#include <thread>

#include "RateReporter.h"
#include "util/ThreadCallback.h"

namespace {

const int kCallsPerIteration = 100000;

class Payload : public Util::ThreadCallback::Context {
public:
    explicit Payload(int value) : value(value) {}
    int value;
};

// What the owner thread does with each call, the same for both paths.
struct Sink {
    long long sum = 0;
    int received = 0;
    void consume(const boost::shared_ptr<Util::ThreadCallback::Context>& context) {
        sum += static_cast<Payload*>(context.get())->value;
        ++received;
    }
    void onCall(boost::shared_ptr<Util::ThreadCallback::Context> context) { consume(context); }
};

struct Producer {
    Util::ThreadCallback* threadCallback;
    Sink* sink;
};

void* produceThreadCallbacks(void* argument) {
    Producer* producer = static_cast<Producer*>(argument);
    Util::ThreadCallback::Function function =
        Util::ThreadCallback::Function::make<Sink, &Sink::onCall>(producer->sink);
    for (int i = 0; i < kCallsPerIteration; ++i) {
        producer->threadCallback->asyncPerformIfDifferentThread(function, boost::make_shared<Payload>(i));
    }
    return nullptr;
}

void BM_ThreadCallback(benchmark::State& state) {
    Sink sink;
    Util::ThreadCallback threadCallback;
    Producer producer{&threadCallback, &sink};
    for (auto _ : state) {
        sink.received = 0;
        KDThread* worker = kdThreadCreate(nullptr, &produceThreadCallbacks, &producer);
        while (sink.received < kCallsPerIteration) {
            kdWaitEvent(static_cast<KDust>(-1));
        }
        kdThreadJoin(worker, nullptr);
    }
    benchmark::DoNotOptimize(sink.sum);
    state.SetItemsProcessed(state.iterations() * kCallsPerIteration);
}
BENCHMARK(BM_ThreadCallback)->UseRealTime()->Unit(benchmark::kMillisecond);

// The textbook handoff: push under the lock and notify; the owner waits, pops
// one item under the lock and runs it outside.
class BareQueue {
public:
    void push(std::function<void()> work) {
        {
            std::lock_guard<std::mutex> lock(mutex);
            queue.push_back(std::move(work));
        }
        changed.notify_one();
    }
    std::function<void()> pop() {
        std::unique_lock<std::mutex> lock(mutex);
        changed.wait(lock, [this] { return !queue.empty(); });
        std::function<void()> work = std::move(queue.front());
        queue.pop_front();
        return work;
    }

private:
    std::mutex mutex;
    std::condition_variable changed;
    std::deque<std::function<void()> > queue;
};

void BM_BareConditionVariableQueue(benchmark::State& state) {
    Sink sink;
    BareQueue queue;
    for (auto _ : state) {
        sink.received = 0;
        std::thread worker([&] {
            for (int i = 0; i < kCallsPerIteration; ++i) {
                boost::shared_ptr<Util::ThreadCallback::Context> context = boost::make_shared<Payload>(i);
                queue.push([&sink, context] { sink.consume(context); });
            }
        });
        while (sink.received < kCallsPerIteration) {
            queue.pop()();
        }
        worker.join();
    }
    benchmark::DoNotOptimize(sink.sum);
    state.SetItemsProcessed(state.iterations() * kCallsPerIteration);
}
BENCHMARK(BM_BareConditionVariableQueue)->UseRealTime()->Unit(benchmark::kMillisecond);

}  // namespace

int main(int argc, char** argv) {
    benchmark::Initialize(&argc, argv);
    RateReporter reporter;
    benchmark::RunSpecifiedBenchmarks(&reporter);
    double ours = reporter.rate("BM_ThreadCallback");
    double bare = reporter.rate("BM_BareConditionVariableQueue");
    if (ours > 0 && bare > 0) {
        std::printf("ThreadCallback: %.0f calls/s, bare condition-variable queue: %.0f calls/s, ratio %.2f\n",
                    ours, bare, ours / bare);
    }
    benchmark::Shutdown();
    return 0;
}
