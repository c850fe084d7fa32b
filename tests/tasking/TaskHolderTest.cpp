#include <boost/make_shared.hpp>

#include "support/PalTest.h"
#include "tasking/TaskHolder.h"
#include "tasking/TaskManager.h"
#include "tasking/TaskProbes.h"
#include "util/Singleton.h"

namespace {

// A service made before the task manager, so that the singleton store
// deletes it, and its holders, after the manager.
class EarlyService : public Util::Singleton<EarlyService> {
public:
    EarlyService() : cancelling(true), waiting(false) {}

    Tasking::TaskHolder cancelling;
    Tasking::TaskHolder waiting;
};

class TaskHolderTest : public PalTest {
protected:
    boost::shared_ptr<ProbeTask> probe(const std::string& name) {
        return boost::make_shared<ProbeTask>(journal, name);
    }
    // Tells the holder when it is done, as holders expect of their tasks.
    boost::shared_ptr<ProbeTask> held(const std::string& name, Tasking::TaskHolder& holder) {
        boost::shared_ptr<ProbeTask> task = probe(name);
        task->onFinishedHook = [&holder] { holder.onFinished(); };
        return task;
    }
    boost::shared_ptr<GateTask> occupyWorker() {
        boost::shared_ptr<GateTask> blocker = boost::make_shared<GateTask>(journal, "gate");
        Tasking::TaskManager::getInstance()->schedule(blocker, 1000);
        blocker->waitUntilRunning();
        return blocker;
    }

    Journal journal;
};

}  // namespace

TEST_F(TaskHolderTest, NotificationEmptiesTheHolderWhetherPumpedOrWaitedFor) {
    Tasking::TaskHolder holder(true);
    boost::shared_ptr<ProbeTask> task = held("task", holder);
    holder.submit(task, 0);
    pumpUntil([&task] { return task->finishedCount > 0; });
    // The same task goes in again, and wait() runs and notifies it.
    holder.submit(task, 0);
    holder.wait();
    EXPECT_EQ(2, task->finishedCount);
    holder.submit(held("next", holder), 0);
    holder.wait();
    EXPECT_EQ((Names{"task", "task", "next"}), journal.read("finished"));
}

TEST_F(TaskHolderTest, CancelledOrDestroyedWithCancelOnDestroyRunsNothing) {
    boost::shared_ptr<GateTask> blocker = occupyWorker();
    boost::shared_ptr<ProbeTask> cancelled = probe("cancelled");
    boost::shared_ptr<ProbeTask> dropped = probe("dropped");
    Tasking::TaskHolder keeper(false);
    keeper.submit(cancelled, 0);
    keeper.cancel();
    {
        Tasking::TaskHolder holder(true);
        holder.submit(dropped, 0);
    }
    blocker->open();
    pumpUntil([&blocker] { return blocker->finishedCount > 0; });
    EXPECT_EQ(Names{"gate"}, journal.read("run"));
    EXPECT_EQ(1, cancelled.use_count());
    EXPECT_EQ(1, dropped.use_count());
}

TEST_F(TaskHolderTest, DestroyedWithoutCancelOnDestroyBlocksUntilTheTaskRan) {
    boost::shared_ptr<GateTask> blocker = occupyWorker();
    boost::shared_ptr<ProbeTask> task = probe("task");
    Signal destroying;
    Helper opener([&] {
        destroying.waitRaised();
        blocker->open();
    });
    {
        Tasking::TaskHolder holder(false);
        holder.submit(task, 0);
        destroying.raise();
    }
    EXPECT_EQ((Names{"gate", "task"}), journal.read("run"));
    pumpUntil([&blocker] { return blocker->finishedCount > 0; });
    pump();
    EXPECT_EQ(0, task->finishedCount);
    EXPECT_EQ(1, task.use_count());
}

TEST_F(TaskHolderTest, UseWithoutATaskOrSubmittingASecondIsAnAssertion) {
    Tasking::TaskHolder holder(true);
    holder.cancel();
    expectAssertion("task");
    holder.wait();
    expectAssertion("task");
    holder.onFinished();
    expectAssertion("task");

    boost::shared_ptr<GateTask> blocker = occupyWorker();
    holder.submit(probe("first"), 0);
    holder.submit(probe("second"), 0);
    expectAssertion("!task");
    blocker->open();
}

TEST_F(TaskHolderTest, HoldersOutlivingTheManagerAtShutdownDoNothing) {
    EarlyService* service = EarlyService::getInstance();
    // Held back, so both tasks are still queued when the platform shuts down.
    Tasking::TaskManager::getInstance()->enableLowProirityMode();
    boost::shared_ptr<ProbeTask> cancelled = probe("cancelled");
    boost::shared_ptr<ProbeTask> waited = probe("waited");
    service->cancelling.submit(cancelled, 0);
    service->waiting.submit(waited, 0);

    shutdownPal();

    EXPECT_EQ(nullptr, EarlyService::getExistingInstance());
    EXPECT_EQ(0, countLogLines("adding singleton when isDestroying"));
    EXPECT_TRUE(journal.read("run").empty());
    EXPECT_EQ(1, cancelled.use_count());
    EXPECT_EQ(1, waited.use_count());
}
