#include <atomic>
#include <mutex>
#include <thread>

#include "NetworkTest.h"

namespace {

// Writes down the ids the engine reports under (from the engine thread).
class IdCollector : public Network::NetworkSpeedCollector {
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

}  // namespace

class NetworkManagerTest : public NetworkTest {};

TEST_F(NetworkManagerTest, CompletedTaskGetsItsBodyOnceFinishedAndIsMeasuredUnderItsWrappingId) {
    boost::shared_ptr<IdCollector> collector = boost::make_shared<IdCollector>();
    manager->setNetworkSpeedCollector(collector);
    Network::NetworkTaskImpl::setNextObjectId(1000000);
    std::string url = serve("/ok", 200, std::string(100000, 'x'), Reply::Chunked);
    Task whole = makeTask(url);
    Task parted = makeTask(url);
    parted->byParts = true;
    parted->gatherStatistics = false;
    manager->submit(whole);
    manager->submit(parted);
    EXPECT_EQ(1000000, stateOf(whole)->getId());
    EXPECT_EQ(0, stateOf(parted)->getId());
    EXPECT_TRUE(settle([&] { return whole->finished() && parted->finished(); }));

    for (const Task& task : {whole, parted}) {
        EXPECT_EQ(std::string(100000, 'x'), task->body);
        EXPECT_EQ((std::vector<int>{200}), task->finishCodes);
        EXPECT_EQ("response 200", task->log[1]);
        EXPECT_EQ("finished 200", task->log.back());
        // The state is gone once the manager has processed the completion.
        EXPECT_FALSE(stateOf(task));
    }
    EXPECT_EQ(4u, whole->log.size());
    EXPECT_GT(parted->log.size(), 4u);
    // Only the task that gathers statistics is reported, under its id.
    std::vector<int> ids = collector->ids();
    EXPECT_FALSE(ids.empty());
    EXPECT_EQ(ids.size(), static_cast<std::size_t>(std::count(ids.begin(), ids.end(), 1000000)));
    EXPECT_EQ(NetworkManager::NoNetworkError, manager->getNetworkErrorStatus());
    EXPECT_EQ(0, manager->getTaskCount());
}

struct RetryCase {
    const char* name;
    int status;       // scripted answer, unless raw is set; 0: nobody listens
    const char* raw;  // raw bytes answered instead of HTTP
    int limit;
    int attempts;
    int finishCode;  // 0: some negative engine code
};

class RetryDecisionTest : public NetworkTest, public ::testing::WithParamInterface<RetryCase> {};

// Bad answers (garbage, nothing, a cut body) end with a failure code after
// the retries, like any transient failure.
TEST_P(RetryDecisionTest, RetriesTransientFailuresUpToTheLimitOnly) {
    const RetryCase& param = GetParam();
    std::unique_ptr<RawReplyServer> raw(param.raw != nullptr ? new RawReplyServer(param.raw) : nullptr);
    std::string url = raw                 ? raw->url()
                      : param.status == 0 ? refusedUrl()
                                          : serve("/answer", param.status, std::string(20000, 'a'),
                                                  param.status == 200 ? Reply::DropMidBody : Reply::Whole);
    Task task = makeTask(url);
    manager->submit(task, policy(1000, param.limit));
    EXPECT_TRUE(settle([&] { return task->finished(); }));
    EXPECT_EQ(param.attempts, task->attempts);
    EXPECT_EQ(param.attempts - 1, task->retries);
    ASSERT_EQ(1u, task->finishCodes.size());
    if (param.finishCode == 0) {
        EXPECT_LT(task->finishCodes[0], 0);
        EXPECT_NE(Network::OFFLINE_ERROR_CODE, task->finishCodes[0]);
        EXPECT_EQ(NetworkManager::NetworkError, manager->getNetworkErrorStatus());
    } else {
        EXPECT_EQ(param.finishCode, task->finishCodes[0]);
        // HTTP error statuses are not network errors.
        EXPECT_EQ(NetworkManager::NoNetworkError, manager->getNetworkErrorStatus());
    }
    // Bodies of answers outside 2xx, and cut ones, never reach the task.
    EXPECT_EQ("", task->body);
}

INSTANTIATE_TEST_SUITE_P(
    Answers, RetryDecisionTest,
    ::testing::Values(RetryCase{"NotFound", 404, nullptr, 5, 1, 404},
                      RetryCase{"NoContent", 204, nullptr, 5, 1, 204},
                      RetryCase{"RequestTimeout", 408, nullptr, 5, 6, 408},
                      RetryCase{"Unavailable", 503, nullptr, 5, 6, 503},
                      RetryCase{"Refused", 0, nullptr, 5, 6, 0}, RetryCase{"CutBody", 200, nullptr, 2, 3, 0},
                      RetryCase{"Garbage", 0, "\x16\x03\x01 no HTTP at all\r\n\r\n", 2, 3, 0},
                      RetryCase{"ClosedWithoutAnswer", 0, "", 2, 3, 0},
                      RetryCase{"BadStatusLine", 0, "HTTP/1.1 abc Nonsense\r\nContent-Length: 0\r\n\r\n", 2,
                                3, 0},
                      RetryCase{"LimitOneNeverRetries", 503, nullptr, 1, 1, 503},
                      RetryCase{"LimitZeroRunsOnce", 503, nullptr, 0, 1, 503}),
    [](const ::testing::TestParamInfo<RetryCase>& info) { return std::string(info.param.name); });

TEST_F(NetworkManagerTest, ATaskBoundsTheBodyItAccepts) {
    const std::string url = serve("/big", 200, std::string(5000, 'b'));
    Task small = makeTask(url);
    small->maxBodySize = 4999;
    Task enough = makeTask(url);
    enough->maxBodySize = 5000;
    manager->submit(small, policy(1000, 0));
    manager->submit(enough, policy(1000, 0));
    EXPECT_TRUE(settle([&] { return small->finished() && enough->finished(); }));
    EXPECT_EQ((std::vector<int>{Network::HTTP_BODY_TOO_LARGE_ERROR_CODE}), small->finishCodes);
    EXPECT_TRUE(small->body.empty());
    EXPECT_EQ((std::vector<int>{200}), enough->finishCodes);
    EXPECT_EQ(5000u, enough->body.size());
}

TEST_F(NetworkManagerTest, RetryWaitsItsIntervalOrWhileUnreachableUntilTheNetworkReturns) {
    Task task = makeTask(serve("/busy", 503));
    task->onResponse = [&] {
        if (task->attempts == 2) {
            pal::setReachability(0);
        }
    };
    manager->submit(task, policy(2000, 5));
    boost::shared_ptr<Network::NetworkTaskImpl> state = stateOf(task);
    pumpUntil([&] { return state->isWaitingForRetry(); });
    advanceMs(1999);
    EXPECT_EQ(1, task->attempts);
    advanceMs(1);
    EXPECT_EQ(2, task->attempts);

    pumpUntil([&] { return state->isWaitingForRetry(); });
    EXPECT_EQ(1, pal::reachabilityListeners());
    advanceMs(60000);
    EXPECT_EQ(2, task->attempts);
    pal::setReachability(2);
    pump();
    EXPECT_EQ(3, task->attempts);
    EXPECT_EQ(0, pal::reachabilityListeners());
    manager->cancel(task);
}

TEST_F(NetworkManagerTest, ServerErrorWithRetriesLeftPassesNoBodyAndTheRetryReplaysTheWrittenBody) {
    Task task = makeTask(serve("/upload", 500, "server trouble"));
    task->streamsBody = true;
    task->onRetry = [&] {
        Reply echo;
        echo.mode = Reply::Echo;
        server->on("/upload", echo);
    };
    manager->submit(task);
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

TEST_F(NetworkManagerTest, OverallTimeoutEndsTheTaskAndItsConnectionButNeverEndlessRetries) {
    StatusLog statuses;
    statuses.listen(manager);
    Task stalled = makeTask(serve("/stall", 200, "late", Reply::StallBeforeReply));
    stalled->timeoutMs = 0;
    manager->submit(stalled, policy(1000, 5, true));
    // 5 x (1 s + 30 s).
    advanceMs(154999);
    EXPECT_FALSE(stalled->finished());
    advanceMs(1);
    EXPECT_EQ((std::vector<int>{Network::TASK_TIMEOUT_ERROR_CODE}), stalled->finishCodes);
    pump();
    EXPECT_EQ((std::vector<std::string>{"active", "idle", "error 1"}), statuses.own);
    server->releaseStalls();

    Network::NetworkTaskHolder holder;
    Task endless = makeTask(refusedUrl());
    holder.submitInfRetries(endless);
    Task unbounded = makeTask(refusedUrl());
    manager->submit(unbounded, policy(1000, -1, true));
    EXPECT_TRUE(settle([&] { return endless->attempts >= 40 && unbounded->attempts >= 40; }, 1000));
    advanceMs(3600 * 1000);
    EXPECT_FALSE(endless->finished());
    EXPECT_FALSE(unbounded->finished());
    holder.cancel();
    manager->cancel(unbounded);

    // Held back by offline mode, a task times out just the same.
    manager->changeOfflineModeStatus(NetworkManager::OfflineModeOn);
    Task queued = makeTask(refusedUrl());
    manager->submit(queued, policy(1000, 1, true));
    advanceMs(31000);
    EXPECT_EQ((std::vector<int>{Network::TASK_TIMEOUT_ERROR_CODE}), queued->finishCodes);
    EXPECT_EQ(0, manager->getUnreadyCount());
    manager->changeOfflineModeStatus(NetworkManager::OfflineModeOff);

    // A zero limit still allows its one attempt a full period.
    Task single = makeTask(serve("/single", 200, "done"));
    manager->submit(single, policy(1000, 0, true));
    EXPECT_TRUE(settle([&] { return single->finished(); }));
    EXPECT_EQ((std::vector<int>{200}), single->finishCodes);
    EXPECT_EQ(0, manager->getTaskCount());
}

TEST_F(NetworkManagerTest, OfflineModeQueuesEverySubmissionAndReleasesThemInOrderAfterItsSignal) {
    std::vector<std::string> log;
    StatusLog statuses(&log);
    statuses.listen(manager);
    manager->changeOfflineModeStatus(NetworkManager::OfflineModeOn);
    std::vector<Task> tasks;
    for (int i = 0; i < 6; ++i) {
        tasks.push_back(makeTask(serve("/queued", 200, "ok"), 3));
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
    EXPECT_TRUE(settle([&] { return allFinished(tasks); }));
}

TEST_F(NetworkManagerTest, OfflineFinishSwitchesOfflineModeOnAndTheRequeuedTaskReportsItsNextRun) {
    std::vector<std::string> log;
    StatusLog statuses(&log);
    statuses.listen(manager);
    Task task = makeTask(serve("/later", 200, "ok"));
    task->name = "task";
    task->sharedLog = &log;
    pal::setReachability(0);
    manager->submit(task);
    pumpUntil([&] { return task->finished(); });
    EXPECT_EQ(NetworkManager::OfflineModeOn, manager->getOfflineModeStatus());
    EXPECT_EQ(1, manager->getUnreadyCount());

    pal::setReachability(1);
    manager->changeOfflineModeStatus(NetworkManager::OfflineModeOff);
    EXPECT_TRUE(settle([&] { return task->finishCodes.size() == 2; }));
    pump();
    EXPECT_EQ(
        (std::vector<std::string>{"task request", "active", "idle", "task finished -1073741825", "offline 1",
                                  "error 1", "offline 0", "task request", "active", "task response 200",
                                  "task bytes", "idle", "task finished 200", "error 0"}),
        log);
    EXPECT_EQ(0, task->retries);
    EXPECT_EQ(0, manager->getUnreadyCount());
}

TEST_F(NetworkManagerTest, UnreadyTaskWaitsForAnotherCompletionAndActivityIsSignalledOnTransitionsOnly) {
    StatusLog statuses;
    statuses.listen(manager);
    std::string url = serve("/r", 200, "ok");
    Task waiting = makeTask(url);
    waiting->ready = false;
    manager->submit(waiting);
    Task one = makeTask(url);
    Task two = makeTask(url);
    manager->submit(one);
    manager->submit(two);
    EXPECT_TRUE(settle([&] { return one->finished() && two->finished(); }));
    EXPECT_EQ((std::vector<std::string>{"active", "idle"}), statuses.own);

    // Nothing polls readiness: only the next completion looks again.
    waiting->ready = true;
    advanceMs(100000);
    EXPECT_EQ(0, waiting->attempts);
    Task three = makeTask(url);
    manager->submit(three);
    EXPECT_TRUE(settle([&] { return three->finished() && waiting->finished(); }));
    EXPECT_EQ((std::vector<int>{200}), waiting->finishCodes);
}

TEST_F(NetworkManagerTest, CancelledTasksNeverHearBackWhereverTheyWere) {
    std::string stall = serve("/stall", 200, "late", Reply::StallBeforeReply);
    std::vector<Task> running;
    for (int i = 0; i < 4; ++i) {
        running.push_back(makeTask(stall));
        running.back()->timeoutMs = 0;
        manager->submit(running.back());
    }
    Task waiting = makeTask(serve("/next", 200, "next"));
    manager->submit(waiting);
    Task retrying = makeTask(serve("/busy", 503));
    manager->submit(retrying, policy(1000, 5));
    Task unready = makeTask(stall);
    unready->ready = false;
    manager->submit(unready);
    EXPECT_EQ(0, waiting->attempts);

    // A running task's slot goes to the earliest waiting one at once.
    manager->cancel(running[0]);
    EXPECT_EQ(1, waiting->attempts);
    EXPECT_EQ(0, retrying->attempts);
    manager->cancel(running[1]);
    EXPECT_EQ(1, retrying->attempts);
    manager->cancel(unready);
    EXPECT_EQ(0, manager->getUnreadyCount());
    // Cancelling from inside its own onFinished leaves nothing behind.
    waiting->onFinish = [&] { manager->cancel(waiting); };
    boost::shared_ptr<Network::NetworkTaskImpl> retryState = stateOf(retrying);
    pumpUntil([&] { return waiting->finished() && retryState->isWaitingForRetry(); });
    retryState.reset();
    manager->cancel(retrying);
    manager->cancel(running[2]);
    manager->cancel(running[3]);
    EXPECT_EQ(NetworkManager::NetworkIdle, manager->getNetworkActivityStatus());
    EXPECT_EQ(0, manager->getTaskCount());
    server->releaseStalls();
    advanceMs(60000);

    // An exchange after them ends after anything they might still send.
    Task last = makeTask(serve("/last", 200, "x"));
    manager->submit(last);
    EXPECT_TRUE(settle([&] { return last->finished(); }));
    for (const Task& task : running) {
        EXPECT_EQ((std::vector<std::string>{"request"}), task->log);
    }
    EXPECT_TRUE(unready->log.empty());
    EXPECT_EQ((std::vector<std::string>{"request", "response 503"}), retrying->log);
    EXPECT_EQ((std::vector<int>{200}), waiting->finishCodes);
    EXPECT_EQ(0, manager->getPriorityManager().getRunningCount());
}

TEST_F(NetworkManagerTest, TaskIsRefusedWhileSubmittedAndAcceptedAgainAfterItsCompletion) {
    Task task = makeTask(serve("/twice", 200, "x"));
    manager->submit(task);
    boost::shared_ptr<Network::NetworkTaskImpl> state = stateOf(task);
    boost::shared_ptr<Network::NetworkTaskWriter> writer = task->getWriter();
    manager->submit(task);
    expectAssertion("getRequestState<NetworkTaskImpl>(request) == __null");
    EXPECT_EQ(state, stateOf(task));
    EXPECT_EQ(writer, task->getWriter());
    EXPECT_EQ(1, manager->getTaskCount());
    state.reset();
    writer.reset();
    EXPECT_TRUE(settle([&] { return task->finished(); }));

    // From inside its own onFinished the old state still exists.
    task->onFinish = [&] { manager->submit(task); };
    manager->submit(task);
    EXPECT_TRUE(settle([&] { return task->finishCodes.size() == 2; }));
    expectAssertion("getRequestState<NetworkTaskImpl>(request) == __null");
    EXPECT_EQ(2, task->attempts);
}

TEST_F(NetworkManagerTest, MisuseIsCaughtAndAHolderCancelsItsTaskWhenItGoes) {
    StatusLog statuses;
    struct OtherThread {
        static void* run(void* self) {
            static_cast<StatusLog*>(self)->listen(NetworkManager::getInstance());
            return nullptr;
        }
    };
    kdThreadJoin(kdThreadCreate(nullptr, &OtherThread::run, &statuses), nullptr);
    for (int i = 0; i < 3; ++i) {
        expectAssertion("threadCallback->getThread() == kdThreadSelf()");
    }

    Network::NetworkTaskWriter writer;
    writer.close();
    writer.write("late", 4);
    writer.close();
    expectAssertion("!closed");
    expectAssertion("!closed");

    {
        Network::NetworkTaskHolder holder;
        holder.onFinished();
        expectAssertion("task != __null");
        holder.cancel();
        expectAssertion("task");
        Task stalled = makeTask(serve("/stall", 200, "", Reply::StallBeforeReply));
        holder.submitNoRetries(stalled);
        holder.submit(makeTask(stalled->url));
        expectAssertion("!task");
        EXPECT_EQ(1, manager->getTaskCount());
    }
    EXPECT_EQ(0, manager->getTaskCount());
    EXPECT_EQ(NetworkManager::NetworkIdle, manager->getNetworkActivityStatus());
}

TEST_F(NetworkManagerTest, ReachabilityIsFollowedOnlyWhileSomeoneListensAndTheAppRuns) {
    StatusLog first;
    StatusLog second;
    pal::postAppPaused();
    pump();
    manager->addNetworkReachabilityStatusCallback(first.reachability());
    EXPECT_EQ(0, pal::reachabilityListeners());
    pal::setReachability(2);
    EXPECT_EQ(NetworkManager::NetworkReachableViaMobile, manager->getNetworkReachabilityStatus());
    pal::postAppResumed();
    pump();
    EXPECT_EQ(1, pal::reachabilityListeners());
    // Changed while paused from what was known at creation.
    EXPECT_EQ((std::vector<std::string>{"reachability 2"}), first.own);

    manager->addNetworkReachabilityStatusCallback(second.reachability());
    manager->addNetworkReachabilityStatusCallback(second.reachability());
    pal::setReachability(0);
    pump();
    EXPECT_EQ((std::vector<std::string>{"reachability 2", "reachability 0"}), first.own);
    EXPECT_EQ((std::vector<std::string>{"reachability 0", "reachability 0"}), second.own);
    manager->removeNetworkReachabilityStatusCallback(second.reachability());
    manager->removeNetworkReachabilityStatusCallback(first.reachability());
    EXPECT_EQ(0, pal::reachabilityListeners());
    pal::setReachability(1);
    pump();
    EXPECT_EQ(2u, first.own.size());
    EXPECT_EQ(NetworkManager::NetworkReachableViaWifi, manager->getNetworkReachabilityStatus());

    // A listener removed by an earlier one during a signal is not called.
    struct Remover {
        void onChange(NetworkManager::NetworkReachabilityStatus) {
            NetworkManager::getInstance()->removeNetworkReachabilityStatusCallback(removed);
        }
        NetworkManager::NetworkReachabilityStatusCallback removed;
    } remover{second.reachability()};
    NetworkManager::NetworkReachabilityStatusCallback removing =
        NetworkManager::NetworkReachabilityStatusCallback::make<Remover, &Remover::onChange>(&remover);
    manager->addNetworkReachabilityStatusCallback(removing);
    manager->addNetworkReachabilityStatusCallback(second.reachability());
    pal::setReachability(2);
    pump();
    EXPECT_EQ(2u, second.own.size());
    manager->removeNetworkReachabilityStatusCallback(removing);
}

TEST_F(NetworkManagerTest, ShutdownDropsTasksWhereverTheyAreWithoutCallbacks) {
    Task running = makeTask(serve("/stall", 200, "", Reply::StallBeforeReply));
    running->timeoutMs = 0;
    manager->submit(running);
    Task waitingForNetwork = makeTask(serve("/busy", 503));
    waitingForNetwork->onResponse = [] { pal::setReachability(0); };
    manager->submit(waitingForNetwork);
    Task unready = makeTask(running->url);
    unready->ready = false;
    manager->submit(unready);
    pumpUntil([&] { return pal::reachabilityListeners() == 1; });
    shutdownPal();
    server->releaseStalls();
    EXPECT_EQ((std::vector<std::string>{"request"}), running->log);
    EXPECT_EQ((std::vector<std::string>{"request", "response 503"}), waitingForNetwork->log);
    EXPECT_TRUE(unready->log.empty());
    EXPECT_EQ(0, pal::reachabilityListeners());
}

// A task submitted on another thread runs there, also when the main thread's
// completion releases it from the unready queue: the start is posted to it.
TEST_F(NetworkManagerTest, TaskOfAnotherThreadRunsAndReportsOnThatThread) {
    struct Worker {
        static void* run(void* argument) {
            Worker* worker = static_cast<Worker*>(argument);
            worker->thread = kdThreadSelf();
            worker->task->onFinish = [worker] { worker->finishThread = kdThreadSelf(); };
            NetworkManager::getInstance()->submit(worker->task, policy(1000, 0));
            worker->submitted = true;
            while (!worker->task->finished()) {
                kdWaitEvent(static_cast<KDust>(-1));
            }
            return nullptr;
        }
        Task task;
        std::atomic<bool> submitted{false};
        KDThread* thread = nullptr;
        KDThread* finishThread = nullptr;
    } worker;
    std::string url = serve("/elsewhere", 200, "far");
    worker.task = makeTask(url);
    worker.task->ready = false;
    KDThread* thread = kdThreadCreate(nullptr, &Worker::run, &worker);
    while (!worker.submitted) {
        std::this_thread::yield();
    }
    EXPECT_EQ(1, manager->getUnreadyCount());
    worker.task->ready = true;
    Task local = makeTask(url);
    manager->submit(local);
    EXPECT_TRUE(settle([&] { return local->finished(); }));
    kdThreadJoin(thread, nullptr);
    EXPECT_EQ("far", worker.task->body);
    EXPECT_EQ(worker.thread, worker.finishThread);
    EXPECT_EQ(0, manager->getTaskCount());
}
