#include <pal/Simulation.h>

#include <algorithm>
#include <cstdio>
#include <string>
#include <vector>

#include "BaseApp.h"
#include "BaseView.h"
#include "TestApp.h"
#include "lifecycle/PauseResumeHandler.h"

namespace {

// Counts what BaseApp asks of it; the view's own machinery is not started.
class CountingView : public BaseView {
public:
    bool init() override {
        ++inits;
        return initResult;
    }
    void shutdown() override { ++shutdowns; }
    void draw() override {}
    void onViewEvent106() override {}
    void onViewEvent104() override {}
    void onPointerPressed(int, int) override {}
    void onPointerReleased(int, int) override {}
    void onPointerMoved(int, int) override {}
    void onGesture(const KDEventData*) override {}
    void onSizeChanged() override {}

    int inits = 0;
    int shutdowns = 0;
    bool initResult = true;
};

std::string showLine(const void* view) {
    char text[64];
    std::snprintf(text, sizeof(text), "BaseApp::showView 0x%X",
                  static_cast<unsigned>(reinterpret_cast<uintptr_t>(view)));
    return text;
}

size_t logIndex(const std::vector<std::string>& lines, const std::string& line) {
    return std::find(lines.begin(), lines.end(), line) - lines.begin();
}

class BaseAppTest : public LifecycleTest {};

class BaseAppFailingInitTest : public LifecycleTest {
protected:
    BaseAppFailingInitTest() { failInitOnStart = true; }
};

}  // namespace

TEST_F(BaseAppTest, StartCreatesAndInitialisesTheAppAndLogsTheLoadTime) {
    ASSERT_NE(nullptr, TestApp::get());
    std::vector<std::string> lines = logLines();
    size_t started = logIndex(lines, "kdInitZVR");
    size_t initialised = logIndex(lines, "BaseApp::init");
    size_t loaded = logIndex(lines, "Time to load: 0 ms");
    ASSERT_LT(loaded, lines.size());
    EXPECT_LT(started, initialised);
    EXPECT_LT(initialised, loaded);
    EXPECT_FALSE(pal::exitRequested());
}

TEST_F(BaseAppTest, AppIsPausedUntilTheFirstResumeAndASecondPauseReportsNoChange) {
    TestApp* app = TestApp::get();
    EXPECT_TRUE(app->getIsPaused());
    EXPECT_TRUE(Lifecycle::PauseResumeHandler::getInstance()->getIsAppPaused());
    pal::postAppResumed();
    pump();
    EXPECT_FALSE(app->getIsPaused());
    EXPECT_FALSE(Lifecycle::PauseResumeHandler::getInstance()->getIsAppPaused());

    pal::postAppPaused();
    pal::postAppPaused();
    pump();
    EXPECT_EQ(std::vector<bool>{true}, app->resumedResults);
    EXPECT_EQ((std::vector<bool>{true, false}), app->pausedResults);
    EXPECT_TRUE(app->getIsPaused());
}

TEST_F(BaseAppTest, ShutdownUnregistersWhileTheHandlerLivesAndDeletesTheApp) {
    int destroyedBefore = TestApp::destroyedCount;
    clearLog();
    shutdownPal();
    EXPECT_EQ(destroyedBefore + 1, TestApp::destroyedCount);
    EXPECT_TRUE(hasLogLine("kdShutdownZVR"));
    // The handler still existed while the app shut down, and lost its entry.
    ASSERT_GT(TestApp::handlerListenersBeforeShutdown, 0u);
    EXPECT_EQ(TestApp::handlerListenersBeforeShutdown - 1, TestApp::handlerListenersAfterShutdown);
    EXPECT_EQ(nullptr, BaseApp::get());
    expectAssertion("app != nullptr");
    EXPECT_EQ(nullptr, Lifecycle::PauseResumeHandler::getInstance());
}

TEST_F(BaseAppTest, HidingTheMiddleOfThreeViewsKeepsTheOthersInOrder) {
    BaseApp* app = TestApp::get();
    CountingView first, middle, last;
    app->showView(&first);
    app->showView(&middle);
    app->showView(&last);
    EXPECT_EQ(&first, app->getCurrentView());
    EXPECT_TRUE(hasLogLine(showLine(&middle)));
    EXPECT_EQ(3, countLogLines("BaseApp::showView: Time to show: "));

    app->hideView(&middle);
    EXPECT_EQ(1, middle.shutdowns);
    EXPECT_EQ(&first, app->getCurrentView());
    app->hideView(&first);
    EXPECT_EQ(&last, app->getCurrentView());
    EXPECT_EQ(2, countLogLines("BaseApp::hideView 0x"));
    EXPECT_EQ(0, last.shutdowns);
    EXPECT_EQ(1, last.inits);
}

TEST_F(BaseAppTest, ShowingARunningViewOrHidingAStrangerAssertsAndChangesNothing) {
    BaseApp* app = TestApp::get();
    CountingView view, stranger;
    app->showView(&view);
    app->showView(&view);
    expectAssertion("!running");
    EXPECT_EQ(1, view.inits);

    app->hideView(&stranger);
    expectAssertion("it != runningViews.end()");
    EXPECT_EQ(0, stranger.shutdowns);
    EXPECT_EQ(&view, app->getCurrentView());

    app->hideView(&view);
    EXPECT_EQ(nullptr, app->getCurrentView());
    expectAssertion("!runningViews.empty()");
}

TEST_F(BaseAppTest, ViewThatFailsToInitEndsTheApplication) {
    CountingView view;
    view.initResult = false;
    TestApp::get()->showView(&view);
    EXPECT_TRUE(hasLogLine("Could not init view"));
    EXPECT_TRUE(pal::exitRequested());
    EXPECT_EQ(-1, pal::exitStatus());
}

TEST_F(BaseAppTest, SecondGlobalInitIsRefused) {
    EXPECT_EQ(-1, BaseApp::globalInit(&BaseApp::create));
    expectAssertion("factory == nullptr");
    EXPECT_EQ(-1, BaseApp::globalInit(nullptr));
    expectAssertion("factory == nullptr");
    expectAssertion("newFactory != nullptr");
}

TEST_F(BaseAppFailingInitTest, FailedInitLogsAndExitsWithMinusOne) {
    EXPECT_TRUE(hasLogLine("Could not init app"));
    EXPECT_EQ(0, countLogLines("Time to load"));
    EXPECT_TRUE(pal::exitRequested());
    EXPECT_EQ(-1, pal::exitStatus());
    int destroyedBefore = TestApp::destroyedCount;
    shutdownPal();
    EXPECT_EQ(destroyedBefore + 1, TestApp::destroyedCount);
}
