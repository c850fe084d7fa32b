// Empty tasks through the task manager: scheduled on the owner thread, run on
// the worker, onFinished() back on the owner, which pumps platform events;
// against a bare worker thread fed through a std::mutex +
// std::condition_variable queue that hands each result back to the owner
// through a second such queue. Both run the same task objects and keep them
// alive by shared pointer while they travel. The manager's worker yields
// after every task, so the bare worker is also measured yielding, to tell the
// cost of the yield from that of the manager.
#include <KD/kdext.h>
#include <benchmark/benchmark.h>

#include <boost/make_shared.hpp>
#include <condition_variable>
#include <cstdio>
#include <deque>
#include <mutex>
#include <string>
#include <thread>
#include <vector>

#include "RateReporter.h"
#include "tasking/TaskManager.h"

namespace {

const int kTasksPerIteration = 20000;

class EmptyTask : public Tasking::Task {
public:
    explicit EmptyTask(int* finished) : finished(finished) {}
    void run() override { benchmark::DoNotOptimize(this); }
    void onFinished() override { ++*finished; }

private:
    int* finished;
};

std::vector<boost::shared_ptr<Tasking::Task> > makeTasks(int* finished) {
    std::vector<boost::shared_ptr<Tasking::Task> > tasks;
    for (int i = 0; i < kTasksPerIteration; ++i) {
        tasks.push_back(boost::make_shared<EmptyTask>(finished));
    }
    return tasks;
}

void BM_TaskManager(benchmark::State& state) {
    int finished = 0;
    std::vector<boost::shared_ptr<Tasking::Task> > tasks = makeTasks(&finished);
    boost::shared_ptr<Tasking::TaskManager> manager = Tasking::TaskManager::create();
    for (auto _ : state) {
        finished = 0;
        for (const boost::shared_ptr<Tasking::Task>& task : tasks) {
            manager->schedule(task, 0);
        }
        while (finished < kTasksPerIteration) {
            kdWaitEvent(static_cast<KDust>(-1));
        }
    }
    state.SetItemsProcessed(state.iterations() * kTasksPerIteration);
}
BENCHMARK(BM_TaskManager)->UseRealTime()->Unit(benchmark::kMillisecond);

// The textbook handoff: push under the lock and notify; the receiver waits,
// pops one item under the lock and handles it outside.
class BareQueue {
public:
    void push(boost::shared_ptr<Tasking::Task> task) {
        {
            std::lock_guard<std::mutex> lock(mutex);
            queue.push_back(std::move(task));
        }
        changed.notify_one();
    }
    // An empty pointer ends the worker.
    boost::shared_ptr<Tasking::Task> pop() {
        std::unique_lock<std::mutex> lock(mutex);
        changed.wait(lock, [this] { return !queue.empty(); });
        boost::shared_ptr<Tasking::Task> task = std::move(queue.front());
        queue.pop_front();
        return task;
    }

private:
    std::mutex mutex;
    std::condition_variable changed;
    std::deque<boost::shared_ptr<Tasking::Task> > queue;
};

void runBareWorker(benchmark::State& state, bool yield) {
    int finished = 0;
    std::vector<boost::shared_ptr<Tasking::Task> > tasks = makeTasks(&finished);
    BareQueue work;
    BareQueue results;
    std::thread worker([&work, &results, yield] {
        while (boost::shared_ptr<Tasking::Task> task = work.pop()) {
            task->run();
            if (yield) {
                kdThreadYieldZVR();
            }
            results.push(std::move(task));
        }
    });
    for (auto _ : state) {
        finished = 0;
        for (const boost::shared_ptr<Tasking::Task>& task : tasks) {
            work.push(task);
        }
        while (finished < kTasksPerIteration) {
            results.pop()->onFinished();
        }
    }
    work.push(boost::shared_ptr<Tasking::Task>());
    worker.join();
    state.SetItemsProcessed(state.iterations() * kTasksPerIteration);
}

void BM_BareWorkerThread(benchmark::State& state) {
    runBareWorker(state, false);
}
BENCHMARK(BM_BareWorkerThread)->UseRealTime()->Unit(benchmark::kMillisecond);

void BM_BareWorkerThreadYielding(benchmark::State& state) {
    runBareWorker(state, true);
}
BENCHMARK(BM_BareWorkerThreadYielding)->UseRealTime()->Unit(benchmark::kMillisecond);

}  // namespace

int main(int argc, char** argv) {
    benchmark::Initialize(&argc, argv);
    RateReporter reporter;
    benchmark::RunSpecifiedBenchmarks(&reporter);
    double ours = reporter.rate("BM_TaskManager");
    double bare = reporter.rate("BM_BareWorkerThread");
    double bareYielding = reporter.rate("BM_BareWorkerThreadYielding");
    if (ours > 0 && bare > 0 && bareYielding > 0) {
        std::printf(
            "TaskManager: %.0f tasks/s; bare worker thread: %.0f tasks/s (ratio %.2f); "
            "bare worker yielding after each task: %.0f tasks/s (ratio %.2f)\n",
            ours, bare, ours / bare, bareYielding, ours / bareYielding);
    }
    benchmark::Shutdown();
    return 0;
}
