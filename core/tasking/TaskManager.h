#pragma once

#include <boost/shared_ptr.hpp>

#include "tasking/Task.h"

namespace Tasking {

// Runs tasks one at a time on a worker thread of its own, highest priority
// first and in order of scheduling within one priority, and calls onFinished()
// of each on the thread that created the manager (the owner), which must pump
// platform events. Every call below is made on the owner thread.
class TaskManager {
public:
    virtual ~TaskManager() {}

    // Queues the task. A task may be scheduled again once it has been notified,
    // consumed by wait() or cancelled (a cancelled running task once its run()
    // has returned); scheduling it, here or on another manager, while a
    // manager still holds it is refused with an assertion. A manager whose
    // worker thread could not start refuses every schedule() and wait() with
    // an assertion.
    virtual void schedule(const boost::shared_ptr<Task>& task, int priority) = 0;
    // Takes a queued or finished task out without notification. A running task
    // is not interrupted: it runs to its end and is then released on the owner
    // thread without notification.
    virtual void cancel(const boost::shared_ptr<Task>& task) = 0;
    // Blocks until the task has run (tasks ahead of it in the queue run first)
    // and takes it out of the pending notifications, calling onFinished() here
    // if notify is set. That call is made with the manager locked, so it must
    // not call back into this manager.
    virtual void wait(const boost::shared_ptr<Task>& task, bool notify) = 0;
    // Moves the worker into the background scheduling class and holds back
    // tasks of priority 0 or less until the mode ends, so that only urgent work
    // competes with the foreground.
    virtual void enableLowProirityMode() = 0;
    virtual void disableLowPriorityMode() = 0;

    // The process-wide manager, created on first use; owned by the singleton
    // store, which deletes it at platform shutdown.
    static TaskManager* getInstance();
    // A separate manager with its own worker, owned by the caller. Destroying
    // it waits for the running task and runs and notifies nothing more.
    static boost::shared_ptr<TaskManager> create();
};

}  // namespace Tasking
