#include <KD/kdext.h>

#include <pal/Simulation.h>

#include <boost/make_shared.hpp>
#include <boost/weak_ptr.hpp>

#include "support/PalTest.h"
#include "tasking/TaskManager.h"
#include "tasking/TaskProbes.h"

namespace {

class TaskManagerTest : public PalTest {
protected:
    void SetUp() override {
        PalTest::SetUp();
        manager = Tasking::TaskManager::create();
    }
    void TearDown() override {
        manager.reset();
        PalTest::TearDown();
    }

    template <class T = ProbeTask>
    boost::shared_ptr<T> make(const std::string& name) {
        return boost::make_shared<T>(journal, name);
    }
    // A new task, already scheduled on the given manager (by default the
    // test's own).
    template <class T = ProbeTask>
    boost::shared_ptr<T> scheduled(const std::string& name, int priority,
                                   Tasking::TaskManager* on = nullptr) {
        boost::shared_ptr<T> task = make<T>(name);
        (on != nullptr ? on : manager.get())->schedule(task, priority);
        return task;
    }
    // Schedules a gate and returns once it runs. With a high priority it
    // leaves what the test schedules next queued until it opens; with a low
    // one, every task scheduled before it has finished and waits for its
    // notification, as long as the owner does not pump.
    boost::shared_ptr<GateTask> runGate(int priority) {
        boost::shared_ptr<GateTask> blocker = scheduled<GateTask>("gate", priority);
        blocker->waitUntilRunning();
        return blocker;
    }
    void pumpUntilNotified(const boost::shared_ptr<ProbeTask>& task) {
        pumpUntil([&task] { return task->finishedCount > 0; });
    }

    Journal journal;
    boost::shared_ptr<Tasking::TaskManager> manager;
};

int userEventsWithoutBinding = 0;
void countUserEvent(const KDEvent*) {
    ++userEventsWithoutBinding;
}

}  // namespace

TEST_F(TaskManagerTest, RunsHighestPriorityFirstAndInSchedulingOrderWithinOne) {
    boost::shared_ptr<GateTask> blocker = runGate(1000);
    const std::vector<boost::shared_ptr<ProbeTask> > tasks = {scheduled("first", 0), scheduled("second", 5),
                                                              scheduled("third", 0), scheduled("fourth", 5)};
    blocker->open();
    pumpUntilNotified(tasks[2]);

    EXPECT_EQ((Names{"gate", "second", "fourth", "first", "third"}), journal.read("run"));
    EXPECT_EQ((Names{"gate", "second", "fourth", "first", "third"}), journal.read("finished"));
    for (const boost::shared_ptr<ProbeTask>& task : tasks) {
        EXPECT_EQ(blocker->runThread, task->runThread);
        EXPECT_EQ(kdThreadSelf(), task->finishedThread);
        EXPECT_EQ(1, task->finishedCount);
    }
    EXPECT_NE(kdThreadSelf(), blocker->runThread);
}

TEST_F(TaskManagerTest, LowPriorityModeBacksTheWorkerAndHoldsBackUnprioritisedTasksUntilItEnds) {
    // Switched at once, before the new worker may even have started: what is
    // restored must still be the class it was created with.
    manager->enableLowProirityMode();
    boost::shared_ptr<ProbeTask> idle = scheduled("idle", 0);
    boost::shared_ptr<ProbeTask> alsoIdle = scheduled("alsoIdle", -3);
    boost::shared_ptr<ProbeTask> urgent = scheduled("urgent", 1);
    pumpUntilNotified(urgent);
    // The worker took the urgent task and went back to waiting; the others
    // would have run by now only if they had run before it.
    EXPECT_EQ(Names{"urgent"}, journal.read("run"));
    // Where the platform refuses a class the worker could not leave, the
    // manager warns and keeps the worker at normal priority.
    if (backgroundClassGranted()) {
        EXPECT_EQ(KD_THREAD_POLICY_BACKGROUND_ZVR, urgent->runPolicy);
    } else {
        EXPECT_EQ(KD_THREAD_POLICY_NORMAL_ZVR, urgent->runPolicy);
        EXPECT_EQ(1, countLogLines("cannot set the worker's scheduling policy 1"));
    }
    EXPECT_EQ(0, urgent->runParam);

    manager->disableLowPriorityMode();
    pumpUntilNotified(alsoIdle);
    EXPECT_EQ((Names{"urgent", "idle", "alsoIdle"}), journal.read("run"));
    EXPECT_EQ(KD_THREAD_POLICY_NORMAL_ZVR, idle->runPolicy);
}

