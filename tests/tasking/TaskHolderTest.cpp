#include <boost/make_shared.hpp>

#include "support/PalTest.h"
#include "tasking/TaskHolder.h"
#include "tasking/TaskManager.h"
#include "tasking/TaskProbes.h"

namespace {

typedef std::vector<std::string> Names;

// Tells its holder when it is done, as holders expect of their tasks.
class HeldTask : public ProbeTask {
public:
    HeldTask(Journal& journal, const std::string& name, Tasking::TaskHolder& holder)
        : ProbeTask(journal, name), holder(holder) {}
    void onFinished() override {
        ProbeTask::onFinished();
        holder.onFinished();
    }
    Tasking::TaskHolder& holder;
};

class TaskHolderTest : public PalTest {
protected:
    boost::shared_ptr<HeldTask> held(const std::string& name, Tasking::TaskHolder& holder) {
        return boost::make_shared<HeldTask>(journal, name, holder);
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

TEST_F(TaskHolderTest, FinishedTaskEmptiesTheHolderForTheNextOne) {
    Tasking::TaskHolder holder(true);
    boost::shared_ptr<HeldTask> first = held("first", holder);
    holder.submit(first, 0);
    pumpUntil([&first] { return first->finishedCount > 0; });
    boost::shared_ptr<HeldTask> second = held("second", holder);
    holder.submit(second, 0);
    pumpUntil([&second] { return second->finishedCount > 0; });
    EXPECT_EQ((Names{"first", "second"}), journal.read("finished"));
}

TEST_F(TaskHolderTest, WaitRunsAndNotifiesTheTask) {
    Tasking::TaskHolder holder(true);
    boost::shared_ptr<HeldTask> task = held("task", holder);
    holder.submit(task, 0);
    task.reset();
    holder.wait();
    EXPECT_EQ(Names{"task"}, journal.read("finished"));
    // The notification emptied the holder: a new task may go in.
    holder.submit(held("next", holder), 0);
    holder.wait();
    EXPECT_EQ((Names{"task", "next"}), journal.read("finished"));
}

TEST_F(TaskHolderTest, CancelledOrDestroyedWithCancelOnDestroyRunsNothing) {
    boost::shared_ptr<GateTask> blocker = occupyWorker();
    boost::shared_ptr<ProbeTask> cancelled = boost::make_shared<ProbeTask>(journal, "cancelled");
    boost::shared_ptr<ProbeTask> dropped = boost::make_shared<ProbeTask>(journal, "dropped");
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
    boost::shared_ptr<ProbeTask> task = boost::make_shared<ProbeTask>(journal, "task");
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
    holder.submit(boost::make_shared<ProbeTask>(journal, "first"), 0);
    holder.submit(boost::make_shared<ProbeTask>(journal, "second"), 0);
    expectAssertion("!task");
    blocker->open();
}
