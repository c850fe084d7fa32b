#include <mutex>

#include "NetworkTest.h"
#include "network/NetworkErrorCodes.h"
#include "network/NetworkSpeedCollector.h"

using Network::NetworkManager;

namespace {

// Writes down the engine's reports (made on the engine thread).
class CollectedIds : public Network::NetworkSpeedCollector {
public:
    void onRequestSent(int id, Network::HttpConnection*) override { add(id); }
    void onRequestFinished(int id) override { add(id); }
    void onDataChunkReceived(int id, Network::DataChunk*) override { add(id); }
    void onRequestCanceled(int id) override { add(id); }
    std::vector<int> ids() const {
        std::lock_guard<std::mutex> lock(mutex);
        return seen;
    }

private:
    void add(int id) {
        std::lock_guard<std::mutex> lock(mutex);
        seen.push_back(id);
    }
    mutable std::mutex mutex;
    std::vector<int> seen;
};

// Records status signals as the manager's thread receives them.
class StatusLog {
public:
    void onOffline(NetworkManager::OfflineModeStatus status) { add("offline " + std::to_string(status)); }
    void onError(NetworkManager::NetworkErrorStatus status) { add("error " + std::to_string(status)); }
    void onActivity(NetworkManager::NetworkActivityStatus status) {
        add(status == NetworkManager::NetworkActive ? "active" : "idle");
    }
    void onReachability(NetworkManager::NetworkReachabilityStatus status) {
        add("reachability " + std::to_string(status));
    }

    void listen(NetworkManager* manager) {
        manager->addOfflineModeStatusCallback(
            NetworkManager::OfflineModeStatusCallback::make<StatusLog, &StatusLog::onOffline>(this));
        manager->addNetworkErrorStatusCallback(
            NetworkManager::NetworkErrorStatusCallback::make<StatusLog, &StatusLog::onError>(this));
        manager->addNetworkActivityStatusCallback(
            NetworkManager::NetworkActivityStatusCallback::make<StatusLog, &StatusLog::onActivity>(this));
    }
    void listenToReachability(NetworkManager* manager) {
        manager->addNetworkReachabilityStatusCallback(reachabilityCallback());
    }
    void stopReachability(NetworkManager* manager) {
        manager->removeNetworkReachabilityStatusCallback(reachabilityCallback());
    }
    NetworkManager::NetworkReachabilityStatusCallback reachabilityCallback() {
        return NetworkManager::NetworkReachabilityStatusCallback::make<StatusLog, &StatusLog::onReachability>(
            this);
    }

    std::vector<std::string>* log = nullptr;
    std::vector<std::string> own;

private:
    void add(const std::string& entry) { (log != nullptr ? *log : own).push_back(entry); }
};

}  // namespace

class NetworkManagerTest : public NetworkTest {};

TEST_F(NetworkManagerTest, SuccessfulTaskGetsResponseWholeOrPartedBodyAndOneFinish) {
    std::string url = serve("/ok", 200, std::string(100000, 'x'), Reply::Chunked);
    for (bool byParts : {false, true}) {
        boost::shared_ptr<RecordingTask> task = makeTask(url);
        task->byParts = byParts;
        manager->submit(task);
        EXPECT_TRUE(settle([&] { return task->finished() && manager->getTaskCount() == 0; }));
        EXPECT_EQ(std::string(100000, 'x'), task->body);
        EXPECT_EQ((std::vector<int>{200}), task->finishCodes);
        EXPECT_EQ("request", task->log.front());
        EXPECT_EQ("response 200", task->log[1]);
        EXPECT_EQ("finished 200", task->log.back());
        long bodyCalls = std::count(task->log.begin(), task->log.end(), "bytes");
        if (byParts) {
            EXPECT_GT(bodyCalls, 1);
        } else {
            EXPECT_EQ(1, bodyCalls);
        }
        EXPECT_EQ(NetworkManager::NoNetworkError, manager->getNetworkErrorStatus());
        EXPECT_EQ(NetworkManager::NetworkIdle, manager->getNetworkActivityStatus());
        // The state is gone once the manager processed the completion.
        EXPECT_FALSE(task->state());
    }
}

