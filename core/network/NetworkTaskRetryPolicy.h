#pragma once

#include <boost/shared_ptr.hpp>

#include "util/callback.h"

namespace Network {

class HttpResponse;

// Decides, after each failed attempt of a task, whether and when it runs
// again, and may bound the whole task with a timeout. One per submission,
// owned by the task's running state; called on the task's caller thread.
class NetworkTaskRetryPolicy {
public:
    typedef callback<void (*)(boost::shared_ptr<NetworkTaskRetryPolicy>)> OnRequestTimeoutCallback;
    typedef callback<void (*)(boost::shared_ptr<NetworkTaskRetryPolicy>)> OnRetryCallback;

    virtual ~NetworkTaskRetryPolicy() {}
    // Once, at submission; onTimeout ends the task when the policy gives up on it.
    virtual void onSubmit(OnRequestTimeoutCallback onTimeout) = 0;
    // Every HTTP status and every non-zero finish code of an attempt.
    virtual void onStatusCodeRecieved(int code) = 0;
    // Every response, after its status: a policy may read how long the
    // server asks it to wait.
    virtual void onResponseRecieved(const HttpResponse& response) { (void)response; }
    virtual bool isRetryCondition() const = 0;
    virtual bool isNeedRetry() const = 0;
    // Called when isNeedRetry() holds; onRetry starts the next attempt.
    virtual void performRetry(OnRetryCallback onRetry) = 0;
};

}  // namespace Network
