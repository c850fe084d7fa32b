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

}  // namespace
