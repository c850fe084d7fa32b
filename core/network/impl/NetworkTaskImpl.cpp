#include "network/impl/NetworkTaskImpl.h"

#include <boost/make_shared.hpp>

#include "network/NetworkErrorCodes.h"
#include "network/NetworkTaskWriter.h"

namespace Network {

int NetworkTaskImpl::nextObjectId = 0;

namespace {

// Carries a schedule request to the state's thread without keeping the state
// alive: a state dropped meanwhile was cancelled.
class ScheduleContext : public Util::ThreadCallback::Context {
public:
    explicit ScheduleContext(const boost::weak_ptr<NetworkTaskImpl>& state) : state(state) {}
    boost::weak_ptr<NetworkTaskImpl> state;
};

}  // namespace

NetworkTaskImpl::NetworkTaskImpl(const boost::shared_ptr<NetworkTask>& task,
                                 const boost::shared_ptr<NetworkTaskRetryPolicy>& retryPolicy,
                                 OnCompletedCallback onCompleted, OnActivityCallback onActivity,
                                 PriorityManager* priorityManager,
                                 const boost::weak_ptr<NetworkSpeedCollector>& speedCollector)
    : waitingForRetry(false),
      task(task),
      retryPolicy(retryPolicy),
      onCompleted(onCompleted),
      onActivity(onActivity),
      priorityManager(priorityManager),
      threadCallback(new Util::ThreadCallback()),
      priority(task->getPriority()),
      // Set again when scheduled; a task that times out while still queued
      // as unready is withdrawn from the priority manager on this thread.
      creationTime(kdGetTimeUST()),
      callerThread(kdThreadSelf()),
      responseReceived(false),
      finished(false),
      statusCode(0),
      id(takeNextId()),
      speedCollector(speedCollector),
      withdrawn(false) {}

NetworkTaskImpl::~NetworkTaskImpl() {
    if (connection) {
        connection->cancel();
    }
}

int NetworkTaskImpl::takeNextId() {
    int taken = nextObjectId;
    nextObjectId = taken < MAX_OBJECT_ID ? taken + 1 : 0;
    return taken;
}

void NetworkTaskImpl::schedule(long long time, KDThread* thread) {
    KD_ASSERT(connection.get() == __null);
    creationTime = time;
    callerThread = thread;
    priority = task->getPriority();
    if (kdThreadSelf() == callerThread) {
        priorityManager->start(shared_from_this());
        return;
    }
    threadCallback->asyncPerformIfDifferentThread(
        Util::ThreadCallback::Function::make<NetworkTaskImpl, &NetworkTaskImpl::doSchedule>(this),
        boost::make_shared<ScheduleContext>(boost::weak_ptr<NetworkTaskImpl>(shared_from_this())));
}

void NetworkTaskImpl::doSchedule(boost::shared_ptr<Util::ThreadCallback::Context> context) {
    boost::shared_ptr<NetworkTaskImpl> self =
        boost::static_pointer_cast<ScheduleContext>(context)->state.lock();
    if (!self || withdrawn) {
        return;
    }
    priorityManager->start(self);
}

void NetworkTaskImpl::start() {
    if (withdrawn) {
        return;
    }
    boost::shared_ptr<NetworkTaskImpl> self = shared_from_this();
    responseReceived = false;
    boost::shared_ptr<HttpRequest> request = task->issueRequest();
    task->getWriter()->setRequest(request);
    boost::weak_ptr<NetworkSpeedCollector> collector;
    if (task->needToGatherStatistics()) {
        collector = speedCollector;
    }
    connection = boost::make_shared<HttpConnection>(request, collector, id);
    connection->setOnFinishedCallback(
        HttpConnection::OnFinishedCallback::make<NetworkTaskImpl, &NetworkTaskImpl::onFinished>(this));
    connection->setOnResponseReceivedCallback(
        HttpConnection::OnResponseReceivedCallback::make<NetworkTaskImpl,
                                                         &NetworkTaskImpl::onResponseRecieved>(this));
    connection->setOnBodyDataReceivedCallback(
        HttpConnection::OnBodyDataReceivedCallback::make<NetworkTaskImpl,
                                                         &NetworkTaskImpl::onBodyDataRecieved>(this),
        !task->recieveResponseBodyByParts());
    connection->setMaxBodySize(task->getMaxResponseBodySize());
    connection->start();
    onActivity(self, NetworkManager::NetworkActive);
}

void NetworkTaskImpl::cancel() {
    dropConnection();
}

void NetworkTaskImpl::dropConnection() {
    if (!connection) {
        return;
    }
    connection->cancel();
    connection.reset();
    onActivity(shared_from_this(), NetworkManager::NetworkIdle);
}

void NetworkTaskImpl::unschedule() {
    if (waitingForRetry) {
        return;
    }
    priorityManager->cancel(shared_from_this());
}

void NetworkTaskImpl::prepareForResubmit() {
    finished = false;
    waitingForRetry = false;
}

void NetworkTaskImpl::withdraw() {
    withdrawn = true;
}

void NetworkTaskImpl::abandon() {
    withdrawn = true;
    if (connection) {
        connection->cancel();
        connection.reset();
    }
}

void NetworkTaskImpl::onSubmit() {
    retryPolicy->onSubmit(
        NetworkTaskRetryPolicy::OnRequestTimeoutCallback::make<NetworkTaskImpl, &NetworkTaskImpl::onTimeout>(
            this));
}

void NetworkTaskImpl::onResponseRecieved(boost::shared_ptr<HttpConnection>,
                                         boost::shared_ptr<HttpResponse> response) {
    boost::shared_ptr<NetworkTaskImpl> self = shared_from_this();
    responseReceived = true;
    statusCode = response->getStatusCode();
    retryPolicy->onStatusCodeRecieved(statusCode);
    retryPolicy->onResponseRecieved(*response);
    task->onResponseRecieved(response);
}

void NetworkTaskImpl::onBodyDataRecieved(boost::shared_ptr<HttpConnection>,
                                         boost::shared_ptr<DataChunk> chunk) {
    if (statusCode < 200 || statusCode > 299) {
        return;
    }
    KD_ASSERT(!retryPolicy->isNeedRetry());
    boost::shared_ptr<NetworkTaskImpl> self = shared_from_this();
    task->onBytesReceived(*chunk);
}

void NetworkTaskImpl::onFinished(boost::shared_ptr<HttpConnection>, int code) {
    if (finished) {
        return;
    }
    boost::shared_ptr<NetworkTaskImpl> self = shared_from_this();
    unschedule();
    if (code != 0 || !responseReceived) {
        statusCode = code;
        retryPolicy->onStatusCodeRecieved(code);
    }
    if (retryPolicy->isNeedRetry()) {
        waitingForRetry = true;
        retryPolicy->performRetry(
            NetworkTaskRetryPolicy::OnRetryCallback::make<NetworkTaskImpl, &NetworkTaskImpl::onRetry>(this));
        return;
    }
    finished = true;
    task->onFinished(statusCode);
    // Also when the task was cancelled from its own onFinished: the manager
    // still learns the code, but queues nothing again.
    onCompleted(self, code);
}

void NetworkTaskImpl::onRetry(boost::shared_ptr<NetworkTaskRetryPolicy>) {
    // The overall timeout may have ended the task while it waited.
    if (finished || withdrawn) {
        return;
    }
    boost::shared_ptr<NetworkTaskImpl> self = shared_from_this();
    waitingForRetry = false;
    task->onRetried();
    if (!withdrawn) {
        priorityManager->start(self);
    }
}

void NetworkTaskImpl::onTimeout(boost::shared_ptr<NetworkTaskRetryPolicy>) {
    if (finished || withdrawn) {
        return;
    }
    boost::shared_ptr<NetworkTaskImpl> self = shared_from_this();
    finished = true;
    unschedule();
    dropConnection();
    task->onFinished(TASK_TIMEOUT_ERROR_CODE);
    onCompleted(self, TASK_TIMEOUT_ERROR_CODE);
}

}  // namespace Network
