#include <boost/make_shared.hpp>
#include <condition_variable>
#include <mutex>
#include <string>
#include <vector>

#include "network/impl/PriorityManager.h"
#include "support/PalTest.h"

using Network::PriorityManager;

namespace {

// A connection that only writes down when the priority manager starts or
// cancels it, into a log shared by all connections of a test.
class LoggedConnection : public PriorityManager::BaseConnection {
public:
    LoggedConnection(const std::string& name, int priority, long long creationTime,
                     std::vector<std::string>* log)
        : name(name), priority(priority), creationTime(creationTime), thread(kdThreadSelf()), log(log) {}

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

// A one-way latch between two threads.
class Latch {
public:
    void open() {
        std::lock_guard<std::mutex> lock(mutex);
        opened = true;
        changed.notify_all();
    }
    void wait() {
        std::unique_lock<std::mutex> lock(mutex);
        changed.wait(lock, [this] { return opened; });
    }

private:
    std::mutex mutex;
    std::condition_variable changed;
    bool opened = false;
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

    Connection make(const std::string& name, int priority) {
        return boost::make_shared<LoggedConnection>(name, priority, kdGetTimeUST(), &log);
    }
    // Starts n connections of priority 1, named r0, r1, ...
    std::vector<Connection> fill(int n) {
        std::vector<Connection> running;
        for (int i = 0; i < n; ++i) {
            running.push_back(make("r" + std::to_string(i), 1));
            manager->start(running.back());
        }
        log.clear();
        return running;
    }

