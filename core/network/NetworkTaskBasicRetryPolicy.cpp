#include "network/NetworkTaskBasicRetryPolicy.h"

#include "network/NetworkErrorCodes.h"

namespace Network {

namespace {

const long long kNanosPerMilli = 1000000ll;
const long long kTimeoutPerRetryNs = 30000000000ll;

}  // namespace

NetworkTaskBasicRetryPolicy::NetworkTaskBasicRetryPolicy(int retryInterval, int maxRetries,
                                                         bool useTaskTimeout)
    : statusCode(0),
      retryInterval(retryInterval),
      maxRetries(maxRetries),
      retryCount(0),
      retryTimer(
          new Util::Timer(callback<void (*)()>::make<NetworkTaskBasicRetryPolicy,
                                                     &NetworkTaskBasicRetryPolicy::onRetryTimerFired>(this))),
      subscribed(false) {
    if (useTaskTimeout) {
        taskTimeoutTimer.reset(
            new Util::Timer(callback<void (*)()>::make<NetworkTaskBasicRetryPolicy,
                                                       &NetworkTaskBasicRetryPolicy::onTaskTimeout>(this)));
    }
}

NetworkTaskBasicRetryPolicy::~NetworkTaskBasicRetryPolicy() {
    unsubscribe();
}

void NetworkTaskBasicRetryPolicy::onSubmit(OnRequestTimeoutCallback onTimeout) {
    KD_ASSERT(timeoutCallback == OnRequestTimeoutCallback());
    if (!taskTimeoutTimer) {
        return;
    }
    KD_ASSERT(!taskTimeoutTimer->isStarted());
    if (maxRetries == -1) {
        return;
    }
    timeoutCallback = onTimeout;
    // A limit of 0 still makes one attempt, which gets one period as well
    // instead of a timeout that ends the task before it starts.
    int periods = maxRetries > 1 ? maxRetries : 1;
    taskTimeoutTimer->start(Util::Timer::OneShot,
                            (retryInterval * kNanosPerMilli + kTimeoutPerRetryNs) * periods);
}

void NetworkTaskBasicRetryPolicy::onStatusCodeRecieved(int code) {
    statusCode = code;
}

bool NetworkTaskBasicRetryPolicy::isRetryCondition() const {
    if (statusCode == 0 || statusCode == OFFLINE_ERROR_CODE) {
        return false;
    }
    if (statusCode == 408) {
        return true;
    }
    return statusCode < 200 || statusCode >= 500;
}

bool NetworkTaskBasicRetryPolicy::isNeedRetry() const {
    if (maxRetries == 1 || !isRetryCondition()) {
        return false;
    }
    return maxRetries == -1 || maxRetries > retryCount;
}

void NetworkTaskBasicRetryPolicy::performRetry(OnRetryCallback onRetry) {
    KD_ASSERT(!retryTimer->isStarted());
    retryCallback = onRetry;
    ++retryCount;
    if (NetworkManager::getInstance()->getNetworkReachabilityStatus() ==
        NetworkManager::NetworkNotReachable) {
        subscribe();
        return;
    }
    retryTimer->start(Util::Timer::OneShot, retryInterval * kNanosPerMilli);
}

void NetworkTaskBasicRetryPolicy::onRetryTimerFired() {
    retryTimer->cancel();
    retryCallback(shared_from_this());
}

void NetworkTaskBasicRetryPolicy::onTaskTimeout() {
    taskTimeoutTimer->cancel();
    // The running state may end here and, with it, this policy's owner.
    boost::shared_ptr<NetworkTaskRetryPolicy> self = shared_from_this();
    timeoutCallback(self);
}

void NetworkTaskBasicRetryPolicy::onNetworkReachabilityChanged(
    NetworkManager::NetworkReachabilityStatus status) {
    if (status == NetworkManager::NetworkNotReachable) {
        return;
    }
    unsubscribe();
    retryCallback(shared_from_this());
}

void NetworkTaskBasicRetryPolicy::subscribe() {
    if (subscribed) {
        return;
    }
    subscribed = true;
    NetworkManager::getInstance()->addNetworkReachabilityStatusCallback(reachabilityCallback());
}

void NetworkTaskBasicRetryPolicy::unsubscribe() {
    if (!subscribed) {
        return;
    }
    subscribed = false;
    NetworkManager::getInstance()->removeNetworkReachabilityStatusCallback(reachabilityCallback());
}

NetworkManager::NetworkReachabilityStatusCallback NetworkTaskBasicRetryPolicy::reachabilityCallback() {
    return NetworkManager::NetworkReachabilityStatusCallback::make<
        NetworkTaskBasicRetryPolicy, &NetworkTaskBasicRetryPolicy::onNetworkReachabilityChanged>(this);
}

}  // namespace Network
