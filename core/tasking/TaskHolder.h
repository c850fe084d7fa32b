#pragma once

#include <boost/shared_ptr.hpp>

#include "tasking/Task.h"

namespace Tasking {

// Submits one task at a time to the process-wide task manager and ties it to
// the holder's lifetime. The held task calls onFinished() of the holder from
// its own onFinished(). Owner thread of the task manager only.
class TaskHolder {
public:
    // On destruction a task still held is cancelled if cancelOnDestroy is set;
    // otherwise the destructor blocks until it has run (without notifying it).
    // Once the process-wide manager is gone (platform shutdown), which took
    // the task with it, the destructor, cancel() and wait() do nothing.
    explicit TaskHolder(bool cancelOnDestroy);
    ~TaskHolder();

    void submit(const boost::shared_ptr<Task>& task, int priority);
    void cancel();
    // Blocks until the task has run, then notifies it.
    void wait();
    void onFinished();

private:
    TaskHolder(const TaskHolder&) = delete;
    TaskHolder& operator=(const TaskHolder&) = delete;

    const bool cancelOnDestroy;
    boost::shared_ptr<Task> task;
};

}  // namespace Tasking
