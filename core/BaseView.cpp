#include "BaseView.h"

#include <boost/make_shared.hpp>
#include <boost/weak_ptr.hpp>
#include <cstring>

#include "lifecycle/PauseResumeHandler.h"
#include "redraw/ViewRedrawManager.h"
#include "render/ResourceManager.h"
#include "util/Logger.h"

namespace {

const KDint32 kInputEvents[] = {KD_EVENT_INPUT, KD_EVENT_INPUT_POINTER, KD_EVENT_GESTURE_ZVR};
const KDint32 kMainEvents[] = {KD_EVENT_VIEW_ACTIVITY_ZVR, KD_EVENT_ORIENTATION, KD_EVENT_VIEW_STATE_ZVR};
const int kEmulatedFlingSpeed = 900;

bool isMainEventType(KDint32 type) {
    for (KDint32 mainEvent : kMainEvents) {
        if (mainEvent == type) {
            return true;
        }
    }
    return false;
}

// Gesture data is laid out by byte offset, the same on 32- and 64-bit
// platforms: the sub-type as 32 bits at offset 0, its values from offset 4.
KDint32 readInt32(const KDEventData& data, size_t offset) {
    KDint32 value;
    std::memcpy(&value, data.bytes + offset, sizeof(value));
    return value;
}

KDfloat32 readFloat(const KDEventData& data, size_t offset) {
    KDfloat32 value;
    std::memcpy(&value, data.bytes + offset, sizeof(value));
    return value;
}

void writeInt32(KDEventData& data, size_t offset, KDint32 value) {
    std::memcpy(data.bytes + offset, &value, sizeof(value));
}

void writeInt16(KDEventData& data, size_t offset, int value) {
    KDint16 narrow = static_cast<KDint16>(value);
    std::memcpy(data.bytes + offset, &narrow, sizeof(narrow));
}

void writeFloat(KDEventData& data, size_t offset, KDfloat32 value) {
    std::memcpy(data.bytes + offset, &value, sizeof(value));
}

KDEventData gestureData(KDint32 subType, int x, int y) {
    KDEventData data;
    std::memset(&data, 0, sizeof(data));
    writeInt32(data, 0, subType);
    writeInt16(data, 4, x);
    writeInt16(data, 6, y);
    return data;
}

// Gestures that carry no movement (a scale of exactly 1, a rotation by 0 ...)
// are not worth the application's attention.
bool isGestureReported(const KDEventData& data) {
    switch (readInt32(data, 0)) {
        case 1:
            return readFloat(data, 4) != 1.0f;
        case 2:
        case 3:
            return readInt32(data, 4) != 0;
        case 4:
        case 5:
        case 6:
        case 7:
            return true;
        case 8:
            return readFloat(data, 8) != 0.0f;
        case 9:
            return readFloat(data, 4) != 0.0f;
        default:
            return false;
    }
}

}  // namespace

BaseView::BaseView()
    : pointerDown(0),
      width(0),
      height(0),
      isViewPaused(true),
      resourceManager(nullptr),
      pointerX(0),
      pointerY(0),
      selectPressed(false),
      redrawManager(nullptr),
      life(boost::make_shared<bool>(true)) {}

BaseView::~BaseView() {
    // The callbacks stay installed across shutdown(); a deleted view must not
    // receive its events any more.
    for (KDint32 type : kInputEvents) {
        kdInstallCallback(nullptr, type, this);
    }
    for (KDint32 type : kMainEvents) {
        kdInstallCallback(nullptr, type, this);
    }
    kdGFXSetRedrawHandler(this, nullptr);
    Lifecycle::PauseResumeHandler* handler = Lifecycle::PauseResumeHandler::getInstance();
    if (handler != nullptr && pauseResumeListenerWrapper) {
        handler->removeListener(pauseResumeListenerWrapper.get());
    }
    delete resourceManager;
    delete redrawManager;
}

bool BaseView::init() {
    for (KDint32 type : kInputEvents) {
        kdInstallCallback(&BaseView::inputCallback, type, this);
    }
    for (KDint32 type : kMainEvents) {
        kdInstallCallback(&BaseView::mainCallback, type, this);
    }
    pauseResumeListenerWrapper = boost::make_shared<Lifecycle::PauseResumeListenerWrapper>(this);
    Lifecycle::PauseResumeHandler* handler = Lifecycle::PauseResumeHandler::getInstance();
    KD_ASSERT(handler != nullptr);
    if (handler != nullptr) {
        handler->addListener(pauseResumeListenerWrapper);
    }
    redrawManager = new Redraw::ViewRedrawManager(*this);
    resourceManager = new Render::ResourceManager();
    return true;
}

