#pragma once

#include <boost/enable_shared_from_this.hpp>
#include <boost/scoped_ptr.hpp>

#include "network/NetworkManager.h"
#include "network/NetworkTaskRetryPolicy.h"
#include "network/RetryJitter.h"
#include "util/Timer.h"

namespace Network {

// Retries transient failures (no answer, 408, 5xx, a 429 that says when)
// after a fixed interval, or as soon as the network comes back when it is
// unreachable, up to a limit (-1: without end); optionally ends the task after
// limit x (interval + 30 s). Without a limit the waits grow: after the first
// interval each wait is drawn between the interval and a ceiling that doubles
// with every failure up to MAX_BACKOFF_INTERVAL_MS, so that clients failing
// together do not come back together. A 503 or 429 carrying Retry-After waits
// what the server asks instead, within [interval, MAX_RETRY_AFTER_MS].
// Construct and use on the task's caller thread; a policy that may wait for
// reachability belongs to the network manager's thread.
class NetworkTaskBasicRetryPolicy : public NetworkTaskRetryPolicy,
                                    public boost::enable_shared_from_this<NetworkTaskBasicRetryPolicy> {
public:
    // The longest wait between attempts without a limit: during an outage
    // each client then asks at most about once a minute on average, and a
    // server back up is found within two minutes.
    static const int MAX_BACKOFF_INTERVAL_MS = 120000;
    // The longest wait a server's Retry-After can impose: a mistaken or
    // hostile date must not park the application for hours.
    static const int MAX_RETRY_AFTER_MS = 600000;

    // retryInterval in milliseconds; maxRetries 1 means a single attempt.
    // The waits' jitter is seeded from the clock.
    NetworkTaskBasicRetryPolicy(int retryInterval, int maxRetries, bool useTaskTimeout);
    // The same with a given seed, for waits that repeat.
    NetworkTaskBasicRetryPolicy(int retryInterval, int maxRetries, bool useTaskTimeout,
                                unsigned long long jitterSeed);
    ~NetworkTaskBasicRetryPolicy() override;

    void onSubmit(OnRequestTimeoutCallback onTimeout) override;
    void onStatusCodeRecieved(int code) override;
    void onResponseRecieved(const HttpResponse& response) override;
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
    long long nextWaitMs();
    long long backoffCeilingMs() const;

    int statusCode;
    int retryInterval;
    int maxRetries;
    int retryCount;
    boost::scoped_ptr<Util::Timer> retryTimer;
    boost::scoped_ptr<Util::Timer> taskTimeoutTimer;
    OnRetryCallback retryCallback;
    OnRequestTimeoutCallback timeoutCallback;
    bool subscribed;
    // Waits without a limit since the start or since the network came back,
    // counted until their ceiling reaches the cap.
    int backoffStep;
    // What the last response's Retry-After asked for; -1 when it asked nothing.
    long long retryAfterMs;
    RetryJitter jitter;
};

}  // namespace Network
