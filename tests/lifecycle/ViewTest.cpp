// A view driven through the platform layer as an application sees it: shown
// by the application, resumed by the platform's view event, fed with
// simulated input, drawing into the real GLES context.
#include <GLES/gl.h>
#include <KD/kdext.h>
#include <pal/Simulation.h>
#include <pal/SimulationInput.h>

#include <boost/scoped_ptr.hpp>
#include <cstring>
#include <string>
#include <vector>

#include "BaseView.h"
#include "TestApp.h"
#include "redraw/UpdateGenerator.h"
#include "redraw/ViewRedrawManager.h"

namespace {

const KDust kTick = 16666666;
const KDust kSecond = 1000000000ull;

typedef std::vector<std::string> Journal;

std::string at(const std::string& what, int x, int y) {
    return what + " " + std::to_string(x) + "," + std::to_string(y);
}

template <typename T>
T valueAt(const KDEventData* data, size_t offset) {
    T value;
    std::memcpy(&value, data->bytes + offset, sizeof(value));
    return value;
}

// Writes down every call; draw() clears the frame to `colour`.
class RecordingView : public BaseView {
public:
    void update(int elapsedMs) override {
        journal.push_back("update " + std::to_string(elapsedMs));
        BaseView::update(elapsedMs);
    }
    void draw() override {
        journal.push_back("draw");
        glClearColor(colour[0], colour[1], colour[2], 1.0f);
        glClear(GL_COLOR_BUFFER_BIT);
    }
    void onViewEvent106() override { journal.push_back("event106"); }
    void onViewEvent104() override { journal.push_back("event104"); }
    void onPointerPressed(int x, int y) override { journal.push_back(at("pressed", x, y)); }
    void onPointerReleased(int x, int y) override { journal.push_back(at("released", x, y)); }
    void onPointerMoved(int x, int y) override { journal.push_back(at("moved", x, y)); }
    void onKey(int key, int x, int y) override {
        journal.push_back(at("key " + std::to_string(key), x, y));
        BaseView::onKey(key, x, y);
    }
    void onGesture(const KDEventData* data) override {
        KDint32 subType = valueAt<KDint32>(data, 0);
        std::string text = "gesture " + std::to_string(subType);
        if (subType == kGestureRotation || subType == kGestureFling || subType == kGestureTap) {
            text += " " + std::to_string(valueAt<KDint16>(data, 4)) + "," +
                    std::to_string(valueAt<KDint16>(data, 6));
        }
        if (subType == kGestureRotation) {
            text += " " + std::to_string(valueAt<float>(data, 8));
        }
        journal.push_back(text);
    }
    void onSizeChanged() override {
        journal.push_back("size " + std::to_string(getWidth()) + "x" + std::to_string(getHeight()));
    }

    Journal journal;
    float colour[3] = {0.0f, 0.0f, 0.0f};
};

Journal gKeyActions;

void onKeyAction(const KDEvent* event) {
    gKeyActions.push_back(event->userptr != nullptr ? "105" : "105 without view");
}

class ViewTest : public LifecycleTest {
protected:
    void TearDown() override {
        if (view && view->getResourceManager() != nullptr) {
            TestApp::get()->hideView(view.get());
        }
        view.reset();
        PalTest::TearDown();
    }

    void show() {
        view.reset(new RecordingView());
        TestApp::get()->showView(view.get());
    }

    // Shown, resumed, first frame drawn and the timer stopped again.
    void showResumedAndIdle() {
        show();
        pal::postViewResumed();
        pump();
        advance(2 * kTick);
        ASSERT_FALSE(view->getRedrawManager()->getIsTimerStarted());
        view->journal.clear();
    }

    void deliverKey(KDint32 index, KDint32 value) {
        pal::postKey(view.get(), index, value);
        pump();
    }

