#include <KD/kdext.h>
#include <gtest/gtest.h>

#include <boost/make_shared.hpp>
#include <vector>

#include "network/NetworkErrorCodes.h"
#include "network/NetworkManager.h"
#include "network/NetworkTask.h"

namespace {

// Overrides only what a task must.
class BareTask : public Network::NetworkTask {
public:
    bool isReadyToPerform() const override { return true; }
    boost::shared_ptr<Network::HttpRequest> issueRequest() const override {
        return Network::HttpRequest::create("http://127.0.0.1/", "GET", 30000, false);
    }
    void onBytesReceived(const std::vector<unsigned char>& bytes) override { received += bytes.size(); }
    void onFinished(int code) override { finishCode = code; }

    std::size_t received = 0;
    int finishCode = 1;
};

class RunningState : public Network::NetworkTask::State {};
class OtherState : public Network::NetworkTask::State {};

}  // namespace

TEST(NetworkInterfacesTest, TaskDefaultsAreMediumPriorityMeasuredWholeBodyAndQuiet) {
    BareTask task;

    EXPECT_EQ(1, task.getPriority());
    EXPECT_TRUE(task.needToGatherStatistics());
    EXPECT_FALSE(task.recieveResponseBodyByParts());
    task.onResponseRecieved(boost::shared_ptr<Network::HttpResponse>());
    task.onRetried();
    EXPECT_EQ(0u, task.received);
    EXPECT_EQ(1, task.finishCode);
    EXPECT_FALSE(task.getWriter());
}

TEST(NetworkInterfacesTest, RequestStateIsFoundOnlyAsItsOwnTypeAndOnlyWhileItLives) {
    boost::shared_ptr<Network::NetworkTask> task = boost::make_shared<BareTask>();
    EXPECT_FALSE(Network::getRequestState<RunningState>(task));

    boost::shared_ptr<RunningState> state = boost::make_shared<RunningState>();
    task->setState(state);
    EXPECT_EQ(state, Network::getRequestState<RunningState>(task));
    EXPECT_FALSE(Network::getRequestState<OtherState>(task));

    state.reset();
    EXPECT_FALSE(Network::getRequestState<RunningState>(task));
    EXPECT_FALSE(Network::getRequestState<RunningState>(boost::shared_ptr<Network::NetworkTask>()));
}

TEST(NetworkInterfacesTest, FixedCodesMatchTheEngineAndStatusValuesMatchThePlatform) {
    EXPECT_EQ(-1073741825, Network::OFFLINE_ERROR_CODE);
    EXPECT_EQ(-1073741826, Network::TASK_TIMEOUT_ERROR_CODE);
    EXPECT_EQ(Network::HTTP_OFFLINE_ERROR_CODE, Network::OFFLINE_ERROR_CODE);
    EXPECT_NE(Network::HTTP_TIMEOUT_ERROR_CODE, Network::TASK_TIMEOUT_ERROR_CODE);
    EXPECT_EQ(KD_NETWORK_NOT_REACHABLE_ZVR, Network::NetworkManager::NetworkNotReachable);
    EXPECT_EQ(KD_NETWORK_REACHABLE_VIA_WIFI_ZVR, Network::NetworkManager::NetworkReachableViaWifi);
    EXPECT_EQ(KD_NETWORK_REACHABLE_VIA_MOBILE_ZVR, Network::NetworkManager::NetworkReachableViaMobile);
    EXPECT_EQ(0, Network::NetworkManager::OfflineModeOff);
    EXPECT_EQ(0, Network::NetworkManager::NoNetworkError);
    EXPECT_EQ(0, Network::NetworkManager::NetworkActive);
}