TEST_F(NetworkManagerTest, SpeedCollectorHearsOnlyTasksThatGatherStatisticsUnderTheirIds) {
    boost::shared_ptr<CollectedIds> collector = boost::make_shared<CollectedIds>();
    manager->setNetworkSpeedCollector(collector);
    std::string url = serve("/measured", 200, "body");
    boost::shared_ptr<RecordingTask> measured = makeTask(url);
    boost::shared_ptr<RecordingTask> unmeasured = makeTask(url);
    unmeasured->gatherStatistics = false;
    manager->submit(measured);
    manager->submit(unmeasured);
    int measuredId = measured->state()->getId();
    EXPECT_EQ(measuredId + 1, unmeasured->state()->getId());
    EXPECT_TRUE(settle([&] { return measured->finished() && unmeasured->finished(); }));
    std::vector<int> ids = collector->ids();
    EXPECT_FALSE(ids.empty());
    EXPECT_EQ(static_cast<long>(ids.size()), std::count(ids.begin(), ids.end(), measuredId));
}

struct RetryCase {
    const char* name;
    int status;  // scripted answer; 0: nobody listens on the port
    int limit;
    int attempts;
    int finishCode;  // 0: a negative engine code
};

class RetryDecisionTest : public NetworkTest, public ::testing::WithParamInterface<RetryCase> {};

TEST_P(RetryDecisionTest, RetriesTransientFailuresUpToTheLimitOnly) {
    const RetryCase& param = GetParam();
    std::string url = param.status == 0
                          ? "http://127.0.0.1:" + std::to_string(TestHttpServer::closedPort()) + "/"
                          : serve("/answer", param.status, "answer body");
    boost::shared_ptr<RecordingTask> task = makeTask(url);
    manager->submit(task, policy(1000, param.limit));
    EXPECT_TRUE(settle([&] { return task->finished(); }));
    EXPECT_EQ(param.attempts, task->attempts);
    EXPECT_EQ(param.attempts - 1, task->retries);
    ASSERT_EQ(1u, task->finishCodes.size());
    if (param.finishCode == 0) {
        EXPECT_LT(task->lastCode(), 0);
        EXPECT_NE(Network::OFFLINE_ERROR_CODE, task->lastCode());
        EXPECT_EQ(NetworkManager::NetworkError, manager->getNetworkErrorStatus());
    } else {
        EXPECT_EQ(param.finishCode, task->lastCode());
        // HTTP errors are not network errors.
        EXPECT_EQ(NetworkManager::NoNetworkError, manager->getNetworkErrorStatus());
    }
    // Bodies of answers outside 2xx never reach the task.
    EXPECT_EQ("", task->body);
}

INSTANTIATE_TEST_SUITE_P(
    Statuses, RetryDecisionTest,
    ::testing::Values(RetryCase{"NotFound", 404, 5, 1, 404}, RetryCase{"NoContent", 204, 5, 1, 204},
                      RetryCase{"Timeout408", 408, 5, 6, 408}, RetryCase{"Unavailable", 503, 5, 6, 503},
                      RetryCase{"Refused", 0, 5, 6, 0}, RetryCase{"LimitOneNeverRetries", 503, 1, 1, 503},
                      RetryCase{"LimitZeroRunsOnce", 503, 0, 1, 503}, RetryCase{"LimitTwo", 500, 2, 3, 500}),
    [](const ::testing::TestParamInfo<RetryCase>& info) { return std::string(info.param.name); });

