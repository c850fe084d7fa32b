#pragma once

#include <KD/kd.h>

#include <boost/enable_shared_from_this.hpp>
#include <boost/scoped_ptr.hpp>
#include <boost/shared_ptr.hpp>
#include <boost/weak_ptr.hpp>

#include "network/DataChunk.h"
#include "network/HttpConnection.h"
#include "network/NetworkManager.h"
#include "network/NetworkSpeedCollector.h"
#include "network/NetworkTask.h"
#include "network/NetworkTaskRetryPolicy.h"
#include "network/impl/PriorityManager.h"
#include "util/ThreadCallback.h"
#include "util/callback.h"

namespace Network {

// The running state of one submission: its attempts as HTTP connections,
// its retries and its timeout. Created on the task's caller thread, where
// every call but schedule() runs; the manager's mutex guards its hand-over
// between the manager's containers and the priority manager.
class NetworkTaskImpl : public NetworkTask::State,
                        public boost::enable_shared_from_this<NetworkTaskImpl>,
                        public PriorityManager::BaseConnection {
public:
    typedef callback<void (*)(boost::shared_ptr<NetworkTaskImpl>, int)> OnCompletedCallback;
    typedef callback<void (*)(boost::shared_ptr<NetworkTaskImpl>, NetworkManager::NetworkActivityStatus)>
        OnActivityCallback;

    static const int MAX_OBJECT_ID = 1000000;

    NetworkTaskImpl(const boost::shared_ptr<NetworkTask>& task,
                    const boost::shared_ptr<NetworkTaskRetryPolicy>& retryPolicy,
                    OnCompletedCallback onCompleted, OnActivityCallback onActivity,
                    PriorityManager* priorityManager,
                    const boost::weak_ptr<NetworkSpeedCollector>& speedCollector);
    ~NetworkTaskImpl() override;

    void start() override;
    void cancel() override;
    int getPriority() const override { return priority; }
    long long getCreationTime() const override { return creationTime; }
    KDThread* getCallerThread() const override { return callerThread; }

    // Any thread: the attempt is started on the thread that created the state.
    void schedule(long long time, KDThread* thread);
    void unschedule();
    // Called when the state is queued again after an offline completion, so
    // that its next run reports its own finish.
    void prepareForResubmit();
    // The task was cancelled: nothing of it runs or reports any more.
    void withdraw();
    // Drops the connection without any callback; the manager goes away.
    void abandon();

    void onSubmit();
    void onTimeout(boost::shared_ptr<NetworkTaskRetryPolicy> policy);
    void onRetry(boost::shared_ptr<NetworkTaskRetryPolicy> policy);
    void onResponseRecieved(boost::shared_ptr<HttpConnection> from, boost::shared_ptr<HttpResponse> response);
    void onBodyDataRecieved(boost::shared_ptr<HttpConnection> from, boost::shared_ptr<DataChunk> chunk);
    void onFinished(boost::shared_ptr<HttpConnection> from, int code);

    const boost::shared_ptr<NetworkTask>& getTask() const { return task; }
    int getId() const { return id; }
    bool isWithdrawn() const { return withdrawn; }
    bool isWaitingForRetry() const { return waitingForRetry; }

    // For tests of the id wrap.
    static void setNextObjectId(int value) { nextObjectId = value; }

private:
    NetworkTaskImpl(const NetworkTaskImpl&) = delete;
    NetworkTaskImpl& operator=(const NetworkTaskImpl&) = delete;

    void doSchedule(boost::shared_ptr<Util::ThreadCallback::Context> context);
    void dropConnection();
    static int takeNextId();

    bool waitingForRetry;
    boost::shared_ptr<NetworkTask> task;
    boost::shared_ptr<NetworkTaskRetryPolicy> retryPolicy;
    OnCompletedCallback onCompleted;
    OnActivityCallback onActivity;
    PriorityManager* priorityManager;
    boost::scoped_ptr<Util::ThreadCallback> threadCallback;
    boost::shared_ptr<HttpConnection> connection;
    int priority;
    long long creationTime;
    KDThread* callerThread;
    bool responseReceived;
    bool finished;
    int statusCode;
    int id;
    boost::weak_ptr<NetworkSpeedCollector> speedCollector;
    // Set by cancel: a retry, a posted start or a completion already under
    // way must not bring the task back.
    bool withdrawn;

    static int nextObjectId;
};

}  // namespace Network
