#include "network/impl/PriorityManager.h"

#include <boost/make_shared.hpp>

namespace Network {

namespace {

const long long kNanosPerSecond = 1000000000ll;

// Carries a promoted connection's holder to its caller thread.
class HolderContext : public Util::ThreadCallback::Context {
public:
    explicit HolderContext(const boost::shared_ptr<PriorityManager::ConnectionHolder>& holder)
        : holder(holder) {}
    boost::shared_ptr<PriorityManager::ConnectionHolder> holder;
};

// Holds the manager's mutex for one scope.
class ScopedLock {
public:
    explicit ScopedLock(KDThreadMutex* mutex) : mutex(mutex) { kdThreadMutexLock(mutex); }
    ~ScopedLock() { kdThreadMutexUnlock(mutex); }

private:
    KDThreadMutex* mutex;
};

}  // namespace

PriorityManager::ConnectionHolder::ConnectionHolder(const boost::shared_ptr<BaseConnection>& connection,
                                                    PriorityManager* priorityManager, long long deadline,
                                                    unsigned long long sequence)
    : connection(connection),
      priorityManager(priorityManager),
      timer(new Util::Timer(
          callback<void (*)()>::make<ConnectionHolder, &ConnectionHolder::onTimerFired>(this))),
      deadline(deadline),
      sequence(sequence),
      threadCallback(new Util::ThreadCallback()) {}

void PriorityManager::ConnectionHolder::onTimerFired() {
    // Starting the connection drops the manager's reference to this holder.
    boost::shared_ptr<ConnectionHolder> self = shared_from_this();
    priorityManager->handleTimerFired(connection);
}

void PriorityManager::ConnectionHolder::onThreadCallback(
    boost::shared_ptr<Util::ThreadCallback::Context> context) {
    boost::shared_ptr<ConnectionHolder> holder = boost::static_pointer_cast<HolderContext>(context)->holder;
    priorityManager->runConnectionOnThread(kdThreadSelf(), holder, true);
}

PriorityManager::PriorityManager(int minConnections, int maxConnections, KDThreadMutex* mutex)
    : mutex(mutex), minConnections(minConnections), maxConnections(maxConnections), nextSequence(0) {
    KD_ASSERT(minConnections <= maxConnections);
}

PriorityManager::~PriorityManager() {
    KD_ASSERT(runningConnections.size() == 0);
    KD_ASSERT(delayedConnections.size() == 0);
}

long long PriorityManager::getTimeoutForPriority(int priority) {
    switch (priority) {
        case 0:
            return 20 * kNanosPerSecond;
        case 1:
            return 10 * kNanosPerSecond;
        case 2:
            return 5 * kNanosPerSecond;
        case 3:
            return 0;
        default:
            KD_ASSERT(false);
            return 0;
    }
}

int PriorityManager::getRunningCount() const {
    ScopedLock lock(mutex);
    return static_cast<int>(runningConnections.size());
}

int PriorityManager::getWaitingCount() const {
    ScopedLock lock(mutex);
    return static_cast<int>(delayedConnections.size());
}

void PriorityManager::start(const boost::shared_ptr<BaseConnection>& connection) {
    KD_ASSERT(connection->getCallerThread() == kdThreadSelf());
    ScopedLock lock(mutex);
    int running = static_cast<int>(runningConnections.size());
    if (running < minConnections || (running < maxConnections && connection->getPriority() == 3)) {
        startNow(connection);
    } else {
        enqueue(connection);
    }
}

void PriorityManager::startNow(const ConnectionPtr& connection) {
    runningConnections.insert(connection);
    connection->start();
}

void PriorityManager::enqueue(const ConnectionPtr& connection) {
    long long wait = getTimeoutForPriority(connection->getPriority());
    boost::shared_ptr<ConnectionHolder> holder = boost::make_shared<ConnectionHolder>(
        connection, this, connection->getCreationTime() + wait, nextSequence++);
    delayedConnections[connection] = holder;
    delayQueue.insert(std::make_tuple(holder->deadline, holder->sequence, connection));
    // Counted from now, while the queue orders by creation time: a retried
    // connection keeps its place ahead of newer ones.
    holder->timer->start(Util::Timer::OneShot, wait);
}

boost::shared_ptr<PriorityManager::ConnectionHolder> PriorityManager::takeWaiting(
    const ConnectionPtr& connection) {
    boost::unordered_map<ConnectionPtr, boost::shared_ptr<ConnectionHolder> >::iterator it =
        delayedConnections.find(connection);
    if (it == delayedConnections.end()) {
        return boost::shared_ptr<ConnectionHolder>();
    }
    boost::shared_ptr<ConnectionHolder> holder = it->second;
    delayedConnections.erase(it);
    delayQueue.erase(std::make_tuple(holder->deadline, holder->sequence, connection));
    return holder;
}

void PriorityManager::handleTimerFired(const boost::shared_ptr<BaseConnection>& connection) {
    ScopedLock lock(mutex);
    boost::unordered_map<ConnectionPtr, boost::shared_ptr<ConnectionHolder> >::iterator it =
        delayedConnections.find(connection);
    if (it == delayedConnections.end()) {
        return;
    }
    it->second->timer.reset();
    if (static_cast<int>(runningConnections.size()) >= maxConnections) {
        return;
    }
    takeWaiting(connection);
    startNow(connection);
}

void PriorityManager::cancel(const boost::shared_ptr<BaseConnection>& connection) {
    KD_ASSERT(connection->getCallerThread() == kdThreadSelf());
    ScopedLock lock(mutex);
    boost::unordered_set<ConnectionPtr>::iterator running = runningConnections.find(connection);
    if (running != runningConnections.end()) {
        connection->cancel();
        runningConnections.erase(connection);
    } else {
        takeWaiting(connection);
    }
    promoteEarliest();
}

void PriorityManager::promoteEarliest() {
    // Bounded by the maximum: dropping a waiting connection frees no slot, and
    // promoting regardless would let more than the maximum run.
    if (delayQueue.empty() || static_cast<int>(runningConnections.size()) >= maxConnections) {
        return;
    }
    ConnectionPtr newConnection = std::get<2>(*delayQueue.begin());
    KD_ASSERT(delayedConnections.count(newConnection));
    boost::shared_ptr<ConnectionHolder> holder = takeWaiting(newConnection);
    runningConnections.insert(newConnection);
    KDThread* thread = newConnection->getCallerThread();
    runConnectionOnThread(thread, holder, thread != kdThreadSelf());
}

void PriorityManager::runConnectionOnThread(KDThread* thread, boost::shared_ptr<ConnectionHolder> holder,
                                            bool lockNeeded) {
    if (thread != kdThreadSelf()) {
        holder->threadCallback->asyncPerformIfDifferentThread(
            Util::ThreadCallback::Function::make<ConnectionHolder, &ConnectionHolder::onThreadCallback>(
                holder.get()),
            boost::make_shared<HolderContext>(holder));
        return;
    }
    holder->timer.reset();
    ConnectionPtr connection = holder->connection;
    holder.reset();
    if (lockNeeded) {
        kdThreadMutexLock(mutex);
    }
    // It may have been cancelled between the promotion and this call.
    if (runningConnections.count(connection)) {
        connection->start();
    }
    if (lockNeeded) {
        kdThreadMutexUnlock(mutex);
    }
}

void PriorityManager::clear() {
    ScopedLock lock(mutex);
    runningConnections.clear();
    delayedConnections.clear();
    delayQueue.clear();
}

}  // namespace Network
