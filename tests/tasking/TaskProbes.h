#pragma once

#include <KD/kd.h>
#include <KD/kdext.h>

#include <condition_variable>
#include <functional>
#include <map>
#include <mutex>
#include <string>
#include <vector>

#include "tasking/Task.h"

typedef std::vector<std::string> Names;

// The names of the tasks that ran ("run", on the worker) and were notified
// ("finished", on the owner), in order; any thread.
class Journal {
public:
    void add(const std::string& kind, const std::string& name) {
        std::lock_guard<std::mutex> lock(mutex);
        entries[kind].push_back(name);
    }
    Names read(const std::string& kind) const {
        std::lock_guard<std::mutex> lock(mutex);
        const auto found = entries.find(kind);
        return found == entries.end() ? Names() : found->second;
    }

private:
    mutable std::mutex mutex;
    std::map<std::string, Names> entries;
};

// A flag one thread raises and another waits for.
class Signal {
public:
    void raise() {
        std::lock_guard<std::mutex> lock(mutex);
        raised = true;
        changed.notify_all();
    }
    void waitRaised() {
        std::unique_lock<std::mutex> lock(mutex);
        changed.wait(lock, [this] { return raised; });
    }

private:
    std::mutex mutex;
    std::condition_variable changed;
    bool raised = false;
};

// Journals its run and notification and remembers the threads, the worker's
// scheduling class during the run, and the count of notifications.
class ProbeTask : public Tasking::Task {
public:
    ProbeTask(Journal& journal, const std::string& name) : journal(journal), name(name) {}
    ~ProbeTask() override {
        if (onDestroyed) {
            onDestroyed();
        }
    }

    void run() override {
        runThread = kdThreadSelf();
        kdThreadGetSchedParamZVR(runThread, &runPolicy, &runParam);
        journal.add("run", name);
    }
    void onFinished() override {
        finishedThread = kdThreadSelf();
        ++finishedCount;
        journal.add("finished", name);
        if (onFinishedHook) {
            onFinishedHook();
        }
    }

    Journal& journal;
    const std::string name;
    KDThread* runThread = nullptr;
    KDThread* finishedThread = nullptr;
    KDint runPolicy = -1;
    KDint runParam = -1;
    int finishedCount = 0;
    std::function<void()> onFinishedHook;
    std::function<void()> onDestroyed;
};

// A task whose run() holds the worker until the test opens it, so that the
// test decides what is queued, running or finished.
class GateTask : public ProbeTask {
public:
    using ProbeTask::ProbeTask;

    void run() override {
        ProbeTask::run();
        started.raise();
        opened.waitRaised();
    }
    void waitUntilRunning() { started.waitRaised(); }
    void open() { opened.raise(); }

private:
    Signal started;
    Signal opened;
};

// Pumps the calling thread's events until done() holds. Blocks while nothing
// arrives; the worker's notification events end each wait.
inline void pumpUntil(const std::function<bool()>& done) {
    while (!done()) {
        kdWaitEvent(static_cast<KDust>(-1));
    }
}

// A thread of the test's own, joined when the object goes.
class Helper {
public:
    explicit Helper(std::function<void()> body) : body(std::move(body)) {
        thread = kdThreadCreate(nullptr, &Helper::start, this);
    }
    ~Helper() { kdThreadJoin(thread, nullptr); }

private:
    static void* start(void* self) {
        static_cast<Helper*>(self)->body();
        return nullptr;
    }

    std::function<void()> body;
    KDThread* thread;
};
