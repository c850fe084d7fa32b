#include "network/NetworkTaskBasicRetryPolicy.h"

#include <KD/kd.h>

#include <algorithm>

#include "network/HttpResponse.h"
#include "network/NetworkErrorCodes.h"
#include "network/RetryAfter.h"

namespace Network {

namespace {

const long long kNanosPerMilli = 1000000ll;
const long long kTimeoutPerRetryNs = 30000000000ll;
const int kServiceUnavailable = 503;
const int kTooManyRequests = 429;

}  // namespace

NetworkTaskBasicRetryPolicy::NetworkTaskBasicRetryPolicy(int retryInterval, int maxRetries,
                                                         bool useTaskTimeout)
    : NetworkTaskBasicRetryPolicy(retryInterval, maxRetries, useTaskTimeout, RetryJitter::seedFromClock()) {}

NetworkTaskBasicRetryPolicy::NetworkTaskBasicRetryPolicy(int retryInterval, int maxRetries,
                                                         bool useTaskTimeout, unsigned long long jitterSeed)
    : statusCode(0),
      retryInterval(retryInterval),
      maxRetries(maxRetries),
      retryCount(0),
      retryTimer(
          new Util::Timer(callback<void (*)()>::make<NetworkTaskBasicRetryPolicy,
                                                     &NetworkTaskBasicRetryPolicy::onRetryTimerFired>(this))),
      subscribed(false),
      backoffStep(0),
      retryAfterMs(-1),
      jitter(jitterSeed) {
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
    retryAfterMs = -1;
}

void NetworkTaskBasicRetryPolicy::onResponseRecieved(const HttpResponse& response) {
    const int status = response.getStatusCode();
    if (status != kServiceUnavailable && status != kTooManyRequests) {
        return;
    }
    long long delayMs = 0;
    if (RetryAfter::parse(response.getHeader("Retry-After"), kdTime(nullptr), delayMs)) {
        retryAfterMs = delayMs;
    }
}

bool NetworkTaskBasicRetryPolicy::isRetryCondition() const {
    if (statusCode == 0 || statusCode == OFFLINE_ERROR_CODE) {
        return false;
    }
    if (statusCode == 408) {
        return true;
    }
    // Without a time to come back, a 429 stays the final answer.
    if (statusCode == kTooManyRequests) {
        return retryAfterMs >= 0;
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
    retryTimer->start(Util::Timer::OneShot, nextWaitMs() * kNanosPerMilli);
}

long long NetworkTaskBasicRetryPolicy::nextWaitMs() {
    if (retryAfterMs >= 0) {
        const long long longest = std::max<long long>(retryInterval, MAX_RETRY_AFTER_MS);
        return std::min(std::max<long long>(retryAfterMs, retryInterval), longest);
    }
    if (maxRetries != -1) {
        return retryInterval;
    }
    const long long ceiling = backoffCeilingMs();
    // Past the cap (or with no interval to double) the step stops counting.
    if (ceiling > 0 && ceiling < MAX_BACKOFF_INTERVAL_MS) {
        ++backoffStep;
    }
    return jitter.between(retryInterval, ceiling);
}

// The interval doubled once per failure waited out, held at the cap (or at
// the interval itself when that is longer).
long long NetworkTaskBasicRetryPolicy::backoffCeilingMs() const {
    const long long cap = std::max<long long>(retryInterval, MAX_BACKOFF_INTERVAL_MS);
    long long ceiling = retryInterval;
    for (int step = 0; step < backoffStep && ceiling > 0 && ceiling < cap; ++step) {
        ceiling *= 2;
    }
    return std::min(ceiling, cap);
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
    // The failures were ours, not the server's: a fresh network starts the
    // waits from the first interval again.
    backoffStep = 0;
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