// Answers that are not HTTP, or stop short, end the task with an engine
// failure code once its retries are spent.
TEST_F(NetworkManagerTest, BadAnswersEndInAFailureCodeAfterTheRetries) {
    RawReplyServer garbage("\x16\x03\x01 this is no HTTP at all\r\n\r\n");
    RawReplyServer silent("");
    RawReplyServer truncated("HTTP/1.1 200 OK\r\nContent-Length: 1000\r\n\r\nshort");
    RawReplyServer badStatus("HTTP/1.1 abc Nonsense\r\nContent-Length: 0\r\n\r\n");
    std::vector<std::string> urls = {garbage.url(), silent.url(), truncated.url(), badStatus.url(),
                                     serve("/drop", 200, std::string(50000, 'd'), Reply::DropMidBody)};
    std::vector<boost::shared_ptr<RecordingTask> > tasks;
    for (const std::string& url : urls) {
        tasks.push_back(makeTask(url));
        manager->submit(tasks.back(), policy(1000, 2));
    }
    EXPECT_TRUE(settle([&] {
        for (const boost::shared_ptr<RecordingTask>& task : tasks) {
            if (!task->finished()) {
                return false;
            }
        }
        return true;
    }));
    for (std::size_t i = 0; i < tasks.size(); ++i) {
        SCOPED_TRACE(urls[i]);
        EXPECT_EQ(3, tasks[i]->attempts);
        ASSERT_EQ(1u, tasks[i]->finishCodes.size());
        EXPECT_LT(tasks[i]->lastCode(), 0);
        EXPECT_EQ("", tasks[i]->body);
    }
    EXPECT_EQ(0, manager->getTaskCount());
}

TEST_F(NetworkManagerTest, RetryWaitsItsIntervalOnTheClock) {
    boost::shared_ptr<RecordingTask> task = makeTask(serve("/busy", 503));
    manager->submit(task, policy(2000, 5));
    pumpUntil([&] {
        return task->statuses.size() == 1 && manager->getTaskCount() == 1 &&
               manager->getNetworkActivityStatus() == NetworkManager::NetworkIdle;
    });
    advanceMs(1999);
    EXPECT_EQ(1, task->attempts);
    advanceMs(1);
    EXPECT_EQ(2, task->attempts);
    manager->cancel(task);
}

TEST_F(NetworkManagerTest, ServerErrorWithRetriesLeftPassesNoBodyAndTheRetryReplaysTheWrittenBody) {
    boost::shared_ptr<RecordingTask> task = makeTask(serve("/upload", 500, "server trouble"));
    task->method = "POST";
    task->streamsBody = true;
    task->onRetry = [&] {
        Reply echo;
        echo.mode = Reply::Echo;
        server->on("/upload", echo);
    };
    manager->submit(task);
    ASSERT_TRUE(task->getWriter());
    task->getWriter()->write("hello ", 6);
    task->getWriter()->write("world", 5);
    task->getWriter()->close();
    EXPECT_TRUE(settle([&] { return task->finished(); }));
    EXPECT_EQ((std::vector<std::string>{"request", "response 500", "retried", "request", "response 200",
                                        "bytes", "finished 200"}),
              task->log);
    EXPECT_EQ("hello world", task->body);
    std::vector<TestHttpServer::Received> received = server->received();
    ASSERT_EQ(2u, received.size());
    EXPECT_EQ("hello world", received[0].body);
    EXPECT_EQ("hello world", received[1].body);
}

TEST_F(NetworkManagerTest, FailureWhileUnreachableRetriesAsSoonAsTheNetworkReturns) {
    boost::shared_ptr<RecordingTask> task = makeTask(serve("/flaky", 503));
    task->onResponse = [&] {
        if (task->attempts == 1) {
            pal::setReachability(0);
        }
    };
    manager->submit(task);
    pumpUntil([&] { return manager->getNetworkActivityStatus() == NetworkManager::NetworkIdle; });
    EXPECT_EQ(1, pal::reachabilityListeners());
    advanceMs(60000);
    EXPECT_EQ(1, task->attempts);
    pal::setReachability(2);
    pump();
    EXPECT_EQ(2, task->attempts);
    EXPECT_EQ(0, pal::reachabilityListeners());
    manager->cancel(task);
}

