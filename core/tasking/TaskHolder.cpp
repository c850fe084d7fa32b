#include "tasking/TaskHolder.h"

#include <KD/kd.h>

#include "tasking/impl/TaskManagerImpl.h"

namespace Tasking {

namespace {

// The process-wide manager the held task was submitted to, or null once it
// is gone: the singleton store may delete it before the holder's owner, and it
// releases our task with everything else. Asking for the manager again then
// would make a new one, with a worker thread, in the middle of the teardown.
TaskManager* liveManager() {
    return TaskManagerImpl::getExistingInstance();
}

}  // namespace

TaskHolder::TaskHolder(bool cancelOnDestroy) : cancelOnDestroy(cancelOnDestroy) {}

TaskHolder::~TaskHolder() {
    TaskManager* manager = task ? liveManager() : nullptr;
    if (manager == nullptr) {
        return;
    }
    if (cancelOnDestroy) {
        manager->cancel(task);
    } else {
        manager->wait(task, false);
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
    if (TaskManager* manager = liveManager()) {
        manager->cancel(task);
    }
    task.reset();
}

void TaskHolder::wait() {
    KD_ASSERT(task);
    if (!task) {
        return;
    }
    TaskManager* manager = liveManager();
    if (manager == nullptr) {
        return;
    }
    // Keeps the task alive should its onFinished() clear the holder.
    boost::shared_ptr<Task> waited = task;
    manager->wait(waited, true);
}

void TaskHolder::onFinished() {
    KD_ASSERT(task);
    task.reset();
}

}  // namespace Tasking
