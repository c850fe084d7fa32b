#include "network/NetworkTaskHolder.h"

#include <KD/kd.h>

#include <boost/make_shared.hpp>

#include "network/NetworkManager.h"
#include "network/NetworkTaskBasicRetryPolicy.h"

namespace Network {

namespace {

const int kRetryInterval = 1000;
const int kNoRetries = 1;
const int kInfiniteRetries = -1;

}  // namespace

NetworkTaskHolder::~NetworkTaskHolder() {
    if (task) {
        cancel();
    }
}

void NetworkTaskHolder::submit(const boost::shared_ptr<NetworkTask>& newTask) {
    KD_ASSERT(!task);
    if (task) {
        return;
    }
    task = newTask;
    NetworkManager::getInstance()->submit(newTask);
}

void NetworkTaskHolder::submit(const boost::shared_ptr<NetworkTask>& newTask,
                               const boost::shared_ptr<NetworkTaskRetryPolicy>& retryPolicy) {
    KD_ASSERT(!task);
    if (task) {
        return;
    }
    task = newTask;
    NetworkManager::getInstance()->submit(newTask, retryPolicy);
}

void NetworkTaskHolder::submitNoRetries(const boost::shared_ptr<NetworkTask>& newTask) {
    submit(newTask, boost::make_shared<NetworkTaskBasicRetryPolicy>(kRetryInterval, kNoRetries, false));
}

void NetworkTaskHolder::submitInfRetries(const boost::shared_ptr<NetworkTask>& newTask) {
    submit(newTask, boost::make_shared<NetworkTaskBasicRetryPolicy>(kRetryInterval, kInfiniteRetries, false));
}

void NetworkTaskHolder::cancel() {
    KD_ASSERT(task);
    if (!task) {
        return;
    }
    boost::shared_ptr<NetworkTask> cancelled;
    cancelled.swap(task);
    NetworkManager::getInstance()->cancel(cancelled);
}

// The task may have finished offline and be queued to run again; a holder
// that lets it go must withdraw it, or that run would reach a gone owner.
void NetworkTaskHolder::onFinished() {
    KD_ASSERT(task != __null);
    boost::shared_ptr<NetworkTask> finished;
    finished.swap(task);
    if (finished) {
        NetworkManager::getInstance()->cancel(finished);
    }
}

}  // namespace Network
