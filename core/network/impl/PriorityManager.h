#pragma once

#include <KD/kd.h>

#include <boost/enable_shared_from_this.hpp>
#include <boost/scoped_ptr.hpp>
#include <boost/shared_ptr.hpp>
#include <boost/unordered_map.hpp>
#include <boost/unordered_set.hpp>
#include <set>
#include <tuple>

#include "util/ThreadCallback.h"
#include "util/Timer.h"

namespace Network {

// Admits connections within a small number of slots: up to the minimum at
// once whatever their priority, up to the maximum only for the most urgent
// priority; every other connection waits for a slot or for its deadline.
// start and cancel run on the connection's caller thread; every container is
// guarded by the owner's recursive mutex, which the owner may already hold.
class PriorityManager {
public:
    // A schedulable connection, held by shared pointer. start() and cancel()
    // are called on its caller thread with the mutex held.
    class BaseConnection {
    public:
        virtual ~BaseConnection() {}
        virtual void start() = 0;
        virtual void cancel() = 0;
        virtual int getPriority() const = 0;
        // Platform UST (ns) of the submission: deadlines count from it.
        virtual long long getCreationTime() const = 0;
        virtual KDThread* getCallerThread() const = 0;
    };

    // One waiting connection with its deadline timer. Made, fired and
    // destroyed on the thread that queued the connection.
    class ConnectionHolder : public boost::enable_shared_from_this<ConnectionHolder> {
    public:
        ConnectionHolder(const boost::shared_ptr<BaseConnection>& connection,
                         PriorityManager* priorityManager, long long deadline, unsigned long long sequence);

        void onTimerFired();
        void onThreadCallback(boost::shared_ptr<Util::ThreadCallback::Context> context);

        boost::shared_ptr<BaseConnection> connection;
        PriorityManager* priorityManager;
        boost::scoped_ptr<Util::Timer> timer;
        long long deadline;
        // Queueing order, breaking ties between equal deadlines first come,
        // first served.
        unsigned long long sequence;
        boost::scoped_ptr<Util::ThreadCallback> threadCallback;
    };

    PriorityManager(int minConnections, int maxConnections, KDThreadMutex* mutex);
    ~PriorityManager();

    void start(const boost::shared_ptr<BaseConnection>& connection);
    void cancel(const boost::shared_ptr<BaseConnection>& connection);
    // Forgets every connection without calling it; for an owner that goes
    // away with connections still held.
    void clear();

    static long long getTimeoutForPriority(int priority);

    int getRunningCount() const;
    int getWaitingCount() const;

    void handleTimerFired(const boost::shared_ptr<BaseConnection>& connection);
    void runConnectionOnThread(KDThread* thread, boost::shared_ptr<ConnectionHolder> holder, bool lockNeeded);

private:
    typedef boost::shared_ptr<BaseConnection> ConnectionPtr;
    typedef std::set<std::tuple<long long, unsigned long long, ConnectionPtr> > DelayQueue;

    PriorityManager(const PriorityManager&) = delete;
    PriorityManager& operator=(const PriorityManager&) = delete;

    void startNow(const ConnectionPtr& connection);
    void enqueue(const ConnectionPtr& connection);
    boost::shared_ptr<ConnectionHolder> takeWaiting(const ConnectionPtr& connection);
    void promoteEarliest();

    boost::unordered_set<ConnectionPtr> runningConnections;
    boost::unordered_map<ConnectionPtr, boost::shared_ptr<ConnectionHolder> > delayedConnections;
    DelayQueue delayQueue;
    KDThreadMutex* mutex;
    int minConnections;
    int maxConnections;
    unsigned long long nextSequence;
};

}  // namespace Network
