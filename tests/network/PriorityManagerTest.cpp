#include <boost/make_shared.hpp>
#include <condition_variable>
#include <mutex>
#include <string>
#include <vector>

#include "network/impl/PriorityManager.h"
#include "support/PalTest.h"

using Network::PriorityManager;

namespace {

// Writes down when the priority manager starts or cancels it, into a log
// shared by the connections of a test.
class LoggedConnection : public PriorityManager::BaseConnection {
public:
    LoggedConnection(const std::string& name, int priority, std::vector<std::string>* log)
        : name(name), priority(priority), creationTime(kdGetTimeUST()), thread(kdThreadSelf()), log(log) {}

    void start() override { log->push_back("start " + name); }
    void cancel() override { log->push_back("cancel " + name); }
    int getPriority() const override { return priority; }
    long long getCreationTime() const override { return creationTime; }
    KDThread* getCallerThread() const override { return thread; }

private:
    std::string name;
    int priority;
    long long creationTime;
    KDThread* thread;
    std::vector<std::string>* log;
};

}  // namespace

class PriorityManagerTest : public PalTest {
protected:
    typedef boost::shared_ptr<PriorityManager::BaseConnection> Connection;

    void SetUp() override {
        PalTest::SetUp();
        mutex = kdThreadMutexCreate(nullptr);
        manager.reset(new PriorityManager(4, 8, mutex));
    }
    void TearDown() override {
        manager->clear();
        manager.reset();
        kdThreadMutexFree(mutex);
        PalTest::TearDown();
    }

    Connection start(const std::string& name, int priority) {
        Connection connection = boost::make_shared<LoggedConnection>(name, priority, &log);
        manager->start(connection);
        return connection;
    }
    // Starts n connections of priority 1, named r0, r1, ...
    std::vector<Connection> fill(int n) {
        std::vector<Connection> running;
        for (int i = 0; i < n; ++i) {
            running.push_back(start("r" + std::to_string(i), 1));
        }
        log.clear();
        return running;
    }
    std::vector<std::string> takeLog() {
        std::vector<std::string> taken;
        taken.swap(log);
        return taken;
    }

    KDThreadMutex* mutex = nullptr;
    std::unique_ptr<PriorityManager> manager;
    std::vector<std::string> log;
};

TEST_F(PriorityManagerTest, AboveTheMinimumOnlyTheMostUrgentStartsAndOthersWaitForTheirDeadline) {
    std::vector<Connection> running = fill(4);
    start("p1", 1);
    start("p2", 2);
    for (int i = 0; i < 4; ++i) {
        start("u" + std::to_string(i), 3);
    }
    EXPECT_EQ((std::vector<std::string>{"start u0", "start u1", "start u2", "start u3"}), takeLog());

    // At the maximum even the most urgent waits, and deadlines passing change
    // nothing until a slot frees; then the earliest deadline goes first.
    start("late", 3);
    advanceMs(10000);
    EXPECT_TRUE(takeLog().empty());
    manager->cancel(running[0]);
    manager->cancel(running[1]);
    manager->cancel(running[2]);
    EXPECT_EQ((std::vector<std::string>{"cancel r0", "start late", "cancel r1", "start p2", "cancel r2",
                                        "start p1"}),
              takeLog());

    EXPECT_EQ(0, PriorityManager::getTimeoutForPriority(7));
    expectAssertion("false");
}

TEST_F(PriorityManagerTest, WaitingConnectionStartsAtItsDeadlineBelowTheMaximum) {
    std::vector<Connection> running = fill(4);
    start("a", 1);
    advanceMs(9999);
    EXPECT_TRUE(log.empty());
    advanceMs(1);
    EXPECT_EQ((std::vector<std::string>{"start a"}), takeLog());

    // Promoted by a cancel instead, its timer goes with it.
    start("b", 1);
    manager->cancel(running[1]);
    advanceMs(20000);
    EXPECT_EQ((std::vector<std::string>{"cancel r1", "start b"}), takeLog());
}

TEST_F(PriorityManagerTest, FreedSlotsGoByDeadlineThenQueueingOrderAndNeverBeyondTheMaximum) {
    std::vector<Connection> running = fill(4);
    Connection retried = boost::make_shared<LoggedConnection>("retried", 0, &log);
    advanceMs(3000);
    start("low", 0);
    start("high", 2);
    Connection low2 = start("low2", 0);
    // Submitted earlier, so its deadline leads the newer priority-0 ones
    // although it is queued last.
    manager->start(retried);
    for (int i = 0; i < 3; ++i) {
        manager->cancel(running[i]);
    }
    EXPECT_EQ((std::vector<std::string>{"cancel r0", "start high", "cancel r1", "start retried", "cancel r2",
                                        "start low"}),
              takeLog());

    // Dropping a waiting connection frees no slot: below the maximum the
    // next one starts, at the maximum it waits.
    Connection waiting = start("w", 1);
    start("w2", 1);
    manager->cancel(low2);
    EXPECT_EQ((std::vector<std::string>{"start w"}), takeLog());
    for (int i = 0; i < 3; ++i) {
        start("u" + std::to_string(i), 3);
    }
    Connection third = start("third", 1);
    takeLog();
    manager->cancel(third);
    EXPECT_TRUE(log.empty());
    EXPECT_EQ(8, manager->getRunningCount());
    EXPECT_EQ(1, manager->getWaitingCount());
}

// A connection of another thread promoted by a cancel on this one starts
// there through a posted call; cancelled before that call runs, it is
// cancelled as a running one but never starts.
TEST_F(PriorityManagerTest, PromotedConnectionCancelledBeforeItsPostedStartNeverStarts) {
    struct Worker {
        static void* run(void* argument) {
            Worker* worker = static_cast<Worker*>(argument);
            worker->connection = boost::make_shared<LoggedConnection>("remote", 1, &worker->log);
            worker->manager->start(worker->connection);
            worker->step(1);
            worker->waitFor(2);
            if (worker->cancelFirst) {
                worker->manager->cancel(worker->connection);
            }
            kdPumpEvents();
            return nullptr;
        }
        void step(int value) {
            std::lock_guard<std::mutex> lock(mutex);
            stage = value;
            changed.notify_all();
        }
        void waitFor(int value) {
            std::unique_lock<std::mutex> lock(mutex);
            changed.wait(lock, [&] { return stage >= value; });
        }
        PriorityManager* manager;
        bool cancelFirst;
        Connection connection;
        std::vector<std::string> log;
        std::mutex mutex;
        std::condition_variable changed;
        int stage = 0;
    };
    for (bool cancelFirst : {false, true}) {
        std::vector<Connection> running = fill(4);
        Worker worker;
        worker.manager = manager.get();
        worker.cancelFirst = cancelFirst;
        KDThread* thread = kdThreadCreate(nullptr, &Worker::run, &worker);
        worker.waitFor(1);
        manager->cancel(running[0]);
        worker.step(2);
        kdThreadJoin(thread, nullptr);
        EXPECT_EQ(std::vector<std::string>{cancelFirst ? "cancel remote" : "start remote"}, worker.log);
        manager->clear();
    }
}