void BaseView::shutdown() {
    Lifecycle::PauseResumeHandler* handler = Lifecycle::PauseResumeHandler::getInstance();
    if (handler != nullptr && pauseResumeListenerWrapper) {
        handler->removeListener(pauseResumeListenerWrapper.get());
    }
    pauseResumeListenerWrapper.reset();
    delete resourceManager;
    resourceManager = nullptr;
    delete redrawManager;
    redrawManager = nullptr;
    // A redraw requested by the last tick must not reach a view without its
    // managers. Shown again, the view starts paused like its new redraw
    // manager, and the next view resume installs the handler again.
    kdGFXSetRedrawHandler(this, nullptr);
    isViewPaused = true;
}

void BaseView::update(int) {
    updateSize();
}

void BaseView::redraw() {
    kdGFXRequestRedraw(this);
}

Redraw::ViewRedrawManager* BaseView::getRedrawManager() {
    KD_ASSERT(redrawManager != nullptr);
    return redrawManager;
}

void BaseView::updateSize() {
    int oldWidth = width;
    int oldHeight = height;
    KDint widthKnown = kdGFXQueryMainContextZVR(this, KD_GFX_WIDTH_ZVR, &width);
    KDint heightKnown = kdGFXQueryMainContextZVR(this, KD_GFX_HEIGHT_ZVR, &height);
    KD_ASSERT(widthKnown && heightKnown);
    if (width < 1 || height < 1 || (width == oldWidth && height == oldHeight)) {
        return;
    }
    Logger::log(Logger::Info, "Size: %ix%i", width, height);
    Redraw::ViewRedrawManager* manager = getRedrawManager();
    if (manager != nullptr) {
        manager->scheduleRedraw();
    }
    onSizeChanged();
}

bool BaseView::onViewPaused() {
    if (isViewPaused) {
        return false;
    }
    isViewPaused = true;
    return true;
}

bool BaseView::onViewResumed() {
    if (!isViewPaused) {
        return false;
    }
    kdGFXSetRedrawHandler(this, &BaseView::handleRedraw);
    const boost::weak_ptr<bool> alive = life;
    updateSize();
    // onSizeChanged() may have hidden this view, which stays paused then, or
    // deleted it.
    if (alive.expired() || redrawManager == nullptr) {
        return false;
    }
    redrawManager->scheduleUpdate();
    redrawManager->scheduleRedraw();
    isViewPaused = false;
    return true;
}

void BaseView::resumeIfViewRunning() {
    Lifecycle::PauseResumeHandler* handler = Lifecycle::PauseResumeHandler::getInstance();
    if (handler == nullptr || handler->getIsViewPaused() || redrawManager == nullptr) {
        return;
    }
    // The order of the event's fan-out: the view registered before its
    // redraw manager.
    const boost::weak_ptr<bool> alive = life;
    onViewResumed();
    if (!alive.expired() && redrawManager != nullptr) {
        redrawManager->onViewResumed();
    }
}

void BaseView::onKey(int key, int, int) {
    if (key != kKeyAction1) {
        return;
    }
    KDEvent* event = kdCreateEvent();
    event->type = KD_EVENT_VIEW_KEY_ACTION_ZVR;
    event->timestamp = kdGetTimeUST();
    event->userptr = this;
    kdPostEvent(event);
}

void BaseView::handleRedraw(KDViewProxyZVR* proxy) {
    static_cast<BaseView*>(proxy)->draw();
}

void BaseView::mainCallback(const KDEvent* event) {
    if (event->userptr == nullptr) {
        return;
    }
    static_cast<BaseView*>(event->userptr)->handleEvent(event);
}