TEST_F(TaskManagerTest, WaitInLowPriorityModeRunsTheHeldBackTaskInsteadOfBlockingForever) {
    manager->enableLowProirityMode();
    scheduled("earlier", 0);
    boost::shared_ptr<ProbeTask> waited = scheduled("waited", 0);
    scheduled("later", 0);
    manager->wait(waited, true);
    EXPECT_EQ(1, waited->finishedCount);
    // Queue order still held, and the mode holds back what comes after.
    boost::shared_ptr<ProbeTask> marker = scheduled("marker", 1);
    pumpUntilNotified(marker);
    EXPECT_EQ((Names{"earlier", "waited", "marker"}), journal.read("run"));
    EXPECT_EQ((Names{"waited", "earlier", "marker"}), journal.read("finished"));
}

TEST_F(TaskManagerTest, CancelledQueuedOrFinishedTaskIsNeitherRunNorNotified) {
    boost::shared_ptr<ProbeTask> finished = scheduled("finished", 0);
    boost::shared_ptr<GateTask> blocker = runGate(-1000);
    boost::shared_ptr<ProbeTask> queued = scheduled("queued", 0);
    boost::shared_ptr<ProbeTask> kept = scheduled("kept", 0);
    manager->cancel(finished);
    manager->cancel(queued);
    blocker->open();
    pumpUntilNotified(kept);
    EXPECT_EQ((Names{"finished", "gate", "kept"}), journal.read("run"));
    EXPECT_EQ((Names{"gate", "kept"}), journal.read("finished"));
    EXPECT_EQ(1, finished.use_count());
    EXPECT_EQ(1, queued.use_count());
}

TEST_F(TaskManagerTest, CancelledRunningTaskCompletesUnnotifiedAndIsReleasedOnTheOwnerThread) {
    boost::shared_ptr<GateTask> running = make<GateTask>("running");
    KDThread* releasedOn = nullptr;
    running->onDestroyed = [&releasedOn] { releasedOn = kdThreadSelf(); };
    manager->schedule(running, 0);
    running->waitUntilRunning();
    manager->cancel(running);
    boost::weak_ptr<GateTask> watched = running;
    boost::shared_ptr<ProbeTask> marker = scheduled("marker", 0);
    running->open();
    running.reset();
    pumpUntilNotified(marker);

    EXPECT_EQ((Names{"running", "marker"}), journal.read("run"));
    EXPECT_EQ(Names{"marker"}, journal.read("finished"));
    EXPECT_TRUE(watched.expired());
    EXPECT_EQ(kdThreadSelf(), releasedOn);
}

TEST_F(TaskManagerTest, WaitForAQueuedTaskRunsEverythingAheadOfIt) {
    scheduled("ahead", 1);
    boost::shared_ptr<ProbeTask> waited = scheduled("waited", 0);
    boost::shared_ptr<ProbeTask> behind = scheduled("behind", 0);
    manager->wait(waited, false);
    const Names runs = journal.read("run");
    ASSERT_GE(runs.size(), 2u);
    EXPECT_EQ((Names{"ahead", "waited"}), Names(runs.begin(), runs.begin() + 2));

    pumpUntilNotified(behind);
    EXPECT_EQ((Names{"ahead", "behind"}), journal.read("finished"));
    EXPECT_EQ(0, waited->finishedCount);
}

