#include "tasking/TaskHolder.h"

#include <KD/kd.h>

#include "tasking/TaskManager.h"

namespace Tasking {

TaskHolder::TaskHolder(bool cancelOnDestroy) : cancelOnDestroy(cancelOnDestroy) {}

TaskHolder::~TaskHolder() {
    if (!task) {
        return;
    }
    if (cancelOnDestroy) {
        TaskManager::getInstance()->cancel(task);
    } else {
        TaskManager::getInstance()->wait(task, false);
    }
    task.reset();
}

void TaskHolder::submit(const boost::shared_ptr<Task>& newTask, int priority) {
    KD_ASSERT(!task);
    task = newTask;
    TaskManager::getInstance()->schedule(task, priority);
}

void TaskHolder::cancel() {
    KD_ASSERT(task);
    if (!task) {
        return;
    }
    TaskManager::getInstance()->cancel(task);
    task.reset();
}

void TaskHolder::wait() {
    KD_ASSERT(task);
    if (!task) {
        return;
    }
    // Keeps the task alive should its onFinished() clear the holder.
    boost::shared_ptr<Task> waited = task;
    TaskManager::getInstance()->wait(waited, true);
}

void TaskHolder::onFinished() {
    KD_ASSERT(task);
    task.reset();
}

}  // namespace Tasking
