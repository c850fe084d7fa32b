#include <KD/kdext.h>

#include <boost/make_shared.hpp>
#include <boost/weak_ptr.hpp>

#include "support/PalTest.h"
#include "tasking/TaskManager.h"
#include "tasking/TaskProbes.h"

namespace {

typedef std::vector<std::string> Names;

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

    boost::shared_ptr<ProbeTask> probe(const std::string& name) {
        return boost::make_shared<ProbeTask>(journal, name);
    }
    boost::shared_ptr<GateTask> gate(const std::string& name) {
        return boost::make_shared<GateTask>(journal, name);
    }
    // Leaves the worker blocked in a task of its own, so that what the test
    // schedules next stays queued until the gate opens.
    boost::shared_ptr<GateTask> occupyWorker() {
        boost::shared_ptr<GateTask> blocker = gate("gate");
        manager->schedule(blocker, 1000);
        blocker->waitUntilRunning();
        return blocker;
    }
    // Once the gate runs, every task scheduled before it has finished and
    // waits for its notification, as long as the owner does not pump.
    boost::shared_ptr<GateTask> finishTasksAheadOfAGate() {
        boost::shared_ptr<GateTask> blocker = gate("gate");
        manager->schedule(blocker, -1000);
        blocker->waitUntilRunning();
        return blocker;
    }
    void pumpUntilNotified(const boost::shared_ptr<ProbeTask>& task) {
        pumpUntil([&task] { return task->finishedCount > 0; });
    }

    Journal journal;
    boost::shared_ptr<Tasking::TaskManager> manager;
};

// Records the scheduling class the worker is in while it runs the task.
class PolicyProbe : public Tasking::Task {
public:
    void run() override { kdThreadGetSchedParamZVR(kdThreadSelf(), &policy, &param); }
    KDint policy = -1;
    KDint param = -1;
};

int userEventsWithoutBinding = 0;
void countUserEvent(const KDEvent*) {
    ++userEventsWithoutBinding;
}

}  // namespace

