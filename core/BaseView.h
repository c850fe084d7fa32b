#pragma once

#include <KD/kdext.h>

#include <boost/shared_ptr.hpp>

#include "lifecycle/PauseResumeListener.h"
#include "lifecycle/PauseResumeListenerWrapper.h"
#include "redraw/ViewRedrawManagerDelegate.h"

namespace Redraw {
class ViewRedrawManager;
}
namespace Render {
class ResourceManager;
}

// A screen of the application, shown and hidden by BaseApp. Turns the
// platform's pointer, key, gesture and view events into calls of its virtual
// operations, follows the size of the main graphics context, and owns the
// redraw manager and the render resource manager while it is shown. The view
// is its own platform view proxy. Main thread only.
//
// The application may hide, show, and also delete a view from inside any of
// the view's callbacks (input, view events, size, update, redraw, draw);
// the view touches nothing of itself afterwards.
class BaseView : public Redraw::ViewRedrawManagerDelegate,
                 public Lifecycle::PauseResumeListener,
                 public KDViewProxyZVR {
public:
    // Input key indices with a meaning of their own.
    static constexpr KDint32 kKeyFlingLeft = 0x2006;
    static constexpr KDint32 kKeyFlingRight = 0x2007;
    static constexpr KDint32 kKeyAlternate1 = 0x2009;
    static constexpr KDint32 kKeyAlternate2 = 0x200A;
    static constexpr KDint32 kKeyTap = 0x1005;
    static constexpr KDint32 kKeyUnsupported = 0x1009;
    static constexpr KDint32 kKeyAction1 = 0xA001;
    static constexpr KDint32 kKeyAction2 = 0xA002;

    // Gesture sub-types (the first 32 bits of the data of event 100).
    static constexpr KDint32 kGestureFling = 3;
    static constexpr KDint32 kGestureTap = 5;
    static constexpr KDint32 kGestureRotation = 8;

    // Follows the size of the main context.
    void update(int elapsedMs) override;
    // Asks the platform for a redraw; draw() follows from the event loop.
    void redraw() override;

    // Removes the platform callbacks bound to this view.
    ~BaseView() override;

    // Subclasses extend these and call the base versions.
    virtual bool init();
    virtual void shutdown();

    // Called with the main context current.
    virtual void draw() = 0;
    virtual void onViewEvent106() = 0;
    virtual void onViewEvent104() = 0;
    virtual void onPointerPressed(int x, int y) = 0;
    virtual void onPointerReleased(int x, int y) = 0;
    virtual void onPointerMoved(int x, int y) = 0;
    // The base posts event 105 for kKeyAction1.
    virtual void onKey(int key, int x, int y);
    // data: the data of event 100; sub-type as 32 bits at offset 0, its
    // values from offset 4.
    virtual void onGesture(const KDEventData* data) = 0;
    virtual void onSizeChanged() = 0;

    bool onPaused() override { return false; }
    bool onResumed() override { return false; }
    bool onViewPaused() override;
    bool onViewResumed() override;
    // The platform resumes views with event 118 only. A view shown after it
    // (a screen switch, or shown again after hideView) is resumed here, with
    // its redraw manager, exactly as that event would have done; BaseApp calls
    // it once init() has returned. Does nothing while the platform view is
    // paused or the view already runs.
    void resumeIfViewRunning();

    // Press, fling gesture and release at (x, y), all delivered before return.
    void emulateFling(int x, int y, int dx, int dy);
    void emulateRotation(int x, int y, float angle);
    void updateSize();

    Redraw::ViewRedrawManager* getRedrawManager();
    // Null while the view is not shown.
    Render::ResourceManager* getResourceManager() { return resourceManager; }
    int getWidth() const { return width; }
    int getHeight() const { return height; }
    bool getIsViewPaused() const { return isViewPaused; }

    static void inputCallback(const KDEvent* event);
    static void mainCallback(const KDEvent* event);
    static void handleRedraw(KDViewProxyZVR* proxy);
    void handleEvent(const KDEvent* event);

protected:
    BaseView();

private:
    BaseView(const BaseView&) = delete;
    BaseView& operator=(const BaseView&) = delete;

    void handlePointer(const KDEventInputPointer& pointer);
    void handleKey(const KDEventInput& key);
    void handleGesture(const KDEventData& data);
    void emulateTap();
    void pressGestureRelease(const KDEventData& data, int x, int y);
    // Posts gesture event 100 and dispatches it at once.
    void postGesture(const KDEventData& data);

    int pointerDown;
    int width;
    int height;
    bool isViewPaused;
    Render::ResourceManager* resourceManager;
    int pointerX;
    int pointerY;
    bool selectPressed;
    boost::shared_ptr<Lifecycle::PauseResumeListenerWrapper> pauseResumeListenerWrapper;
    Redraw::ViewRedrawManager* redrawManager;
    // Expires with the view: code that calls out and then goes on watches it
    // through a weak reference.
    boost::shared_ptr<bool> life;
};
