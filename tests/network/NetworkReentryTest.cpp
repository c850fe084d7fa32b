// Owners that cancel, release or resubmit their tasks from inside the tasks'
// callbacks, status listeners that change the listener lists while they are
// told, and pauses that fall between a failure and its retry.
#include "NetworkTest.h"

namespace {

class NetworkReentryTest : public NetworkTest {
protected:
    // Submits task while the network is unreachable and waits for its
    // offline finish.
    void finishOffline(const Task& task) {
        pal::setReachability(KD_NETWORK_NOT_REACHABLE_ZVR);
        pumpUntil([&] { return task->finished(); });
    }
    void goOnline() {
        pal::setReachability(KD_NETWORK_REACHABLE_VIA_WIFI_ZVR);
        manager->changeOfflineModeStatus(NetworkManager::OfflineModeOff);
        pump();
    }
};

TEST_F(NetworkReentryTest, TaskCancelledFromItsOwnOfflineFinishIsNotQueuedAgainYetOfflineModeSwitchesOn) {
    Task task = makeTask(serve("/later", 200, "ok"));
    task->onFinish = [&] { manager->cancel(task); };
    pal::setReachability(KD_NETWORK_NOT_REACHABLE_ZVR);
    manager->submit(task);
    pumpUntil([&] { return task->finished(); });
    pump();

    EXPECT_EQ(NetworkManager::OfflineModeOn, manager->getOfflineModeStatus());
    EXPECT_EQ(NetworkManager::NetworkError, manager->getNetworkErrorStatus());
    EXPECT_EQ(0, manager->getUnreadyCount());
    goOnline();
    EXPECT_EQ(0, manager->getTaskCount());
    EXPECT_EQ(1, task->attempts);
    EXPECT_EQ(1u, task->finishCodes.size());
}

TEST_F(NetworkReentryTest, HolderThatLetsGoOfItsOfflineFinishedTaskWithdrawsItFromTheQueue) {
    Network::NetworkTaskHolder holder;
    Task task = makeTask(serve("/later", 200, "ok"));
    task->onFinish = [&] { holder.onFinished(); };
    pal::setReachability(KD_NETWORK_NOT_REACHABLE_ZVR);
    holder.submit(task);
    pumpUntil([&] { return task->finished(); });

    EXPECT_FALSE(holder.isWorking());
    EXPECT_EQ(0, manager->getUnreadyCount());
    goOnline();
    EXPECT_EQ(0, manager->getTaskCount());
    EXPECT_EQ(1, task->attempts);
}

TEST_F(NetworkReentryTest, HolderThatKeepsItsOfflineFinishedTaskHearsItsNextRunOrWithdrawsItByCancel) {
    Network::NetworkTaskHolder kept;
    Network::NetworkTaskHolder cancelled;
    Task first = makeTask(serve("/first", 200, "one"));
    Task second = makeTask(serve("/second", 200, "two"));
    pal::setReachability(KD_NETWORK_NOT_REACHABLE_ZVR);
    kept.submit(first);
    cancelled.submit(second);
    pumpUntil([&] { return first->finished() && second->finished(); });
    EXPECT_EQ(2, manager->getUnreadyCount());

    cancelled.cancel();
    EXPECT_EQ(1, manager->getUnreadyCount());
    goOnline();
    EXPECT_TRUE(settle([&] { return first->finishCodes.size() == 2; }));
    EXPECT_EQ(200, first->finishCodes.back());
    EXPECT_EQ(1u, second->finishCodes.size());
    EXPECT_EQ(1, second->attempts);
}

TEST_F(NetworkReentryTest, CancelOfACompletedTaskIsIgnored) {
    Task task = makeTask(serve("/done", 200, "ok"));
    manager->submit(task);
    EXPECT_TRUE(settle([&] { return task->finished(); }));
    manager->cancel(task);
    EXPECT_EQ(0, manager->getTaskCount());
    EXPECT_EQ(0, manager->getUnreadyCount());
}

// The network drops while the application is in the background just as a
// failure that is worth a retry arrives, and comes back before the user
// returns: the retry runs on resume.
TEST_F(NetworkReentryTest, RetryWaitingForTheNetworkWhilePausedRunsOnResumeWhenTheNetworkCameBack) {
    pal::postAppPaused();
    pump();
    const std::string url = serve("/flaky", 503);
    Task task = makeTask(url);
    task->onResponse = [&] {
        pal::setReachability(KD_NETWORK_NOT_REACHABLE_ZVR);
        serve("/flaky", 200, "ok");
    };
    manager->submit(task, policy(1000, -1));
    pumpUntil([&] { return stateOf(task) && stateOf(task)->isWaitingForRetry(); });
    task->onResponse = nullptr;

    pal::setReachability(KD_NETWORK_REACHABLE_VIA_WIFI_ZVR);
    advanceMs(60000);
    pal::postAppResumed();
    pump();

    EXPECT_TRUE(settle([&] { return task->finished(); }));
    EXPECT_EQ((std::vector<int>{200}), task->finishCodes);
    EXPECT_EQ(2, task->attempts);
}

TEST_F(NetworkReentryTest, TaskCancelledFromItsResponseOrItsRetryHearsNothingMore) {
    Task answered = makeTask(serve("/answered", 200, "body"));
    answered->onResponse = [&] { manager->cancel(answered); };
    Task retried = makeTask(serve("/busy", 503));
    retried->onRetry = [&] { manager->cancel(retried); };
    manager->submit(answered);
    manager->submit(retried, policy(1000, 5));

    EXPECT_TRUE(settle([&] { return manager->getTaskCount() == 0; }));
    advanceMs(10000);
    pump();

    EXPECT_EQ((std::vector<std::string>{"request", "response 200"}), answered->log);
    EXPECT_EQ((std::vector<std::string>{"request", "response 503", "retried"}), retried->log);
    EXPECT_EQ(NetworkManager::NetworkIdle, manager->getNetworkActivityStatus());
}

// Status listeners are told from a snapshot: one may remove itself or
// another, and one removed before its turn is not told.
class OfflineListener {
public:
    explicit OfflineListener(std::vector<std::string>* log, const std::string& name) : log(log), name(name) {}
    NetworkManager::OfflineModeStatusCallback callback() {
        return NetworkManager::OfflineModeStatusCallback::make<OfflineListener, &OfflineListener::onOffline>(
            this);
    }
    std::function<void()> whenTold;

private:
    void onOffline(NetworkManager::OfflineModeStatus status) {
        log->push_back(name + " " + std::to_string(status));
        if (whenTold) {
            whenTold();
        }
    }
    std::vector<std::string>* log;
    std::string name;
};

TEST_F(NetworkReentryTest, OfflineListenerMayRemoveItselfAndAnotherWhileBeingTold) {
    std::vector<std::string> log;
    OfflineListener first(&log, "first");
    OfflineListener second(&log, "second");
    first.whenTold = [&] {
        manager->removeOfflineModeStatusCallback(first.callback());
        manager->removeOfflineModeStatusCallback(second.callback());
    };
    manager->addOfflineModeStatusCallback(first.callback());
    manager->addOfflineModeStatusCallback(second.callback());

    manager->changeOfflineModeStatus(NetworkManager::OfflineModeOn);
    manager->changeOfflineModeStatus(NetworkManager::OfflineModeOff);
    pump();

    EXPECT_EQ((std::vector<std::string>{"first 1"}), log);
}

// A listener that switches offline mode on again while told that it ended
// keeps the queued tasks held; they go when it ends for good.
TEST_F(NetworkReentryTest, OfflineListenerSwitchingOfflineModeOnAgainKeepsTheQueueHeld) {
    std::vector<std::string> log;
    OfflineListener listener(&log, "listener");
    bool switchBack = true;
    listener.whenTold = [&] {
        if (switchBack && manager->getOfflineModeStatus() == NetworkManager::OfflineModeOff) {
            switchBack = false;
            manager->changeOfflineModeStatus(NetworkManager::OfflineModeOn);
        }
    };
    manager->addOfflineModeStatusCallback(listener.callback());
    manager->changeOfflineModeStatus(NetworkManager::OfflineModeOn);
    Task task = makeTask(serve("/queued", 200, "ok"));
    manager->submit(task);

    manager->changeOfflineModeStatus(NetworkManager::OfflineModeOff);
    pump();
    EXPECT_EQ(1, manager->getUnreadyCount());
    EXPECT_EQ(0, task->attempts);

    manager->changeOfflineModeStatus(NetworkManager::OfflineModeOff);
    EXPECT_TRUE(settle([&] { return task->finished(); }));
    EXPECT_EQ((std::vector<int>{200}), task->finishCodes);
    manager->removeOfflineModeStatusCallback(listener.callback());
}

}  // namespace
