#pragma once

#include <boost/enable_shared_from_this.hpp>
#include <boost/scoped_ptr.hpp>

#include "network/NetworkManager.h"
#include "network/NetworkTaskRetryPolicy.h"
#include "util/Timer.h"

namespace Network {

// Retries transient failures (no answer, 408, 5xx) after a fixed interval,
// or as soon as the network comes back when it is unreachable, up to a limit
// (-1: without end); optionally ends the task after limit x (interval + 30 s).
// Construct and use on the task's caller thread; a policy that may wait for
// reachability belongs to the network manager's thread.
class NetworkTaskBasicRetryPolicy : public NetworkTaskRetryPolicy,
                                    public boost::enable_shared_from_this<NetworkTaskBasicRetryPolicy> {
public:
    // retryInterval in milliseconds; maxRetries 1 means a single attempt.
    NetworkTaskBasicRetryPolicy(int retryInterval, int maxRetries, bool useTaskTimeout);
    ~NetworkTaskBasicRetryPolicy() override;

    void onSubmit(OnRequestTimeoutCallback onTimeout) override;
    void onStatusCodeRecieved(int code) override;
    bool isRetryCondition() const override;
    bool isNeedRetry() const override;
    void performRetry(OnRetryCallback onRetry) override;

    void onRetryTimerFired();
    void onTaskTimeout();
    void onNetworkReachabilityChanged(NetworkManager::NetworkReachabilityStatus status);

private:
    NetworkTaskBasicRetryPolicy(const NetworkTaskBasicRetryPolicy&) = delete;
    NetworkTaskBasicRetryPolicy& operator=(const NetworkTaskBasicRetryPolicy&) = delete;

    void subscribe();
    void unsubscribe();
    NetworkManager::NetworkReachabilityStatusCallback reachabilityCallback();

    int statusCode;
    int retryInterval;
    int maxRetries;
    int retryCount;
    boost::scoped_ptr<Util::Timer> retryTimer;
    boost::scoped_ptr<Util::Timer> taskTimeoutTimer;
    OnRetryCallback retryCallback;
    OnRequestTimeoutCallback timeoutCallback;
    bool subscribed;
};

}  // namespace Network