    KDThreadMutex* mutex = nullptr;
    std::unique_ptr<PriorityManager> manager;
    std::vector<std::string> log;
};

TEST_F(PriorityManagerTest, WaitingTimesFollowPriorityAndUnknownPrioritiesAssert) {
    EXPECT_EQ(20000000000ll, PriorityManager::getTimeoutForPriority(0));
    EXPECT_EQ(10000000000ll, PriorityManager::getTimeoutForPriority(1));
    EXPECT_EQ(5000000000ll, PriorityManager::getTimeoutForPriority(2));
    EXPECT_EQ(0, PriorityManager::getTimeoutForPriority(3));
    EXPECT_EQ(0, PriorityManager::getTimeoutForPriority(4));
    expectAssertion("false");
    EXPECT_EQ(0, PriorityManager::getTimeoutForPriority(-1));
    expectAssertion("false");
}

TEST_F(PriorityManagerTest, BelowTheMinimumAllStartAboveItOnlyTheMostUrgentUpToTheMaximum) {
    std::vector<Connection> running = fill(4);
    Connection waiting = make("p1", 1);
    manager->start(waiting);
    EXPECT_TRUE(log.empty());
    for (int i = 0; i < 4; ++i) {
        manager->start(make("u" + std::to_string(i), 3));
    }
    EXPECT_EQ((std::vector<std::string>{"start u0", "start u1", "start u2", "start u3"}), log);
    EXPECT_EQ(8, manager->getRunningCount());

    // With the maximum reached even the most urgent waits, and its deadline
    // (now) passing changes nothing until a slot frees.
    log.clear();
    manager->start(make("late", 3));
    advanceMs(0);
    advanceMs(1);
    EXPECT_TRUE(log.empty());
    EXPECT_EQ(2, manager->getWaitingCount());
    manager->cancel(running[0]);
    EXPECT_EQ((std::vector<std::string>{"cancel r0", "start late"}), log);
}

TEST_F(PriorityManagerTest, WaitingConnectionStartsAtItsDeadlineOrWhenASlotFrees) {
    std::vector<Connection> running = fill(4);
    manager->start(make("a", 1));
    advanceMs(9999);
    EXPECT_TRUE(log.empty());
    advanceMs(1);
    EXPECT_EQ((std::vector<std::string>{"start a"}), log);

    log.clear();
    manager->start(make("b", 1));
    manager->cancel(running[1]);
    EXPECT_EQ((std::vector<std::string>{"cancel r1", "start b"}), log);
    // Its timer went with its holder.
    log.clear();
    advanceMs(20000);
    EXPECT_TRUE(log.empty());
}

TEST_F(PriorityManagerTest, FreedSlotGoesToTheEarliestDeadline) {
    std::vector<Connection> running = fill(4);
    Connection retried = boost::make_shared<LoggedConnection>("retried", 0, kdGetTimeUST(), &log);
    advanceMs(3000);
    manager->start(make("low", 0));
    manager->start(make("high", 2));
    manager->start(make("low2", 0));
    // Submitted earlier, so its deadline (creation + 20 s) leads the newer
    // priority-0 one although it is queued last.
    manager->start(retried);
    manager->cancel(running[0]);
    manager->cancel(running[1]);
    manager->cancel(running[2]);
    // Equal deadlines: first queued, first started.
    manager->cancel(running[3]);
    EXPECT_EQ((std::vector<std::string>{"cancel r0", "start high", "cancel r1", "start retried", "cancel r2",
                                        "start low", "cancel r3", "start low2"}),
              log);
}

TEST_F(PriorityManagerTest, CancellingAWaitingConnectionPromotesAnotherOnlyBelowTheMaximum) {
    std::vector<Connection> running = fill(4);
    Connection first = make("first", 1);
    manager->start(first);
    manager->start(make("second", 1));
    manager->cancel(first);
    EXPECT_EQ((std::vector<std::string>{"start second"}), log);
    EXPECT_EQ(5, manager->getRunningCount());

    for (int i = 0; i < 3; ++i) {
        manager->start(make("u" + std::to_string(i), 3));
    }
    Connection third = make("third", 1);
    manager->start(third);
    manager->start(make("fourth", 1));
    log.clear();
    manager->cancel(third);
    EXPECT_TRUE(log.empty());
    EXPECT_EQ(8, manager->getRunningCount());
    EXPECT_EQ(1, manager->getWaitingCount());
}

TEST_F(PriorityManagerTest, ConnectionsMustBeHandledOnTheirCallerThread) {
    Connection connection = make("c", 1);
    struct Call {
        static void* run(void* argument) {
            Call* call = static_cast<Call*>(argument);
            call->manager->start(call->connection);
            return nullptr;
        }
        PriorityManager* manager;
        Connection connection;
    } call{manager.get(), connection};
    KDThread* thread = kdThreadCreate(nullptr, &Call::run, &call);
    kdThreadJoin(thread, nullptr);
    expectAssertion("connection->getCallerThread() == kdThreadSelf()");
}

// A connection of another thread promoted by a cancel on this one is started
// there, through a posted call; cancelled before that call runs, it never
// starts.
TEST_F(PriorityManagerTest, PromotedConnectionCancelledBeforeItsPostedStartNeverStarts) {
    struct Worker {
        static void* run(void* argument) {
            Worker* worker = static_cast<Worker*>(argument);
            worker->connection =
                boost::make_shared<LoggedConnection>("remote", 1, kdGetTimeUST(), &worker->log);
            worker->manager->start(worker->connection);
            worker->queued.open();
            worker->promoted.wait();
            if (worker->cancelFirst) {
                worker->manager->cancel(worker->connection);
            }
            kdPumpEvents();
            return nullptr;
        }
        PriorityManager* manager;
        bool cancelFirst;
        Connection connection;
        std::vector<std::string> log;
        Latch queued;
        Latch promoted;
    };
    for (bool cancelFirst : {false, true}) {
        SCOPED_TRACE(cancelFirst ? "cancelled first" : "not cancelled");
        std::vector<Connection> running = fill(4);
        Worker worker;
        worker.manager = manager.get();
        worker.cancelFirst = cancelFirst;
        KDThread* thread = kdThreadCreate(nullptr, &Worker::run, &worker);
        worker.queued.wait();
        manager->cancel(running[0]);
        worker.promoted.open();
        kdThreadJoin(thread, nullptr);
        // Promoted means counted as running, so a cancel reaches it, but its
        // start never runs.
        EXPECT_EQ(cancelFirst ? std::vector<std::string>{"cancel remote"}
                              : std::vector<std::string>{"start remote"},
                  worker.log);
        manager->clear();
    }
}