TEST_F(NetworkManagerTest, InfiniteRetriesNeverTimeOut) {
    std::string refused = "http://127.0.0.1:" + std::to_string(TestHttpServer::closedPort()) + "/";
    Network::NetworkTaskHolder holder;
    boost::shared_ptr<RecordingTask> held = makeTask(refused);
    holder.submitInfRetries(held);
    boost::shared_ptr<RecordingTask> bounded = makeTask(refused);
    manager->submit(bounded, policy(1000, -1, true));
    EXPECT_TRUE(settle([&] { return held->attempts >= 40 && bounded->attempts >= 40; }, 1000));
    advanceMs(3600 * 1000);
    EXPECT_FALSE(held->finished());
    EXPECT_FALSE(bounded->finished());
    holder.cancel();
    manager->cancel(bounded);
    EXPECT_EQ(0, manager->getTaskCount());
}

TEST_F(NetworkManagerTest, OverallTimeoutCancelsTheOpenConnectionAndReportsTaskTimeout) {
    boost::shared_ptr<RecordingTask> stalled =
        makeTask(serve("/stall", 200, "late", Reply::StallBeforeReply));
    StatusLog statuses;
    statuses.listen(manager);
    manager->submit(stalled, policy(1000, 5, true));
    advanceMs(154999);
    EXPECT_FALSE(stalled->finished());
    advanceMs(1);
    EXPECT_EQ((std::vector<int>{Network::TASK_TIMEOUT_ERROR_CODE}), stalled->finishCodes);
    pump();
    EXPECT_EQ((std::vector<std::string>{"active", "idle", "error 1"}), statuses.own);
    server->releaseStalls();
    // A zero limit still allows its one attempt instead of ending at once.
    boost::shared_ptr<RecordingTask> single = makeTask(serve("/single", 200, "done"));
    manager->submit(single, policy(1000, 0, true));
    EXPECT_TRUE(settle([&] { return single->finished(); }));
    EXPECT_EQ((std::vector<int>{200}), single->finishCodes);
    EXPECT_EQ((std::vector<int>{Network::TASK_TIMEOUT_ERROR_CODE}), stalled->finishCodes);
}

TEST_F(NetworkManagerTest, OfflineModeQueuesEverySubmissionAndReleasesThemInOrderAfterItsSignal) {
    std::vector<std::string> log;
    StatusLog statuses;
    statuses.log = &log;
    statuses.listen(manager);
    manager->changeOfflineModeStatus(NetworkManager::OfflineModeOn);
    std::string url = serve("/queued", 200, "ok");
    std::vector<boost::shared_ptr<RecordingTask> > tasks;
    for (int i = 0; i < 6; ++i) {
        tasks.push_back(makeTask(url, 3));
        tasks.back()->name = "t" + std::to_string(i);
        tasks.back()->sharedLog = &log;
        manager->submit(tasks.back());
    }
    EXPECT_EQ(6, manager->getUnreadyCount());
    EXPECT_EQ(0u, server->requestCount());
    manager->changeOfflineModeStatus(NetworkManager::OfflineModeOn);
    manager->changeOfflineModeStatus(NetworkManager::OfflineModeOff);
    EXPECT_EQ((std::vector<std::string>{"offline 1", "offline 0", "t0 request", "active", "t1 request",
                                        "t2 request", "t3 request", "t4 request", "t5 request"}),
              log);
    EXPECT_TRUE(settle([&] {
        for (const boost::shared_ptr<RecordingTask>& task : tasks) {
            if (!task->finished()) {
                return false;
            }
        }
        return true;
    }));
}

