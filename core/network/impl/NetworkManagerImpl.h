#pragma once

#include <KD/kd.h>

#include <boost/scoped_ptr.hpp>
#include <boost/shared_ptr.hpp>
#include <boost/unordered_set.hpp>
#include <list>
#include <vector>

#include "lifecycle/PauseResumeListenerWrapper.h"
#include "network/HttpEngine.h"
#include "network/NetworkManager.h"
#include "network/impl/NetworkTaskImpl.h"
#include "network/impl/PriorityManager.h"
#include "network/impl/ReachabilityProvider.h"
#include "util/Singleton.h"
#include "util/ThreadCallback.h"

namespace Network {

// The process-wide network manager. Its thread is the one that created it:
// status callbacks are delivered and registered there only. submit and
// cancel run on the task's caller thread. One recursive mutex, shared with
// the priority manager, guards the task containers, the statuses and the
// activity count; the callback vectors belong to the manager's thread alone.
class NetworkManagerImpl : public Util::Singleton<NetworkManagerImpl>, public NetworkManager {
public:
    // A submission held back until its task is ready and offline mode is off.
    struct DelayedRequestData {
        DelayedRequestData(const boost::shared_ptr<NetworkTask>& task,
                           const boost::shared_ptr<NetworkTaskImpl>& taskImpl, long long submitTime,
                           KDThread* thread)
            : task(task), taskImpl(taskImpl), submitTime(submitTime), thread(thread) {}

        boost::shared_ptr<NetworkTask> task;
        boost::shared_ptr<NetworkTaskImpl> taskImpl;
        long long submitTime;
        KDThread* thread;
    };

    NetworkManagerImpl();
    ~NetworkManagerImpl() override;

    bool onPaused() override;
    bool onResumed() override;

    void submit(boost::shared_ptr<NetworkTask> task) override;
    void submit(boost::shared_ptr<NetworkTask> task,
                boost::shared_ptr<NetworkTaskRetryPolicy> retryPolicy) override;
    void cancel(boost::shared_ptr<NetworkTask> task) override;

    OfflineModeStatus getOfflineModeStatus() const override;
    void addOfflineModeStatusCallback(OfflineModeStatusCallback callback) override;
    void removeOfflineModeStatusCallback(OfflineModeStatusCallback callback) override;
    void changeOfflineModeStatus(OfflineModeStatus status) override;

    NetworkReachabilityStatus getNetworkReachabilityStatus() const override;
    void addNetworkReachabilityStatusCallback(NetworkReachabilityStatusCallback callback) override;
    void removeNetworkReachabilityStatusCallback(NetworkReachabilityStatusCallback callback) override;

    NetworkErrorStatus getNetworkErrorStatus() const override;
    void addNetworkErrorStatusCallback(NetworkErrorStatusCallback callback) override;
    void removeNetworkErrorStatusCallback(NetworkErrorStatusCallback callback) override;

    NetworkActivityStatus getNetworkActivityStatus() const override;
    void addNetworkActivityStatusCallback(NetworkActivityStatusCallback callback) override;
    void removeNetworkActivityStatusCallback(NetworkActivityStatusCallback callback) override;

    void setNetworkSpeedCollector(boost::weak_ptr<NetworkSpeedCollector> collector) override;

    // Submissions known to the manager: running or waiting, and held back.
    int getTaskCount() const;
    int getUnreadyCount() const;
    const PriorityManager& getPriorityManager() const { return *priorityManager; }

    void onTaskImplCompleted(boost::shared_ptr<NetworkTaskImpl> state, int code);
    void onTaskNetworkActivityChanged(boost::shared_ptr<NetworkTaskImpl> state, NetworkActivityStatus status);
    void onNetworkReachabilityChanged(int status);
    void signalOfflineModeChanged(boost::shared_ptr<Util::ThreadCallback::Context> context);
    void signalNetworkErrorStatusChanged(boost::shared_ptr<Util::ThreadCallback::Context> context);
    void signalNetworkActivityStatusChanged(boost::shared_ptr<Util::ThreadCallback::Context> context);

private:
    typedef std::list<boost::shared_ptr<DelayedRequestData> > DelayedRequests;

    NetworkManagerImpl(const NetworkManagerImpl&) = delete;
    NetworkManagerImpl& operator=(const NetworkManagerImpl&) = delete;

    void doSubmit(const boost::shared_ptr<NetworkTaskImpl>& state, long long time, KDThread* thread);
    void removeCompleted(const boost::shared_ptr<NetworkTaskImpl>& state);
    void resubmit(const boost::shared_ptr<NetworkTaskImpl>& state);
    void submitUnreadyRequests();
    bool removeUnready(const boost::shared_ptr<NetworkTask>& task);
    void post(Util::ThreadCallback::Function signal);
    void assertManagerThread() const;
    void dropAllTasks();

    boost::unordered_set<boost::shared_ptr<NetworkTaskImpl> > tasks;
    DelayedRequests unreadyRequests;
    boost::scoped_ptr<Util::ThreadCallback> threadCallback;
    boost::shared_ptr<HttpEngine> httpEngine;
    boost::shared_ptr<PriorityManager> priorityManager;
    boost::shared_ptr<Lifecycle::PauseResumeListenerWrapper> pauseResumeListenerWrapper;
    KDThreadMutex* mutex;
    OfflineModeStatus offlineModeStatus;
    std::vector<OfflineModeStatusCallback> offlineModeCallbacks;
    boost::scoped_ptr<ReachabilityProvider> reachabilityProvider;
    std::vector<NetworkReachabilityStatusCallback> reachabilityCallbacks;
    NetworkErrorStatus networkErrorStatus;
    std::vector<NetworkErrorStatusCallback> errorCallbacks;
    std::vector<NetworkActivityStatusCallback> activityCallbacks;
    int activeConnectionCount;
    boost::weak_ptr<NetworkSpeedCollector> speedCollector;
};

}  // namespace Network