TEST_F(TaskManagerTest, WaitWithNotifyOnAFinishedTaskNotifiesExactlyOnceAndFreesItForScheduling) {
    boost::shared_ptr<ProbeTask> waited = scheduled("waited", 0);
    boost::shared_ptr<GateTask> blocker = runGate(-1000);
    manager->wait(waited, true);
    EXPECT_EQ(1, waited->finishedCount);
    EXPECT_EQ(kdThreadSelf(), waited->finishedThread);
    blocker->open();
    pumpUntilNotified(blocker);
    EXPECT_EQ(1, waited->finishedCount);

    manager->schedule(waited, 0);
    pumpUntil([&waited] { return waited->finishedCount == 2; });
    EXPECT_EQ((Names{"waited", "gate", "waited"}), journal.read("run"));
}

TEST_F(TaskManagerTest, WaitForTheRunningTaskReturnsOnceItHasRun) {
    boost::shared_ptr<GateTask> running = runGate(1000);
    Helper opener([&running] { running->open(); });
    manager->wait(running, true);
    EXPECT_EQ(1, running->finishedCount);
}

TEST_F(TaskManagerTest, CancellingOrWaitingForATaskTheManagerDoesNotHoldIsAnAssertion) {
    boost::shared_ptr<ProbeTask> neverScheduled = make("neverScheduled");
    manager->cancel(neverScheduled);
    expectAssertion("state != nullptr");
    manager->wait(neverScheduled, true);
    expectAssertion("state != nullptr");

    boost::shared_ptr<Tasking::TaskManager> other = Tasking::TaskManager::create();
    boost::shared_ptr<GateTask> elsewhere = scheduled<GateTask>("elsewhere", 0, other.get());
    boost::shared_ptr<ProbeTask> queuedElsewhere = scheduled("queuedElsewhere", 0, other.get());
    manager->cancel(queuedElsewhere);
    expectAssertion("taskState->manager == this");
    manager->wait(queuedElsewhere, false);
    expectAssertion("taskState->manager == this");
    elsewhere->open();
    other->wait(queuedElsewhere, false);
    EXPECT_EQ((Names{"elsewhere", "queuedElsewhere"}), journal.read("run"));

    boost::shared_ptr<ProbeTask> notified = scheduled("notified", 0);
    pumpUntilNotified(notified);
    manager->cancel(notified);
    expectAssertion("queued || finished");
    manager->wait(notified, true);
    expectAssertion("queued");
    EXPECT_EQ(1, notified->finishedCount);
}

TEST_F(TaskManagerTest, SchedulingATaskSomeManagerStillHoldsIsRefusedAndChangesNothing) {
    const std::string refused = "a task may be scheduled again only after its notification";
    boost::shared_ptr<Tasking::TaskManager> other = Tasking::TaskManager::create();
    boost::shared_ptr<GateTask> running = runGate(1000);
    boost::shared_ptr<ProbeTask> task = scheduled("task", 0);
    manager->schedule(running, 0);
    expectAssertion(refused);
    manager->schedule(task, 5);
    expectAssertion(refused);
    other->schedule(task, 0);
    expectAssertion(refused);

    running->open();
    // Once this gate runs, the task has run and waits for its notification.
    boost::shared_ptr<GateTask> later = runGate(-1000);
    manager->schedule(task, 0);
    expectAssertion(refused);
    other->schedule(task, 0);
    expectAssertion(refused);
    later->open();

    // Notified, it may go again, even from its own onFinished().
    task->onFinishedHook = [this, &task] {
        if (task->finishedCount == 1) {
            manager->schedule(task, 0);
        }
    };
    pumpUntil([&task] { return task->finishedCount >= 2; });
    other->schedule(task, 0);
    pumpUntil([&task] { return task->finishedCount >= 3; });
    EXPECT_EQ((Names{"gate", "task", "gate", "task", "task"}), journal.read("run"));
    EXPECT_NE(running->runThread, task->runThread);
}