void BaseView::handleEvent(const KDEvent* event) {
    KD_ASSERT(event != nullptr);
    if (event == nullptr) {
        return;
    }
    KD_ASSERT(isMainEventType(event->type));
    const boost::weak_ptr<bool> alive = life;
    switch (event->type) {
        case KD_EVENT_VIEW_ACTIVITY_ZVR:
            onViewEvent104();
            break;
        case KD_EVENT_VIEW_STATE_ZVR:
            onViewEvent106();
            break;
        case KD_EVENT_ORIENTATION:
            // The callbacks outlive shutdown(), the redraw manager does not.
            if (redrawManager != nullptr) {
                redrawManager->scheduleUpdate();
            }
            break;
        default:
            return;
    }
    if (alive.expired()) {
        return;
    }
    if (!isViewPaused && redrawManager != nullptr) {
        redrawManager->onUserActivity();
    }
}

void BaseView::inputCallback(const KDEvent* event) {
    BaseView* view = static_cast<BaseView*>(event->userptr);
    if (view == nullptr) {
        return;
    }
    if (view->redrawManager != nullptr) {
        view->redrawManager->onUserActivity();
    }
    switch (event->type) {
        case KD_EVENT_INPUT_POINTER:
            view->handlePointer(event->data.inputpointer);
            break;
        case KD_EVENT_INPUT:
            view->handleKey(event->data.input);
            break;
        case KD_EVENT_GESTURE_ZVR:
            view->handleGesture(event->data);
            break;
        default:
            break;
    }
}

void BaseView::handlePointer(const KDEventInputPointer& pointer) {
    if (pointer.index == KD_INPUT_POINTER_X || pointer.index == KD_INPUT_POINTER_Y) {
        pointerX = pointer.x;
        pointerY = pointer.y;
        if (pointerDown) {
            onPointerMoved(pointerX, pointerY);
        }
        return;
    }
    if (pointer.index != KD_INPUT_POINTER_SELECT) {
        return;
    }
    const bool pressed = pointer.select > 0;
    const bool wasPressed = selectPressed;
    // Updated before the call, which may delete the view.
    selectPressed = pressed;
    if (pressed && !wasPressed) {
        pointerDown = 1;
        onPointerPressed(pointerX, pointerY);
    } else if (!pressed && wasPressed) {
        pointerDown = 0;
        onPointerReleased(pointerX, pointerY);
    }
}

void BaseView::handleKey(const KDEventInput& key) {
    if (key.value.i == 0) {
        return;
    }
    const boost::weak_ptr<bool> alive = life;
    onKey(key.index, pointerX, pointerY);
    if (alive.expired()) {
        return;
    }
    switch (key.index) {
        case kKeyFlingLeft:
            emulateFling(pointerX, pointerY, -kEmulatedFlingSpeed, 0);
            break;
        case kKeyFlingRight:
            emulateFling(pointerX, pointerY, kEmulatedFlingSpeed, 0);
            break;
        case kKeyAlternate1:
            onKey(kKeyAction1, pointerX, pointerY);
            break;
        case kKeyAlternate2:
            onKey(kKeyAction2, pointerX, pointerY);
            break;
        case kKeyTap:
            emulateTap();
            break;
        default:
            KD_ASSERT(key.index != kKeyUnsupported);
            break;
    }
}

void BaseView::handleGesture(const KDEventData& data) {
    if (isGestureReported(data)) {
        onGesture(&data);
    }
}

void BaseView::emulateFling(int x, int y, int dx, int dy) {
    pressGestureRelease(gestureData(kGestureFling, dx, dy), x, y);
}

void BaseView::emulateRotation(int x, int y, float angle) {
    KDEventData data = gestureData(kGestureRotation, x, y);
    writeFloat(data, 8, angle);
    pressGestureRelease(data, x, y);
}

void BaseView::emulateTap() {
    pressGestureRelease(gestureData(kGestureTap, pointerX, pointerY), pointerX, pointerY);
}

void BaseView::pressGestureRelease(const KDEventData& data, int x, int y) {
    const boost::weak_ptr<bool> alive = life;
    onPointerPressed(x, y);
    if (alive.expired()) {
        return;
    }
    postGesture(data);
    if (alive.expired()) {
        return;
    }
    onPointerReleased(x, y);
}

void BaseView::postGesture(const KDEventData& data) {
    KDEvent* event = kdCreateEvent();
    event->type = KD_EVENT_GESTURE_ZVR;
    event->timestamp = kdGetTimeUST();
    event->userptr = this;
    event->data = data;
    kdPostEvent(event);
    kdPumpEvents();
}
