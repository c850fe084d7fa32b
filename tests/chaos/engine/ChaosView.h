#pragma once

#include <functional>
#include <memory>

#include "BaseView.h"

// A screen that can ask to be hidden, and deleted, from inside the calls its
// redraw manager and the platform make: the animation step, the redraw
// request, the size change and the frame drawing, as an application does when
// an animation ends with a screen switch. Main thread only.
class ChaosView : public BaseView {
public:
    enum Reentry { NoReentry, HideOnUpdate, HideOnRedraw, HideOnSizeChanged, HideOnDraw, ReentryCount };
    // Hides the view, and deletes it when asked to; the view returns at once after it.
    typedef std::function<void(ChaosView& view, bool deleteNow)> HideHook;

    explicit ChaosView(HideHook hideHook)
        : hideHook(hideHook), reentry(NoReentry), deleteInside(false), alive(std::make_shared<bool>(true)) {}
    ~ChaosView() override { *alive = false; }

    // Armed until it has happened once.
    void arm(Reentry value, bool deleteToo) {
        reentry = value;
        deleteInside = deleteToo;
    }
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
    bool deleteInside;
    // Cleared by the destructor: tells code of this view on the stack that it was deleted.
    std::shared_ptr<bool> alive;
};