TEST_F(NetworkManagerTest, OfflineFinishSwitchesOfflineModeOnAndTheRequeuedTaskReportsItsNextRun) {
    std::vector<std::string> log;
    StatusLog statuses;
    statuses.log = &log;
    statuses.listen(manager);
    boost::shared_ptr<RecordingTask> task = makeTask(serve("/later", 200, "ok"));
    task->name = "task";
    task->sharedLog = &log;
    pal::setReachability(0);
    manager->submit(task);
    pumpUntil([&] { return task->finished(); });
    pump();
    EXPECT_EQ((std::vector<int>{Network::OFFLINE_ERROR_CODE}), task->finishCodes);
    EXPECT_EQ(NetworkManager::OfflineModeOn, manager->getOfflineModeStatus());
    EXPECT_EQ(NetworkManager::NetworkError, manager->getNetworkErrorStatus());
    EXPECT_EQ(1, manager->getUnreadyCount());
    EXPECT_EQ(0, task->retries);

    pal::setReachability(1);
    manager->changeOfflineModeStatus(NetworkManager::OfflineModeOff);
    EXPECT_TRUE(settle([&] { return task->finishCodes.size() == 2; }));
    pump();
    EXPECT_EQ((std::vector<int>{Network::OFFLINE_ERROR_CODE, 200}), task->finishCodes);
    EXPECT_EQ(
        (std::vector<std::string>{"task request", "active", "idle", "task finished -1073741825", "offline 1",
                                  "error 1", "offline 0", "task request", "active", "task response 200",
                                  "task bytes", "idle", "task finished 200", "error 0"}),
        log);
    EXPECT_EQ(0, manager->getUnreadyCount());
    EXPECT_EQ(0, manager->getTaskCount());
}

TEST_F(NetworkManagerTest, UnreadyTaskStartsWhenAnotherCompletesAfterItBecameReady) {
    std::string url = serve("/r", 200, "ok");
    boost::shared_ptr<RecordingTask> waiting = makeTask(url);
    waiting->ready = false;
    manager->submit(waiting);
    boost::shared_ptr<RecordingTask> first = makeTask(url);
    manager->submit(first);
    EXPECT_TRUE(settle([&] { return first->finished(); }));
    EXPECT_EQ(0, waiting->attempts);
    waiting->ready = true;
    advanceMs(100000);
    EXPECT_EQ(0, waiting->attempts);
    boost::shared_ptr<RecordingTask> second = makeTask(url);
    manager->submit(second);
    EXPECT_TRUE(settle([&] { return second->finished() && waiting->finished(); }));
    EXPECT_EQ((std::vector<int>{200}), waiting->finishCodes);
}

TEST_F(NetworkManagerTest, ActivityListenersHearActiveOnceAndIdleOnceForOverlappingTasks) {
    StatusLog statuses;
    statuses.listen(manager);
    std::string url = serve("/a", 200, "ok");
    boost::shared_ptr<RecordingTask> one = makeTask(url);
    boost::shared_ptr<RecordingTask> two = makeTask(url);
    manager->submit(one);
    manager->submit(two);
    EXPECT_EQ(NetworkManager::NetworkActive, manager->getNetworkActivityStatus());
    EXPECT_TRUE(settle([&] { return one->finished() && two->finished(); }));
    EXPECT_EQ((std::vector<std::string>{"active", "idle"}), statuses.own);
}

