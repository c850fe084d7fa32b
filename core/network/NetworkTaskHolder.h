#pragma once

#include <boost/shared_ptr.hpp>

#include "network/NetworkTask.h"
#include "network/NetworkTaskRetryPolicy.h"

namespace Network {

// Runs one task at a time through the network manager and ties it to the
// holder's lifetime: a task still held is cancelled when the holder goes.
// The held task calls onFinished() of the holder from its own onFinished()
// when its owner is done with it; a task that finished offline and is not
// let go stays held and runs again after offline mode.
// The task's caller thread only.
class NetworkTaskHolder {
public:
    NetworkTaskHolder() {}
    ~NetworkTaskHolder();

    void submit(const boost::shared_ptr<NetworkTask>& newTask);
    void submit(const boost::shared_ptr<NetworkTask>& newTask,
                const boost::shared_ptr<NetworkTaskRetryPolicy>& retryPolicy);
    void submitNoRetries(const boost::shared_ptr<NetworkTask>& newTask);
    void submitInfRetries(const boost::shared_ptr<NetworkTask>& newTask);
    void cancel();
    void onFinished();
    bool isWorking() const { return task.get() != nullptr; }

private:
    NetworkTaskHolder(const NetworkTaskHolder&) = delete;
    NetworkTaskHolder& operator=(const NetworkTaskHolder&) = delete;

    boost::shared_ptr<NetworkTask> task;
};

}  // namespace Network
