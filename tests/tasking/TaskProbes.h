#pragma once

#include <KD/kd.h>

#include <boost/shared_ptr.hpp>
#include <condition_variable>
#include <functional>
#include <mutex>
#include <string>
#include <vector>

#include "tasking/Task.h"

// What the tasks of one test did, in order, from any thread.
class Journal {
public:
    void add(const std::string& entry) {
        std::lock_guard<std::mutex> lock(mutex);
        entries.push_back(entry);
    }
    // The entries of one kind ("run" or "finished"), without the kind.
    std::vector<std::string> read(const std::string& kind) const {
        std::lock_guard<std::mutex> lock(mutex);
        std::vector<std::string> names;
        for (const std::string& entry : entries) {
            if (entry.compare(0, kind.size() + 1, kind + " ") == 0) {
                names.push_back(entry.substr(kind.size() + 1));
            }
        }
        return names;
    }

private:
    mutable std::mutex mutex;
    std::vector<std::string> entries;
};

// Writes "run <name>" on the worker and "finished <name>" on the owner, and
// remembers the threads and counts.
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
        journal.add("run " + name);
    }
    void onFinished() override {
        finishedThread = kdThreadSelf();
        ++finishedCount;
        journal.add("finished " + name);
        if (onFinishedHook) {
            onFinishedHook();
        }
    }

    Journal& journal;
    const std::string name;
    KDThread* runThread = nullptr;
    KDThread* finishedThread = nullptr;
    int finishedCount = 0;
    std::function<void()> onFinishedHook;
    std::function<void()> onDestroyed;
};

// A task whose run() holds the worker until the test opens it, so that the
// test decides what is queued, running or finished.
class GateTask : public ProbeTask {
public:
    GateTask(Journal& journal, const std::string& name) : ProbeTask(journal, name) {}

    void run() override {
        ProbeTask::run();
        std::unique_lock<std::mutex> lock(mutex);
        started = true;
        changed.notify_all();
        changed.wait(lock, [this] { return opened; });
    }

    void waitUntilRunning() {
        std::unique_lock<std::mutex> lock(mutex);
        changed.wait(lock, [this] { return started; });
    }
    void open() {
        std::lock_guard<std::mutex> lock(mutex);
        opened = true;
        changed.notify_all();
    }

private:
    std::mutex mutex;
    std::condition_variable changed;
    bool started = false;
    bool opened = false;
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