TEST_F(TaskManagerTest, ManagerWhoseWorkerCouldNotStartRefusesWorkInsteadOfBlocking) {
    pal::setThreadCreationRefused(true);
    boost::shared_ptr<Tasking::TaskManager> broken = Tasking::TaskManager::create();
    pal::setThreadCreationRefused(false);
    expectAssertion("workerThread != nullptr");
    EXPECT_EQ(1, countLogLines("TaskManager: cannot start the worker thread"));

    boost::shared_ptr<ProbeTask> task = make("task");
    broken->schedule(task, 0);
    expectAssertion("workerThread != nullptr");
    broken->wait(task, true);
    expectAssertion("workerThread != nullptr");
    broken->enableLowProirityMode();
    broken->disableLowPriorityMode();
    broken.reset();
    EXPECT_EQ(1, task.use_count());

    // Refused, the task was never held: a working manager takes it.
    manager->schedule(task, 0);
    pumpUntilNotified(task);
    EXPECT_EQ(Names{"task"}, journal.read("finished"));
}

TEST_F(TaskManagerTest, WaitingForACancelledRunningTaskIsAnAssertionAndReturns) {
    boost::shared_ptr<GateTask> running = runGate(1000);
    manager->cancel(running);
    manager->wait(running, true);
    expectAssertion("!currentTaskAborted");
    running->open();
    boost::shared_ptr<ProbeTask> marker = scheduled("marker", 0);
    pumpUntilNotified(marker);
    EXPECT_EQ(0, running->finishedCount);
}

TEST_F(TaskManagerTest, DestroyedManagerRunsAndNotifiesNothingMore) {
    // Events of a dead manager would land here.
    kdInstallCallback(&countUserEvent, KD_EVENT_USER, nullptr);
    userEventsWithoutBinding = 0;
    // Holds the queued task back whenever the worker gets free, so that it is
    // still queued when the destruction begins.
    manager->enableLowProirityMode();
    boost::shared_ptr<ProbeTask> earlier = scheduled("earlier", 2);
    boost::shared_ptr<GateTask> running = scheduled<GateTask>("running", 1);
    running->waitUntilRunning();
    // With no notification outstanding, the running task's end posts one,
    // which must not outlive the manager.
    pumpUntilNotified(earlier);
    const boost::weak_ptr<ProbeTask> queued = scheduled("queued", 0);

    Helper opener([&running] { running->open(); });
    manager.reset();
    pump();

    EXPECT_EQ((Names{"earlier", "running"}), journal.read("run"));
    EXPECT_EQ(Names{"earlier"}, journal.read("finished"));
    EXPECT_TRUE(queued.expired());
    EXPECT_EQ(1, running.use_count());
    EXPECT_EQ(0, userEventsWithoutBinding);
    kdInstallCallback(nullptr, KD_EVENT_USER, nullptr);
}

TEST_F(TaskManagerTest, ManagerDestroyedInANotificationNotifiesNoMore) {
    boost::shared_ptr<ProbeTask> first = scheduled("first", 0);
    boost::shared_ptr<ProbeTask> second = scheduled("second", 0);
    boost::shared_ptr<ProbeTask> last = scheduled("last", 0);
    manager->wait(last, false);
    first->onFinishedHook = [this] { manager.reset(); };
    pumpUntil([this] { return !manager; });
    pump();
    EXPECT_EQ(Names{"first"}, journal.read("finished"));
    EXPECT_EQ(1, second.use_count());
}

TEST_F(TaskManagerTest, ProcessWideManagerOutlivesSeparateOnesAndRunsTasksUntilPlatformShutdown) {
    Tasking::TaskManager* shared = Tasking::TaskManager::getInstance();
    manager.reset();
    EXPECT_EQ(shared, Tasking::TaskManager::getInstance());
    boost::shared_ptr<ProbeTask> task = scheduled("task", 0, shared);
    pumpUntilNotified(task);

    shared->enableLowProirityMode();
    boost::shared_ptr<GateTask> running = scheduled<GateTask>("running", 1, shared);
    boost::shared_ptr<ProbeTask> queued = scheduled("queued", 0, shared);
    running->waitUntilRunning();
    Helper opener([&running] { running->open(); });
    shutdownPal();
    EXPECT_EQ(Names{"task"}, journal.read("finished"));
    EXPECT_EQ((Names{"task", "running"}), journal.read("run"));
    EXPECT_EQ(1, queued.use_count());
}
