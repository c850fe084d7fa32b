#pragma once

#include <boost/shared_ptr.hpp>
#include <boost/weak_ptr.hpp>

#include "lifecycle/PauseResumeListener.h"
#include "network/NetworkErrorCodes.h"
#include "network/NetworkSpeedCollector.h"
#include "network/NetworkTask.h"
#include "util/callback.h"

namespace Network {

class NetworkTaskRetryPolicy;

// Runs network tasks and publishes the network's status. The manager's thread
// is the one that first calls getInstance(); status callbacks are delivered
// there and may only be added or removed there. submit and cancel belong to
// the task's caller thread.
class NetworkManager : public Lifecycle::PauseResumeListener {
public:
    enum OfflineModeStatus { OfflineModeOff = 0, OfflineModeOn = 1 };
    // The platform's reachability value, passed through unchanged; only 0
    // means anything to the network subsystem.
    enum NetworkReachabilityStatus {
        NetworkNotReachable = 0,
        NetworkReachableViaWifi = 1,
        NetworkReachableViaMobile = 2
    };
    enum NetworkErrorStatus { NoNetworkError = 0, NetworkError = 1 };
    enum NetworkActivityStatus { NetworkActive = 0, NetworkIdle = 1 };

    typedef callback<void (*)(OfflineModeStatus)> OfflineModeStatusCallback;
    typedef callback<void (*)(NetworkReachabilityStatus)> NetworkReachabilityStatusCallback;
    typedef callback<void (*)(NetworkErrorStatus)> NetworkErrorStatusCallback;
    typedef callback<void (*)(NetworkActivityStatus)> NetworkActivityStatusCallback;

    static NetworkManager* getInstance();

    virtual void submit(boost::shared_ptr<NetworkTask> task) = 0;
    virtual void submit(boost::shared_ptr<NetworkTask> task,
                        boost::shared_ptr<NetworkTaskRetryPolicy> retryPolicy) = 0;
    // A task that finishes with OFFLINE_ERROR_CODE is queued again and runs
    // (and reports) once more after offline mode ends: its owner keeps it to
    // hear that run, or lets it go with cancel(). cancel() withdraws the task
    // in any state, also from inside its own onFinished and after it
    // completed; nothing of it runs or reports afterwards.
    virtual void cancel(boost::shared_ptr<NetworkTask> task) = 0;

    virtual OfflineModeStatus getOfflineModeStatus() const = 0;
    virtual void addOfflineModeStatusCallback(OfflineModeStatusCallback callback) = 0;
    virtual void removeOfflineModeStatusCallback(OfflineModeStatusCallback callback) = 0;
    virtual void changeOfflineModeStatus(OfflineModeStatus status) = 0;

    virtual NetworkReachabilityStatus getNetworkReachabilityStatus() const = 0;
    virtual void addNetworkReachabilityStatusCallback(NetworkReachabilityStatusCallback callback) = 0;
    virtual void removeNetworkReachabilityStatusCallback(NetworkReachabilityStatusCallback callback) = 0;

    virtual NetworkErrorStatus getNetworkErrorStatus() const = 0;
    virtual void addNetworkErrorStatusCallback(NetworkErrorStatusCallback callback) = 0;
    virtual void removeNetworkErrorStatusCallback(NetworkErrorStatusCallback callback) = 0;

    virtual NetworkActivityStatus getNetworkActivityStatus() const = 0;
    virtual void addNetworkActivityStatusCallback(NetworkActivityStatusCallback callback) = 0;
    virtual void removeNetworkActivityStatusCallback(NetworkActivityStatusCallback callback) = 0;

    // Kept weakly; tasks submitted afterwards report to it.
    virtual void setNetworkSpeedCollector(boost::weak_ptr<NetworkSpeedCollector> collector) = 0;
};

}  // namespace Network