    boost::scoped_ptr<RecordingView> view;
};

TEST_F(ViewTest, ShowingCreatesTheManagersAndHidingDeletesThem) {
    show();
    EXPECT_NE(view->getRedrawManager(), nullptr);
    EXPECT_NE(view->getResourceManager(), nullptr);
    EXPECT_TRUE(view->getIsViewPaused());

    TestApp::get()->hideView(view.get());
    EXPECT_EQ(view->getResourceManager(), nullptr);
    EXPECT_EQ(view->getRedrawManager(), nullptr);
    expectAssertion("redrawManager != nullptr");

    // Its callbacks stay installed: input still reaches the view though there is no manager to
    // wake, and an orientation change has no manager to schedule a frame with.
    const int redraws = pal::redrawCount();
    pal::postPointerMove(view.get(), 5, 6);
    pal::postPointerSelect(view.get(), true);
    pal::postPointerMove(view.get(), 7, 8);
    pal::postPointerSelect(view.get(), false);
    pal::postViewEvent(view.get(), KD_EVENT_ORIENTATION);
    pump();
    advance(kSecond);
    EXPECT_EQ(view->journal, (Journal{"pressed 5,6", "moved 7,8", "released 7,8"}));
    EXPECT_EQ(pal::redrawCount(), redraws);
}

TEST_F(ViewTest, ResumedViewReadsItsSizeDrawsOneFrameIntoTheContextAndThenCostsNoWakeUps) {
    show();
    view->colour[0] = 1.0f;
    view->colour[2] = 0.5f;
    pal::postViewResumed();
    pump();
    EXPECT_TRUE(hasLogLine("Size: 480x800"));
    EXPECT_EQ(view->journal, (Journal{"size 480x800"}));

    advance(kTick);
    EXPECT_EQ(view->journal, (Journal{"size 480x800", "update 16", "draw"}));
    EXPECT_EQ(pal::redrawCount(), 1);
    std::vector<std::uint8_t> rgba;
    int width = 0;
    int height = 0;
    ASSERT_TRUE(pal::readFrame(rgba, width, height));
    ASSERT_EQ(rgba.size(), 480u * 800u * 4u);
    size_t centre = (static_cast<size_t>(height / 2) * width + width / 2) * 4;
    EXPECT_EQ(rgba[centre], 255);
    EXPECT_EQ(rgba[centre + 1], 0);
    EXPECT_NEAR(rgba[centre + 2], 128, 1);

    advance(kTick);
    EXPECT_FALSE(view->getRedrawManager()->getIsTimerStarted());
    std::uint64_t fires = pal::timerFireCount();
    advance(5 * 60 * kSecond);
    EXPECT_EQ(pal::timerFireCount(), fires);
    EXPECT_EQ(pal::redrawCount(), 1);
}

TEST_F(ViewTest, SizeChangeIsReportedOnceAndAnUnchangedSizeIsNot) {
    showResumedAndIdle();
    clearLog();

    view->getRedrawManager()->scheduleUpdate();
    advance(kTick);
    EXPECT_EQ(view->journal, (Journal{"update 16"}));
    EXPECT_EQ(countLogLines("Size:"), 0);

    pal::setContextSize(320, 240);
    view->getRedrawManager()->scheduleUpdate();
    advance(2 * kTick);

    EXPECT_EQ(view->journal, (Journal{"update 16", "update 16", "size 320x240", "draw"}));
    EXPECT_TRUE(hasLogLine("Size: 320x240"));
}

TEST_F(ViewTest, PointerIsPressedMovedAndReleasedOnlyInThatOrder) {
    show();
    pal::postPointerSelect(view.get(), false);
    pal::postPointerMove(view.get(), 10, 20);
    pal::postPointerSelect(view.get(), true);
    pal::postPointerSelect(view.get(), true);
    pal::postPointer(view.get(), KD_INPUT_POINTER_Y, 0, 11, 22);
    pal::postPointerSelect(view.get(), false);
    pal::postPointerMove(view.get(), 30, 40);
    pal::postPointer(view.get(), 0x4004, 1, 50, 60);
    pump();

    EXPECT_EQ(view->journal, (Journal{"pressed 10,20", "moved 11,22", "released 11,22"}));
}

TEST_F(ViewTest, FlingKeyPressesFlingsAndReleasesBeforeTheCallbackReturns) {
    show();
    pal::postPointerMove(view.get(), 100, 200);
    pump();

    KDEvent event{};
    event.type = KD_EVENT_INPUT;
    event.userptr = view.get();
    event.data.input.index = BaseView::kKeyFlingLeft;
    event.data.input.value.i = 1;
    BaseView::inputCallback(&event);

    EXPECT_EQ(view->journal,
              (Journal{"key 8198 100,200", "pressed 100,200", "gesture 3 -900,0", "released 100,200"}));
}

TEST_F(ViewTest, KeyEmulationTableAndUnsupportedKeyReported) {
    show();
    kdInstallCallback(&onKeyAction, KD_EVENT_VIEW_KEY_ACTION_ZVR, view.get());
    gKeyActions.clear();
    pal::postPointerMove(view.get(), 7, 8);
    pump();

    deliverKey(BaseView::kKeyFlingRight, 1);
    deliverKey(BaseView::kKeyAlternate1, 1);
    deliverKey(BaseView::kKeyAlternate2, 1);
    deliverKey(BaseView::kKeyTap, 1);
    deliverKey(0x1234, 0);
    deliverKey(BaseView::kKeyUnsupported, 1);
    expectAssertion("key.index != kKeyUnsupported");

    EXPECT_EQ(view->journal,
              (Journal{"key 8199 7,8", "pressed 7,8", "gesture 3 900,0", "released 7,8", "key 8201 7,8",
                       "key 40961 7,8", "key 8202 7,8", "key 40962 7,8", "key 4101 7,8", "pressed 7,8",
                       "gesture 5 7,8", "released 7,8", "key 4105 7,8"}));
    EXPECT_EQ(gKeyActions, (Journal{"105"}));
    kdInstallCallback(nullptr, KD_EVENT_VIEW_KEY_ACTION_ZVR, view.get());
}

TEST_F(ViewTest, GesturesWithoutMovementAreNotReportedAndEmulatedRotationIsPressRotateRelease) {
    show();
    float one = 1.0f;
    float scale = 1.5f;
    KDint32 zero = 0;
    float angles[2] = {0.0f, 0.0f};
    float turned[2] = {0.0f, 0.25f};
    pal::postGesture(view.get(), 1, &one, sizeof(one));
    pal::postGesture(view.get(), 1, &scale, sizeof(scale));
    pal::postGesture(view.get(), 2, &zero, sizeof(zero));
    pal::postFling(view.get(), 0, 0);
    pal::postFling(view.get(), 0, 3);
    pal::postGesture(view.get(), 4, nullptr, 0);
    pal::postGesture(view.get(), 8, angles, sizeof(angles));
    pal::postGesture(view.get(), 8, turned, sizeof(turned));
    pal::postGesture(view.get(), 9, &zero, sizeof(zero));
    pal::postGesture(view.get(), 10, &scale, sizeof(scale));
    pump();

    EXPECT_EQ(view->journal, (Journal{"gesture 1", "gesture 3 0,3", "gesture 4", "gesture 8 0,0 0.250000"}));

    view->journal.clear();
    view->emulateRotation(12, 34, 0.5f);
    EXPECT_EQ(view->journal, (Journal{"pressed 12,34", "gesture 8 12,34 0.500000", "released 12,34"}));
}

TEST_F(ViewTest, ViewEventsReachTheViewAndOrientationSchedulesAnUpdate) {
    showResumedAndIdle();
    pal::postViewEvent(view.get(), KD_EVENT_VIEW_ACTIVITY_ZVR);
    pal::postViewEvent(view.get(), KD_EVENT_VIEW_STATE_ZVR);
    pal::postViewEvent(view.get(), KD_EVENT_ORIENTATION);
    pump();
    advance(kTick);

    EXPECT_EQ(view->journal, (Journal{"event104", "event106", "update 16"}));

    KDEvent unknown{};
    unknown.type = KD_EVENT_INPUT;
    view->handleEvent(&unknown);
    expectAssertion("isMainEventType(event->type)");
    view->handleEvent(nullptr);
    expectAssertion("event != nullptr");
}

TEST_F(ViewTest, AnyInputLiftsTheIdleThrottle) {
    showResumedAndIdle();
    advance(12 * kSecond);
    Redraw::UpdateGenerator generator(*view->getRedrawManager());
    advance(7 * kTick);
    EXPECT_EQ(view->journal, (Journal{"update 116"}));

    pal::postPointerMove(view.get(), 1, 1);
    pump();
    advance(kTick);

    EXPECT_EQ(view->journal, (Journal{"update 116", "update 16"}));
}

TEST_F(ViewTest, PausedViewStopsItsTimerAndResumesWithAFreshFrame) {
    showResumedAndIdle();
    Redraw::UpdateGenerator generator(*view->getRedrawManager());

    pal::postViewPaused();
    pump();
    EXPECT_TRUE(view->getIsViewPaused());
    EXPECT_FALSE(view->getRedrawManager()->getIsTimerStarted());
    advance(kSecond);
    EXPECT_TRUE(view->journal.empty());

    pal::postViewResumed();
    pump();
    advance(kTick);
    EXPECT_EQ(view->journal, (Journal{"update 16", "draw"}));
}

TEST_F(ViewTest, HiddenViewDropsItsQueuedRedrawAndIsResumedAgainWhenShownAgain) {
    showResumedAndIdle();
    view->redraw();
    TestApp::get()->hideView(view.get());
    pump();
    EXPECT_TRUE(view->journal.empty());

    TestApp::get()->showView(view.get());
    advance(kTick);
    EXPECT_EQ(view->journal, (Journal{"update 16", "draw"}));
}

TEST_F(ViewTest, ViewShownWhileThePlatformViewRunsResumesAtOnceAndOnlyOnce) {
    pal::postViewResumed();
    pump();
    show();
    EXPECT_FALSE(view->getIsViewPaused());
    advance(kTick);
    EXPECT_EQ(view->journal, (Journal{"size 480x800", "update 16", "draw"}));

    // The resume event arriving late resumes nothing a second time.
    pal::postViewResumed();
    pump();
    advance(10 * kTick);
    EXPECT_EQ(view->journal, (Journal{"size 480x800", "update 16", "draw"}));
    EXPECT_EQ(pal::redrawCount(), 1);
    EXPECT_FALSE(view->getRedrawManager()->getIsTimerStarted());

    // Shown while the platform view is paused, it waits for the event.
    pal::postViewPaused();
    pump();
    TestApp::get()->hideView(view.get());
    TestApp::get()->showView(view.get());
    advance(kSecond);
    EXPECT_TRUE(view->getIsViewPaused());
    EXPECT_EQ(pal::redrawCount(), 1);
}

TEST_F(ViewTest, DeletedViewReceivesNoMoreEvents) {
    showResumedAndIdle();
    TestApp::get()->hideView(view.get());
    KDViewProxyZVR* proxy = view.get();
    view.reset();

    pal::postPointerMove(proxy, 1, 1);
    pal::postKey(proxy, BaseView::kKeyTap, 1);
    pal::postViewEvent(proxy, KD_EVENT_VIEW_ACTIVITY_ZVR);
    kdGFXRequestRedraw(proxy);
    int redraws = pal::redrawCount();
    pump();

    EXPECT_EQ(pal::redrawCount(), redraws);
}

}  // namespace
