#pragma once

#include <KD/kd.h>

#include <atomic>
#include <boost/shared_ptr.hpp>
#include <cstdint>
#include <list>
#include <map>
#include <vector>

#include "tasking/TaskManager.h"
#include "util/Singleton.h"

namespace Tasking {

// The task manager: one worker thread, a priority queue and the finished
// notifications posted back to the owner thread as platform user events.
// Public calls on the owner thread only; run() and runWrapper() on the worker.
// One mutex guards every field from currentTask on, and the positions kept in
// the tasks' states.
class TaskManagerImpl : public TaskManager, public Util::Singleton<TaskManagerImpl> {
public:
    // Queue order: higher priority first, then earlier scheduling first.
    struct Key {
        std::int32_t priority;
        std::int64_t sequence;

        bool operator<(const Key& other) const {
            if (priority != other.priority) {
                return priority > other.priority;
            }
            return sequence < other.sequence;
        }
    };

    typedef std::map<Key, boost::shared_ptr<Task> > Queue;
    typedef std::list<boost::shared_ptr<Task> > FinishedList;

    // Where a task sits in the manager that scheduled it last. The manager is
    // kept so that a task handed to the wrong manager is recognised instead of
    // having its positions used in another manager's containers.
    class TaskState : public Task::State {
    public:
        // Positions are set under the manager's lock.
        explicit TaskState(TaskManagerImpl* manager) : manager(manager), held(true) {}

        TaskManagerImpl* const manager;
        // Queued, running, or waiting for its notification. Any manager reads
        // it, without the holding manager's lock, before scheduling the task:
        // once it is clear the holding manager never touches the task again.
        std::atomic<bool> held;
        // The queue's end when not queued.
        Queue::iterator queuePosition;
        // The finished list's end when not waiting for its notification.
        FinishedList::iterator finishedPosition;
    };

    TaskManagerImpl();
    ~TaskManagerImpl() override;

    void schedule(const boost::shared_ptr<Task>& task, int priority) override;
    void cancel(const boost::shared_ptr<Task>& task) override;
    void wait(const boost::shared_ptr<Task>& task, bool notify) override;
    void enableLowProirityMode() override;
    void disableLowPriorityMode() override;

    static void* runWrapper(void* manager);
    static void onTaskCompletedWrapper(const KDEvent* event);

private:
    TaskManagerImpl(const TaskManagerImpl&) = delete;
    TaskManagerImpl& operator=(const TaskManagerImpl&) = delete;

    void run();
    Task* takeNextTask();
    bool isHeldBack(const Key& key) const;
    bool finishCurrentTask();
    void postNotification();

    void onTaskCompleted();
    void notifyFinishedTasks(const bool& destroyed);
    void releaseAbortedTasks();
    TaskState* heldState(const boost::shared_ptr<Task>& task) const;
    bool hasWorker() const;
    void setWorkerSchedParam(KDint policy, KDint param);
    void releaseTasks();

    KDThread* const ownerThread;
    KDThread* workerThread;
    KDThreadMutex* const mutex;
    KDThreadCond* const workAvailable;
    KDThreadCond* const taskFinished;

    boost::shared_ptr<Task> currentTask;
    bool currentTaskAborted;
    boost::shared_ptr<Task> waitedTask;
    std::int64_t sequenceCounter;
    Queue queue;
    FinishedList finishedTasks;
    std::vector<boost::shared_ptr<Task> > abortedTasks;
    bool stopping;
    bool lowPriorityMode;
    KDint savedSchedPolicy;
    KDint savedSchedParam;
    // An event is on its way to the owner and its pass has not begun.
    bool notificationPending;

    // Owner thread only: set while a notification pass runs, so that a pass
    // whose onFinished() destroyed the manager stops touching it.
    bool* destroyedDuringNotification;
};

}  // namespace Tasking
