#include "tasking/impl/TaskManagerImpl.h"

#include <KD/kdext.h>

#include <boost/make_shared.hpp>
#include <utility>

#include "util/Logger.h"

namespace Tasking {

TaskManagerImpl::TaskManagerImpl()
    : ownerThread(kdThreadSelf()),
      workerThread(nullptr),
      mutex(kdThreadMutexCreate(nullptr)),
      workAvailable(kdThreadCondCreate(nullptr)),
      taskFinished(kdThreadCondCreate(nullptr)),
      currentTaskAborted(false),
      sequenceCounter(0),
      stopping(false),
      lowPriorityMode(false),
      savedSchedPolicy(KD_THREAD_POLICY_NORMAL_ZVR),
      savedSchedParam(0),
      notificationPending(false),
      destroyedDuringNotification(nullptr) {
    kdInstallCallback(&TaskManagerImpl::onTaskCompletedWrapper, KD_EVENT_USER, this);
    kdThreadMutexLock(mutex);
    workerThread = kdThreadCreate(nullptr, &TaskManagerImpl::runWrapper, this);
    if (workerThread == nullptr) {
        Logger::log(Logger::Error, "TaskManager: cannot start the worker thread");
    } else {
        // Read here and not by the worker when it starts: the owner may move
        // the worker to the background class before it gets to run, and that
        // class must not become what low-priority mode restores.
        kdThreadGetSchedParamZVR(workerThread, &savedSchedPolicy, &savedSchedParam);
    }
    kdThreadMutexUnlock(mutex);
    // Reported at once, and again by every call the manager refuses.
    KD_ASSERT(workerThread != nullptr);
}

TaskManagerImpl::~TaskManagerImpl() {
    KD_ASSERT(kdThreadSelf() == ownerThread);
    kdThreadMutexLock(mutex);
    stopping = true;
    kdThreadMutexUnlock(mutex);
    kdThreadCondSignal(workAvailable);
    if (workerThread != nullptr) {
        kdThreadJoin(workerThread, nullptr);
    }
    // Only now, with the worker gone, has the last notification event been
    // posted; removing the binding discards all of them, so none can reach an
    // object that later gets this address.
    kdInstallCallback(nullptr, KD_EVENT_USER, this);
    if (destroyedDuringNotification != nullptr) {
        *destroyedDuringNotification = true;
    }
    kdThreadCondFree(taskFinished);
    kdThreadCondFree(workAvailable);
    kdThreadMutexFree(mutex);
    releaseTasks();
}

void TaskManagerImpl::schedule(const boost::shared_ptr<Task>& task, int priority) {
    if (!hasWorker()) {
        return;
    }
    // Queued twice, a task would run and be notified twice; held by another
    // manager, its positions would be written by two workers under two locks.
    const TaskState* previous = static_cast<const TaskState*>(task->state.get());
    if (previous != nullptr && previous->held) {
        kdHandleAssertion("a task may be scheduled again only after its notification", __FILE__, __LINE__);
        return;
    }
    boost::shared_ptr<TaskState> state = boost::make_shared<TaskState>(this);
    kdThreadMutexLock(mutex);
    task->state = state;
    const Key key = {priority, sequenceCounter++};
    state->queuePosition = queue.insert(std::make_pair(key, task)).first;
    state->finishedPosition = finishedTasks.end();
    const bool wakeWorker = queue.size() == 1 || (lowPriorityMode && priority > 0);
    kdThreadMutexUnlock(mutex);
    if (wakeWorker) {
        kdThreadCondSignal(workAvailable);
    }
}

void TaskManagerImpl::cancel(const boost::shared_ptr<Task>& task) {
    kdThreadMutexLock(mutex);
    if (task && task == currentTask) {
        currentTaskAborted = true;
    } else if (TaskState* state = heldState(task)) {
        const bool queued = state->queuePosition != queue.end();
        const bool finished = state->finishedPosition != finishedTasks.end();
        KD_ASSERT(!(queued && finished));
        KD_ASSERT(queued || finished);
        if (queued) {
            queue.erase(state->queuePosition);
            state->queuePosition = queue.end();
        }
        if (finished) {
            finishedTasks.erase(state->finishedPosition);
            state->finishedPosition = finishedTasks.end();
        }
        state->held = false;
    }
    kdThreadMutexUnlock(mutex);
}

void TaskManagerImpl::wait(const boost::shared_ptr<Task>& task, bool notify) {
    if (!hasWorker()) {
        return;
    }
    kdThreadMutexLock(mutex);
    for (;;) {
        if (task && task == currentTask) {
            // A cancelled task never reaches the finished list: waiting for it
            // would never end.
            KD_ASSERT(!currentTaskAborted);
            if (currentTaskAborted) {
                break;
            }
        } else {
            TaskState* state = heldState(task);
            if (state == nullptr) {
                break;
            }
            if (state->finishedPosition != finishedTasks.end()) {
                finishedTasks.erase(state->finishedPosition);
                state->finishedPosition = finishedTasks.end();
                state->held = false;
                if (notify) {
                    task->onFinished();
                }
                break;
            }
            const bool queued = state->queuePosition != queue.end();
            KD_ASSERT(queued);
            if (!queued) {
                break;
            }
            if (lowPriorityMode) {
                // The worker may be holding the task back; see isHeldBack().
                kdThreadCondSignal(workAvailable);
            }
        }
        waitedTask = task;
        kdThreadCondWait(taskFinished, mutex);
        waitedTask.reset();
    }
    kdThreadMutexUnlock(mutex);
}

void TaskManagerImpl::enableLowProirityMode() {
    kdThreadMutexLock(mutex);
    if (!lowPriorityMode) {
        setWorkerSchedParam(KD_THREAD_POLICY_BACKGROUND_ZVR, 0);
        lowPriorityMode = true;
    }
    kdThreadMutexUnlock(mutex);
}

void TaskManagerImpl::disableLowPriorityMode() {
    kdThreadMutexLock(mutex);
    const bool wasOn = lowPriorityMode;
    if (wasOn) {
        setWorkerSchedParam(savedSchedPolicy, savedSchedParam);
        lowPriorityMode = false;
    }
    kdThreadMutexUnlock(mutex);
    if (wasOn) {
        kdThreadCondSignal(workAvailable);
    }
}

void* TaskManagerImpl::runWrapper(void* manager) {
    static_cast<TaskManagerImpl*>(manager)->run();
    return nullptr;
}

void TaskManagerImpl::run() {
    kdThreadMutexLock(mutex);
    while (Task* task = takeNextTask()) {
        kdThreadMutexUnlock(mutex);
        task->run();
        kdThreadYieldZVR();
        kdThreadMutexLock(mutex);
        const bool wakeWaiter = finishCurrentTask();
        // One event is enough while the owner has not started on the last
        // one: its pass takes everything finished by then.
        const bool notifyOwner = !notificationPending;
        notificationPending = true;
        if (wakeWaiter || notifyOwner) {
            kdThreadMutexUnlock(mutex);
            if (wakeWaiter) {
                kdThreadCondSignal(taskFinished);
            }
            if (notifyOwner) {
                postNotification();
            }
            kdThreadMutexLock(mutex);
        }
    }
    kdThreadMutexUnlock(mutex);
}

// Called and returns with the mutex held; waits until there is a task to run.
// The task stays referenced by currentTask only, so that the worker never
// holds the last reference. Null once the manager stops.
Task* TaskManagerImpl::takeNextTask() {
    for (;;) {
        if (stopping) {
            return nullptr;
        }
        if (queue.empty() || isHeldBack(queue.begin()->first)) {
            kdThreadCondWait(workAvailable, mutex);
            continue;
        }
        KD_ASSERT(!currentTask);
        Queue::iterator first = queue.begin();
        currentTask = std::move(first->second);
        static_cast<TaskState*>(currentTask->state.get())->queuePosition = queue.end();
        queue.erase(first);
        return currentTask.get();
    }
}

bool TaskManagerImpl::isHeldBack(const Key& key) const {
    if (!lowPriorityMode || key.priority > 0) {
        return false;
    }
    // The owner blocked in wait() cannot end the mode; holding its task back
    // would block it for good.
    const bool ownerWaitsForQueuedTask =
        waitedTask && static_cast<TaskState*>(waitedTask->state.get())->queuePosition != queue.end();
    return !ownerWaitsForQueuedTask;
}

// Returns whether the owner waits for the task that just ran.
bool TaskManagerImpl::finishCurrentTask() {
    bool wakeWaiter = false;
    if (currentTaskAborted) {
        static_cast<TaskState*>(currentTask->state.get())->held = false;
        abortedTasks.push_back(std::move(currentTask));
    } else {
        wakeWaiter = currentTask == waitedTask;
        TaskState* state = static_cast<TaskState*>(currentTask->state.get());
        state->finishedPosition = finishedTasks.insert(finishedTasks.end(), std::move(currentTask));
    }
    currentTask.reset();
    currentTaskAborted = false;
    return wakeWaiter;
}

void TaskManagerImpl::postNotification() {
    KDEvent* event = kdCreateEvent();
    event->type = KD_EVENT_USER;
    event->userptr = this;
    event->timestamp = kdGetTimeUST();
    kdPostThreadEvent(event, ownerThread);
}

void TaskManagerImpl::onTaskCompletedWrapper(const KDEvent* event) {
    static_cast<TaskManagerImpl*>(event->userptr)->onTaskCompleted();
}

// One event may deliver several notifications, and a later one find nothing.
void TaskManagerImpl::onTaskCompleted() {
    bool destroyed = false;
    bool* const outerPass = destroyedDuringNotification;
    destroyedDuringNotification = &destroyed;
    notifyFinishedTasks(destroyed);
    if (!destroyed) {
        releaseAbortedTasks();
    }
    if (destroyed) {
        // A pass further out on the stack, in whose onFinished() this one was
        // pumped, must stop as well.
        if (outerPass != nullptr) {
            *outerPass = true;
        }
        return;
    }
    destroyedDuringNotification = outerPass;
}

// Stops as soon as an onFinished() has destroyed the manager.
void TaskManagerImpl::notifyFinishedTasks(const bool& destroyed) {
    kdThreadMutexLock(mutex);
    // What finishes from here on needs an event of its own.
    notificationPending = false;
    while (!finishedTasks.empty()) {
        boost::shared_ptr<Task> task = std::move(finishedTasks.front());
        finishedTasks.pop_front();
        TaskState* state = static_cast<TaskState*>(task->state.get());
        state->finishedPosition = finishedTasks.end();
        // onFinished() may schedule the task again.
        state->held = false;
        kdThreadMutexUnlock(mutex);
        task->onFinished();
        task.reset();
        if (destroyed) {
            return;
        }
        kdThreadMutexLock(mutex);
    }
    kdThreadMutexUnlock(mutex);
}

// Their last references may go here, on the owner thread; a task's destructor
// may even destroy the manager, so nothing of it is touched afterwards.
void TaskManagerImpl::releaseAbortedTasks() {
    std::vector<boost::shared_ptr<Task> > aborted;
    kdThreadMutexLock(mutex);
    aborted.swap(abortedTasks);
    kdThreadMutexUnlock(mutex);
}

// Null, after an assertion, for a task this manager has never scheduled.
TaskManagerImpl::TaskState* TaskManagerImpl::heldState(const boost::shared_ptr<Task>& task) const {
    Task::State* state = task ? task->state.get() : nullptr;
    KD_ASSERT(state != nullptr);
    if (state == nullptr) {
        return nullptr;
    }
    TaskState* taskState = static_cast<TaskState*>(state);
    KD_ASSERT(taskState->manager == this);
    return taskState->manager == this ? taskState : nullptr;
}

// Without a worker, queued work would never run and every wait() would block
// for good: such a manager refuses all work, loudly.
bool TaskManagerImpl::hasWorker() const {
    KD_ASSERT(workerThread != nullptr);
    return workerThread != nullptr;
}

void TaskManagerImpl::setWorkerSchedParam(KDint policy, KDint param) {
    if (workerThread != nullptr && kdThreadSetSchedParamZVR(workerThread, policy, &param) != 0) {
        Logger::log(Logger::Warning, "TaskManager: cannot set the worker's scheduling policy %d", policy);
    }
}

// After the worker has ended. The tasks' states point into our containers, so
// they go with them.
void TaskManagerImpl::releaseTasks() {
    for (Queue::value_type& entry : queue) {
        entry.second->state.reset();
    }
    for (boost::shared_ptr<Task>& task : finishedTasks) {
        task->state.reset();
    }
    queue.clear();
    finishedTasks.clear();
    abortedTasks.clear();
}

}  // namespace Tasking
