#include "network/impl/NetworkManagerImpl.h"

#include <algorithm>
#include <boost/make_shared.hpp>

#include "lifecycle/PauseResumeHandler.h"
#include "network/NetworkTaskBasicRetryPolicy.h"
#include "network/NetworkTaskWriter.h"

namespace Network {

namespace {

const int kMinConnections = 4;
const int kMaxConnections = 8;
const int kDefaultRetryInterval = 1000;
const int kDefaultRetryLimit = 5;

// Calls every callback of a snapshot of callbacks that is still registered
// when its turn comes: one removed by an earlier callback (its owner may be
// gone) is skipped, one added meanwhile waits for the next signal.
template <class Callback, class Value>
void notifyRegistered(const std::vector<Callback>& registered, Value value) {
    const std::vector<Callback> snapshot = registered;
    for (const Callback& callback : snapshot) {
        if (std::find(registered.begin(), registered.end(), callback) != registered.end()) {
            callback(value);
        }
    }
}

template <class Callback>
void removeAll(std::vector<Callback>& callbacks, Callback callback) {
    callbacks.erase(std::remove(callbacks.begin(), callbacks.end(), callback), callbacks.end());
}

class ScopedLock {
public:
    explicit ScopedLock(KDThreadMutex* mutex) : mutex(mutex) { kdThreadMutexLock(mutex); }
    ~ScopedLock() { kdThreadMutexUnlock(mutex); }

private:
    KDThreadMutex* mutex;
};

}  // namespace

NetworkManagerImpl::NetworkManagerImpl()
    : mutex(nullptr),
      offlineModeStatus(OfflineModeOff),
      networkErrorStatus(NoNetworkError),
      activeConnectionCount(0) {
    mutex = kdThreadMutexCreate(nullptr);
    threadCallback.reset(new Util::ThreadCallback());
    httpEngine.reset(new HttpEngine());
    priorityManager.reset(new PriorityManager(kMinConnections, kMaxConnections, mutex));
    reachabilityProvider.reset(new ReachabilityProvider(
        ReachabilityProvider::OnChangedCallback::make<
            NetworkManagerImpl, &NetworkManagerImpl::onNetworkReachabilityChanged>(this)));
    pauseResumeListenerWrapper = boost::make_shared<Lifecycle::PauseResumeListenerWrapper>(this);
    Lifecycle::PauseResumeHandler* handler = Lifecycle::PauseResumeHandler::getInstance();
    if (handler != nullptr) {
        handler->addListener(pauseResumeListenerWrapper);
        if (!handler->getIsAppPaused()) {
            onResumed();
        }
    }
}

NetworkManagerImpl::~NetworkManagerImpl() {
    dropAllTasks();
    reachabilityProvider.reset();
    threadCallback.reset();
    priorityManager.reset();
    httpEngine.reset();
    Lifecycle::PauseResumeHandler* handler = Lifecycle::PauseResumeHandler::getInstance();
    if (handler != nullptr) {
        handler->removeListener(pauseResumeListenerWrapper.get());
    }
    pauseResumeListenerWrapper.reset();
    kdThreadMutexFree(mutex);
}

void NetworkManagerImpl::dropAllTasks() {
    // Released outside the lock and before the reachability provider: a
    // policy waiting for the network unregisters its listener as it goes.
    boost::unordered_set<boost::shared_ptr<NetworkTaskImpl> > dropped;
    DelayedRequests droppedUnready;
    {
        ScopedLock lock(mutex);
        dropped.swap(tasks);
        droppedUnready.swap(unreadyRequests);
        priorityManager->clear();
        for (const boost::shared_ptr<NetworkTaskImpl>& state : dropped) {
            state->abandon();
        }
        for (const boost::shared_ptr<DelayedRequestData>& entry : droppedUnready) {
            entry->taskImpl->abandon();
        }
    }
}

bool NetworkManagerImpl::onPaused() {
    reachabilityProvider->onPaused();
    return true;
}

bool NetworkManagerImpl::onResumed() {
    reachabilityProvider->onResumed();
    return true;
}

void NetworkManagerImpl::submit(boost::shared_ptr<NetworkTask> task) {
    submit(task,
           boost::make_shared<NetworkTaskBasicRetryPolicy>(kDefaultRetryInterval, kDefaultRetryLimit, false));
}

void NetworkManagerImpl::submit(boost::shared_ptr<NetworkTask> request,
                                boost::shared_ptr<NetworkTaskRetryPolicy> retryPolicy) {
    KD_ASSERT(getRequestState<NetworkTaskImpl>(request) == __null);
    if (!request || !retryPolicy || getRequestState<NetworkTaskImpl>(request)) {
        return;
    }
    ScopedLock lock(mutex);
    boost::shared_ptr<NetworkTaskImpl> state = boost::make_shared<NetworkTaskImpl>(
        request, retryPolicy,
        NetworkTaskImpl::OnCompletedCallback::make<NetworkManagerImpl,
                                                   &NetworkManagerImpl::onTaskImplCompleted>(this),
        NetworkTaskImpl::OnActivityCallback::make<NetworkManagerImpl,
                                                  &NetworkManagerImpl::onTaskNetworkActivityChanged>(this),
        priorityManager.get(), speedCollector);
    request->setState(state);
    state->onSubmit();
    request->setWriter(boost::make_shared<NetworkTaskWriter>());
    if (!request->isReadyToPerform() || offlineModeStatus == OfflineModeOn) {
        unreadyRequests.push_back(
            boost::make_shared<DelayedRequestData>(request, state, kdGetTimeUST(), kdThreadSelf()));
    } else {
        doSubmit(state, kdGetTimeUST(), kdThreadSelf());
    }
}

void NetworkManagerImpl::doSubmit(const boost::shared_ptr<NetworkTaskImpl>& state, long long time,
                                  KDThread* thread) {
    tasks.insert(state);
    state->schedule(time, thread);
}

void NetworkManagerImpl::cancel(boost::shared_ptr<NetworkTask> request) {
    if (!request) {
        return;
    }
    ScopedLock lock(mutex);
    boost::shared_ptr<NetworkTaskImpl> task = getRequestState<NetworkTaskImpl>(request);
    // Whatever the state (queued, running, waiting for a retry, finishing in
    // its own onFinished, or completed), the owner has let the task go: it
    // never runs or reports again, so it never reaches for its owner.
    if (task) {
        task->withdraw();
    }
    if (removeUnready(request) || !task) {
        return;
    }
    if (tasks.erase(task)) {
        task->unschedule();
    }
}

bool NetworkManagerImpl::removeUnready(const boost::shared_ptr<NetworkTask>& task) {
    for (DelayedRequests::iterator it = unreadyRequests.begin(); it != unreadyRequests.end(); ++it) {
        if ((*it)->task == task) {
            unreadyRequests.erase(it);
            return true;
        }
    }
    return false;
}

void NetworkManagerImpl::onTaskImplCompleted(boost::shared_ptr<NetworkTaskImpl> state, int code) {
    ScopedLock lock(mutex);
    NetworkErrorStatus newErrorStatus = code < 0 ? NetworkError : NoNetworkError;
    bool offlineModeSignal = false;
    if (code == OFFLINE_ERROR_CODE && offlineModeStatus == OfflineModeOff) {
        offlineModeStatus = OfflineModeOn;
        offlineModeSignal = true;
    }
    // A task its owner cancelled from inside onFinished has left the
    // containers already and is not queued again; its code still tells the
    // statuses what the network did.
    if (!state->isWithdrawn()) {
        removeCompleted(state);
        if (code == OFFLINE_ERROR_CODE) {
            resubmit(state);
        }
    }
    if (offlineModeStatus == OfflineModeOff) {
        submitUnreadyRequests();
    }
    if (offlineModeSignal) {
        post(Util::ThreadCallback::Function::make<NetworkManagerImpl,
                                                  &NetworkManagerImpl::signalOfflineModeChanged>(this));
    }
    bool errorChanged = newErrorStatus != networkErrorStatus;
    networkErrorStatus = newErrorStatus;
    if (errorChanged && !errorCallbacks.empty()) {
        post(
            Util::ThreadCallback::Function::make<NetworkManagerImpl,
                                                 &NetworkManagerImpl::signalNetworkErrorStatusChanged>(this));
    }
}

void NetworkManagerImpl::removeCompleted(const boost::shared_ptr<NetworkTaskImpl>& state) {
    if (tasks.erase(state)) {
        return;
    }
    DelayedRequests::iterator it = unreadyRequests.begin();
    while (it != unreadyRequests.end() && (*it)->task != state->getTask()) {
        ++it;
    }
    KD_ASSERT(it != unreadyRequests.end());
    if (it != unreadyRequests.end()) {
        unreadyRequests.erase(it);
    }
}

void NetworkManagerImpl::resubmit(const boost::shared_ptr<NetworkTaskImpl>& state) {
    state->prepareForResubmit();
    unreadyRequests.push_back(
        boost::make_shared<DelayedRequestData>(state->getTask(), state, kdGetTimeUST(), kdThreadSelf()));
}

void NetworkManagerImpl::submitUnreadyRequests() {
    // Taken out first: starting a task runs client code, which may submit or
    // cancel and so change the list.
    std::vector<boost::shared_ptr<DelayedRequestData> > ready;
    for (DelayedRequests::iterator it = unreadyRequests.begin(); it != unreadyRequests.end();) {
        if ((*it)->task->isReadyToPerform()) {
            ready.push_back(*it);
            it = unreadyRequests.erase(it);
        } else {
            ++it;
        }
    }
    for (const boost::shared_ptr<DelayedRequestData>& entry : ready) {
        if (!entry->taskImpl->isWithdrawn()) {
            doSubmit(entry->taskImpl, entry->submitTime, entry->thread);
        }
    }
}

void NetworkManagerImpl::post(Util::ThreadCallback::Function signal) {
    threadCallback->asyncPerformIfDifferentThread(signal, boost::shared_ptr<Util::ThreadCallback::Context>());
}

void NetworkManagerImpl::assertManagerThread() const {
    KD_ASSERT(threadCallback->getThread() == kdThreadSelf());
}

NetworkManager::OfflineModeStatus NetworkManagerImpl::getOfflineModeStatus() const {
    ScopedLock lock(mutex);
    return offlineModeStatus;
}

void NetworkManagerImpl::addOfflineModeStatusCallback(OfflineModeStatusCallback callback) {
    assertManagerThread();
    offlineModeCallbacks.push_back(callback);
}

void NetworkManagerImpl::removeOfflineModeStatusCallback(OfflineModeStatusCallback callback) {
    assertManagerThread();
    removeAll(offlineModeCallbacks, callback);
}

void NetworkManagerImpl::changeOfflineModeStatus(OfflineModeStatus status) {
    ScopedLock lock(mutex);
    OfflineModeStatus previous = offlineModeStatus;
    offlineModeStatus = status;
    if (previous != status) {
        post(Util::ThreadCallback::Function::make<NetworkManagerImpl,
                                                  &NetworkManagerImpl::signalOfflineModeChanged>(this));
    }
}

NetworkManager::NetworkReachabilityStatus NetworkManagerImpl::getNetworkReachabilityStatus() const {
    return static_cast<NetworkReachabilityStatus>(reachabilityProvider->getNetworkReachabilityStatus());
}

void NetworkManagerImpl::addNetworkReachabilityStatusCallback(NetworkReachabilityStatusCallback callback) {
    assertManagerThread();
    reachabilityCallbacks.push_back(callback);
    if (reachabilityCallbacks.size() == 1) {
        reachabilityProvider->enable();
    }
}

void NetworkManagerImpl::removeNetworkReachabilityStatusCallback(NetworkReachabilityStatusCallback callback) {
    assertManagerThread();
    bool hadCallbacks = !reachabilityCallbacks.empty();
    removeAll(reachabilityCallbacks, callback);
    if (hadCallbacks && reachabilityCallbacks.empty()) {
        reachabilityProvider->disable();
    }
}

NetworkManager::NetworkErrorStatus NetworkManagerImpl::getNetworkErrorStatus() const {
    ScopedLock lock(mutex);
    return networkErrorStatus;
}

void NetworkManagerImpl::addNetworkErrorStatusCallback(NetworkErrorStatusCallback callback) {
    assertManagerThread();
    errorCallbacks.push_back(callback);
}

void NetworkManagerImpl::removeNetworkErrorStatusCallback(NetworkErrorStatusCallback callback) {
    assertManagerThread();
    removeAll(errorCallbacks, callback);
}

NetworkManager::NetworkActivityStatus NetworkManagerImpl::getNetworkActivityStatus() const {
    ScopedLock lock(mutex);
    return activeConnectionCount < 1 ? NetworkIdle : NetworkActive;
}

void NetworkManagerImpl::addNetworkActivityStatusCallback(NetworkActivityStatusCallback callback) {
    assertManagerThread();
    activityCallbacks.push_back(callback);
}

void NetworkManagerImpl::removeNetworkActivityStatusCallback(NetworkActivityStatusCallback callback) {
    assertManagerThread();
    removeAll(activityCallbacks, callback);
}

void NetworkManagerImpl::setNetworkSpeedCollector(boost::weak_ptr<NetworkSpeedCollector> collector) {
    speedCollector = collector;
}

int NetworkManagerImpl::getTaskCount() const {
    ScopedLock lock(mutex);
    return static_cast<int>(tasks.size());
}

int NetworkManagerImpl::getUnreadyCount() const {
    ScopedLock lock(mutex);
    return static_cast<int>(unreadyRequests.size());
}

void NetworkManagerImpl::onTaskNetworkActivityChanged(boost::shared_ptr<NetworkTaskImpl>,
                                                      NetworkActivityStatus status) {
    ScopedLock lock(mutex);
    int before = activeConnectionCount;
    if (status == NetworkActive) {
        ++activeConnectionCount;
    } else if (status == NetworkIdle) {
        --activeConnectionCount;
    } else {
        KD_ASSERT(false);
    }
    KD_ASSERT(activeConnectionCount >= 0);
    if ((before == 0 || activeConnectionCount == 0) && !activityCallbacks.empty()) {
        post(Util::ThreadCallback::Function::make<NetworkManagerImpl,
                                                  &NetworkManagerImpl::signalNetworkActivityStatusChanged>(
            this));
    }
}

void NetworkManagerImpl::onNetworkReachabilityChanged(int status) {
    notifyRegistered(reachabilityCallbacks, static_cast<NetworkReachabilityStatus>(status));
}

void NetworkManagerImpl::signalOfflineModeChanged(boost::shared_ptr<Util::ThreadCallback::Context>) {
    notifyRegistered(offlineModeCallbacks, getOfflineModeStatus());
    if (getOfflineModeStatus() == OfflineModeOff) {
        ScopedLock lock(mutex);
        submitUnreadyRequests();
    }
}

void NetworkManagerImpl::signalNetworkErrorStatusChanged(boost::shared_ptr<Util::ThreadCallback::Context>) {
    notifyRegistered(errorCallbacks, getNetworkErrorStatus());
}

void NetworkManagerImpl::signalNetworkActivityStatusChanged(
    boost::shared_ptr<Util::ThreadCallback::Context>) {
    notifyRegistered(activityCallbacks, getNetworkActivityStatus());
}

}  // namespace Network
