// Simulated input events for views, all built on postToMain.
#include <pal/Simulation.h>
#include <pal/SimulationInput.h>

#include <cstring>

#include "Runtime.h"

namespace {

const std::size_t kPayloadOffset = 4;

KDEvent makeEvent(KDViewProxyZVR* view, KDint32 type) {
    KDEvent event;
    std::memset(&event, 0, sizeof(event));
    event.type = type;
    event.timestamp = kdGetTimeUST();
    event.userptr = view;
    return event;
}

}  // namespace

namespace pal {

void postPointer(KDViewProxyZVR* view, KDint32 index, KDint32 select, KDint32 x, KDint32 y) {
    KDEvent event = makeEvent(view, KD_EVENT_INPUT_POINTER);
    event.data.inputpointer.index = index;
    event.data.inputpointer.select = select;
    event.data.inputpointer.x = x;
    event.data.inputpointer.y = y;
    postToMain(event);
}

void postPointerMove(KDViewProxyZVR* view, KDint32 x, KDint32 y) {
    postPointer(view, KD_INPUT_POINTER_X, 0, x, y);
}

void postPointerSelect(KDViewProxyZVR* view, bool pressed) {
    postPointer(view, KD_INPUT_POINTER_SELECT, pressed ? 1 : 0, 0, 0);
}

void postKey(KDViewProxyZVR* view, KDint32 index, KDint32 value) {
    KDEvent event = makeEvent(view, KD_EVENT_INPUT);
    event.data.input.index = index;
    event.data.input.countflag = 0;
    event.data.input.value.i = value;
    postToMain(event);
}

void postGesture(KDViewProxyZVR* view, KDint32 subType, const void* payload, std::size_t payloadSize) {
    KDEvent event = makeEvent(view, KD_EVENT_GESTURE_ZVR);
    if (payloadSize > sizeof(event.data) - kPayloadOffset) {
        detail::writeLogLine("pal: postGesture: payload too large; event dropped");
        return;
    }
    std::memcpy(event.data.bytes, &subType, sizeof(subType));
    if (payloadSize > 0) {
        std::memcpy(event.data.bytes + kPayloadOffset, payload, payloadSize);
    }
    postToMain(event);
}

void postFling(KDViewProxyZVR* view, KDint16 dx, KDint16 dy) {
    KDint16 payload[2] = {dx, dy};
    postGesture(view, 3, payload, sizeof(payload));
}

void postViewEvent(KDViewProxyZVR* view, KDint32 type) {
    postToMain(makeEvent(view, type));
}

}  // namespace pal