TEST_F(NetworkManagerTest, CancelledTasksNeverHearBackWhereverTheyWere) {
    std::string stall = serve("/stall", 200, "late", Reply::StallBeforeReply);
    std::vector<boost::shared_ptr<RecordingTask> > running;
    for (int i = 0; i < 4; ++i) {
        running.push_back(makeTask(stall));
        running.back()->timeoutMs = 0;
        manager->submit(running.back());
    }
    boost::shared_ptr<RecordingTask> waiting = makeTask(serve("/next", 200, "next"));
    manager->submit(waiting);
    boost::shared_ptr<RecordingTask> retrying = makeTask(serve("/busy", 503));
    manager->submit(retrying, policy(1000, 5));
    boost::shared_ptr<RecordingTask> unready = makeTask(stall);
    unready->ready = false;
    manager->submit(unready);
    EXPECT_EQ(0, waiting->attempts);

    // Cancelling a running task gives its slot to the earliest waiting one.
    manager->cancel(running[0]);
    EXPECT_EQ(1, waiting->attempts);
    EXPECT_EQ(0, retrying->attempts);
    manager->cancel(running[1]);
    EXPECT_EQ(1, retrying->attempts);
    manager->cancel(unready);
    EXPECT_EQ(0, manager->getUnreadyCount());
    boost::shared_ptr<Network::NetworkTaskImpl> retryState = retrying->state();
    pumpUntil([&] { return waiting->finished() && retryState->isWaitingForRetry(); });
    retryState.reset();
    manager->cancel(retrying);
    manager->cancel(running[2]);
    manager->cancel(running[3]);
    EXPECT_EQ(NetworkManager::NetworkIdle, manager->getNetworkActivityStatus());
    EXPECT_EQ(0, manager->getTaskCount());
    server->releaseStalls();
    advanceMs(60000);

    // The exchange after them ends after anything they might still send.
    boost::shared_ptr<RecordingTask> last = makeTask(serve("/last", 200, "x"));
    manager->submit(last);
    EXPECT_TRUE(settle([&] { return last->finished(); }));
    for (const boost::shared_ptr<RecordingTask>& task : running) {
        EXPECT_EQ((std::vector<std::string>{"request"}), task->log);
    }
    EXPECT_TRUE(unready->log.empty());
    EXPECT_EQ((std::vector<std::string>{"request", "response 503"}), retrying->log);
    EXPECT_EQ((std::vector<int>{200}), waiting->finishCodes);
    EXPECT_EQ(0, manager->getPriorityManager().getRunningCount());
}

TEST_F(NetworkManagerTest, CancellingFromInsideOnFinishedLeavesNothingBehind) {
    boost::shared_ptr<RecordingTask> task = makeTask(serve("/done", 200, "x"));
    task->onFinish = [&](int) { manager->cancel(task); };
    manager->submit(task);
    EXPECT_TRUE(settle([&] { return task->finished(); }));
    EXPECT_EQ(0, manager->getTaskCount());
    EXPECT_EQ(NetworkManager::NetworkIdle, manager->getNetworkActivityStatus());
}

TEST_F(NetworkManagerTest, TaskIsRefusedWhileSubmittedAndAcceptedAgainAfterItsCompletion) {
    boost::shared_ptr<RecordingTask> task = makeTask(serve("/twice", 200, "x"));
    manager->submit(task);
    boost::shared_ptr<Network::NetworkTaskImpl> state = task->state();
    boost::shared_ptr<Network::NetworkTaskWriter> writer = task->getWriter();
    manager->submit(task);
    expectAssertion("getRequestState<NetworkTaskImpl>(request) == __null");
    EXPECT_EQ(state, task->state());
    EXPECT_EQ(writer, task->getWriter());
    EXPECT_EQ(1, manager->getTaskCount());
    state.reset();
    writer.reset();
    EXPECT_TRUE(settle([&] { return task->finished(); }));
    EXPECT_EQ(1, task->attempts);

    // From inside its own onFinished the old state still exists.
    task->onFinish = [&](int) { manager->submit(task); };
    manager->submit(task);
    EXPECT_TRUE(settle([&] { return task->finishCodes.size() == 2; }));
    expectAssertion("getRequestState<NetworkTaskImpl>(request) == __null");
    EXPECT_EQ(2, task->attempts);
}

TEST_F(NetworkManagerTest, IdsWrapToZeroAfterTheMillionth) {
    Network::NetworkTaskImpl::setNextObjectId(999999);
    std::string url = serve("/id", 200, "x");
    std::vector<boost::shared_ptr<RecordingTask> > tasks;
    std::vector<int> ids;
    for (int i = 0; i < 3; ++i) {
        tasks.push_back(makeTask(url));
        tasks.back()->ready = false;
        manager->submit(tasks.back());
        ids.push_back(tasks.back()->state()->getId());
        manager->cancel(tasks.back());
    }
    EXPECT_EQ((std::vector<int>{999999, 1000000, 0}), ids);
}

