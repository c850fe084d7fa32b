#include <random>

#include "NetworkTest.h"
#include "network/NetworkErrorCodes.h"

using Network::NetworkManager;

namespace {

// A task that checks the manager's promises as its callbacks arrive: nothing
// after its cancel, nothing after its final finish; before that only
// offline finishes, each after a run of its own. It may cancel itself from inside a callback.
class GuardedTask : public Network::NetworkTask {
public:
    enum CancelPoint { Never, OnResponse, OnBytes, OnRetried };

    GuardedTask(const std::string& url, int priority, int timeoutMs, CancelPoint cancelPoint)
        : url(url), priority(priority), timeoutMs(timeoutMs), cancelPoint(cancelPoint) {}

    bool isReadyToPerform() const override { return true; }
    int getPriority() const override { return priority; }
    boost::shared_ptr<Network::HttpRequest> issueRequest() const override {
        const_cast<GuardedTask*>(this)->event("request");
        ++runs;
        return Network::HttpRequest::create(url.c_str(), "GET", timeoutMs, false);
    }
    bool recieveResponseBodyByParts() const override { return priority % 2 == 0; }
    void onResponseRecieved(boost::shared_ptr<Network::HttpResponse>) override {
        event("response");
        maybeCancel(OnResponse);
    }
    void onBytesReceived(const std::vector<unsigned char>&) override {
        event("bytes");
        maybeCancel(OnBytes);
    }
    void onFinished(int code) override {
        event("finished");
        // Only a connection reports offline, so each such finish ends a run
        // of its own; the overall timeout may end a re-queued task unrun.
        if (code == Network::OFFLINE_ERROR_CODE && runsFinished >= runs) {
            violations.push_back("an offline finish without a run");
        }
        runsFinished = runs;
        if (code == Network::OFFLINE_ERROR_CODE) {
            ++offlineFinishes;
        } else {
            finalCode = code;
            ++finalFinishes;
        }
    }
    void onRetried() override {
        event("retried");
        maybeCancel(OnRetried);
    }

    void cancelNow() {
        if (!cancelled && finalFinishes == 0) {
            cancelled = true;
            NetworkManager::getInstance()->cancel(self.lock());
        }
    }
    bool ended() const { return cancelled || finalFinishes > 0; }

    boost::weak_ptr<GuardedTask> self;
    std::string url;
    int priority;
    int timeoutMs;
    CancelPoint cancelPoint;
    bool cancelled = false;
    mutable int runs = 0;
    int runsFinished = 0;
    int offlineFinishes = 0;
    int finalFinishes = 0;
    int finalCode = 1;
    std::vector<std::string> violations;

private:
    void event(const std::string& name) {
        if (cancelled) {
            violations.push_back(name + " after cancel");
        }
        if (finalFinishes > 0) {
            violations.push_back(name + " after the final finish");
        }
    }
    void maybeCancel(CancelPoint point) {
        if (cancelPoint == point) {
            cancelNow();
        }
    }
};

}  // namespace

class NetworkFaultInjectionTest : public NetworkTest {};

// A few hundred tasks against resets, bursts of 5xx, stalls, garbage and
// refused connections while reachability flaps and tasks are cancelled at
// random moments (fixed seed). The checks hold for any timing of the real
// exchanges, so the test does not depend on scheduling.
TEST_F(NetworkFaultInjectionTest, EveryTaskEndsExactlyOnceAndCancelledTasksStaySilent) {
    const int kTasks = 300;
    std::mt19937 random(20261206);
    auto chance = [&](int percent) { return static_cast<int>(random() % 100) < percent; };

    RawReplyServer garbage("HTTP/1.1 2x0 Garbled\r\n\r\n\x01\x02");
    Reply slow;
    slow.status = 200;
    slow.body = "slow";
    // Longer than the requests' patience: the engine gives up first.
    slow.delayMs = 300;
    server->on("/stall", slow);
    bool burst = false;
    std::vector<std::string> urls = {serve("/ok", 200, std::string(20000, 'o')),
                                     serve("/burst", 200, "fine"),
                                     serve("/reset", 200, std::string(40000, 'r'), Reply::DropMidBody),
                                     server->url("/stall"),
                                     garbage.url(),
                                     "http://127.0.0.1:" + std::to_string(TestHttpServer::closedPort()) + "/",
                                     serve("/missing", 404)};

    std::vector<boost::shared_ptr<GuardedTask> > tasks;
    int reachability = 1;
    int steps = 0;
    while (tasks.size() < static_cast<std::size_t>(kTasks) && steps < 200000) {
        ++steps;
        int action = static_cast<int>(random() % 100);
        if (action < 40) {
            GuardedTask::CancelPoint point =
                chance(12) ? static_cast<GuardedTask::CancelPoint>(1 + random() % 3) : GuardedTask::Never;
            boost::shared_ptr<GuardedTask> task = boost::make_shared<GuardedTask>(
                urls[random() % urls.size()], static_cast<int>(random() % 4), 150, point);
            task->self = task;
            tasks.push_back(task);
            int limit = static_cast<int>(random() % 5);
            manager->submit(task, policy(100 + static_cast<int>(random() % 1900), limit, chance(50)));
        } else if (action < 48 && !tasks.empty()) {
            tasks[random() % tasks.size()]->cancelNow();
        } else if (action < 52) {
            reachability = reachability == 0 ? 1 + static_cast<int>(random() % 2) : 0;
            pal::setReachability(reachability);
        } else if (action < 56) {
            burst = !burst;
            serve("/burst", burst ? 503 : 200, "fine");
        } else if (action < 62 && reachability != 0) {
            manager->changeOfflineModeStatus(NetworkManager::OfflineModeOff);
        } else if (action < 80) {
            advanceMs(random() % 1500);
        } else if (manager->getNetworkActivityStatus() == NetworkManager::NetworkActive) {
            kdWaitEvent(static_cast<KDust>(-1));
        }
        pump();
    }
    ASSERT_EQ(static_cast<std::size_t>(kTasks), tasks.size());

    // Calm: the network back, offline mode off, no more 5xx; then run down.
    pal::setReachability(1);
    pump();
    serve("/burst", 200, "fine");
    manager->changeOfflineModeStatus(NetworkManager::OfflineModeOff);
    EXPECT_TRUE(settle(
        [&] {
            for (const boost::shared_ptr<GuardedTask>& task : tasks) {
                if (!task->ended()) {
                    return false;
                }
            }
            return manager->getTaskCount() == 0 && manager->getUnreadyCount() == 0;
        },
        500));

    int cancelled = 0;
    int offlineRequeues = 0;
    for (std::size_t i = 0; i < tasks.size(); ++i) {
        const GuardedTask& task = *tasks[i];
        SCOPED_TRACE("task " + std::to_string(i) + " " + task.url);
        EXPECT_TRUE(task.violations.empty()) << task.violations.front();
        EXPECT_TRUE(task.ended());
        EXPECT_LE(task.finalFinishes, 1);
        cancelled += task.cancelled ? 1 : 0;
        offlineRequeues += task.offlineFinishes;
    }
    // The run exercised what it claims to.
    EXPECT_GT(cancelled, 10);
    EXPECT_GT(offlineRequeues, 0);
    EXPECT_EQ(0, manager->getTaskCount());
    EXPECT_EQ(0, manager->getUnreadyCount());
    EXPECT_EQ(NetworkManager::NetworkIdle, manager->getNetworkActivityStatus());
    EXPECT_EQ(0, manager->getPriorityManager().getRunningCount());
    EXPECT_EQ(0, manager->getPriorityManager().getWaitingCount());
}
