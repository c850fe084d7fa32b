#include <random>

#include "NetworkTest.h"

namespace {

// Checks the manager's promises as its callbacks arrive: nothing after its
// cancel or its final finish; before that only offline finishes, each after
// a run of its own. It may cancel itself from inside a callback.
class GuardedTask : public Network::NetworkTask {
public:
    enum CancelPoint { Never, OnResponse, OnBytes, OnRetried };

    GuardedTask(const std::string& url, int priority, CancelPoint cancelPoint)
        : url(url), priority(priority), cancelPoint(cancelPoint) {}

    bool isReadyToPerform() const override { return true; }
    int getPriority() const override { return priority; }
    boost::shared_ptr<Network::HttpRequest> issueRequest() const override {
        const_cast<GuardedTask*>(this)->event("request", Never);
        ++runs;
        // Shorter than the slow path's answer: the engine gives up first.
        return Network::HttpRequest::create(url.c_str(), "GET", 150, false);
    }
    bool recieveResponseBodyByParts() const override { return priority % 2 == 0; }
    void onResponseRecieved(boost::shared_ptr<Network::HttpResponse>) override {
        event("response", OnResponse);
    }
    void onBytesReceived(const std::vector<unsigned char>&) override { event("bytes", OnBytes); }
    void onRetried() override { event("retried", OnRetried); }
    void onFinished(int code) override {
        event("finished", Never);
        // Only a connection reports offline; the overall timeout may end a
        // re-queued task that has not run again.
        if (code == Network::OFFLINE_ERROR_CODE && finishedRuns >= runs) {
            violations.push_back("an offline finish without a run");
        }
        finishedRuns = runs;
        offlineFinishes += code == Network::OFFLINE_ERROR_CODE ? 1 : 0;
        finalFinishes += code == Network::OFFLINE_ERROR_CODE ? 0 : 1;
    }

    void cancelNow() {
        if (!ended()) {
            cancelled = true;
            NetworkManager::getInstance()->cancel(self.lock());
        }
    }
    bool ended() const { return cancelled || finalFinishes > 0; }

    boost::weak_ptr<GuardedTask> self;
    std::string url;
    int priority;
    CancelPoint cancelPoint;
    bool cancelled = false;
    mutable int runs = 0;
    int finishedRuns = 0;
    int offlineFinishes = 0;
    int finalFinishes = 0;
    std::vector<std::string> violations;

private:
    void event(const std::string& name, CancelPoint point) {
        if (ended()) {
            violations.push_back(name + (cancelled ? " after cancel" : " after the final finish"));
        }
        if (point != Never && point == cancelPoint) {
            cancelNow();
        }
    }
};

}  // namespace

class NetworkFaultInjectionTest : public NetworkTest {};

// Tasks against resets, cut bodies, bursts of 5xx, slow answers, garbage, refused
// connections and a missing path while reachability flaps, offline mode
// comes and goes and tasks are cancelled at random moments (fixed seed). The
// checks hold for any timing of the real exchanges.
TEST_F(NetworkFaultInjectionTest, EveryTaskEndsExactlyOnceAndCancelledTasksStaySilent) {
    const std::size_t kTasks = 300;
    std::mt19937 random(20261206);
    auto pick = [&](int range) { return static_cast<int>(random() % range); };

    RawReplyServer garbage("HTTP/1.1 2x0 Garbled\r\n\r\n\x01\x02");
    RawReplyServer::Options resetting;
    resetting.reset = true;
    RawReplyServer reset("HTTP/1.1 200 OK\r\nContent-Length: 100\r\n\r\ncut short", resetting);
    Reply slow;
    slow.body = "slow";
    slow.delayMs = 300;
    server->on("/slow", slow);
    bool burst = false;
    std::vector<std::string> urls = {serve("/ok", 200, std::string(20000, 'o')),
                                     serve("/burst", 200, "fine"),
                                     serve("/reset", 200, std::string(40000, 'r'), Reply::DropMidBody),
                                     server->url("/slow"),
                                     garbage.url(),
                                     reset.url(),
                                     refusedUrl(),
                                     serve("/missing", 404)};

    std::vector<boost::shared_ptr<GuardedTask> > tasks;
    int reachability = 1;
    for (int step = 0; tasks.size() < kTasks && step < 200000; ++step) {
        int action = pick(100);
        if (action < 40) {
            GuardedTask::CancelPoint point =
                pick(100) < 12 ? static_cast<GuardedTask::CancelPoint>(1 + pick(3)) : GuardedTask::Never;
            tasks.push_back(boost::make_shared<GuardedTask>(urls[pick(urls.size())], pick(4), point));
            tasks.back()->self = tasks.back();
            manager->submit(tasks.back(), policy(100 + pick(1900), pick(5), pick(2) == 0));
        } else if (action < 48 && !tasks.empty()) {
            tasks[pick(tasks.size())]->cancelNow();
        } else if (action < 52) {
            reachability = reachability == 0 ? 1 + pick(2) : 0;
            pal::setReachability(reachability);
        } else if (action < 56) {
            burst = !burst;
            serve("/burst", burst ? 503 : 200, "fine");
        } else if (action < 62 && reachability != 0) {
            manager->changeOfflineModeStatus(NetworkManager::OfflineModeOff);
        } else if (action < 80) {
            advanceMs(pick(1500));
        } else if (manager->getNetworkActivityStatus() == NetworkManager::NetworkActive) {
            kdWaitEvent(static_cast<KDust>(-1));
        }
        pump();
    }
    ASSERT_EQ(kTasks, tasks.size());

    // Calm: the network back, no more 5xx, offline mode off; then run down.
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
    int offlineFinishes = 0;
    for (std::size_t i = 0; i < tasks.size(); ++i) {
        SCOPED_TRACE("task " + std::to_string(i) + " " + tasks[i]->url);
        EXPECT_TRUE(tasks[i]->violations.empty()) << tasks[i]->violations.front();
        EXPECT_TRUE(tasks[i]->ended());
        EXPECT_LE(tasks[i]->finalFinishes, 1);
        cancelled += tasks[i]->cancelled ? 1 : 0;
        offlineFinishes += tasks[i]->offlineFinishes;
    }
    // The run went through what it claims to.
    EXPECT_GT(cancelled, 10);
    EXPECT_GT(offlineFinishes, 0);
    EXPECT_EQ(NetworkManager::NetworkIdle, manager->getNetworkActivityStatus());
    EXPECT_EQ(0, manager->getPriorityManager().getRunningCount());
    EXPECT_EQ(0, manager->getPriorityManager().getWaitingCount());
}
