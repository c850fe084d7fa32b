// Views hidden, shown and switched from inside their own callbacks: the
// redraw manager that called is gone when the callback returns, and neither
// it nor the view may be touched as if it still ran (ASan finds the rest).
#include <KD/kdext.h>
#include <pal/Simulation.h>
#include <pal/SimulationInput.h>

#include <boost/scoped_ptr.hpp>
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

// Hides itself (and shows `next`, if set) from the callback named in
// `hideIn`; every call is written down.
class HidingView : public BaseView {
public:
    explicit HidingView(Journal* journal, const std::string& name) : journal(journal), name(name) {}

    void update(int elapsedMs) override {
        note("update");
        if (hideIn == "update") {
            switchAway();
            return;
        }
        BaseView::update(elapsedMs);
    }
    void redraw() override {
        note("redraw");
        if (hideIn == "redraw") {
            switchAway();
            return;
        }
        BaseView::redraw();
    }
    void onSizeChanged() override {
        note("size");
        if (hideIn == "size") {
            switchAway();
        }
    }
    void draw() override {
        note("draw");
        if (hideIn == "draw") {
            switchAway();
        }
    }
    void onViewEvent106() override {}
    void onViewEvent104() override {
        note("event104");
        if (hideIn == "event104") {
            switchAway();
        }
    }
    void onPointerPressed(int, int) override {
        note("pressed");
        if (hideIn == "pressed") {
            switchAway();
        }
    }
    void onPointerReleased(int, int) override { note("released"); }
    void onPointerMoved(int, int) override {}
    void onKey(int key, int x, int y) override {
        note("key");
        if (hideIn == "key") {
            switchAway();
            return;
        }
        BaseView::onKey(key, x, y);
    }
    void onGesture(const KDEventData*) override { note("gesture"); }
    void shutdown() override {
        BaseView::shutdown();
        if (hideIn == "shutdown") {
            note("shutdown");
            TestApp::get()->hideView(this);
        }
    }

    std::string hideIn;
    HidingView* next = nullptr;
    // Set: the view is deleted through it right after it hid itself.
    boost::scoped_ptr<HidingView>* owner = nullptr;

private:
    void note(const std::string& what) { journal->push_back(name + " " + what); }
    void switchAway() {
        hideIn.clear();
        TestApp::get()->hideView(this);
        note("hidden");
        if (next != nullptr) {
            TestApp::get()->showView(next);
        }
        if (owner != nullptr) {
            journal->push_back(name + " deleted");
            owner->reset();
        }
    }

    Journal* journal;
    std::string name;
};

class ViewReentryTest : public LifecycleTest {
protected:
    void SetUp() override {
        LifecycleTest::SetUp();
        first.reset(new HidingView(&journal, "first"));
        second.reset(new HidingView(&journal, "second"));
    }

    void TearDown() override {
        for (HidingView* view : {first.get(), second.get()}) {
            if (view != nullptr && view->getResourceManager() != nullptr) {
                TestApp::get()->hideView(view);
            }
        }
        first.reset();
        second.reset();
        PalTest::TearDown();
    }

    // Shown and resumed; its first frame is drawn and the timer idles.
    void showIdle(HidingView* view) {
        TestApp::get()->showView(view);
        pal::postViewResumed();
        pump();
        advance(2 * kTick);
        journal.clear();
    }

    Journal journal;
    boost::scoped_ptr<HidingView> first;
    boost::scoped_ptr<HidingView> second;
};

TEST_F(ViewReentryTest, HidingFromUpdateEndsTheTickAndTheScheduledRedrawIsNotCalled) {
    showIdle(first.get());
    first->getRedrawManager()->scheduleUpdate();
    first->getRedrawManager()->scheduleRedraw();
    first->hideIn = "update";

    advance(kTick);
    advance(kSecond);

    EXPECT_EQ(journal, (Journal{"first update", "first hidden"}));
    EXPECT_EQ(first->getResourceManager(), nullptr);
    EXPECT_EQ(pal::activeTimerCount(), 0);
}

TEST_F(ViewReentryTest, HidingFromOnSizeChangedReachedThroughUpdateEndsTheTick) {
    showIdle(first.get());
    pal::setContextSize(320, 240);
    first->getRedrawManager()->scheduleUpdate();
    first->hideIn = "size";

    advance(kTick);
    advance(kSecond);

    EXPECT_EQ(journal, (Journal{"first update", "first size", "first hidden"}));
    EXPECT_EQ(pal::activeTimerCount(), 0);
}

TEST_F(ViewReentryTest, HidingFromAnOverriddenRedrawEndsTheTick) {
    showIdle(first.get());
    first->getRedrawManager()->scheduleRedraw();
    first->hideIn = "redraw";

    advance(kTick);
    advance(kSecond);

    EXPECT_EQ(journal, (Journal{"first redraw", "first hidden"}));
    EXPECT_EQ(pal::redrawCount(), 1);
}

TEST_F(ViewReentryTest, ScreenSwitchFromUpdateRunsTheNextViewOnItsOwnRedrawManager) {
    showIdle(first.get());
    first->next = second.get();
    first->hideIn = "update";
    first->getRedrawManager()->scheduleUpdate();

    advance(kTick);
    advance(kTick);

    EXPECT_EQ(journal, (Journal{"first update", "first hidden", "second size", "second update",
                                "second redraw", "second draw"}));
    EXPECT_EQ(TestApp::get()->getCurrentView(), second.get());
    EXPECT_FALSE(second->getIsViewPaused());
}