TEST_F(NetworkManagerTest, StatusListenersBelongToTheManagersThread) {
    StatusLog statuses;
    struct OtherThread {
        static void* run(void* argument) {
            OtherThread* self = static_cast<OtherThread*>(argument);
            self->statuses->listen(self->manager);
            return nullptr;
        }
        StatusLog* statuses;
        NetworkManager* manager;
    } other{&statuses, manager};
    kdThreadJoin(kdThreadCreate(nullptr, &OtherThread::run, &other), nullptr);
    for (int i = 0; i < 3; ++i) {
        expectAssertion("threadCallback->getThread() == kdThreadSelf()");
    }
}

TEST_F(NetworkManagerTest, ReachabilityIsFollowedOnlyWhileSomeoneListensAndTheAppRuns) {
    StatusLog first;
    StatusLog second;
    pal::postAppPaused();
    pump();
    first.listenToReachability(manager);
    EXPECT_EQ(0, pal::reachabilityListeners());
    pal::setReachability(2);
    EXPECT_EQ(NetworkManager::NetworkReachableViaMobile, manager->getNetworkReachabilityStatus());
    pal::postAppResumed();
    pump();
    EXPECT_EQ(1, pal::reachabilityListeners());
    // The value changed while paused from what was known at creation.
    EXPECT_EQ((std::vector<std::string>{"reachability 2"}), first.own);

    second.listenToReachability(manager);
    second.listenToReachability(manager);
    pal::setReachability(0);
    pump();
    EXPECT_EQ((std::vector<std::string>{"reachability 2", "reachability 0"}), first.own);
    EXPECT_EQ((std::vector<std::string>{"reachability 0", "reachability 0"}), second.own);
    second.stopReachability(manager);
    first.stopReachability(manager);
    EXPECT_EQ(0, pal::reachabilityListeners());
    pal::setReachability(1);
    pump();
    EXPECT_EQ(2u, first.own.size());
    EXPECT_EQ(NetworkManager::NetworkReachableViaWifi, manager->getNetworkReachabilityStatus());
}

TEST_F(NetworkManagerTest, HolderKeepsOneTaskAndCatchesMisuse) {
    std::string url = serve("/held", 200, "x");
    boost::shared_ptr<RecordingTask> task = makeTask(url);
    {
        Network::NetworkTaskHolder holder;
        holder.onFinished();
        expectAssertion("task != __null");
        holder.cancel();
        expectAssertion("task");
        task->onFinish = [&](int) { holder.onFinished(); };
        holder.submitNoRetries(task);
        holder.submit(makeTask(url));
        expectAssertion("!task");
        EXPECT_TRUE(holder.isWorking());
        EXPECT_TRUE(settle([&] { return task->finished(); }));
        EXPECT_FALSE(holder.isWorking());

        boost::shared_ptr<RecordingTask> stalled =
            makeTask(serve("/stall", 200, "", Reply::StallBeforeReply));
        holder.submit(stalled);
        EXPECT_EQ(NetworkManager::NetworkActive, manager->getNetworkActivityStatus());
    }
    // The holder's end cancelled the stalled task.
    EXPECT_EQ(0, manager->getTaskCount());
    EXPECT_EQ(NetworkManager::NetworkIdle, manager->getNetworkActivityStatus());
}

TEST_F(NetworkManagerTest, WriterRefusesWritesAfterClose) {
    Network::NetworkTaskWriter writer;
    writer.write("abc", 3);
    writer.close();
    writer.write("def", 3);
    expectAssertion("!closed");
    writer.close();
    expectAssertion("!closed");
    boost::shared_ptr<Network::HttpRequest> request =
        Network::HttpRequest::create(server->url("/w").c_str(), "POST", 1000, false);
    writer.setRequest(request);
    ASSERT_TRUE(request->findBodyStream());
}