TEST_F(TaskManagerTest, RunsHighestPriorityFirstAndInSchedulingOrderWithinOne) {
    boost::shared_ptr<GateTask> blocker = occupyWorker();
    std::vector<boost::shared_ptr<ProbeTask> > tasks = {probe("first"), probe("second"), probe("third"),
                                                        probe("fourth")};
    manager->schedule(tasks[0], 0);
    manager->schedule(tasks[1], 5);
    manager->schedule(tasks[2], 0);
    manager->schedule(tasks[3], 5);
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

TEST_F(TaskManagerTest, NotifiedTaskCanBeScheduledAgain) {
    boost::shared_ptr<ProbeTask> task = probe("task");
    manager->schedule(task, 0);
    pumpUntilNotified(task);
    manager->schedule(task, 0);
    pumpUntil([&task] { return task->finishedCount == 2; });
    EXPECT_EQ((Names{"task", "task"}), journal.read("run"));
}

TEST_F(TaskManagerTest, LowPriorityModeHoldsBackUnprioritisedTasksUntilAnUrgentOneArrives) {
    manager->enableLowProirityMode();
    boost::shared_ptr<ProbeTask> idle = probe("idle");
    boost::shared_ptr<ProbeTask> alsoIdle = probe("alsoIdle");
    boost::shared_ptr<ProbeTask> urgent = probe("urgent");
    manager->schedule(idle, 0);
    manager->schedule(alsoIdle, -3);
    manager->schedule(urgent, 1);
    pumpUntilNotified(urgent);
    // The worker took the urgent task and went back to waiting; the others
    // would have run by now only if they had run before it.
    EXPECT_EQ(Names{"urgent"}, journal.read("run"));

    manager->disableLowPriorityMode();
    pumpUntilNotified(alsoIdle);
    EXPECT_EQ((Names{"urgent", "idle", "alsoIdle"}), journal.read("run"));
}

TEST_F(TaskManagerTest, LowPriorityModeMovesTheWorkerToTheBackgroundClassAndBack) {
    // Switched at once, before the new worker may even have started: what is
    // restored must still be the class it was created with.
    manager->enableLowProirityMode();
    boost::shared_ptr<PolicyProbe> duringMode = boost::make_shared<PolicyProbe>();
    manager->schedule(duringMode, 1);
    manager->wait(duringMode, false);
    EXPECT_EQ(KD_THREAD_POLICY_BACKGROUND_ZVR, duringMode->policy);
    EXPECT_EQ(0, duringMode->param);

    manager->disableLowPriorityMode();
    boost::shared_ptr<PolicyProbe> afterMode = boost::make_shared<PolicyProbe>();
    manager->schedule(afterMode, 0);
    manager->wait(afterMode, false);
    EXPECT_EQ(KD_THREAD_POLICY_NORMAL_ZVR, afterMode->policy);
}

TEST_F(TaskManagerTest, WaitInLowPriorityModeRunsTheHeldBackTaskInsteadOfBlockingForever) {
    manager->enableLowProirityMode();
    boost::shared_ptr<ProbeTask> earlier = probe("earlier");
    boost::shared_ptr<ProbeTask> waited = probe("waited");
    boost::shared_ptr<ProbeTask> later = probe("later");
    manager->schedule(earlier, 0);
    manager->schedule(waited, 0);
    manager->schedule(later, 0);
    manager->wait(waited, true);
    EXPECT_EQ(1, waited->finishedCount);
    // Queue order still held, and the mode holds back what comes after.
    boost::shared_ptr<ProbeTask> marker = probe("marker");
    manager->schedule(marker, 1);
    pumpUntilNotified(marker);
    EXPECT_EQ((Names{"earlier", "waited", "marker"}), journal.read("run"));
    EXPECT_EQ((Names{"waited", "earlier", "marker"}), journal.read("finished"));
    EXPECT_EQ(1, waited->finishedCount);
}

TEST_F(TaskManagerTest, CancelledQueuedTaskNeverRuns) {
    boost::shared_ptr<GateTask> blocker = occupyWorker();
    boost::shared_ptr<ProbeTask> cancelled = probe("cancelled");
    boost::shared_ptr<ProbeTask> kept = probe("kept");
    manager->schedule(cancelled, 0);
    manager->schedule(kept, 0);
    manager->cancel(cancelled);
    blocker->open();
    pumpUntilNotified(kept);
    EXPECT_EQ((Names{"gate", "kept"}), journal.read("run"));
    EXPECT_EQ(1, cancelled.use_count());
}

TEST_F(TaskManagerTest, CancelledFinishedTaskIsNotNotified) {
    boost::shared_ptr<ProbeTask> cancelled = probe("cancelled");
    manager->schedule(cancelled, 0);
    boost::shared_ptr<GateTask> blocker = finishTasksAheadOfAGate();
    manager->cancel(cancelled);
    blocker->open();
    pumpUntilNotified(blocker);
    EXPECT_EQ((Names{"cancelled", "gate"}), journal.read("run"));
    EXPECT_EQ(Names{"gate"}, journal.read("finished"));
    EXPECT_EQ(1, cancelled.use_count());
}

TEST_F(TaskManagerTest, CancelledRunningTaskCompletesUnnotifiedAndIsReleasedOnTheOwnerThread) {
    boost::shared_ptr<GateTask> running = gate("running");
    KDThread* releasedOn = nullptr;
    running->onDestroyed = [&releasedOn] { releasedOn = kdThreadSelf(); };
    manager->schedule(running, 0);
    running->waitUntilRunning();
    manager->cancel(running);
    boost::weak_ptr<GateTask> watched = running;
    boost::shared_ptr<ProbeTask> marker = probe("marker");
    manager->schedule(marker, 0);
    running->open();
    running.reset();
    pumpUntilNotified(marker);

    EXPECT_EQ((Names{"running", "marker"}), journal.read("run"));
    EXPECT_EQ(Names{"marker"}, journal.read("finished"));
    EXPECT_TRUE(watched.expired());
    EXPECT_EQ(kdThreadSelf(), releasedOn);
}

TEST_F(TaskManagerTest, WaitForAQueuedTaskRunsEverythingAheadOfIt) {
    boost::shared_ptr<ProbeTask> ahead = probe("ahead");
    boost::shared_ptr<ProbeTask> waited = probe("waited");
    boost::shared_ptr<ProbeTask> behind = probe("behind");
    manager->schedule(ahead, 1);
    manager->schedule(waited, 0);
    manager->schedule(behind, 0);
    manager->wait(waited, false);
    Names runs = journal.read("run");
    ASSERT_GE(runs.size(), 2u);
    EXPECT_EQ((Names{"ahead", "waited"}), Names(runs.begin(), runs.begin() + 2));

    pumpUntilNotified(behind);
    EXPECT_EQ((Names{"ahead", "behind"}), journal.read("finished"));
    EXPECT_EQ(0, waited->finishedCount);
}

TEST_F(TaskManagerTest, WaitWithNotifyOnAFinishedTaskNotifiesExactlyOnce) {
    boost::shared_ptr<ProbeTask> waited = probe("waited");
    manager->schedule(waited, 0);
    boost::shared_ptr<GateTask> blocker = finishTasksAheadOfAGate();
    manager->wait(waited, true);
    EXPECT_EQ(1, waited->finishedCount);
    EXPECT_EQ(kdThreadSelf(), waited->finishedThread);

    blocker->open();
    pumpUntilNotified(blocker);
    EXPECT_EQ(1, waited->finishedCount);
}

TEST_F(TaskManagerTest, WaitForTheRunningTaskReturnsOnceItHasRun) {
    boost::shared_ptr<GateTask> running = occupyWorker();
    Helper opener([&running] { running->open(); });
    manager->wait(running, true);
    EXPECT_EQ(1, running->finishedCount);
    EXPECT_EQ(Names{"gate"}, journal.read("run"));
}

TEST_F(TaskManagerTest, CancellingOrWaitingForATaskTheManagerDoesNotHoldIsAnAssertion) {
    boost::shared_ptr<ProbeTask> neverScheduled = probe("neverScheduled");
    manager->cancel(neverScheduled);
    expectAssertion("state != nullptr");
    manager->wait(neverScheduled, true);
    expectAssertion("state != nullptr");

    boost::shared_ptr<Tasking::TaskManager> other = Tasking::TaskManager::create();
    boost::shared_ptr<GateTask> elsewhere = gate("elsewhere");
    other->schedule(elsewhere, 0);
    boost::shared_ptr<ProbeTask> queuedElsewhere = probe("queuedElsewhere");
    other->schedule(queuedElsewhere, 0);
    manager->cancel(queuedElsewhere);
    expectAssertion("taskState->manager == this");
    manager->wait(queuedElsewhere, false);
    expectAssertion("taskState->manager == this");
    elsewhere->open();
    other->wait(queuedElsewhere, false);
    EXPECT_EQ((Names{"elsewhere", "queuedElsewhere"}), journal.read("run"));

    boost::shared_ptr<ProbeTask> notified = probe("notified");
    manager->schedule(notified, 0);
    pumpUntilNotified(notified);
    manager->cancel(notified);
    expectAssertion("queued || finished");
    manager->wait(notified, true);
    expectAssertion("queued");
    EXPECT_EQ(1, notified->finishedCount);
}

TEST_F(TaskManagerTest, WaitingForACancelledRunningTaskIsAnAssertionAndReturns) {
    boost::shared_ptr<GateTask> running = occupyWorker();
    manager->cancel(running);
    manager->wait(running, true);
    expectAssertion("!currentTaskAborted");
    running->open();
    boost::shared_ptr<ProbeTask> marker = probe("marker");
    manager->schedule(marker, 0);
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
    boost::shared_ptr<ProbeTask> earlier = probe("earlier");
    manager->schedule(earlier, 2);
    boost::shared_ptr<GateTask> running = gate("running");
    manager->schedule(running, 1);
    running->waitUntilRunning();
    // With no notification outstanding, the running task's end posts one,
    // which must not outlive the manager.
    pumpUntilNotified(earlier);
    boost::shared_ptr<ProbeTask> queued = probe("queued");
    manager->schedule(queued, 0);
    boost::weak_ptr<ProbeTask> watchedQueued = queued;
    queued.reset();

    Signal destroying;
    Helper opener([&] {
        destroying.waitRaised();
        running->open();
    });
    destroying.raise();
    manager.reset();
    pump();

    EXPECT_EQ((Names{"earlier", "running"}), journal.read("run"));
    EXPECT_EQ(Names{"earlier"}, journal.read("finished"));
    EXPECT_TRUE(watchedQueued.expired());
    EXPECT_EQ(1, running.use_count());
    EXPECT_EQ(0, userEventsWithoutBinding);
    kdInstallCallback(nullptr, KD_EVENT_USER, nullptr);
}

TEST_F(TaskManagerTest, ManagerDestroyedInANotificationNotifiesNoMore) {
    boost::shared_ptr<ProbeTask> first = probe("first");
    boost::shared_ptr<ProbeTask> second = probe("second");
    boost::shared_ptr<ProbeTask> last = probe("last");
    manager->schedule(first, 0);
    manager->schedule(second, 0);
    manager->schedule(last, 0);
    manager->wait(last, false);
    first->onFinishedHook = [this] { manager.reset(); };
    pumpUntil([this] { return !manager; });
    pump();
    EXPECT_EQ(Names{"first"}, journal.read("finished"));
    EXPECT_EQ(1, second.use_count());
}

TEST_F(TaskManagerTest, SeparateManagerLeavesTheProcessWideOneInPlace) {
    Tasking::TaskManager* shared = Tasking::TaskManager::getInstance();
    manager.reset();
    EXPECT_EQ(shared, Tasking::TaskManager::getInstance());
}

TEST_F(TaskManagerTest, ProcessWideManagerRunsTasksUntilPlatformShutdown) {
    Tasking::TaskManager* shared = Tasking::TaskManager::getInstance();
    boost::shared_ptr<ProbeTask> task = probe("task");
    shared->schedule(task, 0);
    pumpUntilNotified(task);

    shared->enableLowProirityMode();
    boost::shared_ptr<GateTask> running = gate("running");
    shared->schedule(running, 1);
    boost::shared_ptr<ProbeTask> queued = probe("queued");
    shared->schedule(queued, 0);
    running->waitUntilRunning();
    Helper opener([&running] { running->open(); });
    shutdownPal();
    EXPECT_EQ(Names{"task"}, journal.read("finished"));
    EXPECT_EQ((Names{"task", "running"}), journal.read("run"));
    EXPECT_EQ(1, queued.use_count());
}