TEST_F(ViewReentryTest, HidingFromOnSizeChangedWhileTheViewResumesLeavesItPausedAndHidden) {
    TestApp::get()->showView(first.get());
    first->hideIn = "size";

    pal::postViewResumed();
    pump();
    advance(kSecond);

    EXPECT_EQ(journal, (Journal{"first size", "first hidden"}));
    EXPECT_TRUE(first->getIsViewPaused());
    EXPECT_EQ(first->getResourceManager(), nullptr);
    EXPECT_EQ(pal::activeTimerCount(), 0);
}

TEST_F(ViewReentryTest, HidingFromOnSizeChangedWhileShownIntoARunningViewLeavesItHidden) {
    pal::postViewResumed();
    pump();
    first->hideIn = "size";

    TestApp::get()->showView(first.get());
    advance(kSecond);

    EXPECT_EQ(journal, (Journal{"first size", "first hidden"}));
    EXPECT_TRUE(first->getIsViewPaused());
    EXPECT_EQ(pal::activeTimerCount(), 0);
}

TEST_F(ViewReentryTest, ViewHiddenFromItsUpdateIsShownAgainAndDrawsAgain) {
    showIdle(first.get());
    first->hideIn = "update";
    first->getRedrawManager()->scheduleUpdate();
    advance(kTick);
    journal.clear();

    TestApp::get()->showView(first.get());
    advance(kTick);

    EXPECT_EQ(journal, (Journal{"first update", "first redraw", "first draw"}));
}

TEST_F(ViewReentryTest, HidingFromAPointerPressOfAnEmulatedFlingStillEndsTheGesture) {
    showIdle(first.get());
    first->hideIn = "pressed";

    pal::postKey(first.get(), BaseView::kKeyFlingLeft, 1);
    pump();
    advance(kSecond);

    EXPECT_EQ(journal,
              (Journal{"first key", "first pressed", "first hidden", "first gesture", "first released"}));
}

TEST_F(ViewReentryTest, HidingFromDrawLeavesNoRedrawHandlerBehind) {
    showIdle(first.get());
    first->hideIn = "draw";
    first->getRedrawManager()->scheduleRedraw();
    advance(kTick);
    const int redraws = pal::redrawCount();

    kdGFXRequestRedraw(first.get());
    pump();
    advance(kSecond);

    EXPECT_EQ(journal, (Journal{"first redraw", "first draw", "first hidden"}));
    EXPECT_EQ(redraws, pal::redrawCount());
}

// The application may delete the view too, once hidden, from inside any of
// its callbacks; what the view would have done afterwards is dropped.
TEST_F(ViewReentryTest, ViewDeletedInsideItsCallbacksIsNotTouchedAfterwards) {
    const char* const callbacks[] = {"update", "size", "redraw", "draw", "pressed", "key", "event104"};
    for (const char* callback : callbacks) {
        SCOPED_TRACE(callback);
        first.reset(new HidingView(&journal, "first"));
        showIdle(first.get());
        first->owner = &first;
        first->hideIn = callback;
        if (std::string(callback) == "size") {
            pal::setContextSize(320 + static_cast<int>(journal.size()), 240);
        }
        HidingView* view = first.get();
        first->getRedrawManager()->scheduleUpdate();
        first->getRedrawManager()->scheduleRedraw();
        pal::postKey(view, BaseView::kKeyFlingRight, 1);
        pal::postViewEvent(view, KD_EVENT_VIEW_ACTIVITY_ZVR);
        pump();
        advance(kSecond);

        EXPECT_EQ(first.get(), nullptr);
        EXPECT_EQ(journal.back(), "first deleted");
        EXPECT_EQ(pal::activeTimerCount(), 0);
    }
}

TEST_F(ViewReentryTest, ViewDeletedFromOnSizeChangedWhileItResumesIsNotTouchedAfterwards) {
    TestApp::get()->showView(first.get());
    first->owner = &first;
    first->hideIn = "size";

    pal::postViewResumed();
    pump();
    advance(kSecond);

    EXPECT_EQ(journal, (Journal{"first size", "first hidden", "first deleted"}));
    EXPECT_EQ(pal::activeTimerCount(), 0);
}

// A screen switch at the end of an animation: the view is hidden from its
// update while the animation's generator still exists, and the generator
// goes afterwards.
TEST_F(ViewReentryTest, GeneratorOfAnAnimationMayOutliveTheViewHiddenFromItsUpdate) {
    showIdle(first.get());
    boost::scoped_ptr<Redraw::UpdateGenerator> animation(
        new Redraw::UpdateGenerator(*first->getRedrawManager()));
    first->next = second.get();
    first->hideIn = "update";

    advance(kTick);
    animation.reset();
    advance(kSecond);

    EXPECT_EQ(journal.front(), "first update");
    EXPECT_EQ(journal[1], "first hidden");
    EXPECT_EQ(TestApp::get()->getCurrentView(), second.get());
    EXPECT_EQ(pal::activeTimerCount(), 0);
}

TEST_F(ViewReentryTest, HidingAViewAgainFromItsOwnShutdownIsAnAssertionAndShutsItDownOnce) {
    showIdle(first.get());
    first->hideIn = "shutdown";

    TestApp::get()->hideView(first.get());

    expectAssertion("!beingHidden && \"a view is not hidden again from inside its own shutdown()\"");
    EXPECT_EQ(journal, (Journal{"first shutdown"}));
    EXPECT_EQ(first->getResourceManager(), nullptr);
}

}  // namespace
