#pragma once

#include <functional>

#include "BaseView.h"

// A screen that can ask to be hidden from inside the calls its redraw manager
// and the platform make: the animation step, the redraw request, the size
// change and the frame drawing, as an application does when an animation
// ends with a screen switch. Main thread only.
class ChaosView : public BaseView {
public:
    enum Reentry { NoReentry, HideOnUpdate, HideOnRedraw, HideOnSizeChanged, HideOnDraw, ReentryCount };
    // Hides (and may delete) the view; the view returns at once after it.
    typedef std::function<void(ChaosView& view)> HideHook;

    explicit ChaosView(HideHook hideHook) : hideHook(hideHook), reentry(NoReentry) {}

    // Armed until it has happened once.
    void arm(Reentry value) { reentry = value; }
    bool isArmed() const { return reentry != NoReentry; }

    void update(int elapsedMs) override;
    void redraw() override;
    void draw() override;
    void onViewEvent106() override {}
    void onViewEvent104() override {}
    void onPointerPressed(int, int) override {}
    void onPointerReleased(int, int) override {}
    void onPointerMoved(int, int) override {}
    void onGesture(const KDEventData*) override {}
    void onSizeChanged() override;

private:
    // True when the view was hidden and must not be touched any more.
    bool hideIf(Reentry due);

    HideHook hideHook;
    Reentry reentry;
};
